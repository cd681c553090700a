#ifndef ZRM_HOST_AGENT_ACCESS_H
#define ZRM_HOST_AGENT_ACCESS_H

#include <string>
#include <vector>

namespace zrm::host {

/// Options of every command.
struct CommonOptions {
    std::string config;    ///< empty: the default configuration
    std::string url;       ///< empty: not given
    std::string tokenFile; ///< empty: not given
    std::string caFile;    ///< empty: not given
    bool json = false;
};

/// Where the agent is, and the token that it wants.
struct AgentAccess {
    std::string url; ///< "http://127.0.0.1:7186", without a slash at its end
    std::string token;
    std::string tokenSource; ///< where the token was found, for messages
    /// Files of certificates to trust beside those of the system.
    std::vector<std::string> authorities = {};

    /// Finds both. The address: `--url`, ZRM_URL, `[http] listen` of the configuration. The
    /// token: `--token-file`, ZRM_TOKEN, the token file of the configuration. The authorities:
    /// `--ca-file` or ZRM_CA_FILE, and the certificate of a configuration that names the address.
    /// Throws CliError when there is no address or token, or when the token would travel
    /// unencrypted to another machine.
    static AgentAccess find(const CommonOptions& options);
};

} // namespace zrm::host

#endif
