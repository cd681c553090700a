#ifndef ZRM_HOST_HOST_H
#define ZRM_HOST_HOST_H

#include "host/base/WatchedFile.h"
#include "host/config/HostConfig.h"
#include "host/sources/LogList.h"
#include "host/start/ServiceNotifier.h"
#include "host/start/Serving.h"
#include "host/start/Watchdog.h"

#include <condition_variable>
#include <map>
#include <memory>
#include <mutex>
#include <set>
#include <string>
#include <thread>
#include <vector>

namespace zrm::host {

/// The standalone host of this process, behind the framework calls of the agent's start-up and
/// end. One per process, never destroyed, so that threads which outlive main may use it.
///
/// The orderly end: a stop is requested, run ends everything that serves, and returns. When a
/// thread ends the process otherwise (exit), run is still under way: processEnds, which exit calls
/// before the agent's own exit routine, releases the agent's threads from the host, and shutdown
/// delivers what is queued.
class Host {
public:
    static Host& instance();

    Host(const Host&) = delete;
    Host& operator=(const Host&) = delete;

    /// Sets the configuration that was read from this file at start-up, and the notifier of start
    /// and orderly stop. Opens the history, whose positions the first log needs. Main thread,
    /// first.
    void configure(HostConfig config, WatchedFile file, ServiceNotifier notifier = {});
    /// Finds the logs of the configuration for the log manager, which must not exist yet.
    /// `traceFile`: where the trace goes; empty: not to a file. Main thread, after configure.
    void findLogs(std::string traceFile);
    void setLoader(int (*loader)()) noexcept { m_loader = loader; }

    /// The main loop: loads the agent, serves until a stop is requested, ends the serving. Returns
    /// the process's status. Main thread.
    int run();

    /// The agent has begun to end, perhaps before everything is served. Any thread.
    void noteStopping() noexcept { m_watchdog.noteStopping(); }

    /// Makes run return soon. Any thread.
    void requestStop();

    /// Before the agent's exit routine, on any thread; any number of times. Bounded.
    void processEnds();

    /// At the end of the agent's exit routine, on any thread; any number of times. Bounded.
    void shutdown();

private:
    using Clock = Serving::Clock;
    enum class State { BEFORE, STARTING, SERVING, STOPPING, ENDED };
    using enum State;

    Host();
    bool begin();
    bool waitForTick();
    void tick(int number);
    bool haveFilesChanged();
    void watchRules();
    void reload();
    void sayNoLogs() const;
    void sayWhatIsReadAgain(const std::set<std::string>& monitored) const;
    LogList::OwnFiles ownFiles(const HostConfig& config) const;
    void stop();
    void setState(State state);

    Watchdog m_watchdog;
    HostConfig m_config;
    OpenedHistory m_history; ///< until it is served
    WatchedFile m_file{""};
    std::map<std::string, WatchedFile> m_ruleFiles; ///< of the situations in force, by path
    ServiceNotifier m_notifier;
    int (*m_loader)() = nullptr;
    std::string m_traceFile;
    LogList m_logs;

    std::mutex m_mutex; ///< guards what follows
    std::condition_variable m_changed;
    std::unique_ptr<Serving> m_serving; ///< set once; what it points to guards itself
    State m_state = BEFORE;
    bool m_stopRequested = false;
    bool m_isBusy = false;      ///< the main thread works on what is served
    bool m_processEnds = false; ///< the process ends without the main thread
    std::thread::id m_mainThread;
};

} // namespace zrm::host

#endif
