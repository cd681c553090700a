#include "monitor/FileFollower.h"

#include <algorithm>
#include <cerrno>
#include <utility>

namespace zrm {

// The end of the file that is read: what waits there, and when the next file takes over.

/// True if the lines that wait at the end of the file have done so for long enough.
bool FileFollower::hasWaitedEnough() noexcept {
    if (!m_block.isWaiting()) {
        return false;
    }
    if (m_block.waitingTo() != m_waitingTo) {
        m_waitingTo = m_block.waitingTo();
        // Much may have been read since the look.
        m_waitingSince = m_now.steady + (std::chrono::steady_clock::now() - m_lookBegan);
    }
    return !m_waits || m_now.steady - m_waitingSince >= m_options.join->limits().wait;
}

bool FileFollower::isFinished() const noexcept {
    if (m_chain.size() < 2) {
        return false;
    }
    const Member& member = m_chain.front();
    if (member.isComplete || member.file->isCompressed() ||
        m_now.steady - m_active >= m_options.rotateWait) {
        return true;
    }
    // What was rotated before the start need not be waited for again.
    Generation::Status now;
    return m_isTakenUp && member.file->status(now) &&
           m_now.wall - now.changed >= std::chrono::nanoseconds(m_options.rotateWait).count();
}

/// False if the next file is not read yet.
bool FileFollower::switchToNext() {
    Member finished = std::move(m_chain.front());
    m_chain.pop_front();
    m_older.clear();
    Generation::Status status{};
    const bool hasStatus = finished.file->status(status);
    if (m_block.readTo() > 0) {
        noteModified(hasStatus ? status.modified : m_seen.modified);
        m_position = positionOf(finished.file->identity(), m_block.offset(), m_block.tail());
        m_position.modified = m_modified;
        m_hasPosition = true;
    }
    if (finished.isRecovery && m_block.offset() > finished.from) {
        m_ledger.noteRecovered(finished.file->path(), finished.from, m_block.offset());
    }
    Member& next = m_chain.front();
    if (hasStatus && !status.hasName && !finished.file->isCompressed() &&
        identityOf(m_position) == finished.file->identity()) {
        continueIn(next);
    }
    if (!finished.isComplete && !finished.file->isCompressed()) {
        m_late.add(std::move(finished.file), m_block.offset(), m_block.tail(), m_now.steady);
    } else if (m_block.readTo() > 0) {
        m_owner.leave(m_position);
    }
    m_isTakenUp = m_isTakenUp && m_chain.size() > 1;
    enter();
    return !m_chain.front().hadName || m_block.readTo() != 0 || insertMissed() != Missed::awaited;
}

/// What the ledger calls a file: nothing if it is the one that has the log's name.
std::string FileFollower::sourceOf(const Member& member) {
    return member.hadName ? "" : member.file->path();
}

/// True if the file is not read any further should a read fail now.
bool FileFollower::isGivenUp() const noexcept {
    return m_chain.size() > 1 &&
           (m_chain.front().file->isCompressed() || m_readRetry.failures >= mostReadFailures);
}

/// A read has failed. True if reading goes on at once.
bool FileFollower::handleFailedRead() {
    const int number = errno;
    if (number == EINTR || number == ECANCELED) {
        return number == EINTR; // interrupted for good
    }
    Member& member = m_chain.front();
    const bool isHopeless = isGivenUp();
    fail(m_readRetry, "read", number, sourceOf(member));
    if (!isHopeless) {
        // Descriptors of network file systems go stale.
        std::unique_ptr<Generation> again = Generation::open(member.file->path());
        if (again && again->identity() == member.file->identity()) {
            member.file = std::move(again);
        }
        return false;
    }
    const std::int64_t size = member.file->isCompressed() ? 0 : m_seen.size; // of its contents
    m_ledger.noteLost(m_block.offset(), std::max(m_block.readTo(), size), sourceOf(member));
    Generation::Status status;
    if (member.file->status(status)) {
        giveUp({member.file->identity(), status.modified}); // nothing of it may have been read
    }
    succeed(m_readRetry);
    member.isComplete = true;
    return switchToNext();
}

/// What a file that is finished has behind its last whole entry: lines that waited, an unfinished
/// line, or the lost beginning of a record.
char* FileFollower::finish() {
    const std::int64_t from = m_block.offset();
    char* const entry = m_block.rest();
    if (entry != nullptr) {
        m_wasInBlock = std::exchange(m_isInBlock, true);
    } else if (m_block.offset() > from) {
        m_ledger.noteLost(from, m_block.offset(), sourceOf(m_chain.front()));
    }
    return entry;
}

} // namespace zrm
