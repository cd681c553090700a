#include "host/sources/PathSearch.h"

#include "base/ErrorText.h"
#include "host/config/PathPattern.h"

#include <algorithm>
#include <cerrno>
#include <memory>
#include <utility>

#include <dirent.h>

namespace zrm::host {

PathSearch::PathSearch(const std::string& pattern) : paths{""} {
    std::size_t begin = 1;
    while (begin <= pattern.size() && !paths.empty()) {
        const std::size_t end = std::min(pattern.find('/', begin), pattern.size());
        const std::string name = pattern.substr(begin, end - begin);
        begin = end + 1;
        if (!PathPattern::isPattern(name)) {
            for (std::string& path : paths) {
                path += '/' + name;
            }
            continue;
        }
        std::vector<std::string> found;
        for (const std::string& path : paths) {
            searchDirectory(path, name, found);
        }
        paths = std::move(found);
    }
    std::sort(paths.begin(), paths.end());
}

void PathSearch::searchDirectory(const std::string& directory, const std::string& name,
                                 std::vector<std::string>& found) {
    const std::string opened = directory.empty() ? "/" : directory;
    const std::unique_ptr<DIR, int (*)(DIR*)> stream(::opendir(opened.c_str()), ::closedir);
    if (stream == nullptr) {
        // Other files than directories match the name of a directory, too.
        if (errno != ENOENT && errno != ENOTDIR) {
            const ErrorText error(errno);
            problem = "The directory " + opened + " cannot be read: " + error.text();
        }
        return;
    }
    while (const dirent* const entry = ::readdir(stream.get())) {
        if (++m_entries > mostEntries) {
            problem = "The search ended after " + std::to_string(mostEntries) +
                      " directory entries; name the files more narrowly";
            return;
        }
        const std::string entryName = entry->d_name;
        if (entryName == "." || entryName == ".." || !PathPattern::matches(name, entryName)) {
            continue;
        }
        if (found.size() == mostPaths) {
            problem = "More than " + std::to_string(mostPaths) +
                      " paths match; name the files more narrowly";
            return;
        }
        found.push_back(directory + '/' + entryName);
    }
}

} // namespace zrm::host
