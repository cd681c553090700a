#ifndef ZRM_HOST_COMMAND_LINE_H
#define ZRM_HOST_COMMAND_LINE_H

#include <span>
#include <string>

namespace zrm::host {

/// The parsed command line of zrmagent.
class CommandLine {
public:
    /// Parses the arguments after the program name.
    explicit CommandLine(std::span<const char* const> arguments);

    bool wantsHelp() const noexcept { return m_help; }
    bool wantsVersion() const noexcept { return m_version; }
    const std::string& config() const noexcept { return m_config; }       ///< empty: not given
    const std::string& traceFile() const noexcept { return m_traceFile; } ///< empty: not given
    /// What is wrong with the command line; empty if nothing.
    const std::string& error() const noexcept { return m_error; }

    /// The text of --help.
    static std::string help();

private:
    bool m_help = false;
    bool m_version = false;
    std::string m_config;
    std::string m_traceFile;
    std::string m_error;
};

} // namespace zrm::host

#endif
