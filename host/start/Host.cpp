#include "host/start/Host.h"

#include "base/TraceScope.h"
#include "host/base/Say.h"
#include "host/config/ConfigFile.h"
#include "host/config/OwnFiles.h"
#include "host/config/SituationWarnings.h"
#include "host/framework/EventRoomControl.h"
#include "host/framework/Tables.h"
#include "logs/FollowSettings.h"
#include "logs/FurtherLogs.h"

#include <algorithm>
#include <cstdlib>
#include <set>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include <signal.h>
#include <unistd.h>

namespace zrm::host {

namespace {

TRC1_Anchor anchor{"Host.cpp"};

constexpr int failureStatus = 255;
constexpr std::chrono::seconds tickInterval{1};
/// For the delivery of what is queued, and for whatever else an end waits.
constexpr std::chrono::seconds endLimit{5};

/// The log manager's first refresh is done within the first of these.
constexpr int ticksUntilNoLogs = 2;

/// How many situations of a configuration the next one names no more.
std::size_t removedSituations(const HostConfig& before, const HostConfig& now) {
    std::set<std::string_view> names;
    for (const SituationConfig& situation : now.situations) {
        names.insert(situation.name);
    }
    return static_cast<std::size_t>(std::count_if(
        before.situations.begin(), before.situations.end(),
        [&](const SituationConfig& situation) { return !names.contains(situation.name); }));
}

} // namespace

Host& Host::instance() {
    static Host* const theHost = new Host;
    return *theHost;
}

/// The log manager takes a changed list when it is asked to refresh.
Host::Host() : m_logs([] { ::kill(::getpid(), SIGHUP); }) {}

void Host::configure(HostConfig config, WatchedFile file, ServiceNotifier notifier) {
    m_config = std::move(config);
    m_file = std::move(file);
    watchRules();
    m_notifier = std::move(notifier);
    m_history = openHistory(m_config);
}

void Host::findLogs(std::string traceFile) {
    m_traceFile = std::move(traceFile);
    const std::set<std::string> monitored =
        m_history.history == nullptr ? std::set<std::string>() : m_history.history->logs();
    m_logs.begin(m_config.logs, ownFiles(m_config), monitored);
    sayWhatIsReadAgain(monitored);
}

/// The logs that an earlier run monitored as lines of the log configuration have no positions.
void Host::sayWhatIsReadAgain(const std::set<std::string>& monitored) const {
    const auto found = FurtherLogs::published();
    if (!found || m_history.history == nullptr) {
        return;
    }
    for (const FurtherLog& log : *found) {
        const FollowSettings& settings = *log.settings;
        if (settings.resume && settings.start == FollowSettings::Start::beginning &&
            !settings.isNewcomer && monitored.contains(log.name) &&
            !m_history.history->positions()->isStored(log.name)) {
            say("%s was monitored before, but not as a log of a [[log]] table: start = "
                "\"beginning\" reads it again, and its entries raise events again",
                log.name.c_str());
        }
    }
}

LogList::OwnFiles Host::ownFiles(const HostConfig& config) const {
    LogList::OwnFiles files = ownFilesOf(config);
    files.merge(ownFilesOf(m_config)); // most of a changed configuration is not in force yet
    files.emplace("/dev/stdout", "standard output");
    files.emplace("/dev/stderr", "standard error");
    files.emplace(m_traceFile, "the trace");
    return files;
}

void Host::setState(State state) {
    {
        const std::lock_guard guard(m_mutex);
        m_state = state;
    }
    m_changed.notify_all();
}

int Host::run() {
    TraceScope trace(anchor);
    {
        const std::lock_guard guard(m_mutex);
        m_mainThread = std::this_thread::get_id();
        m_state = STARTING;
    }
    if (!m_watchdog.start([this] { requestStop(); })) {
        say("no thread can be started: raise the limit on processes or on memory");
        return trace.result(failureStatus);
    }
    // Runs before the agent's own exit routine, which waits for threads that may wait for the host.
    if (std::atexit([] { Host::instance().processEnds(); }) != 0) {
        trace.error()("Error establishing the host's exit routine.");
    }
    if (!begin()) {
        return trace.result(failureStatus);
    }
    for (int number = 1; waitForTick(); ++number) {
        tick(number);
    }
    stop();
    return trace.result(0);
}

bool Host::begin() {
    TraceScope trace(anchor);
    if (m_loader != nullptr) {
        m_loader();
    }
    TableManager* const entries = Tables::find("RMLOGENT");
    if (entries == nullptr) {
        trace.error()("The agent has not registered its Log Entries table.");
        return false;
    }
    std::unique_ptr<Serving> serving =
        Serving::begin(m_config, *entries, m_watchdog, std::move(m_history));
    if (serving == nullptr) {
        return false;
    }
    {
        const std::lock_guard guard(m_mutex);
        m_serving = std::move(serving);
        m_state = SERVING;
        m_isBusy = true;
    }
    m_changed.notify_all();
    if (!m_logs.start()) {
        say("no thread can be started that looks for new logs: files that appear later are not "
            "followed");
    }
    m_serving->startHttp(m_config);
    m_watchdog.noteStage("serving");
    m_notifier.ready();
    return true;
}

bool Host::waitForTick() {
    std::unique_lock lock(m_mutex);
    m_isBusy = false;
    m_changed.notify_all();
    m_changed.wait_for(lock, tickInterval, [&] { return m_stopRequested || m_processEnds; });
    // Another thread takes what is served apart; this one must not come back to it.
    m_changed.wait(lock, [&] { return !m_processEnds; });
    m_isBusy = true;
    if (m_stopRequested) {
        m_state = STOPPING;
    }
    return !m_stopRequested;
}

void Host::tick(int number) {
    if (number <= ticksUntilNoLogs && Serving::countLogs() == 0 && number == ticksUntilNoLogs) {
        sayNoLogs();
    }
    m_serving->tick();
    if (haveFilesChanged()) {
        reload();
    }
}

/// Whether the configuration, or a ready situation that it uses, has changed.
bool Host::haveFilesChanged() {
    bool hasChanged = m_file.hasChanged();
    for (auto& [path, file] : m_ruleFiles) {
        hasChanged = file.hasChanged() || hasChanged;
    }
    return hasChanged;
}

/// Files that are watched already stay as they were seen last.
void Host::watchRules() {
    std::map<std::string, WatchedFile> files;
    for (const SituationConfig& situation : m_config.situations) {
        if (situation.ruleFile.empty()) {
            continue;
        }
        const auto known = m_ruleFiles.find(situation.ruleFile);
        if (known != m_ruleFiles.end()) {
            files.insert(*known);
        } else {
            files.emplace(situation.ruleFile, WatchedFile(situation.ruleFile));
        }
    }
    m_ruleFiles = std::move(files);
}

void Host::sayNoLogs() const {
    const std::string path = m_file.path().empty() ? "/etc/zrm/zrm.toml" : m_file.path();
    const char* const file = std::getenv("ZRM_CONFIG_FILE");
    if (!m_config.logs.empty()) {
        say("no log to monitor yet: 'zrmctl check --host %s' shows what its [[log]] tables match; "
            "waiting for a file",
            path.c_str());
    } else if (file == nullptr || *file == '\0') {
        say("no log to monitor: set log_config in %s, or ZRM_CONFIG_FILE in the environment, "
            "to a file that names one log per line; exiting in a minute",
            path.c_str());
    } else {
        say("no log to monitor: %s names none that can be monitored, and 'zrmctl check %s' "
            "says why; exiting in a minute",
            file, file);
    }
}

void Host::reload() {
    TraceScope trace(anchor);
    ConfigFile::Result reloaded = ConfigFile::reload(m_file.path());
    if (!reloaded) {
        for (const std::string& problem : reloaded.error()) {
            say("%s", problem.c_str());
        }
        say("%s was not loaded; the situations and the logs stay as they were",
            m_file.path().c_str());
        m_serving->noteUnusableConfig();
        return;
    }
    HostConfig& config = *reloaded;
    trace.detail()("%s taken over.", m_file.path().c_str());
    const std::size_t removed = removedSituations(m_config, config);
    const bool removesMost = removed > m_config.situations.size() / 2;
    if (removesMost) {
        say("%s: %zu of %zu situations are gone and no longer raise events; if the file was cut "
            "off, write it again",
            m_file.path().c_str(), removed, m_config.situations.size());
    }
    m_serving->apply(config.situations, removesMost);
    if (config.logs != m_config.logs) {
        m_logs.apply(config.logs, ownFiles(config));
        if (const auto warning = warningOfDebug(config, m_file.path())) {
            say("%s", warning->c_str());
        }
    }
    const std::vector<std::string> known = warningsOfSituations(m_config, m_file.path());
    for (const std::string& warning : warningsOfSituations(config, m_file.path())) {
        if (std::find(known.begin(), known.end(), warning) == known.end()) {
            say("%s", warning.c_str());
        }
    }
    if (config.environment != m_config.environment || config.http != m_config.http ||
        config.sinks != m_config.sinks || config.history != m_config.history ||
        config.stateDirectory != m_config.stateDirectory) {
        say("%s: logs and situations are reloaded; every other change takes effect at the next "
            "start",
            m_file.path().c_str());
    }
    m_config = std::move(config);
    watchRules();
}

void Host::stop() {
    TraceScope trace(anchor);
    m_notifier.stopping();
    m_serving->stop(Clock::now() + endLimit);
    m_watchdog.noteStage("waiting for the agent's threads");
    setState(ENDED);
}

void Host::requestStop() {
    TraceScope trace(anchor);
    m_watchdog.noteStopping();
    {
        const std::lock_guard guard(m_mutex);
        m_stopRequested = true;
    }
    m_changed.notify_all();
}

void Host::processEnds() {
    const Clock::time_point limit = Clock::now() + endLimit;
    m_watchdog.noteStopping();
    EventRoomControl::close();
    std::unique_lock lock(m_mutex);
    const bool isMain = std::this_thread::get_id() == m_mainThread;
    m_processEnds = true;
    if (!isMain) {
        // Events may have come before the start is over; what serves them is known only then.
        m_changed.wait_until(lock, limit, [&] { return m_state != STARTING; });
    }
    if (m_state == SERVING) {
        m_changed.wait_until(lock, limit, [&] { return isMain || !m_isBusy; });
        lock.unlock();
        m_serving->abandonHttp(limit);
    } else if (!isMain) {
        m_changed.wait_until(lock, limit, [&] { return m_state != STOPPING; });
    }
}

void Host::shutdown() {
    TraceScope trace(anchor);
    std::unique_lock lock(m_mutex);
    if (m_state == SERVING) {
        m_state = ENDED;
        lock.unlock();
        m_serving->deliverRest(Clock::now() + endLimit);
    }
}

} // namespace zrm::host
