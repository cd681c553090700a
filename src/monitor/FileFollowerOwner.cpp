#include "monitor/FileFollower.h"

#include <algorithm>
#include <utility>

#include <sys/stat.h>

namespace zrm {

// Files that have come to have the name of another followed log, and those that this log gets.

FileFollower::~FileFollower() {
    for (const LateLines::Left& left : m_late.takeLeft()) {
        m_owner.leave(left.position);
    }
    if (!m_chain.empty()) {
        m_owner.leave(positionInBlock());
    }
}

std::vector<LateLines::Left> FileFollower::takeLeft() {
    std::vector<LateLines::Left> left = m_late.takeLeft();
    for (const LateLines::Left& one : left) {
        if (!one.isWatched) {
            m_owner.leave(one.position);
        }
    }
    return left;
}

/// Another log goes on with files in which this one had a position when it ended.
void FileFollower::leaveToOthers(LogPosition& stored) {
    if (stored.inode != 0 && !m_owner.take(identityOf(stored))) {
        stored.device = stored.inode = 0;
    }
    std::vector<LogPosition> late = stored.late.files();
    if (std::erase_if(late, [this](const LogPosition& left) {
            return !m_owner.take(identityOf(left));
        }) > 0) {
        stored.late = LatePositions(std::move(late));
    }
}

/// Gives up the files that another log asks for and that no longer have this log's name.
void FileFollower::giveAway() {
    if (m_hadName && m_chain.size() == 1 && m_late.isEmpty()) {
        return;
    }
    struct stat status;
    const bool isThere = stat(m_path.c_str(), &status) == 0;
    const auto isAskedFor = [&](const FileIdentity& file) {
        const bool hasName = isThere && FileIdentity{status.st_dev, status.st_ino} == file;
        return !hasName && m_owner.isAskedFor(file);
    };
    for (const FileIdentity& file : m_late.files()) {
        if (isAskedFor(file)) {
            giveUpAt(m_late.remove(file).value_or(LogPosition{}));
        }
    }
    for (auto member = m_chain.begin() + 1; member != m_chain.end();) {
        const bool isGiven = isAskedFor(member->file->identity());
        if (isGiven) {
            giveUpAt(positionOf(member->file->identity(), member->from, member->tail));
        }
        member = isGiven ? m_chain.erase(member) : member + 1;
    }
    if (isAskedFor(m_chain.front().file->identity())) {
        giveFirstAway();
    }
}

/// Another log goes on with a file. Should the process end before that has a position in it, the
/// next run begins with this log's, and gives the file up again.
void FileFollower::giveUpAt(const LogPosition& left) {
    m_owner.leave(left);
    m_given.push_back(left);
}

/// Another log reads the rest of the file that is read.
void FileFollower::giveFirstAway() {
    m_position = positionInBlock();
    m_hasPosition = true;
    m_isInBlock = false;
    giveUpAt(m_position);
    if (m_readModified != 0) {
        noteModified(m_readModified);
    }
    m_chain.pop_front();
    m_older.clear();
    if (!m_chain.empty()) {
        enter();
        return;
    }
    m_block.start(0, {});
    m_block.release();
    m_isAtEnd = false;
    m_isGivenAway = true;
    m_stored = LogPosition{}; // the next file is one that was modified after this one
    m_stored->modified = m_modified == INT64_MAX ? 0 : m_modified;
}

/// True if another log has read the beginning of the file.
bool FileFollower::beginWhereLeft(Member& member) const {
    const std::optional<LogPosition> left = m_owner.left(member.file->identity());
    Tail tail;
    const bool isLeft = left && member.file->holds(*left, tail);
    if (isLeft) {
        member.from = left->offset;
        member.tail = tail;
        member.isLeft = true;
    }
    return isLeft;
}

} // namespace zrm
