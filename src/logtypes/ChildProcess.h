#ifndef ZRM_CHILD_PROCESS_H
#define ZRM_CHILD_PROCESS_H

#include "base/ErrorText.h"

#include <sys/types.h>

namespace zrm {

/// The system calls for running a command whose standard output the agent reads through a pipe.
///
/// The agent has many threads, and all of them block every signal. A child inherits one thread, the
/// blocked signals, and locks that nobody will release. So the parent prepares everything before
/// the fork, and between fork and exec the child makes no call that locks or allocates.
namespace ChildProcess {

/// Creates a pipe whose ends close on exec. Like pipe(), returns 0, or -1 and errno. Any thread.
int openPipe(int fds[2]);

/// Waits for a child that was asked to end or whose output is no longer read. Kills the child if it
/// has not ended after two seconds. Returns what waitpid() returns. Any thread.
pid_t waitFor(pid_t pid, int* status);

/// In the child: makes the pipe's write end the standard output and closes both ends. The command
/// inherits no other descriptor of the agent except standard input and standard error.
void redirectOutput(const int fds[2]);

/// In the child: restores the signal handling that the agent's threads changed, so that signal 15
/// or a pipe that nobody reads can end the command.
void restoreSignals();

} // namespace ChildProcess

/// The texts of the errors with which exec can fail, created before the fork. A text may come from
/// the locale's message catalogue, which a child cannot access safely.
class ExecErrorTexts {
public:
    ExecErrorTexts() noexcept;
    const char* text(int number) const noexcept;

private:
    ErrorText m_texts[12];
};

} // namespace zrm

#endif
