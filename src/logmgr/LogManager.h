#ifndef ZRM_LOG_MANAGER_H
#define ZRM_LOG_MANAGER_H

#include "framework/Pulse.h"
#include "logs/ValidLog.h"

#include <atomic>
#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <ctime>
#include <memory>

#include <pthread.h>

namespace zrm {

class LogFile;

/// The single owner of everything that is monitored. Its manager thread reads the configuration,
/// builds and deletes the monitoring objects and takes the process's signals (SIGHUP, SIGINT,
/// SIGTERM, SIGQUIT and SIGCHLD, which the creator has blocked before any thread exists); requests
/// of the tables bracket their use of the chain of logs with beginRequest and endRequest. Lives
/// from start-up until the exit routine destroys it.
class LogManager {
public:
    /// Reads the environment and starts the manager thread. Ends the process when that fails.
    LogManager();
    LogManager(const LogManager&) = delete;
    LogManager& operator=(const LogManager&) = delete;
    /// Stops the manager thread and every log; may run on the manager thread itself.
    ~LogManager();

    // For requests, on any thread.

    /// Holds the chain of logs still until endRequest: a refresh waits.
    void beginRequest();
    /// Ends a request; a refresh that waits for the last one goes on.
    void endRequest();
    /// True while a refresh waits for requests to end: a long one may end early. Any thread.
    bool isRefreshWaiting() const noexcept { return RefreshWaiting.load(); }
    /// Records that the framework has begun to serve requests; a stop waits for that.
    void setServerUp();
    /// Walks the chain between beginRequest and endRequest: null gives the first log; `index` is
    /// the number of logs already given. Null at the end.
    LogFile* getNextLogObject(LogFile* current, unsigned index);
    /// The monitored log of this local name, or null. Between beginRequest and endRequest.
    LogFile* findLogObject(const char* localName);
    /// True when a refresh now would take the log configuration for unchanged. Any thread.
    bool isConfigTakenOver(std::time_t lastModified) const noexcept {
        return lastModified == ConfigFileLastChanged.load();
    }
    std::uint32_t numLogs() const noexcept { return NumLogs.load(); }
    /// The open debug log, or null. Any thread; it stays open as long as any log exists.
    std::FILE* debugLogStream() const noexcept { return DebugLogP.load(); }

    /// Writes one record of all fields, whatever the level. Any thread.
    void printSelf() const;

private:
    friend void* managerThread(void* manager);

    void getEnvVars();
    std::unique_ptr<char[]> allocMem(std::size_t size) const;
    std::unique_ptr<char[]> copyOf(const char* text) const;

    void startManagerThread();
    void stopManagerThread();
    /// Waits for the next signal that matters: true for a refresh, false to stop.
    bool waitForSignal();
    void terminateFramework();
    void waitForServer();
    /// Waits on a condition with the manager locked (`limit` null: for ever); only here and in
    /// sleep and sigwait can the manager thread be cancelled.
    int waitFor(pthread_cond_t& condition, const timespec* limit);

    /// Re-reads the configuration; returns the number of logs, 0 when there is nothing to do.
    std::uint32_t refresh();
    void waitForRequests();
    std::uint32_t getValidLogs();
    std::uint32_t getDefaultLogs();
    std::uint32_t createValidLogList(WhenceConfig whence, const char* path);
    void discardValidLogs();
    void buildLogObjects(unsigned validCount);
    void buildLogObject(const ValidLog& log);
    void retireMarkedLogs();
    /// Ends the monitoring of what was taken off the chain. Without the lock: a thread takes up to
    /// a second to end, and requests need the lock meanwhile.
    void deleteRetiredLogs();
    /// Deletes the chain from its tail to `log`, which is its member number `depth`; the manager
    /// gives the head and 1.
    void deleteNextLog(LogFile* log, unsigned depth);
    void deleteLogObject(LogFile* log);
    /// Takes the log off the chain, which does not wait.
    void retireLogObject(LogFile* log);
    /// Waits like sleep, but for a signal that ends the agent, which it takes.
    void sleepUnlessStopped(unsigned seconds);

    void lockManager();
    void unlockManager();
    void shutdown();
    void openDebugLog();
    void closeDebugLog();

    // What printSelf reads while other threads write is atomic.
    std::atomic<bool> AgentServerUp{false};
    std::unique_ptr<char[]> ConfigFile;
    std::unique_ptr<char[]> DebugLog;
    std::unique_ptr<char[]> SyslogConfFile;
    std::atomic<std::FILE*> DebugLogP{nullptr};
    std::atomic<LogFile*> FirstLogObject{nullptr}; ///< owns the circular chain of NumLogs objects
    pthread_cond_t AgentServerNotUp;
    pthread_cond_t ManagerNotInUse;
    pthread_mutex_t ManagerLock; ///< guards AgentServerUp, UseCount, the chain and NumLogs
    std::atomic<pthread_t> ManagerThread{};
    std::atomic<std::time_t> ConfigFileLastChanged{0};
    std::atomic<std::time_t> SyslogConfFileLastChanged{0};
    std::atomic<std::uint32_t> NumLogs{0};
    std::atomic<std::int32_t> UseCount{0};
    std::atomic<bool> RefreshWaiting{false};
    LogFile* RetiredLogs = nullptr; ///< owns a chain of logs to delete; the manager thread's
    Pulse ManagerPulse{"the log manager"};
    /// Owns the circular chain of valid logs, which exists from the reading of the configuration
    /// to the building of the objects.
    std::atomic<ValidLog*> FirstValidLog{nullptr};
};

/// The one log manager; null until start-up created it. Atomic, since its own threads already run
/// when start-up stores it. Never cleared.
extern std::atomic<LogManager*> pTheLogManager;

/// The manager thread's start routine; its argument is the LogManager.
void* managerThread(void* manager);

} // namespace zrm

#endif
