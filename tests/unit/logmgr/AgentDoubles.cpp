#include "AgentDoubles.h"

#include "logs/ValidLog.h"
#include "monitor/LogFile.h"

#include <atomic>
#include <chrono>
#include <mutex>
#include <thread>

using namespace zrm;

namespace {

std::atomic<bool> g_typesKnown{true};
std::atomic<bool> g_logsCreatable{true};
std::atomic<int> g_living{0};
std::atomic<int> g_shutdowns{0};
std::mutex g_mutex;

std::vector<std::string>& recorded() {
    static auto* const theRecord = new std::vector<std::string>;
    return *theRecord;
}

/// A log whose thread does nothing until it is stopped. It does so when the constructor returns, so
/// that its own records never mix with those of later operations.
class TestLog final : public LogFile {
public:
    TestLog(const ValidLog& log, LogFile* chainHead) : LogFile(log, chainHead) {
        ++g_living;
        startThread();
        while (!m_isAtWork) {
            std::this_thread::yield();
        }
    }
    ~TestLog() override {
        stopThread();
        --g_living;
    }
    void endReportRequest(void** /*reportState*/) override {}
    void* getNextLogEntry(void*, void*, void*) override { return nullptr; }
    void* startReportRequest(void* /*thresholds*/) override { return nullptr; }
    long formatEntryAsRow(char*, void*, void*) override { return 0; }
    void processLogData() override {
        m_isAtWork = true;
        while (monitorStatus() == MONITOR_RUNNING) {
            std::this_thread::sleep_for(std::chrono::microseconds(200));
        }
    }

private:
    std::atomic<bool> m_isAtWork{false};
};

} // namespace

void AgentDoubles::reset() {
    g_typesKnown = true;
    g_logsCreatable = true;
    g_shutdowns = 0;
    const std::lock_guard guard(g_mutex);
    recorded().clear();
}

void AgentDoubles::setTypesKnown(bool known) {
    g_typesKnown = known;
}

void AgentDoubles::setLogsCreatable(bool creatable) {
    g_logsCreatable = creatable;
}

std::vector<std::string> AgentDoubles::created() {
    const std::lock_guard guard(g_mutex);
    return recorded();
}

int AgentDoubles::living() {
    return g_living;
}

int AgentDoubles::shutdowns() {
    return g_shutdowns;
}

// The functions below replace those of other parts under their linker names.

extern "C" bool __wrap__ZN3zrm14isKnownLogTypeEc(char type);
extern "C" bool __wrap__ZN3zrm14isKnownLogTypeEc(char /*type*/) {
    return g_typesKnown;
}

extern "C" LogFile* __wrap__ZN3zrm13createLogFileERKNS_8ValidLogEPNS_7LogFileE(const ValidLog& log,
                                                                               LogFile* chainHead);
extern "C" LogFile* __wrap__ZN3zrm13createLogFileERKNS_8ValidLogEPNS_7LogFileE(const ValidLog& log,
                                                                               LogFile* chainHead) {
    if (!g_logsCreatable) {
        return nullptr;
    }
    {
        const std::lock_guard guard(g_mutex);
        recorded().push_back(std::string(1, log.type()) + " " + log.fileNameLocal() + " " +
                             log.procedure());
    }
    return new TestLog(log, chainHead);
}

extern "C" void __wrap__Z13RPC1_ShutdownPj(unsigned* status);
extern "C" void __wrap__Z13RPC1_ShutdownPj(unsigned* status) {
    ++g_shutdowns;
    *status = 0;
}
