#include "FollowedWorld.h"

#include <algorithm>
#include <utility>

#include <sys/stat.h>
#include <unistd.h>

// What the follower can know of the files, and a program that writes to a rotated one.

/// Another program may go on with the file that the log's own program leaves.
void FollowedWorld::leaveLateWriter() {
    // An empty file could not be told from another one that gets its inode.
    const bool isRecognised = m_written && !m_written->entries.empty() && !m_written->isOpenEnded &&
                              !m_written->isUnknown;
    if (m_written == m_rotatedLast && isRecognised && m_lateDescriptor < 0 && m_random() % 2 == 0) {
        m_lateDescriptor = m_descriptor;
        m_lateFile = m_written;
    } else if (m_descriptor >= 0) {
        close(m_descriptor);
    }
}

void FollowedWorld::endLateWriter() {
    if (m_lateDescriptor >= 0) {
        close(m_lateDescriptor);
        m_lateDescriptor = -1;
        m_lateFile.reset();
    }
}

void FollowedWorld::writeLate() {
    if (m_lateDescriptor < 0) {
        return;
    }
    std::string text;
    for (auto lines = 1 + m_random() % 3; lines > 0; --lines) {
        const auto number = m_lateEntries.size();
        m_lateEntries.push_back(
            {"L" + std::to_string(number) + ":" + random(40), m_rotations, m_lateFile->isUnknown});
        m_lateFile->lateEntries.push_back(static_cast<int>(number));
        text += m_lateEntries.back().text + "\n";
    }
    append(m_lateDescriptor, text);
    findMissing();
}

/// True if a late writer has written to a rotated file after the log was written.
bool FollowedWorld::hasContradictingTime() const {
    const auto timeOf = [](const std::string& path) {
        struct stat status {};
        stat(path.c_str(), &status);
        return std::pair(status.st_mtim.tv_sec, status.st_mtim.tv_nsec);
    };
    return std::any_of(m_files.begin(), m_files.end(), [&](const auto& file) {
        return !file.second->lateEntries.empty() && timeOf(file.first) > timeOf(m_path);
    });
}

void FollowedWorld::findMissingLate() {
    std::set<int> there;
    for (const auto& [path, file] : m_files) {
        if (m_style != Style::SYMLINK || path == m_target || m_held.count(file) != 0 ||
            !m_isFollowed) {
            there.insert(file->lateEntries.begin(), file->lateEntries.end());
        }
    }
    for (const auto& file : m_held) {
        there.insert(file->lateEntries.begin(), file->lateEntries.end());
    }
    for (std::size_t i = 0; i < m_lateEntries.size(); ++i) {
        m_lateEntries[i].mayMiss =
            m_lateEntries[i].mayMiss || there.count(static_cast<int>(i)) == 0;
    }
}

void FollowedWorld::noteLook() {
    m_isFollowed = true;
    const auto found = m_files.find(m_target);
    if (found != m_files.end()) {
        m_held.insert(found->second);
        struct stat status {};
        stat(m_target.c_str(), &status);
        m_seen[status.st_ino] = found->second;
    }
    if (m_style == Style::SYMLINK) {
        findMissing();
    }
}

std::shared_ptr<FollowedWorld::File> FollowedWorld::fileAt(ino_t inode) const {
    const auto found = m_seen.find(inode);
    return found == m_seen.end() ? nullptr : found->second;
}

void FollowedWorld::noteEnd(int last) {
    m_held.clear();
    m_isFollowed = false;
    m_last = last;
    findMissing();
}

void FollowedWorld::noteStart(bool hasPosition, const Files& lateFiles) {
    findMissing();
    // Only generations whose names begin with the log's are looked for by their times.
    bool isFound = false;
    for (const auto& [path, file] : m_files) {
        isFound = isFound || has(*file, m_last);
        if (lateFiles.count(file) != 0 || has(*file, m_last)) {
            m_held.insert(file);
        }
    }
    if (!isFound) {
        if (m_isReopenDue) {
            reopen();
        }
        std::set<int> there;
        for (const auto& [path, file] : m_files) {
            if ((hasPosition && m_style != Style::SYMLINK) || path == m_target) {
                there.insert(file->entries.begin(), file->entries.end());
            }
        }
        for (std::size_t i = static_cast<std::size_t>(m_delivered + 1); i < m_entries.size(); ++i) {
            m_entries[i].mayMiss = m_entries[i].mayMiss || there.count(static_cast<int>(i)) == 0;
        }
    }
    for (const auto& [path, file] : m_files) {
        const bool isFoundByName = hasPosition && m_style != Style::SYMLINK;
        file->isUnknown =
            file->isUnknown || !(isFoundByName || path == m_target || m_held.count(file) != 0);
        for (const int entry : file->lateEntries) {
            LateEntry& late = m_lateEntries[static_cast<std::size_t>(entry)];
            late.mayMiss = late.mayMiss || file->isUnknown;
        }
    }
    // Its time may say later that nothing of it was read.
    if (m_lateFile && m_lateFile->isUnknown) {
        endLateWriter();
    }
}
