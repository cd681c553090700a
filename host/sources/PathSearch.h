#ifndef ZRM_HOST_PATH_SEARCH_H
#define ZRM_HOST_PATH_SEARCH_H

#include <cstddef>
#include <string>
#include <vector>

namespace zrm::host {

/// What an absolute glob (PathPattern) matches in the file system.
struct PathSearch {
    static constexpr std::size_t mostPaths = 10'000;      ///< matches, also of each directory level
    static constexpr std::size_t mostEntries = 1'000'000; ///< directory entries that are looked at

    /// Searches the directories of one glob. May wait for the file system. Any thread.
    explicit PathSearch(const std::string& pattern);

    std::vector<std::string> paths; ///< sorted; what they denote was not looked at
    /// Why the search is incomplete, as a sentence without its full stop; empty if it is complete.
    std::string problem;

private:
    void searchDirectory(const std::string& directory, const std::string& name,
                         std::vector<std::string>& found);

    std::size_t m_entries = 0;
};

} // namespace zrm::host

#endif
