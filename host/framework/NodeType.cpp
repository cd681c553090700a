#include "host/framework/NodeType.h"

#include <cstdio>
#include <cstdlib>

namespace zrm::host {

namespace {

char g_nodeType[32] = "";

} // namespace

void NodeType::set(const char* nodeType) noexcept {
    std::snprintf(g_nodeType, sizeof g_nodeType, "%s", nodeType);
}

const char* NodeType::get() noexcept {
    if (*g_nodeType != '\0') {
        return g_nodeType;
    }
    const char* const configured = std::getenv("CTREQ_NODETYPE");
    return configured != nullptr && *configured != '\0' ? configured : "ZRM";
}

} // namespace zrm::host
