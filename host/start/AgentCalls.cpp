#include "framework/agent_calls.h"

#include "base/TraceScope.h"
#include "host/framework/NodeType.h"
#include "host/start/Host.h"

#include <cstdio>

using namespace zrm;
using namespace zrm::host;

namespace {

TRC1_Anchor anchor{"AgentCalls.cpp"};

} // namespace

void AGF_RegisterAgentLoader(int (*loader)()) {
    Host::instance().setLoader(loader);
}

int agfmain(int /*argc*/, char** /*argv*/) {
    TraceScope trace(anchor);
    return trace.result(Host::instance().run());
}

void AGF_SetNodeType(const char* nodeType) {
    NodeType::set(nodeType);
}

// Affinities announce an agent's features to a monitoring server; the standalone host has no
// server.
void AGF_SetAffinity(const char* affinity) {
    TraceScope trace(anchor);
    trace.detail()("Affinity %s.", affinity);
}

void AGF_SetVersionUsingProduct(const char* product, char* version, int size) {
    TraceScope trace(anchor);
    std::snprintf(version, static_cast<std::size_t>(size), "%s", ZRM_VERSION);
    trace.detail()("Product %s has version %s.", product, version);
}

void AGF_Stopping() {
    Host::instance().noteStopping();
}

void AGF_Shutdown(int /*reason*/) {
    Host::instance().shutdown();
}

void RPC1_Shutdown(unsigned* status) {
    Host::instance().requestStop();
    *status = 0;
}
