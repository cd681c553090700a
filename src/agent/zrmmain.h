#ifndef ZRM_ZRMMAIN_H
#define ZRM_ZRMMAIN_H

namespace zrm {

/// Runs the agent: starts it, hands control to the framework's main loop, and returns that loop's
/// status. Ends the process with status 255 if the start fails.
int zrmMain(int argc, char** argv);

// Start-up and shutdown steps. They run on the initial thread unless stated otherwise.

/// Traces the environment and limits. Sets gMaxRows and the process's locale.
void checkEnvironment();
/// Traces a sysconf value with `format` (a long and a text) and returns the value.
long printSysconfLimit(const char* format, int name);
/// Traces a pathconf value with `format` (a long and a text) and returns the value.
long printPathconfLimit(const char* format, int name, const char* path);
/// Sets gSystemName and gHostName. Ends the process if memory runs out.
void getSystemName();
/// Sets gHostName to the node name, cut to 256 characters.
void setHostName(const char* nodeName);
/// The framework's agent loader: identifies the agent and registers its tables. Returns 0.
int loadAgents();
/// The exit routine: destroys the log manager, if there is one, and notifies the framework. Runs on
/// the thread that ends the process.
void shutDown();

} // namespace zrm

#endif
