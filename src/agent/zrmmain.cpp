#include "agent/zrmmain.h"

#include "base/ErrorText.h"
#include "base/ProcessValues.h"
#include "base/TraceScope.h"
#include "framework/agent_calls.h"
#include "logmgr/LogManager.h"
#include "monitor/LogFile.h"
#include "tables/zrm_rmlogent_manager.h"
#include "tables/zrm_rmmonlog_manager.h"

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <new>

#include <signal.h>
#include <sys/utsname.h>

namespace zrm {

namespace {

TRC1_Anchor anchor{"zrmmain.cpp"};

constexpr const char* component = "zrmagent";
constexpr const char* nodeType = "ZRM";
constexpr const char* product = "RM";

/// The agent's own affinity, followed by the features of the framework that it supports.
constexpr const char* affinities[] = {
    "ZRM.logs",
    "framework.version-2",
    "framework.agent-management",
    "framework.internationalisation",
    "framework.earlier-monitor-parity",
};

constexpr int systemNameSize = 65;
constexpr std::size_t maxHostName = 256;

void blockAllSignals() {
    sigset_t all;
    sigfillset(&all);
    pthread_sigmask(SIG_BLOCK, &all, nullptr);
}

[[noreturn]] void endWithoutMemory(const TraceScope& trace, std::size_t size) {
    trace.error()("Memory allocation of %d bytes failed. Agent is terminating.",
                  static_cast<int>(size));
    std::exit(-1);
}

} // namespace

int zrmMain(int argc, char** argv) {
    SYS1_Main(&argc, argv, component);
    TraceScope trace(anchor);
    checkEnvironment();
    // Every thread inherits the mask. Only the manager thread takes signals, by waiting for them.
    blockAllSignals();
    if (std::atexit(shutDown) != 0) {
        const ErrorText error(errno);
        trace.error()("Error establishing exit routine.  errno = %d; %s.  Use the error number "
                      "and message to investigate the failure.  Agent is terminating...",
                      error.number(), error.text());
        std::exit(-1);
    }
    getSystemName();
    LogFile::setRowReceiver(zrm_rmlogent_manager::EventArrived);
    LogFile::setEarlierReceiver(
        {zrm_rmlogent_manager::LongestPeriod, zrm_rmlogent_manager::CountEarlier});
    auto* const logManager = new (std::nothrow) LogManager;
    if (logManager == nullptr) {
        endWithoutMemory(trace, sizeof(LogManager));
    }
    pTheLogManager = logManager;
    AGF_RegisterAgentLoader(loadAgents);
    return trace.result(agfmain(argc, argv));
}

void getSystemName() {
    TraceScope trace(anchor);
    gSystemName = new (std::nothrow) char[systemNameSize]();
    if (gSystemName == nullptr) {
        endWithoutMemory(trace, systemNameSize);
    }
    if (std::getenv("CTREQ_NODETYPE") == nullptr) {
        AGF_SetNodeType(nodeType);
    }
    DetermineLocalHost(gSystemName, systemNameSize);
    gHostName = new (std::nothrow) char[maxHostName + 1]();
    if (gHostName == nullptr) {
        endWithoutMemory(trace, maxHostName); // not counting the terminator
    }
    utsname names;
    if (::uname(&names) < 0) {
        const ErrorText error(errno);
        trace.error()("uname() system call failed. errno = %d; %s", error.number(), error.text());
        setHostName("-1");
    } else {
        setHostName(names.nodename);
    }
    trace.fine()("gSystemName = %s ; gHostName = %s", gSystemName, gHostName);
}

void setHostName(const char* nodeName) {
    std::strncpy(gHostName, nodeName, maxHostName);
    gHostName[maxHostName] = '\0';
}

int loadAgents() {
    TraceScope trace(anchor);
    for (const char* const affinity : affinities) {
        AGF_SetAffinity(affinity);
    }
    char version[9] = {};
    AGF_SetVersionUsingProduct(product, version, sizeof version);
    zrm_rmmonlog_init();
    zrm_rmlogent_init();
    return trace.result(0);
}

void shutDown() {
    TraceScope trace(anchor);
    delete pTheLogManager.load();
    delete[] gSystemName;
    std::fflush(stderr);
    std::fflush(stdout);
    AGF_Shutdown(1);
}

} // namespace zrm
