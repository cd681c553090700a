#ifndef ZRM_TESTS_FRAMEWORK_DOUBLE_H
#define ZRM_TESTS_FRAMEWORK_DOUBLE_H

#include <string>
#include <vector>

/// Stands in for the framework's start-up calls and for the tables (linked with --wrap): records
/// every call, and in a death test's child writes it to standard error.
namespace FrameworkDouble {

/// The calls so far, each as the function's name and its arguments.
std::vector<std::string> calls();
void clear();
/// What the main loop does once it has called the agent's loader: marks the server as up, waits for
/// the manager thread's call of RPC1_Shutdown, and returns this status.
void setStatus(int status);
/// The main loop sends SIGTERM instead of marking the server as up.
void setServerStaysDown();
/// Called last, by AGF_Shutdown.
void setEnd(void (*end)());

} // namespace FrameworkDouble

#endif
