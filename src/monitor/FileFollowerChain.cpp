#include "monitor/FileFollower.h"

#include <algorithm>
#include <array>
#include <iterator>
#include <utility>

#include <sys/stat.h>

namespace zrm {

// Which files are read besides the present one of a followed log: those between two looks, and the
// copies that have what a truncation removed.

namespace {

constexpr std::size_t mostFiles = 64; ///< waiting to be read

} // namespace

/// Another file has the name: it is read after those that were there before it.
void FileFollower::extend(std::unique_ptr<Generation> named) {
    if (m_chain.size() >= mostFiles || !mayTry(m_youngerRetry)) {
        return; // found again when these have been read
    }
    if (m_chain.size() == 1) {
        m_active = m_now.steady;
    }
    Generation::Status status;
    Generation& last = *m_chain.back().file;
    GenerationReference reference{last.identity(),
                                  last.status(status) ? status.modified : INT64_MAX};
    // What was read before it may have been written to later.
    if (m_modified != INT64_MAX) {
        reference.modified = std::max(reference.modified, m_modified);
    }
    Found found = findYounger(reference, named.get());
    if (found.isInterrupted) {
        return;
    }
    takeUnreadable(found);
    std::move(found.younger.begin(), found.younger.end(), std::back_inserter(m_chain));
    if (found.isAll) {
        m_chain.push_back(memberOf(std::move(named)));
    }
}

/// The file that has the name. An older one may have got it back.
FileFollower::Member FileFollower::memberOf(std::unique_ptr<Generation> named) {
    Member present;
    present.file = std::move(named);
    present.hadName = true;
    const std::optional<LogPosition> left = m_late.remove(present.file->identity());
    Tail tail;
    if (!left) {
        beginWhereLeft(present);
    } else if (present.file->holds(*left, tail)) {
        present.from = left->offset;
        present.tail = tail;
    }
    return present;
}

bool FileFollower::isOlder(Generation& file) const {
    return std::any_of(m_older.begin(), m_older.end(), [&file](const Older& older) {
        Tail head;
        return older.identity == file.identity() && older.isCompressed == file.isCompressed() &&
               file.readHead(head) >= older.head.length &&
               std::equal(head.bytes.begin(), head.bytes.begin() + older.head.length,
                          older.head.bytes.begin());
    });
}

bool FileFollower::hasLostName() const noexcept {
    struct stat status;
    return m_chain.size() > 1 || stat(m_path.c_str(), &status) != 0 ||
           !(FileIdentity{status.st_dev, status.st_ino} == m_chain.front().file->identity());
}

/// What was made after the file that is read had lost its name belongs behind it. A file before
/// it may have been written to later. Where an empty file was that is gone makes no difference.
void FileFollower::dropYoungerThanFirst(Found& found) {
    Generation::Status status{};
    const auto first =
        std::find_if(m_chain.begin(), m_chain.end(), [&status](const Member& member) {
            return member.file->status(status) && (status.hasName || status.size > 0);
        });
    if (first == m_chain.end()) {
        return;
    }
    const std::vector<GenerationFile> younger =
        youngerThan(generations(), {first->file->identity(), status.modified});
    std::erase_if(found.younger, [&younger](const Member& member) {
        return std::any_of(younger.begin(), younger.end(), [&member](const GenerationFile& file) {
            return file.identity == member.file->identity();
        });
    });
}

/// The present file has nothing that was read, so that a truncation is not seen in it. What was in
/// it before may be in a copy, which is read first.
FileFollower::Missed FileFollower::insertMissed() {
    Found found = find(m_position, Search::byIdentity, nullptr);
    takeUnreadable(found);
    m_isAwaited = found.awaited || found.isInterrupted;
    if (m_isAwaited) {
        return Missed::awaited;
    }
    const bool isHeld = found.holder.has_value();
    found.holder.reset();
    std::erase_if(found.younger, [this](const Member& member) { return isOlder(*member.file); });
    if (hasLostName()) {
        dropYoungerThanFirst(found);
    }
    if (found.younger.empty()) {
        return Missed::nothing;
    }
    if (!isHeld) {
        continueIn(found.younger.front());
    }
    for (Member& member : found.younger) {
        member.isRecovery = true;
    }
    prepend(found);
    enter();
    return Missed::inserted;
}

/// A copy that was made before a truncation is recognised by its beginning.
void FileFollower::noteHead() {
    Generation& file = *m_chain.front().file;
    std::array<char, Tail::size> bytes;
    if (file.isCompressed()) {
        return; // never truncated
    }
    const std::ptrdiff_t count = file.readAt(bytes.data(), bytes.size(), 0);
    if (count > 0) {
        m_head.assign(bytes.data(),
                      static_cast<std::size_t>(std::min<std::int64_t>(count, m_block.readTo())));
    }
}

/// What was written between the copy and the truncation may have been read, so that the copy ends
/// before the position. All of it was read then, although its time is younger. Returns that time.
std::optional<std::int64_t> FileFollower::dropShortCopy(Found& found, std::int64_t offset) const {
    const auto isShortCopy = [&](const Member& member) {
        std::array<char, Tail::size> bytes;
        const std::ptrdiff_t length = member.file->readAt(bytes.data(), m_head.length, 0);
        return length > 0 &&
               std::equal(bytes.begin(), bytes.begin() + length, m_head.bytes.begin()) &&
               member.file->readAt(bytes.data(), 1, offset) <= 0;
    };
    const auto copy = std::find_if(found.younger.begin(), found.younger.end(), isShortCopy);
    if (copy == found.younger.end()) {
        return std::nullopt;
    }
    Generation::Status status{};
    copy->file->status(status);
    found.younger.erase(copy);
    return status.modified;
}

/// True if a file has all lines of this one that wait, with what may continue them, or if one that
/// cannot be read yet may have them.
bool FileFollower::hasCopyOfWaiting() {
    const Found found = find(positionInBlock(), Search::byContents, nullptr);
    if (found.awaited || found.isInterrupted) {
        return true;
    }
    char last;
    return found.holder && found.holder->file->readAt(&last, 1, m_block.waitingTo() - 1) == 1;
}

/// The file no longer has what was read of it: it was truncated. The rest of the old contents is
/// read from a copy, as far as there is one; then the file is read from its beginning. Gives lines
/// that wait and are in no copy. Nothing is changed while a file that may be the copy is awaited.
char* FileFollower::recover() {
    if (m_block.isWaiting() && !hasCopyOfWaiting()) {
        return give(m_block.endWaiting());
    }
    Member& truncated = m_chain.front();
    // Else the position is in a file before this one, which was read to its end.
    const bool isOwn = m_isInBlock || truncated.from > 0;
    LogPosition at = isOwn ? positionInBlock() : m_position;
    const std::int64_t known = std::max(m_known, m_block.readTo());
    Found found = find(at, Search::byContents, nullptr);
    takeUnreadable(found, at.offset, known);
    m_isAwaited = found.awaited || found.isInterrupted;
    if (m_isAwaited) {
        return nullptr;
    }
    m_ledger.noteTruncation();
    if (!isOwn) {
        found.holder.reset();
    } else if (!found.holder) {
        const auto copied = dropShortCopy(found, at.offset);
        at.modified = std::max(at.modified, copied.value_or(0));
    }
    if (m_isInBlock) {
        noteModified(at.modified);
    }
    m_position = at;
    m_hasPosition = true;
    m_isInBlock = false;
    truncated.from = 0;
    truncated.tail = Tail{};
    truncated.isLeft = false;
    if (found.lost.empty() && (isOwn ? !found.holder : found.younger.empty())) {
        const std::int64_t from = isOwn ? at.offset : 0;
        m_ledger.noteLost(from, std::max(from, known));
    }
    for (Member& member : found.younger) {
        member.isRecovery = true;
    }
    if (found.holder) {
        found.holder->isComplete = true;
        found.holder->isRecovery = true;
    }
    prepend(found);
    enter();
    return nullptr;
}

/// The file of the position is gone. If it was replaced by one that begins with all of it, as
/// editors do, reading goes on in that.
void FileFollower::continueIn(Member& next) {
    Tail tail;
    if (next.from == 0 && m_position.guardLength > 0 && next.file->holds(m_position, tail)) {
        next.from = m_position.offset;
        next.tail = tail;
    }
}

void FileFollower::prepend(Found& found) {
    for (auto member = found.younger.rbegin(); member != found.younger.rend(); ++member) {
        m_chain.push_front(std::move(*member));
    }
    if (found.holder) {
        m_chain.push_front(std::move(*found.holder));
    }
}

} // namespace zrm
