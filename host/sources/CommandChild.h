#ifndef ZRM_HOST_COMMAND_CHILD_H
#define ZRM_HOST_COMMAND_CHILD_H

#include <chrono>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include <sys/types.h>

namespace zrm::host {

/// A command in a process group of its own, with its standard output and standard error. Whatever
/// it leaves in the group ends with it. One thread.
class CommandChild {
public:
    CommandChild() = default;
    /// Ends the group.
    ~CommandChild();
    CommandChild(const CommandChild&) = delete;
    CommandChild& operator=(const CommandChild&) = delete;

    /// Starts the program, which is looked for as a shell does. Returns 0, or errno.
    int start(const std::vector<std::string>& arguments);
    bool isRunning() const noexcept { return m_pid > 0; }

    /// Reads what there is of its output, without waiting: bytes, 0 at the end, -1 and errno.
    ssize_t read(char* out, std::size_t size) noexcept;
    /// Reads what there is of its standard error.
    void readErrors();
    /// The last line on standard error since the start that is not blank, shortened.
    const std::string& lastError() const noexcept { return m_lastError; }
    /// Waits for output or the end, for this long at most.
    void wait(std::chrono::milliseconds most) const noexcept;

    /// Whether the process has ended; others of its group may still run.
    bool hasEnded() const noexcept;
    /// Waits a moment for the process to end by itself. Returns whether it has.
    bool waitForEnd() const noexcept;
    /// Ends what is left of the group, SIGTERM first, and says how the process ended, as a clause.
    std::string end();

private:
    static constexpr std::size_t longestError = 256; ///< bytes

    void takeErrors(std::string_view text);
    void closePipes() noexcept;

    pid_t m_pid = -1;
    int m_output = -1;
    int m_errors = -1;
    std::string m_errorLine; ///< the beginning of one
    std::string m_lastError;
};

} // namespace zrm::host

#endif
