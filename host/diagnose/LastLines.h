#ifndef ZRM_HOST_LAST_LINES_H
#define ZRM_HOST_LAST_LINES_H

#include <cstddef>
#include <optional>
#include <string>
#include <vector>

namespace zrm::host {

/// The end of a text file. Stateless.
class LastLines {
public:
    static constexpr std::size_t defaultByteLimit = std::size_t{4} << 20;

    /// The last lines of an open regular file, at most `count`, the oldest first and without their
    /// line ends; fewer when they have more than `byteLimit` bytes. None, with errno, when it
    /// cannot be read. Any thread.
    static std::optional<std::vector<std::string>> read(int descriptor, std::size_t count,
                                                        std::size_t byteLimit = defaultByteLimit);
};

} // namespace zrm::host

#endif
