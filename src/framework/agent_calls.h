#ifndef ZRM_FRAMEWORK_AGENT_CALLS_H
#define ZRM_FRAMEWORK_AGENT_CALLS_H

/// Initialises the framework's base services for this process. Must be the first call. May end the
/// process (help, version, invalid command line).
void SYS1_Main(int* argc, char** argv, const char* component);

/// Stores the loader. agfmain calls it once it accepts table registrations.
void AGF_RegisterAgentLoader(int (*loader)());

/// Runs the framework's main loop. Returns the exit status when the agent has to end.
int agfmain(int argc, char** argv);

/// Sets the managed system's node type.
void AGF_SetNodeType(const char* nodeType);

/// Writes the managed-system name, at most `size` bytes including its terminator.
void DetermineLocalHost(char* name, int size);

/// Adds one affinity of the agent.
void AGF_SetAffinity(const char* affinity);

/// Sets the agent's version from the version record of `product`. `version` (`size` bytes) receives
/// the version text, terminated.
void AGF_SetVersionUsingProduct(const char* product, char* version, int size);

/// Notifies the framework that the agent has begun to end, before the agent waits for the
/// framework's server. Returns immediately. Any thread.
void AGF_Stopping();

/// Notifies the framework that the agent ends: its threads are stopped and its queues delivered.
void AGF_Shutdown(int reason);

/// Asks the framework's server to stop, which makes agfmain return. `status` receives 0 or the
/// server's reason for refusing. Returns immediately. Any thread.
void RPC1_Shutdown(unsigned* status);

#endif
