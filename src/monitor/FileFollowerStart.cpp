#include "monitor/FileFollower.h"

#include <algorithm>
#include <cerrno>
#include <utility>
#include <vector>

namespace zrm {

// Where reading begins: in the file that has the log's name, or at the position of an earlier run.

/// Finds the first file to read. False while there is none.
bool FileFollower::begin() {
    std::unique_ptr<Generation> named = openNamed();
    if (!named && m_nameRetry.failures > 0) {
        return false;
    }
    if (m_stored) {
        leaveToOthers(*m_stored);
        takeUp(*m_stored, std::move(named));
    } else if (named) {
        beginFirst(std::move(named));
    }
    if (m_chain.empty()) {
        return false;
    }
    enter();
    // It may have been truncated before anything of it was read.
    return !m_stored || !m_chain.front().hadName || m_block.readTo() != 0 ||
           insertMissed() != Missed::awaited;
}

/// A log without a position.
void FileFollower::beginFirst(std::unique_ptr<Generation> named) {
    Member member;
    member.file = std::move(named);
    member.hadName = true;
    Generation::Status status;
    const bool isFromEnd = !beginWhereLeft(member) && !m_options.fromBeginning && !m_wasAbsent;
    if (!member.file->status(status) ||
        (isFromEnd && !member.file->readTail(status.size, member.tail))) {
        fail(m_nameRetry, "read", errno);
        return;
    }
    member.from = isFromEnd ? status.size : member.from;
    m_modified = status.modified;
    noteOlder(status.size == 0);
    m_position = positionOf(member.file->identity(), member.from, member.tail);
    m_position.modified = m_modified;
    m_hasPosition = true;
    m_chain.push_back(std::move(member));
}

/// A writer that still has the file before this one open writes to it later than this one was made.
/// `isEmpty`: this one, in which a truncation is not seen then.
void FileFollower::noteOlder(bool isEmpty) {
    for (const GenerationFile& file : generations()) {
        noteModified(file.modified);
        if (!isEmpty || file.size == 0) {
            continue; // what an empty file gets is written from now on
        }
        Older older{file.identity, file.isCompressed};
        if (const auto opened = file.isCompressed ? nullptr : Generation::open(file.path)) {
            opened->readHead(older.head);
        }
        m_older.push_back(older);
    }
}

/// Continues at a position of an earlier run.
void FileFollower::takeUp(const LogPosition& stored, std::unique_ptr<Generation> named) {
    if (!m_isGivenAway) {
        m_position = stored;
        m_hasPosition = true;
    }
    m_modified = stored.modified == 0 ? INT64_MAX : stored.modified;
    takeUpLate(stored, named.get());
    Found found = find(stored, Search::byContents, named.get());
    takeUnreadable(found);
    if (found.isInterrupted || (found.awaited && !found.holder && found.younger.empty())) {
        return;
    }
    const bool isHeld = found.holder.has_value() || stored.offset == 0;
    std::optional<Member> present;
    if (found.holder && !found.holder->file) {
        present = std::move(found.holder);
        found.holder.reset();
    } else if (!isHeld && (named || !found.younger.empty()) && stored.inode != 0) {
        m_ledger.noteLost(stored.offset, stored.offset);
    }
    // A copy of the present file may be younger than the position.
    const Generation* const first = found.holder           ? found.holder->file.get()
                                    : stored.modified == 0 ? named.get()
                                                           : nullptr;
    Generation::Status status;
    if (first != nullptr && first->status(status)) {
        m_modified = status.modified;
    }
    prepend(found);
    m_isTakenUp = !m_chain.empty();
    if (named && found.isAll) {
        Member member = memberOf(std::move(named));
        if (present && present->from >= member.from) {
            member.from = present->from;
            member.tail = present->tail;
        }
        m_chain.push_back(std::move(member));
    }
}

/// A writer that was not told of a rotation may have written to older files since the earlier run
/// has read them.
void FileFollower::takeUpLate(const LogPosition& stored, const Generation* named) {
    std::vector<ino_t> inodes;
    for (const LogPosition& left : stored.late.files()) {
        inodes.push_back(static_cast<ino_t>(left.inode));
    }
    if (inodes.empty()) {
        return;
    }
    const std::vector<GenerationFile> files = generations(inodes);
    for (const LogPosition& left : stored.late.files()) {
        const FileIdentity wanted = identityOf(left);
        if (wanted == identityOf(stored)) {
            continue; // read in its turn
        }
        if (named != nullptr && named->identity() == wanted && takeUpLate(left, m_path)) {
            continue; // it has got the name back
        }
        const auto isWanted = [&](const GenerationFile& file) { return file.identity == wanted; };
        const auto same = std::find_if(files.begin(), files.end(), isWanted);
        // An empty file that was left has no bytes to be recognised by. One that has some now may
        // be another file, even a compressed older one, which has got the inode.
        if (same != files.end() && (left.guardLength > 0 || same->size == 0) &&
            takeUpLate(left, same->path)) {
            continue;
        }
        // Compressed since. Some programs store the time of modification in seconds.
        constexpr std::int64_t second = 1'000'000'000;
        for (const GenerationFile& file : files) {
            if (file.isCompressed && left.guardLength > 0 &&
                file.modified >= left.modified - second && takeUpLate(left, file.path)) {
                break;
            }
        }
    }
}

/// False if the file is not that of the position.
bool FileFollower::takeUpLate(const LogPosition& left, const std::string& path) {
    std::unique_ptr<Generation> opened = Generation::open(path);
    Tail tail;
    if (!opened || !m_owner.take(opened->identity()) || !opened->holds(left, tail)) {
        return false;
    }
    if (!m_late.has(opened->identity())) { // not taken by an earlier attempt
        m_late.add(std::move(opened), left.offset, tail, m_now.steady);
    }
    return true;
}

} // namespace zrm
