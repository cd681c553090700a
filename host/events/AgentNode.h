#ifndef ZRM_HOST_AGENT_NODE_H
#define ZRM_HOST_AGENT_NODE_H

#include "framework/agent_calls.h"

#include <string>

namespace zrm::host {

/// The name of this agent's node, as rows have it in ORIGINNODE.
namespace AgentNode {

inline std::string name() {
    char name[128] = "";
    DetermineLocalHost(name, sizeof name);
    return name;
}

} // namespace AgentNode

} // namespace zrm::host

#endif
