#ifndef ZRM_HOST_AGENT_ACCESS_H
#define ZRM_HOST_AGENT_ACCESS_H

#include <string>
#include <vector>

namespace zrm::host {

/// Options common to all commands.
struct CommonOptions {
    std::string config;    ///< empty: the default configuration
    std::string url;       ///< empty: not given
    std::string tokenFile; ///< empty: not given
    std::string caFile;    ///< empty: not given
    bool json = false;
};

/// The agent's address and the token it requires.
struct AgentAccess {
    std::string url; ///< "http://127.0.0.1:7186", without a trailing slash
    std::string token;
    std::string tokenSource; ///< where the token came from, for messages
    /// Certificate files to trust in addition to the system's.
    std::vector<std::string> authorities = {};

    /// Finds both. The address: `--url`, ZRM_URL, `[http] listen` of the configuration. The token:
    /// `--token-file`, ZRM_TOKEN, the token file of the configuration. The trusted certificates:
    /// `--ca-file` or ZRM_CA_FILE, and the certificate in the configuration when the address comes
    /// from there. Throws CliError when there is no address or token, or when the token would be
    /// sent unencrypted to another machine.
    static AgentAccess find(const CommonOptions& options);
};

} // namespace zrm::host

#endif
