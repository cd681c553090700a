#ifndef ZRM_HOST_CLI_ERROR_H
#define ZRM_HOST_CLI_ERROR_H

#include <stdexcept>
#include <string>

namespace zrm::host {

/// The exit statuses of zrmctl.
enum class CliStatus {
    DONE = 0,
    REFUSED = 1,     ///< refused by the agent or by a check, nothing found, or a problem reported
    USAGE = 2,       ///< the command line or the configuration is invalid
    UNREACHABLE = 3, ///< the agent does not answer
    FORBIDDEN = 4,   ///< the token cannot be read, or the agent does not accept it
};

/// Why a command failed, as a message for the operator, and its exit status.
class CliError : public std::runtime_error {
public:
    CliError(CliStatus status, const std::string& text)
        : std::runtime_error(text), m_status(status) {}
    CliStatus status() const noexcept { return m_status; }

private:
    CliStatus m_status;
};

} // namespace zrm::host

#endif
