#include "host/start/Serving.h"

#include "base/TraceScope.h"
#include "framework/ctreq.h"
#include "host/api/AgentResource.h"
#include "host/api/AnalysisResource.h"
#include "host/api/DiagnoseResource.h"
#include "host/api/EpisodesResource.h"
#include "host/api/EventStream.h"
#include "host/api/EventsResource.h"
#include "host/api/LogsResource.h"
#include "host/api/ReportResource.h"
#include "host/api/RulesResource.h"
#include "host/api/SampleResource.h"
#include "host/api/SilencesResource.h"
#include "host/api/SituationsResource.h"
#include "host/api/SuggestResource.h"
#include "host/base/Say.h"
#include "host/base/TimeText.h"
#include "host/console/ConsoleResource.h"
#include "host/diagnose/LogLedgers.h"
#include "host/framework/EventRoomControl.h"
#include "host/framework/PulseRegistry.h"
#include "host/framework/Request.h"
#include "host/framework/Sample.h"
#include "host/metrics/MetricSources.h"
#include "host/metrics/MetricsResource.h"
#include "host/start/Watchdog.h"

#include <algorithm>
#include <cinttypes>
#include <string>
#include <system_error>
#include <utility>

namespace zrm::host {

namespace {

TRC1_Anchor anchor{"Serving.cpp"};

/// Time for opening the situations at startup; nothing else waits for it longer.
constexpr std::chrono::seconds openingLimit{30};
/// Time for reports to end. One that reads a hanging file system is left behind.
constexpr std::chrono::milliseconds reportLimit{800};
/// Time for the logs' threads to count what they skip.
constexpr std::chrono::milliseconds countingLimit{800};

/// The receiver of a request that is opened only to learn its table's rows.
class NoRows : public RowReceiver {
public:
    unsigned receive(const ctreq&, const char*, unsigned) override { return 0; }
    void stopped(const ctreq&, unsigned) override {}
};

} // namespace

std::unique_ptr<Serving> Serving::begin(const HostConfig& config, TableManager& entries,
                                        Watchdog& watchdog, OpenedHistory history) {
    TraceScope trace(anchor);
    NoRows receiver;
    RequestDetail detail;
    detail.name = "layout";
    detail.sampleType = SAMPLE_REPORT;
    const Request request(entries, std::move(detail), receiver);
    if (!request.isOpen()) {
        trace.error()("The Log Entries table opens no request.");
        return nullptr;
    }
    std::unique_ptr<Serving> serving;
    try {
        serving.reset(new Serving(config, entries, *request.get(), RowLayout(*request.get()),
                                  watchdog, std::move(history)));
        serving->m_delivery.start();
    } catch (const std::system_error& error) {
        static_cast<void>(
            serving.release()); // leaked: some of its threads are running while the process ends
        say("cannot start a thread (%s): raise the limits of threads and memory (TasksMax= and "
            "MemoryMax= of the service, ulimit -u), or end other programs; ending",
            error.code().message().c_str());
        return nullptr;
    }
    if (const std::string message = serving->m_situations.load(); !message.empty()) {
        say("%s", message.c_str());
    }
    serving->m_situations.apply(config.situations);
    if (!serving->m_situations.waitUntilOpen(openingLimit)) {
        say("some situations are still being opened: entries that arrive before then do not raise "
            "them");
    }
    EventRoomControl::open();
    countLogs(); // the first sample signals the log manager that requests are served
    return serving;
}

Serving::Serving(const HostConfig& config, TableManager& entries, const ctreq& request,
                 const RowLayout& layout, Watchdog& watchdog, OpenedHistory history)
    : m_watchdog(watchdog), m_delivery(config, layout, request.rowSize, std::move(history)),
      m_stateEvents(m_delivery.queue(), Clock::now()),
      m_situations(entries, m_delivery.queue(), config.stateDirectory + "/situations.json"),
      m_http(m_router) {
    if (History* const history = m_delivery.history()) {
        m_states = LogStates(history->rhythms());
        m_entries.emplace(*history, [this] { return m_states.takeLearned(); });
    }
    addResources(config, entries);
}

void Serving::apply(const std::vector<SituationConfig>& situations, bool removesMost) {
    m_situations.apply(situations);
    m_reload.hasRemovedMost.store(removesMost);
    m_reload.isTakenOver.store(true);
}

void Serving::tick() {
    m_descriptors.tick();
    m_watch.tick(Clock::now(), [this] {
        std::vector<LogLedgerView> logs = LogLedgers::read();
        m_states.judge(logs, Clock::now(), WallClock::now());
        m_stateEvents.judge(m_states.states(), Clock::now(), WallClock::now());
        return logs;
    });
    if (m_entries) {
        m_entries->tick(WallClock::now());
    }
    renewCredentials();
}

void Serving::renewCredentials() {
    if (!m_credentials) {
        return;
    }
    const Credentials::Change change = m_credentials->refresh();
    if (change.isNew) {
        m_http.renew(m_credentials->token(), m_credentials->tls());
    }
    if (change.problem) {
        say("HTTP: %s", change.problem->text().c_str());
    }
}

void Serving::addResources(const HostConfig& config, TableManager& entries) {
    addResource(std::make_unique<HealthResource>([this] { return m_watchdog.problem(); }));
    addResource(std::make_unique<ConsoleResource>());
    addResource(std::make_unique<AgentResource>(m_delivery, m_watch));
    addResource(std::make_unique<LogsResource>(m_watch));
    addResource(std::make_unique<SampleResource>(m_sampler));
    addResource(std::make_unique<DiagnoseResource>());
    addResource(std::make_unique<SuggestResource>(config.formatDirectories));
    auto reports = std::make_unique<ReportResource>(entries);
    m_reports = reports.get();
    addResource(std::move(reports));
    addResource(std::make_unique<EventsResource>(m_delivery.history()));
    addResource(std::make_unique<EpisodesResource>(m_delivery.history(), m_delivery.history()));
    addResource(std::make_unique<SituationsResource>(m_situations));
    addResource(std::make_unique<SilencesResource>(m_delivery.silences()));
    addResource(std::make_unique<RulesResource>(config.ruleDirectories, m_situations));
    auto analysis =
        std::make_unique<AnalysisResource>(m_situations, entries, m_watch, m_delivery.history());
    m_analysis = analysis.get();
    addResource(std::move(analysis));
    auto stream = std::make_unique<EventStream>(m_delivery.history());
    addMetrics(*stream);
    addResource(std::move(stream));
}

void Serving::addMetrics(const EventStream& stream) {
    auto metrics = std::make_unique<MetricsResource>();
    metrics->add(std::make_unique<ProcessMetrics>());
    metrics->add(std::make_unique<ConfigMetrics>(m_reload));
    metrics->add(std::make_unique<LogMetrics>(m_watch));
    metrics->add(std::make_unique<SituationMetrics>(m_situations));
    metrics->add(std::make_unique<DeliveryMetrics>(m_delivery));
    metrics->add(std::make_unique<HttpMetrics>(m_http, stream));
    addResource(std::move(metrics));
}

void Serving::addResource(std::unique_ptr<Resource> resource) {
    resource->addRoutes(m_router);
    m_resources.push_back(std::move(resource));
}

std::size_t Serving::countLogs() {
    const std::optional<Sample> logs = Sample::take("RMMONLOG", {}, "monitored logs");
    return logs ? logs->size() : 0;
}

void Serving::startHttp(const HostConfig& config) {
    TraceScope trace(anchor);
    if (!config.http.listen) {
        return;
    }
    const std::string path = config.http.tokenFile.empty() ? config.stateDirectory + "/api-token"
                                                           : config.http.tokenFile;
    m_credentials.emplace(path, config.http.certificate, config.http.key);
    const Result<void> started = m_credentials->load().and_then([&] {
        return m_http.start(*config.http.listen, m_credentials->token(), m_credentials->tls());
    });
    if (!started) {
        m_credentials.reset();
        say("HTTP is off: %s", started.error().text().c_str());
        return;
    }
    const ListenAddress address{config.http.listen->host, m_http.port()};
    say("HTTP at %s://%s/, token in %s", config.http.certificate.empty() ? "http" : "https",
        address.text().c_str(), path.c_str());
}

void Serving::abandonHttp(Clock::time_point limit) {
    m_analysis->cancel();
    m_reports->cancel();
    m_http.abandon(limit);
    m_reports->waitForEnd(limit);
}

void Serving::stop(Clock::time_point limit) {
    TraceScope trace(anchor);
    m_watchdog.noteStage("ending the reading of logs");
    EventRoomControl::close();
    PulseRegistry::waitUntilAllRest(Clock::now() + countingLimit);
    m_watchdog.noteStage("ending HTTP");
    m_analysis->cancel();
    m_reports->cancel();
    m_http.stop(limit);
    m_reports->waitForEnd(std::min(limit, Clock::now() + reportLimit));
    m_watchdog.noteStage("closing the situations");
    m_delivery.closePositions();
    m_situations.close();
    if (m_entries) {
        m_entries->finish();
    }
    m_watchdog.noteStage("delivering events");
    m_delivery.finish(limit);
    if (const std::uint64_t entries = EventRoomControl::passedOver(); entries > 0) {
        say("%" PRIu64 " lines that were waiting in the logs were not read; reports will find them",
            entries);
    }
}

} // namespace zrm::host
