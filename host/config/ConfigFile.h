#ifndef ZRM_HOST_CONFIG_FILE_H
#define ZRM_HOST_CONFIG_FILE_H

#include "host/base/Result.h"
#include "host/config/HostConfig.h"

#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace zrm::host {

/// Reads host configuration files. Stateless.
class ConfigFile {
public:
    /// A configuration, or all problems of its file.
    using Result = zrm::host::Result<HostConfig, std::vector<std::string>>;

    /// Reads a file.
    static Result load(const std::string& path);

    /// Reads a file that has changed while in use. An empty file, or one whose last line is
    /// incomplete, is still being written or was truncated: that counts as a problem here.
    static Result reload(const std::string& path);

    /// Reads only what a client of the agent needs: the state directory, from [http] the address,
    /// the certificate and the token file, and the directories of ready formats. Other problems of
    /// the file are ignored.
    static Result loadAccess(const std::string& path);

    /// Parses the text of a file; messages call it `path`.
    static Result parse(std::string_view text, const std::string& path);
};

/// A warning when the configuration read from this file contains a secret of a sink and every user
/// can read the file.
std::optional<std::string> warningOfSecrets(const HostConfig& config, const std::string& path);

/// A warning when the configuration read from this file turns on the debug mode of a log, and
/// neither it nor the environment names a debug log.
std::optional<std::string> warningOfDebug(const HostConfig& config, const std::string& path);

} // namespace zrm::host

#endif
