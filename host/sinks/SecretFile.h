#ifndef ZRM_HOST_SECRET_FILE_H
#define ZRM_HOST_SECRET_FILE_H

#include <optional>
#include <string>

namespace zrm::host {

/// Secrets that are kept in files of their own. Stateless.
class SecretFile {
public:
    /// The content of a file without the line end behind it; none when it is not a regular file, is
    /// empty or longer than 4 kB, is open to every user, or cannot be read: then `problem` says
    /// why.
    static std::optional<std::string> read(const std::string& path, std::string& problem);
};

} // namespace zrm::host

#endif
