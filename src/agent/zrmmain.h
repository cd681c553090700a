#ifndef ZRM_ZRMMAIN_H
#define ZRM_ZRMMAIN_H

namespace zrm {

/// The life of the agent's process: starts it, gives control to the framework's main loop and
/// returns that loop's status. Ends the process with status 255 when the start fails.
int zrmMain(int argc, char** argv);

// The steps of start-up and shutdown, on the initial thread unless stated otherwise.

/// Traces environment and limits; sets gMaxRows and the process's locale.
void checkEnvironment();
/// Traces `format` (a long and a text) with the value of a sysconf selector, which is returned.
long printSysconfLimit(const char* format, int name);
/// Traces `format` (a long and a text) with the value of a pathconf selector, which is returned.
long printPathconfLimit(const char* format, int name, const char* path);
/// Fills gSystemName and gHostName. Ends the process when memory runs out.
void getSystemName();
/// Cuts a node name to 256 characters and makes it gHostName.
void setHostName(const char* nodeName);
/// The framework's agent loader: says what the agent is and registers its tables. Returns 0.
int loadAgents();
/// The exit routine: destroys the log manager, if there is one, and tells the framework. On
/// whichever thread ends the process.
void shutDown();

} // namespace zrm

#endif
