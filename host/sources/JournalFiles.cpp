#include "host/sources/JournalFiles.h"

#include "base/ErrorText.h"
#include "host/sources/MapFaults.h"

#include <algorithm>
#include <cerrno>
#include <filesystem>
#include <system_error>

#include <systemd/sd-id128.h>
#include <systemd/sd-journal.h>
#include <unistd.h>

namespace zrm::host {

namespace {

namespace fs = std::filesystem;

constexpr const char* persistent = "/var/log/journal";
constexpr const char* inMemory = "/run/log/journal";
constexpr std::size_t mostFiles = 10'000;

bool isJournal(const fs::path& path) {
    const std::string name = path.filename().string();
    return name.ends_with(".journal") || name.ends_with(".journal~");
}

/// Why the library cannot read the file; empty if it can.
std::string problemOf(const std::string& path) {
    const MapFaults tolerated;
    const char* paths[] = {path.c_str(), nullptr};
    sd_journal* journal = nullptr;
    const int outcome =
        ::access(path.c_str(), R_OK) != 0 ? -errno : sd_journal_open_files(&journal, paths, 0);
    sd_journal_close(journal);
    if (outcome >= 0 || outcome == -ENOENT) { // one that is gone was removed as it should be
        return "";
    }
    if (outcome == -ENODATA) {
        return "it is empty or was cut off";
    }
    return outcome == -EBADMSG ? "it is damaged" : ErrorText(-outcome).text();
}

void lookInto(const std::string& directory, int depth, const std::set<std::string>& known,
              JournalFiles& found) {
    std::error_code error;
    fs::directory_iterator entry(directory, error);
    if (error) {
        if (error.value() != ENOENT && error.value() != ENOTDIR && found.unreadable.empty()) {
            found.unreadable = directory + ": " + ErrorText(error.value()).text();
        }
        return;
    }
    found.searched.push_back(directory);
    for (; !error && entry != fs::directory_iterator() && found.files.size() < mostFiles;
         entry.increment(error)) {
        std::error_code ignored;
        if (entry->is_directory(ignored)) {
            if (depth > 0) {
                lookInto(entry->path().string(), depth - 1, known, found);
            }
        } else if (isJournal(entry->path())) {
            const std::string path = entry->path().string();
            const auto size = entry->file_size(ignored);
            found.files.push_back({path, ignored ? 0 : static_cast<std::int64_t>(size),
                                   known.contains(path) ? "" : problemOf(path)});
        }
    }
}

} // namespace

std::vector<std::string> JournalFiles::directories() {
    sd_id128_t machine;
    std::string own;
    if (sd_id128_get_machine(&machine) >= 0) {
        char text[SD_ID128_STRING_MAX];
        own = std::string("/") + sd_id128_to_string(machine, text);
    }
    return {persistent + own, inMemory + own};
}

JournalFiles JournalFiles::look(const std::string& directory, const std::set<std::string>& known) {
    JournalFiles found;
    if (!directory.empty()) {
        lookInto(directory, 1, known, found);
    } else {
        for (const std::string& one : directories()) {
            lookInto(one, 0, known, found);
        }
    }
    std::sort(found.files.begin(), found.files.end(),
              [](const File& a, const File& b) { return a.path < b.path; });
    return found;
}

bool JournalFiles::isReadable() const noexcept {
    return std::any_of(files.begin(), files.end(),
                       [](const File& file) { return file.problem.empty(); });
}

std::string JournalFiles::problem() const {
    if (isReadable()) {
        return "";
    }
    if (!files.empty()) {
        return "the journal cannot be read: " + files.front().path + ": " + files.front().problem;
    }
    return unreadable.empty() ? "there is no journal" : "the journal cannot be read: " + unreadable;
}

} // namespace zrm::host
