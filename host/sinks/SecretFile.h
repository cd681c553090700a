#ifndef ZRM_HOST_SECRET_FILE_H
#define ZRM_HOST_SECRET_FILE_H

#include <map>
#include <optional>
#include <string>

namespace zrm::host {

/// Secrets kept in separate files. Stateless.
class SecretFile {
public:
    /// The contents of a file without the final line end. None when it is not a regular file, is
    /// empty or longer than 4 kB, is accessible to every user, or cannot be read; `problem` then
    /// says why.
    static std::optional<std::string> read(const std::string& path, std::string& problem);
};

/// Headers that are kept in a file of their own, because they are secrets: "Name: value", one per
/// line. Stateless.
class HeadersFile {
public:
    using Headers = std::map<std::string, std::string>;

    /// The headers of a file, which holds what a SecretFile may hold; none when it cannot be used:
    /// then `problem` says why, and never what the file holds.
    static std::optional<Headers> read(const std::string& path, std::string& problem);
};

} // namespace zrm::host

#endif
