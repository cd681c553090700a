#ifndef ZRM_HOST_CONNECTION_H
#define ZRM_HOST_CONNECTION_H

#include <string>

/// Options of every command.
struct CommonOptions {
    std::string config;    ///< empty: the default configuration
    std::string url;       ///< empty: not given
    std::string tokenFile; ///< empty: not given
    bool json = false;
};

/// Where the agent is, and the token that it wants.
struct Connection {
    std::string url; ///< "http://127.0.0.1:7186", without a slash at its end
    std::string token;
    std::string tokenSource; ///< where the token was found, for messages
    /// File of a certificate to trust beside those of the system; empty: none.
    std::string certificate = {};

    /// Finds both. The address: `--url`, ZRM_URL, `[http] listen` of the configuration. The
    /// token: `--token-file`, ZRM_TOKEN, the token file of the configuration. Throws CliError
    /// when there is none, or when the token would travel unencrypted to another machine.
    static Connection find(const CommonOptions& options);
};

#endif
