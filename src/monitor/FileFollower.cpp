#include "monitor/FileFollower.h"

#include "base/WallTime.h"

#include <algorithm>
#include <cerrno>
#include <ctime>
#include <iterator>
#include <utility>

#include <sys/stat.h>

namespace zrm {

namespace {

constexpr std::chrono::seconds firstPause{1};
constexpr std::chrono::seconds longestPause{60};
constexpr int readsPerPause = 64; ///< without an entry, of 256 kB each

} // namespace

FileFollower::Moment FileFollower::Moment::now() noexcept {
    const std::timespec wall = wallTime();
    return {std::chrono::steady_clock::now(),
            static_cast<std::int64_t>(wall.tv_sec) * 1'000'000'000 + wall.tv_nsec};
}

FileFollower::FileFollower(std::string path, const Options& options, FollowLedger& ledger)
    : m_path(std::move(path)), m_options(options), m_ledger(ledger),
      m_block(options.recordLength, options.join.get()),
      m_late(options.recordLength, options.join, ledger), m_owner(options.owners, options.log) {}

void FileFollower::fail(Retry& retry, const char* call, int number, const std::string& file) {
    ++retry.failures;
    retry.pause = retry.pause.count() == 0 ? firstPause : std::min(2 * retry.pause, longestPause);
    retry.at = m_now.steady + retry.pause;
    m_ledger.noteFailure(call, number, file);
}

void FileFollower::succeed(Retry& retry) {
    if (retry.failures > 0) {
        retry = Retry{};
        if (m_nameRetry.failures + m_readRetry.failures + m_youngerRetry.failures == 0) {
            m_ledger.clearFailure();
        }
    }
}

std::optional<FileIdentity> FileFollower::file() const noexcept {
    return m_chain.empty() ? std::nullopt : std::optional(m_chain.front().file->identity());
}

LogPosition FileFollower::positionInBlock() const noexcept {
    LogPosition position =
        positionOf(m_chain.front().file->identity(), m_block.offset(), m_block.tail());
    position.modified = m_modified == INT64_MAX ? 0 : m_modified;
    if (m_isInBlock) {
        position.modified = std::max(position.modified, m_readModified);
    }
    return position;
}

std::optional<FileFollower::Place> FileFollower::place() const noexcept {
    if (m_chain.empty()) {
        return std::nullopt;
    }
    return Place{*m_chain.front().file, m_block.offset()};
}

std::optional<LogPosition> FileFollower::position() const noexcept {
    if (!m_isInBlock && !m_hasPosition) {
        return std::nullopt;
    }
    LogPosition position = m_isInBlock ? positionInBlock() : m_position;
    position.late = m_late.positions();
    if (!m_given.empty()) [[unlikely]] {
        std::vector<LogPosition> files = m_given;
        files.insert(files.end(), position.late.files().begin(), position.late.files().end());
        position.late = LatePositions(std::move(files));
    }
    return position;
}

bool FileFollower::look(const Moment& now) {
    m_now = now;
    m_mayLeaveOut = false;
    m_lookBegan = std::chrono::steady_clock::now();
    if (m_chain.empty()) {
        const bool hasBegun = mayTry(m_nameRetry) && mayTry(m_youngerRetry) && begin();
        return hasBegun || (m_isGivenAway && m_late.look(now.steady));
    }
    if (m_options.byName && mayTry(m_nameRetry)) {
        checkName();
        giveAway();
    }
    const bool hasLate = m_late.look(now.steady);
    return (!m_chain.empty() && mayTry(m_readRetry) && checkFile()) || hasLate;
}

/// Begins with the first file of the chain.
void FileFollower::enter() {
    const Member& member = m_chain.front();
    m_block.start(member.from, member.tail);
    m_head = Tail{};
    m_known = 0;
    m_isInBlock = false;
    m_isAtEnd = false;
    m_waitingTo = -1;
    m_hasSeen = false;
    m_readModified = 0;
    m_active = m_now.steady;
    m_readRetry = Retry{};
    if (member.isLeft) {
        // A restart would not find out from the file before it where this one was left.
        m_position = positionInBlock();
        m_hasPosition = true;
    }
    member.file->showPosition(member.from);
    m_ledger.noteGeneration(member.file->identity(), member.file->path());
    notePresent();
}

void FileFollower::notePresent() {
    m_ledger.setState(m_chain.size() > 1 ? FollowLedger::State::finishing
                                         : FollowLedger::State::reading);
}

bool FileFollower::isQuiet() noexcept {
    if (!m_mayLeaveOut) {
        return false;
    }
    if (m_options.byName && ++m_leftOut == nameInterval) {
        m_leftOut = 0;
        struct stat named;
        return lstat(m_path.c_str(), &named) == 0 &&
               FileIdentity{named.st_dev, named.st_ino} == m_chain.front().file->identity() &&
               Generation::Status::of(named) == m_seen;
    }
    Generation::Status now;
    return m_chain.front().file->status(now) && now == m_seen;
}

/// Looks whether another file has the log's name.
void FileFollower::checkName() {
    m_hadName = false;
    struct stat status;
    bool isThere = lstat(m_path.c_str(), &status) == 0;
    const bool isLink = isThere && S_ISLNK(status.st_mode);
    if (isLink) {
        isThere = stat(m_path.c_str(), &status) == 0;
    }
    if (isThere && S_ISREG(status.st_mode) &&
        FileIdentity{status.st_dev, status.st_ino} == m_chain.back().file->identity()) {
        m_hadName = !isLink;
        succeed(m_nameRetry);
        notePresent();
        return;
    }
    std::unique_ptr<Generation> named = openNamed();
    if (named && !(named->identity() == m_chain.back().file->identity())) {
        extend(std::move(named));
        notePresent();
    }
}

/// A file that was read was modified then. An older one may have been written to after a younger
/// one was made.
void FileFollower::noteModified(std::int64_t time) noexcept {
    m_modified = m_modified == INT64_MAX ? time : std::max(m_modified, time);
}

/// Looks whether the file that is read has changed. True if there may be something to read.
bool FileFollower::checkFile() {
    Generation::Status now;
    if (!m_chain.front().file->status(now)) {
        fail(m_readRetry, "fstat", errno);
        return false;
    }
    const bool isSame = m_hasSeen && now.size == m_seen.size && now.modified == m_seen.modified;
    if (!isSame) {
        m_isAtEnd = false;
        if (m_hasSeen) {
            m_active = m_now.steady;
        }
        if (m_isInBlock && m_readModified != 0) {
            noteModified(m_readModified); // before what is found now was done
        }
        if (m_chain.front().hadName && m_block.readTo() == 0) {
            const bool isPaused = m_isAwaited && !mayTry(m_youngerRetry);
            const Missed missed = isPaused ? Missed::awaited : insertMissed();
            if (missed != Missed::nothing) {
                return missed == Missed::inserted;
            }
        }
    }
    const bool isUnchanged = m_hasSeen && now == m_seen; // else it may have lost its name since
    m_seen = now;
    m_hasSeen = true;
    if (isSame && m_isAtEnd && m_chain.size() == 1 && !m_block.isWaiting()) {
        m_block.release();
        const bool isFailing =
            m_nameRetry.failures + m_readRetry.failures + m_youngerRetry.failures > 0;
        const bool hasName = m_hadName || !m_options.byName;
        m_mayLeaveOut = isUnchanged && hasName && !isFailing && m_late.isEmpty();
        m_leftOut = 0;
        return false;
    }
    return true;
}

/// A read has shown that the file was not truncated before the last look.
void FileFollower::noteSame() noexcept {
    if (m_hasSeen) {
        m_readModified = m_seen.modified;
    }
}

char* FileFollower::give(char* entry) noexcept {
    m_wasInBlock = std::exchange(m_isInBlock, true);
    if (m_block.isCut()) [[unlikely]] {
        m_ledger.noteCut();
    }
    return entry;
}

char* FileFollower::next() {
    m_isPaused = false;
    m_isLate = false;
    char* const entry = nextInOrder();
    return entry != nullptr || m_isPaused ? entry : nextLate();
}

/// While nothing of the present file was judged, the position is in the one before it. It moves
/// with the late lines of that, which a restart would read again.
char* FileFollower::nextLate() {
    char* const entry = m_late.next();
    if (entry == nullptr) {
        return nullptr;
    }
    m_isLate = true;
    noteModified(m_late.modified());
    m_before = m_position;
    const LogPosition behind = m_late.position();
    if (!m_isInBlock && identityOf(behind) == identityOf(m_position)) {
        m_position = behind;
        m_position.modified = m_modified;
    }
    return entry;
}

char* FileFollower::nextInOrder() {
    if (m_chain.empty() || !mayTry(m_readRetry) || (m_isAwaited && !mayTry(m_youngerRetry))) {
        return nullptr;
    }
    for (int reads = 0;; ++reads) {
        if (char* const entry = m_block.next()) {
            return give(entry);
        }
        m_isAtEnd = false;
        if (reads == readsPerPause) {
            m_isPaused = true;
            return nullptr;
        }
        const std::int64_t from = m_block.readTo();
        // The end of damaged contents is wrong before the damage shows.
        switch (m_chain.front().file->verify() ? m_block.fill(*m_chain.front().file)
                                               : EntryBlock::Fill::failed) {
        case EntryBlock::Fill::more:
            m_bytesRead += m_block.readTo() - from;
            m_known = std::max(m_seen.size, m_block.readTo());
            noteSame();
            m_isAwaited = false;
            if (m_head.length < Tail::size) {
                noteHead();
            }
            succeed(m_readRetry);
            break;
        case EntryBlock::Fill::changed:
            if (char* const entry = recover()) {
                return entry;
            }
            if (m_isAwaited) {
                return nullptr;
            }
            break;
        case EntryBlock::Fill::failed:
            if (errno != EINTR && isGivenUp() && m_block.isWaiting()) {
                return give(m_block.endWaiting());
            }
            if (!handleFailedRead()) {
                return nullptr;
            }
            break;
        case EntryBlock::Fill::end:
            succeed(m_readRetry);
            noteSame();
            m_isAtEnd = true;
            if (!isFinished()) {
                return hasWaitedEnough() ? give(m_block.endWaiting()) : nullptr;
            }
            if (char* const entry = finish()) {
                return entry;
            }
            if (!switchToNext()) {
                return nullptr;
            }
            break;
        }
    }
}

bool FileFollower::takeBack() noexcept {
    if (m_isLate) {
        m_position = m_before;
        return m_late.takeBack();
    }
    const bool isTaken = m_block.takeBack();
    m_isInBlock = isTaken ? m_wasInBlock : m_isInBlock;
    return isTaken;
}

void FileFollower::noteProgress() {
    std::vector<FileIdentity> files = m_late.files();
    std::int64_t behind = 0;
    for (const Member& member : m_chain) {
        files.push_back(member.file->identity());
        Generation::Status status;
        if (!member.file->isCompressed() && member.file->status(status)) {
            const bool isFirst = &member == &m_chain.front();
            behind += std::max<std::int64_t>(status.size - (isFirst ? m_block.offset() : 0), 0);
        }
    }
    m_owner.keep(files);
    std::erase_if(m_given, [this](const LogPosition& left) {
        return m_owner.isSettledByAnother(identityOf(left));
    });
    if (!m_chain.empty()) {
        const FileIdentity& first = m_chain.front().file->identity();
        if (m_isInBlock || identityOf(m_position) == first) {
            m_owner.settle(first);
        }
        m_chain.front().file->showPosition(m_block.readTo());
        m_ledger.notePosition(m_block.offset(), behind);
    }
}

} // namespace zrm
