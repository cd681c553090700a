#include "host/cli/AgentAccess.h"

#include "host/cli/CliError.h"
#include "host/config/ConfigFile.h"

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <memory>
#include <optional>
#include <utility>
#include <vector>

#include <unistd.h>

namespace zrm::host {

namespace {

constexpr const char* defaultConfig = "/etc/zrm/zrm.toml";

std::string variable(const char* name) {
    const char* const value = std::getenv(name);
    return value == nullptr ? "" : value;
}

std::string trimmed(std::string text) {
    text.erase(text.find_last_not_of(" \t\r\n") + 1);
    return text;
}

/// The agent's configuration, read on first use.
class AgentConfig {
public:
    explicit AgentConfig(const std::string& path) : m_path(path.empty() ? defaultConfig : path) {}

    const std::string& path() const { return m_path; }

    bool isThere() const { return access(m_path.c_str(), F_OK) == 0; }

    const HostConfig& get() {
        if (!m_config) {
            m_config = load();
        }
        return *m_config;
    }

private:
    HostConfig load() const {
        if (!isThere()) {
            throw CliError(CliStatus::USAGE, m_path +
                                                 " does not exist: name the agent's configuration "
                                                 "with --config, or its address with --url");
        }
        if (access(m_path.c_str(), R_OK) != 0) {
            throw CliError(CliStatus::FORBIDDEN, "no permission to read " + m_path +
                                                     ": use sudo, or join the file's group");
        }
        ConfigFile::Result config = ConfigFile::loadAccess(m_path);
        if (!config) {
            std::string text;
            for (const std::string& problem : config.error()) {
                text += (text.empty() ? "" : "\n") + problem;
            }
            throw CliError(CliStatus::USAGE, text);
        }
        return std::move(*config);
    }

    std::string m_path;
    std::optional<HostConfig> m_config;
};

/// The address that a client on this machine connects to.
std::string urlOf(AgentConfig& config) {
    const std::optional<ListenAddress>& listen = config.get().http.listen;
    if (!listen) {
        throw CliError(
            CliStatus::USAGE,
            config.path() +
                " turns HTTP off: give [http] a listen address, or give the address with --url");
    }
    if (listen->port == 0) {
        throw CliError(
            CliStatus::USAGE,
            config.path() +
                " leaves the port open: give the address that the agent reported with --url");
    }
    ListenAddress reached = *listen;
    if (reached.host == "0.0.0.0") { // all addresses, including the loopback address
        reached.host = "127.0.0.1";
    }
    const bool isSecret = !config.get().http.certificate.empty();
    return (isSecret ? "https://" : "http://") + reached.text();
}

/// Checks a URL given by the operator: the token is sent unencrypted only to this machine.
std::string checkedUrl(const std::string& written, const std::string& source) {
    std::string url = written;
    while (url.ends_with('/')) {
        url.pop_back();
    }
    constexpr std::string_view secret = "https://";
    if (url.starts_with(secret) && url.size() > secret.size() &&
        url.find_first_of("/?#@ \t", secret.size()) == std::string::npos) {
        return url;
    }
    constexpr std::string_view plain = "http://";
    const std::string address = url.starts_with(plain) ? url.substr(plain.size()) : "";
    const bool hasPort = address.rfind(':') != std::string::npos && !address.ends_with(']');
    const std::optional<ListenAddress> host =
        ListenAddress::parse(hasPort ? address : address + ":80");
    if (!host) {
        throw CliError(CliStatus::USAGE, source + ": '" + written +
                                             "' is not an address; write it as "
                                             "http://127.0.0.1:7186");
    }
    if (!host->isLoopback()) {
        throw CliError(CliStatus::USAGE, source + ": the token would reach " + host->host +
                                             " unencrypted; use https, or an SSH tunnel");
    }
    return url;
}

std::string readToken(const std::string& path) {
    const std::unique_ptr<std::FILE, int (*)(std::FILE*)> stream(std::fopen(path.c_str(), "re"),
                                                                 &std::fclose);
    if (stream == nullptr) {
        const int number = errno;
        if (number == EACCES) {
            throw CliError(CliStatus::FORBIDDEN, "no permission to read the token " + path +
                                                     ": use sudo, or give the token in ZRM_TOKEN");
        }
        throw CliError(CliStatus::FORBIDDEN, because("cannot read the token " + path, number) +
                                                 "; the agent creates it when it starts with HTTP");
    }
    char text[4096];
    std::string token = trimmed({text, std::fread(text, 1, sizeof text, stream.get())});
    if (token.empty() || token.find_first_of("\r\n") != std::string::npos) {
        throw CliError(CliStatus::FORBIDDEN,
                       path + " does not contain a token: one line of visible characters");
    }
    return token;
}

std::string tokenFileOf(AgentConfig& config) {
    if (!config.isThere()) {
        return HostConfig().stateDirectory + "/api-token";
    }
    const HostConfig& read = config.get();
    return read.http.tokenFile.empty() ? read.stateDirectory + "/api-token" : read.http.tokenFile;
}

} // namespace

AgentAccess AgentAccess::find(const CommonOptions& options) {
    AgentConfig config(options.config);
    AgentAccess found;
    if (!options.url.empty()) {
        found.url = checkedUrl(options.url, "--url");
    } else if (const std::string url = variable("ZRM_URL"); !url.empty()) {
        found.url = checkedUrl(url, "ZRM_URL");
    } else {
        found.url = urlOf(config);
        if (!config.get().http.certificate.empty()) {
            found.authorities.push_back(config.get().http.certificate);
        }
    }
    const std::string authorities =
        options.caFile.empty() ? variable("ZRM_CA_FILE") : options.caFile;
    if (!authorities.empty()) {
        found.authorities.push_back(authorities);
    }
    const std::string token = trimmed(variable("ZRM_TOKEN"));
    if (options.tokenFile.empty() && !token.empty()) {
        found.token = token;
        found.tokenSource = "ZRM_TOKEN";
    } else {
        found.tokenSource = options.tokenFile.empty() ? tokenFileOf(config) : options.tokenFile;
        found.token = readToken(found.tokenSource);
    }
    return found;
}

} // namespace zrm::host
