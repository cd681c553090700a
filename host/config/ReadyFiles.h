#ifndef ZRM_HOST_READY_FILES_H
#define ZRM_HOST_READY_FILES_H

#include <cstddef>
#include <optional>
#include <string>
#include <vector>

namespace zrm::host {

/// Finds the files NAME.toml of some directories by their names: ready formats and ready
/// situations. Any thread; looks into the directories anew at each call.
class ReadyFiles {
public:
    static constexpr std::size_t largestFile = 256 * 1024; ///< bytes
    static constexpr std::size_t mostFiles = 10'000;       ///< that are listed
    static constexpr std::size_t longestName = 64;         ///< bytes

    /// Where one is found by its name.
    struct Place {
        std::string name;
        std::string path;
    };

    /// A name is looked for in these directories in turn.
    explicit ReadyFiles(std::vector<std::string> directories);

    /// None if no directory has it.
    std::optional<Place> find(const std::string& name) const;
    /// All files in the order of their names. Of several with one name, the one that counts.
    std::vector<Place> list() const;
    /// At most five names that are written like this one, quoted; empty if there are none.
    std::string nearTo(const std::string& name) const;

    /// Small letters, digits and '-', '_' and '.' within, at most 64 of them.
    static bool isName(const std::string& name);

private:
    std::vector<std::string> m_directories;
};

} // namespace zrm::host

#endif
