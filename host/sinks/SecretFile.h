#ifndef ZRM_HOST_SECRET_FILE_H
#define ZRM_HOST_SECRET_FILE_H

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

} // namespace zrm::host

#endif
