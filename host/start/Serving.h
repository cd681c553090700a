#ifndef ZRM_HOST_SERVING_H
#define ZRM_HOST_SERVING_H

#include "host/api/SampleSource.h"
#include "host/base/Say.h"
#include "host/config/HostConfig.h"
#include "host/delivery/Delivery.h"
#include "host/diagnose/LogStateEvents.h"
#include "host/diagnose/LogStates.h"
#include "host/diagnose/LogWatch.h"
#include "host/history/EntryRecorder.h"
#include "host/http/Credentials.h"
#include "host/http/HttpServer.h"
#include "host/http/Router.h"
#include "host/metrics/MetricSources.h"
#include "host/situations/SituationSet.h"
#include "host/start/Descriptors.h"

#include <chrono>
#include <memory>
#include <optional>
#include <vector>

class TableManager;

namespace zrm::host {

class AnalysisResource;
class EventStream;
class ReportResource;
class Watchdog;

/// Everything that lives while the host serves: the delivery of events, the situations, HTTP.
/// Begun and stopped by the main thread.
class Serving {
public:
    using Clock = std::chrono::steady_clock;

    /// Begins to deliver events, opens the situations on the Log Entries table, and lets the log
    /// manager know that requests are served. Null when the table opens no request.
    /// The watchdog outlives the object.
    static std::unique_ptr<Serving> begin(const HostConfig& config, TableManager& entries,
                                          Watchdog& watchdog, OpenedHistory history);

    Serving(const Serving&) = delete;
    Serving& operator=(const Serving&) = delete;

    /// Begins to serve HTTP where the configuration asks for it. Where it cannot, it says why, and
    /// everything else goes on.
    void startHttp(const HostConfig& config);

    /// Exchanges the situations. `removesMost`: more than half of those before are gone.
    void apply(const std::vector<SituationConfig>& situations, bool removesMost);

    /// The configuration file has changed and cannot be used as it is now. Any thread.
    void noteUnusableConfig() noexcept { m_reload.isTakenOver.store(false); }

    /// What is done about once a second.
    void tick();

    /// The number of monitored logs.
    static std::size_t countLogs();

    /// Ends everything in order: no more requests over HTTP, no more events, then the delivery of
    /// what is queued, at the latest at the limit.
    void stop(Clock::time_point limit);

    // For an end of the process of which the main thread does not know. Any thread.

    /// Begins no further samples and waits for those under way, at most until the limit.
    void abandonHttp(Clock::time_point limit);
    /// Delivers what is queued, at the latest until the limit.
    void deliverRest(Clock::time_point limit) { m_delivery.finish(limit); }

private:
    Serving(const HostConfig& config, TableManager& entries, const ctreq& request,
            const RowLayout& layout, Watchdog& watchdog, OpenedHistory history);

    void renewCredentials();
    void addResources(const HostConfig& config, TableManager& entries);
    void addMetrics(const EventStream& stream);
    void addResource(std::unique_ptr<Resource> resource);

    Watchdog& m_watchdog;
    Delivery m_delivery;
    Descriptors m_descriptors;
    LogStates m_states;                     ///< used by the main thread
    LogStateEvents m_stateEvents;           ///< the same
    std::optional<EntryRecorder> m_entries; ///< none: the history is off
    SituationSet m_situations;
    ConfigReload m_reload;
    LogWatch m_watch{[](const std::string& line) { say("%s", line.c_str()); }};
    TableSampler m_sampler;
    Router m_router;
    std::vector<std::unique_ptr<Resource>> m_resources; ///< what answers over HTTP
    AnalysisResource* m_analysis = nullptr;             ///< one of these
    ReportResource* m_reports = nullptr;                ///< one of these
    std::optional<Credentials> m_credentials;           ///< none: HTTP is off
    HttpServer m_http;
};

} // namespace zrm::host

#endif
