#include "host/start/Serving.h"

#include "agent/TraceScope.h"
#include "agent/framework/ctreq.h"
#include "host/analysis/AnalysisResource.h"
#include "host/framework/Request.h"
#include "host/framework/Sample.h"
#include "host/http/ApiToken.h"
#include "host/http/HealthResource.h"
#include "host/http/SampleResource.h"
#include "host/situations/SituationsResource.h"
#include "host/start/Say.h"

#include <string>
#include <utility>
#include <variant>

namespace {

TRC1_Anchor anchor{"Serving.cpp"};

/// The receiver of a request that is opened only to learn its table's rows.
class NoRows : public RowReceiver {
public:
    unsigned receive(const ctreq&, const char*, unsigned) override { return 0; }
    void stopped(const ctreq&, unsigned) override {}
};

} // namespace

std::unique_ptr<Serving> Serving::begin(const HostConfig& config, TableManager& entries) {
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
    std::unique_ptr<Serving> serving(
        new Serving(config, entries, *request.get(), RowLayout(*request.get())));
    serving->m_delivery.start();
    if (const std::string message = serving->m_situations.load(); !message.empty()) {
        say("%s", message.c_str());
    }
    serving->m_situations.apply(config.situations);
    countLogs(); // the first sample tells the log manager that requests are served
    return serving;
}

Serving::Serving(const HostConfig& config, TableManager& entries, const ctreq& request,
                 const RowLayout& layout)
    : m_delivery(config.sinks, layout, request.rowSize),
      m_situations(entries, m_delivery.queue(), config.stateDirectory + "/situations.json"),
      m_http(m_router) {
    addResources(entries);
}

void Serving::addResources(TableManager& entries) {
    addResource(std::make_unique<HealthResource>());
    addResource(std::make_unique<SampleResource>(m_sampler));
    addResource(std::make_unique<SituationsResource>(m_situations));
    auto analysis = std::make_unique<AnalysisResource>(m_situations, entries, nullptr);
    m_analysis = analysis.get();
    addResource(std::move(analysis));
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
    auto token = ApiToken::load(path);
    std::string problem;
    if (const auto* const noToken = std::get_if<std::string>(&token)) {
        problem = *noToken;
    } else {
        problem = m_http.start(*config.http.listen, std::move(std::get<ApiToken>(token)));
    }
    if (!problem.empty()) {
        say("HTTP is off: %s", problem.c_str());
        return;
    }
    const ListenAddress address{config.http.listen->host, m_http.port()};
    say("HTTP at http://%s/, token in %s", address.text().c_str(), path.c_str());
}

void Serving::abandonHttp(Clock::time_point limit) {
    m_analysis->cancel();
    m_http.abandon(limit);
}

void Serving::stop(Clock::time_point limit) {
    TraceScope trace(anchor);
    // Released first, so that none holds the table's lock when the situations are closed.
    limitWaits(limit);
    m_analysis->cancel();
    m_http.stop(limit);
    m_situations.close();
    m_delivery.finish(limit);
}
