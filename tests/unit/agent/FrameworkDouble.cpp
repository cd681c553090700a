#include "FrameworkDouble.h"

#include "logmgr/LogManager.h"

#include <gtest/gtest.h>

#include <atomic>
#include <cstdio>
#include <cstring>
#include <mutex>

#include <signal.h>
#include <unistd.h>

using namespace zrm;

namespace {

struct State {
    std::mutex mutex;
    std::vector<std::string> calls;
    int (*loader)() = nullptr;
    int status = 0;
    bool comesUp = true;
    void (*end)() = nullptr;
    std::atomic<bool> isStopped{false};
};

State& state() {
    static State* const theState = new State;
    return *theState;
}

void record(const std::string& call) {
    if (testing::internal::InDeathTestChild()) {
        const std::string line = call + "\n";
        [[maybe_unused]] const auto written = write(STDERR_FILENO, line.data(), line.size());
    }
    const std::lock_guard guard(state().mutex);
    state().calls.push_back(call);
}

/// Which of two typical signals the calling thread blocks.
std::string blockedSignals() {
    sigset_t mask;
    pthread_sigmask(SIG_BLOCK, nullptr, &mask);
    return std::string(sigismember(&mask, SIGTERM) == 1 ? " TERM" : "") +
           (sigismember(&mask, SIGUSR1) == 1 ? " USR1" : "");
}

} // namespace

std::vector<std::string> FrameworkDouble::calls() {
    const std::lock_guard guard(state().mutex);
    return state().calls;
}

void FrameworkDouble::clear() {
    const std::lock_guard guard(state().mutex);
    state().calls.clear();
}

void FrameworkDouble::setStatus(int status) {
    state().status = status;
}

void FrameworkDouble::setServerStaysDown() {
    state().comesUp = false;
}

void FrameworkDouble::setEnd(void (*end)()) {
    state().end = end;
}

// The functions below replace the framework's and the tables' under their linker names.

extern "C" void __wrap__Z9SYS1_MainPiPPcPKc(int* argc, char** argv, const char* component);
extern "C" void __wrap__Z9SYS1_MainPiPPcPKc(int* argc, char** argv, const char* component) {
    record("SYS1_Main " + std::to_string(*argc) + " " + argv[0] + " " + component +
           blockedSignals());
    --*argc; // the framework keeps an argument to itself
}

extern "C" void __wrap__Z23AGF_RegisterAgentLoaderPFivE(int (*loader)());
extern "C" void __wrap__Z23AGF_RegisterAgentLoaderPFivE(int (*loader)()) {
    record(std::string("AGF_RegisterAgentLoader") +
           (pTheLogManager.load() != nullptr ? " with a log manager" : ""));
    state().loader = loader;
}

extern "C" int __wrap__Z7agfmainiPPc(int argc, char** argv);
extern "C" int __wrap__Z7agfmainiPPc(int argc, char** argv) {
    record("agfmain " + std::to_string(argc) + " " + argv[0]);
    record("loaded " + std::to_string(state().loader()));
    if (state().comesUp) {
        pTheLogManager.load()->setServerUp();
    } else {
        kill(getpid(), SIGTERM);
    }
    state().isStopped.wait(false);
    return state().status;
}

extern "C" void __wrap__Z15AGF_SetNodeTypePKc(const char* nodeType);
extern "C" void __wrap__Z15AGF_SetNodeTypePKc(const char* nodeType) {
    record(std::string("AGF_SetNodeType ") + nodeType);
}

extern "C" void __wrap__Z18DetermineLocalHostPci(char* name, int size);
extern "C" void __wrap__Z18DetermineLocalHostPci(char* name, int size) {
    record("DetermineLocalHost " + std::to_string(size) + blockedSignals());
    std::snprintf(name, static_cast<std::size_t>(size), "%s", "web1:ZRM");
}

extern "C" void __wrap__Z15AGF_SetAffinityPKc(const char* affinity);
extern "C" void __wrap__Z15AGF_SetAffinityPKc(const char* affinity) {
    record(std::string("AGF_SetAffinity ") + affinity);
}

extern "C" void __wrap__Z26AGF_SetVersionUsingProductPKcPci(const char* product, char* version,
                                                            int size);
extern "C" void __wrap__Z26AGF_SetVersionUsingProductPKcPci(const char* product, char* version,
                                                            int size) {
    const std::string zeroes(static_cast<std::size_t>(size), '\0');
    const bool isZeroed = std::memcmp(version, zeroes.data(), zeroes.size()) == 0;
    record(std::string("AGF_SetVersionUsingProduct ") + product + " " + std::to_string(size) +
           (isZeroed ? " zeroed" : ""));
}

extern "C" void __wrap__Z12AGF_Shutdowni(int reason);
extern "C" void __wrap__Z12AGF_Shutdowni(int reason) {
    record("AGF_Shutdown " + std::to_string(reason));
    if (state().end != nullptr) {
        state().end();
    }
}

extern "C" void __wrap__Z13RPC1_ShutdownPj(unsigned* status);
extern "C" void __wrap__Z13RPC1_ShutdownPj(unsigned* status) {
    *status = 0;
    state().isStopped = true;
    state().isStopped.notify_all();
}

extern "C" unsigned __wrap__ZN3zrm17zrm_rmlogent_initEv();
extern "C" unsigned __wrap__ZN3zrm17zrm_rmlogent_initEv() {
    record("zrm_rmlogent_init");
    return 1; // ignored by the agent
}

extern "C" unsigned __wrap__ZN3zrm17zrm_rmmonlog_initEv();
extern "C" unsigned __wrap__ZN3zrm17zrm_rmmonlog_initEv() {
    record("zrm_rmmonlog_init");
    return 1; // ignored by the agent
}
