#ifndef ZRM_HOST_CONFIG_FILE_H
#define ZRM_HOST_CONFIG_FILE_H

#include "host/config/HostConfig.h"

#include <string>
#include <string_view>
#include <variant>
#include <vector>

namespace zrm::host {

/// Reads host configuration files. Stateless.
class ConfigFile {
public:
    /// A configuration, or every problem of its file.
    using Result = std::variant<HostConfig, std::vector<std::string>>;

    /// Reads a file.
    static Result load(const std::string& path);

    /// Reads a file that has changed while it is in use. One that is empty or ends within a line is
    /// being written, or was cut off: that is a problem then.
    static Result reload(const std::string& path);

    /// Reads only what a client of the agent needs: the state directory, and of [http] the address,
    /// the certificate and the token's file. What else is wrong with the file is no problem then.
    static Result loadAccess(const std::string& path);

    /// Reads the text of a file that is called `path` in messages.
    static Result parse(std::string_view text, const std::string& path);
};

} // namespace zrm::host

#endif
