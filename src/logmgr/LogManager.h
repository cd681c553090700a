#ifndef ZRM_LOG_MANAGER_H
#define ZRM_LOG_MANAGER_H

#include "framework/Pulse.h"
#include "logs/FurtherLogs.h"
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
/// creates and deletes the monitoring objects and handles the process's signals (SIGHUP, SIGINT,
/// SIGTERM, SIGQUIT and SIGCHLD, which the creator must block before any thread exists). Requests
/// on the tables use the chain of logs only between beginRequest and endRequest. Lives from
/// start-up until the exit routine destroys it.
class LogManager {
public:
    /// Reads the environment and starts the manager thread. Ends the process if that fails.
    LogManager();
    LogManager(const LogManager&) = delete;
    LogManager& operator=(const LogManager&) = delete;
    /// Stops the manager thread and every log; may run on the manager thread itself.
    ~LogManager();

    // For requests, on any thread.

    /// Keeps the chain of logs unchanged until endRequest; a refresh waits.
    void beginRequest();
    /// Ends a request. A refresh that waits for the last request then continues.
    void endRequest();
    /// True while a refresh waits for requests; a long one can then end early. Any thread.
    bool isRefreshWaiting() const noexcept { return RefreshWaiting.load(); }
    /// Records that the framework has begun to serve requests. A stop waits for that.
    void setServerUp();
    /// Walks the chain between beginRequest and endRequest. Null returns the first log. `index` is
    /// the number of logs already returned. Returns null at the end.
    LogFile* getNextLogObject(LogFile* current, unsigned index);
    /// The monitored log with this local name, or null. Use between beginRequest and endRequest.
    LogFile* findLogObject(const char* localName);
    /// True if a refresh now would consider the log configuration unchanged. Any thread.
    bool isConfigTakenOver(std::time_t lastModified) const noexcept {
        return lastModified == ConfigFileLastChanged.load();
    }
    std::uint32_t numLogs() const noexcept { return NumLogs.load(); }

    /// Writes one record with all fields, whatever the trace level. Any thread.
    void printSelf() const;

private:
    friend void* managerThread(void* manager);

    void getEnvVars();
    std::unique_ptr<char[]> allocMem(std::size_t size) const;
    std::unique_ptr<char[]> copyOf(const char* text) const;

    void startManagerThread();
    void stopManagerThread();
    /// Waits for the next relevant signal. True: refresh; false: stop.
    bool waitForSignal();
    void terminateFramework();
    void waitForServer();
    /// Waits on a condition with the manager locked (`limit` null: forever). The manager thread can
    /// only be cancelled here and in sleep and sigwait.
    int waitFor(pthread_cond_t& condition, const timespec* limit);

    /// Re-reads the configuration. Returns 0 if there is nothing to do and nothing to wait for.
    std::uint32_t refresh();
    /// Takes the published list of further logs. True if it is another than before.
    bool takeFurtherLogs();
    void waitForRequests();
    std::uint32_t getValidLogs();
    std::uint32_t getDefaultLogs();
    std::uint32_t createValidLogList(WhenceConfig whence, const char* path);
    void discardValidLogs();
    void buildLogObjects(unsigned validCount);
    /// True if the object can continue as the monitor of this line, possibly in a new debug mode.
    static bool canMonitor(const LogFile& object, const ValidLog& log);
    /// Keeps the log's present object or creates a new one.
    void buildLogObject(const ValidLog& log, LogFile* present);
    /// Marks the objects that this refresh does not keep unless it builds them again. Returns the
    /// number of others.
    std::uint32_t markLogObjects(bool isConfigNew);
    /// Builds the objects of the further logs. Returns their number.
    std::uint32_t buildFurtherLogs();
    void retireMarkedLogs();
    /// Ends the monitoring of the logs taken off the chain. Runs without the lock, because a thread
    /// needs up to a second to end and requests need the lock in the meantime.
    void deleteRetiredLogs();
    /// Deletes the chain from its tail to its head.
    void deleteLogs();
    void deleteLogObject(LogFile* log);
    /// Takes the log off the chain. Does not wait.
    void retireLogObject(LogFile* log);
    /// Waits like sleep, but ends early on a signal that ends the agent, and consumes it.
    void sleepUnlessStopped(unsigned seconds);

    void lockManager();
    void unlockManager();
    void shutdown();
    void openDebugLog();
    void closeDebugLog();

    // Atomic where printSelf reads while other threads write.
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
    // Used by the manager thread only.
    std::shared_ptr<const FurtherLogs::List> FurtherLogsTaken; ///< null: there are none
    bool IsConfigEmptied = false;   ///< the log configuration was read and names no valid log
    LogFile* RetiredLogs = nullptr; ///< owns a chain of logs to delete
    Pulse ManagerPulse{"the log manager"};
    /// Owns the circular chain of valid logs, which exists from reading the configuration until the
    /// monitoring objects are built.
    std::atomic<ValidLog*> FirstValidLog{nullptr};
};

/// The one log manager; null until start-up has created it. Atomic because its own threads already
/// run when start-up stores it. Never cleared.
extern std::atomic<LogManager*> pTheLogManager;

/// The manager thread's start routine; its argument is the LogManager.
void* managerThread(void* manager);

} // namespace zrm

#endif
