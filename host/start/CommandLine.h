#ifndef ZRM_HOST_COMMAND_LINE_H
#define ZRM_HOST_COMMAND_LINE_H

#include "host/base/Result.h"

#include <span>
#include <string>

namespace zrm::host {

/// The parsed command line of zrmagent.
class CommandLine {
public:
    /// Parses the arguments after the program name.
    static Result<CommandLine> parse(std::span<const char* const> arguments);

    bool wantsHelp() const noexcept { return m_help; }
    bool wantsVersion() const noexcept { return m_version; }
    const std::string& config() const noexcept { return m_config; }       ///< empty: not given
    const std::string& traceFile() const noexcept { return m_traceFile; } ///< empty: not given

    /// The text of --help.
    static std::string help();

private:
    CommandLine() = default;

    bool m_help = false;
    bool m_version = false;
    std::string m_config;
    std::string m_traceFile;
};

} // namespace zrm::host

#endif
