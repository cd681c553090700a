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

/// Headers kept in a separate file because they are secrets: "Name: value", one per line.
/// Stateless.
class HeadersFile {
public:
    using Headers = std::map<std::string, std::string>;

    /// The headers of a file, for which the rules of SecretFile apply. None when it cannot be used;
    /// `problem` then says why, without quoting the file.
    static std::optional<Headers> read(const std::string& path, std::string& problem);
};

} // namespace zrm::host

#endif
