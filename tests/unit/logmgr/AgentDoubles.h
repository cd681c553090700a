#ifndef ZRM_TESTS_AGENT_DOUBLES_H
#define ZRM_TESTS_AGENT_DOUBLES_H

#include <string>
#include <vector>

/// Stands in for the log types and for the framework's server (linked with --wrap): the log
/// manager's tests watch which monitoring objects it creates and deletes.
namespace AgentDoubles {

/// Puts the defaults back: every type is known, logs can be created, nothing recorded.
void reset();
/// False: no type letter is known.
void setTypesKnown(bool known);
/// False: the creation of a log fails.
void setLogsCreatable(bool creatable);
/// The logs created so far, as "TYPE NAME PROCEDURE".
std::vector<std::string> created();
/// Number of logs that exist.
int living();
/// Number of calls of RPC1_Shutdown.
int shutdowns();

} // namespace AgentDoubles

#endif
