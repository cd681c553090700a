#ifndef ZRM_LOG_MANAGER_H
#define ZRM_LOG_MANAGER_H

#include "logmgr/ValidLog.h"

#include <atomic>
#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <ctime>
#include <memory>

#include <pthread.h>

class LogFile;

/// The single owner of everything that is monitored. Its manager thread reads the configuration,
/// builds and deletes the monitoring objects and takes the process's signals; requests of the
/// tables bracket their use of the chain of logs with beginRequest and endRequest.
class LogManager {
public:
    /// Reads the environment and starts the manager thread.
    LogManager();
    LogManager(const LogManager&) = delete;
    LogManager& operator=(const LogManager&) = delete;
    /// Stops the manager thread and every log.
    ~LogManager();

    // For requests, on any thread.

    /// Holds the chain of logs still until endRequest: a refresh waits.
    void beginRequest();
    void endRequest();
    /// Records that the framework has begun to serve requests.
    void setServerUp();
    /// Walks the chain between beginRequest and endRequest: null gives the first log; `index` is
    /// the number of logs already given. Null at the end.
    LogFile* getNextLogObject(LogFile* current, unsigned index);
    /// The monitored log of this local name, or null. Between beginRequest and endRequest.
    LogFile* findLogObject(const char* localName);
    std::uint32_t numLogs() const noexcept { return NumLogs.load(); }
    /// The open debug log, or null. Any thread.
    std::FILE* debugLogStream() const noexcept { return DebugLogP.load(); }

    void printSelf() const;

private:
    friend void* managerThread(void* manager);

    void getEnvVars();
    std::unique_ptr<char[]> allocMem(std::size_t size);
    void startManagerThread();
    void stopManagerThread();
    bool waitForSignal();
    std::uint32_t refresh();
    std::uint32_t getValidLogs();
    std::uint32_t createValidLogList(WhenceConfig whence, const char* path);
    void buildLogObjects(unsigned validCount);
    void deleteNextLog(LogFile* log, unsigned depth);
    void deleteLogObject(LogFile* log);
    void lockManager();
    void unlockManager();
    void shutdown();
    void openDebugLog();
    void closeDebugLog();

    bool AgentServerUp = false;
    std::unique_ptr<char[]> ConfigFile;
    std::unique_ptr<char[]> DebugLog;
    std::unique_ptr<char[]> SyslogConfFile;
    std::atomic<std::FILE*> DebugLogP{nullptr};
    LogFile* FirstLogObject = nullptr;
    pthread_cond_t AgentServerNotUp;
    pthread_cond_t ManagerNotInUse;
    pthread_mutex_t ManagerLock;
    pthread_t ManagerThread;
    std::time_t ConfigFileLastChanged = 0;
    std::time_t SyslogConfFileLastChanged = 0;
    std::atomic<std::uint32_t> NumLogs{0};
    std::int32_t UseCount = 0;
    ValidLog* FirstValidLog = nullptr;
};

/// The manager thread's start routine; its argument is the LogManager.
void* managerThread(void* manager);

#endif
