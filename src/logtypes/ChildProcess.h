#ifndef ZRM_CHILD_PROCESS_H
#define ZRM_CHILD_PROCESS_H

#include "base/ErrorText.h"

#include <sys/types.h>

namespace zrm {

/// The system's side of running a command whose standard output the agent reads through a pipe.
///
/// The agent has many threads and blocks every signal in all of them; a child inherits one thread,
/// the blocked signals, and locks that nobody will release. So whatever a child needs is prepared
/// before the fork, and between fork and exec a child makes no call that takes a lock or memory.
namespace ChildProcess {

/// Makes a pipe whose ends close on exec. As pipe(): 0, or -1 and errno. Any thread.
int openPipe(int fds[2]);

/// Waits for the end of a child that has been asked to end, or whose output nobody reads any more.
/// One that has not ended after two seconds is killed. As waitpid(). Any thread.
pid_t waitFor(pid_t pid, int* status);

/// In the child: makes the pipe's write end its standard output and closes both ends. The command
/// will find nothing else of the agent's open than standard input and error.
void redirectOutput(const int fds[2]);

/// In the child: undoes what the agent's threads do with signals, so that the command can be ended
/// by signal 15 and by a pipe that nobody reads.
void restoreSignals();

} // namespace ChildProcess

/// The texts of the errors with which exec fails, made before the fork: a text may come from the
/// locale's message catalogue, which is out of a child's reach.
class ExecErrorTexts {
public:
    ExecErrorTexts() noexcept;
    const char* text(int number) const noexcept;

private:
    ErrorText m_texts[12];
};

} // namespace zrm

#endif
