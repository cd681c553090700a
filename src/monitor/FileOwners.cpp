#include "monitor/FileOwners.h"

#include "monitor/Generation.h"

#include <algorithm>
#include <iterator>

namespace zrm {

FileOwners& FileOwners::ofProcess() {
    static auto* const owners =
        new FileOwners; // logs may still be followed while the process exits
    return *owners;
}

void FileOwners::expect(const std::vector<Expected>& logs) {
    const std::lock_guard guard(m_mutex);
    for (auto file = m_files.begin(); file != m_files.end();) {
        const auto next = std::next(file);
        if (!file->second.owner.empty() && file->second.reader == 0) {
            free(file);
        }
        file = next;
    }
    const auto until = Clock::now() + patience;
    for (const auto& [log, position] : logs) {
        if (position.inode == 0) {
            continue; // in no file
        }
        const Key key = keyOf(identityOf(position));
        File& file = m_files[key];
        const bool isBehind =
            !file.owner.empty() && file.left && file.left->offset >= position.offset;
        if (file.reader == 0 && !isBehind) {
            file.owner = log;
            file.until = until;
            noteLeft(key, file, position, log);
        }
    }
}

/// True if the file is that of another log than this.
bool FileOwners::isAnothers(const File& file, const std::string& log) noexcept {
    return !file.owner.empty() && file.owner != log &&
           (file.reader != 0 || Clock::now() < file.until);
}

bool FileOwners::isAskedFor(const File& file) noexcept {
    return file.asked != Clock::time_point{} && Clock::now() - file.asked < asksFor;
}

/// The file is nobody's from now on.
void FileOwners::free(std::map<Key, File>::iterator file) {
    file->second.owner.clear();
    file->second.reader = 0;
    if (!file->second.left) {
        m_files.erase(file);
    }
}

void FileOwners::noteLeft(const Key& key, File& file, const LogPosition& position,
                          const std::string& log) {
    file.left = position;
    file.leftBy = log;
    file.order = ++m_order;
    m_left.emplace_back(m_order, key);
    while (m_left.size() > mostLeft) {
        const auto oldest = m_files.find(m_left.front().second);
        if (oldest != m_files.end() && oldest->second.order == m_left.front().first) {
            oldest->second.left.reset();
            if (oldest->second.owner.empty()) {
                m_files.erase(oldest);
            }
        }
        m_left.pop_front();
    }
}

FileOwner::FileOwner(FileOwners* owners, std::string log)
    : m_owners(owners), m_log(std::move(log)) {
    if (m_owners != nullptr) {
        const std::lock_guard guard(m_owners->m_mutex);
        m_reader = ++m_owners->m_readers;
    }
}

FileOwner::~FileOwner() {
    keep({});
}

bool FileOwner::take(const FileIdentity& file) {
    return take(file, false);
}

bool FileOwner::ask(const FileIdentity& file) {
    return take(file, true);
}

bool FileOwner::take(const FileIdentity& file, bool asks) {
    if (m_owners == nullptr || has(file)) {
        return true;
    }
    const std::lock_guard guard(m_owners->m_mutex);
    FileOwners::File& found = m_owners->m_files[FileOwners::keyOf(file)];
    if (FileOwners::isAnothers(found, m_log)) {
        if (asks) {
            found.asked = FileOwners::Clock::now();
            found.askedBy = m_log;
        }
        return false;
    }
    found.owner = m_log;
    found.reader = m_reader;
    found.asked = {};
    found.isSettled = false;
    m_files.push_back(file);
    return true;
}

bool FileOwner::has(const FileIdentity& file) const noexcept {
    return std::find(m_files.begin(), m_files.end(), file) != m_files.end();
}

bool FileOwner::isAskedFor(const FileIdentity& file) const {
    if (m_owners == nullptr) {
        return false;
    }
    const std::lock_guard guard(m_owners->m_mutex);
    const auto found = m_owners->m_files.find(FileOwners::keyOf(file));
    return found != m_owners->m_files.end() && found->second.reader == m_reader &&
           FileOwners::isAskedFor(found->second);
}

void FileOwner::leave(const LogPosition& position) {
    const FileIdentity file = identityOf(position);
    if (m_owners == nullptr || std::erase(m_files, file) == 0) {
        return;
    }
    m_settled = m_settled == file ? std::nullopt : m_settled;
    const std::lock_guard guard(m_owners->m_mutex);
    const auto found = m_owners->m_files.find(FileOwners::keyOf(file));
    if (found != m_owners->m_files.end() && found->second.reader == m_reader) {
        const bool isAsked = FileOwners::isAskedFor(found->second);
        found->second.owner = isAsked ? found->second.askedBy : "";
        found->second.until = FileOwners::Clock::now() + FileOwners::asksFor;
        found->second.reader = 0;
        found->second.isSettled = false;
        m_owners->noteLeft(found->first, found->second, position, m_log);
    }
}

void FileOwner::keep(const std::vector<FileIdentity>& files) {
    std::vector<FileIdentity> given;
    std::erase_if(m_files, [&](const FileIdentity& file) {
        const bool isGiven = std::find(files.begin(), files.end(), file) == files.end();
        if (isGiven) {
            given.push_back(file);
        }
        return isGiven;
    });
    if (given.empty()) {
        return;
    }
    const std::lock_guard guard(m_owners->m_mutex);
    for (const FileIdentity& file : given) {
        const auto found = m_owners->m_files.find(FileOwners::keyOf(file));
        if (found != m_owners->m_files.end() && found->second.reader == m_reader) {
            m_owners->free(found);
        }
    }
}

void FileOwner::settle(const FileIdentity& file) {
    if (m_owners == nullptr || m_settled == file) {
        return;
    }
    m_settled = file;
    const std::lock_guard guard(m_owners->m_mutex);
    const auto found = m_owners->m_files.find(FileOwners::keyOf(file));
    if (found != m_owners->m_files.end() && found->second.reader == m_reader) {
        found->second.isSettled = true;
    }
}

bool FileOwner::isSettledByAnother(const FileIdentity& file) const {
    const std::lock_guard guard(m_owners->m_mutex);
    const auto found = m_owners->m_files.find(FileOwners::keyOf(file));
    return found == m_owners->m_files.end() || found->second.leftBy != m_log ||
           (found->second.isSettled && found->second.reader != m_reader);
}

std::optional<LogPosition> FileOwner::left(const FileIdentity& file) const {
    if (m_owners == nullptr) {
        return std::nullopt;
    }
    const std::lock_guard guard(m_owners->m_mutex);
    const auto found = m_owners->m_files.find(FileOwners::keyOf(file));
    return found != m_owners->m_files.end() && found->second.leftBy != m_log ? found->second.left
                                                                             : std::nullopt;
}

} // namespace zrm
