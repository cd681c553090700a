#ifndef ZRM_FRAMEWORK_AGENT_CALLS_H
#define ZRM_FRAMEWORK_AGENT_CALLS_H

/// Initialises the framework's base services for this process. Called before anything else; may
/// end the process (help, version, unusable command line).
void SYS1_Main(int* argc, char** argv, const char* component);

/// Remembers the loader that agfmain calls once it accepts table registrations.
void AGF_RegisterAgentLoader(int (*loader)());

/// Runs the framework's main loop and returns the process's status when the agent is to end.
int agfmain(int argc, char** argv);

/// Sets the node type of the managed system.
void AGF_SetNodeType(const char* nodeType);

/// Writes the managed-system name, at most `size` bytes with its terminator.
void DetermineLocalHost(char* name, int size);

/// Adds one affinity of the agent.
void AGF_SetAffinity(const char* affinity);

/// Sets the agent's version from the version record of `product`; `version` (of `size` bytes)
/// receives its text, terminated.
void AGF_SetVersionUsingProduct(const char* product, char* version, int size);

/// Tells the framework that the agent has begun to end, before it waits for the framework's server.
/// Returns at once. Any thread.
void AGF_Stopping();

/// Tells the framework that the agent is ending: its threads are stopped, its queues delivered.
void AGF_Shutdown(int reason);

/// Asks the framework's server to stop, which makes agfmain return; `status` receives 0 or the
/// server's reason for refusing. Returns at once. Any thread.
void RPC1_Shutdown(unsigned* status);

#endif
