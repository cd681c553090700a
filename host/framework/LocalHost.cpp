// The managed-system name of agent_calls.h.
#include "framework/agent_calls.h"

#include "host/framework/NodeType.h"

#include <algorithm>
#include <cstdio>
#include <cstring>

#include <unistd.h>

using namespace zrm::host;

namespace {

constexpr int maxHostName = 255;

/// Length of the host name without its domain; a name that begins with a dot is taken whole.
int shortLength(const char* host) {
    const auto length = static_cast<int>(std::strcspn(host, "."));
    return length > 0 ? length : static_cast<int>(std::strlen(host));
}

} // namespace

void DetermineLocalHost(char* name, int size) {
    if (size <= 0) {
        return;
    }
    // gethostname need not terminate a name that it cuts.
    char host[maxHostName + 1] = "";
    if (gethostname(host, maxHostName) != 0 || *host == '\0') {
        std::strcpy(host, "unknown");
    }
    // The node type tells systems of one host apart, so where room is short the host name gives.
    const char* const nodeType = NodeType::get();
    const int room = size - 1 - 1 - static_cast<int>(std::strlen(nodeType));
    const int length = std::min(shortLength(host), std::max(room, 0));
    std::snprintf(name, static_cast<std::size_t>(size), "%.*s:%s", length, host, nodeType);
}
