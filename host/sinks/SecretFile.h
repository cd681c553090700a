#ifndef ZRM_HOST_SECRET_FILE_H
#define ZRM_HOST_SECRET_FILE_H

#include "host/base/Result.h"

#include <map>
#include <string>

namespace zrm::host {

/// Secrets kept in separate files. Stateless.
class SecretFile {
public:
    /// The contents of a file without the final line end. Refused when it is not a regular file, is
    /// empty or longer than 4 kB, is accessible to every user, or cannot be read.
    static Result<std::string> read(const std::string& path);
};

/// Headers kept in a separate file because they are secrets: "Name: value", one per line.
/// Stateless.
class HeadersFile {
public:
    using Headers = std::map<std::string, std::string>;

    /// The headers of a file, for which the rules of SecretFile apply. A problem does not quote the
    /// file.
    static Result<Headers> read(const std::string& path);
};

} // namespace zrm::host

#endif
