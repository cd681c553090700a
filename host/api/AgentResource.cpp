#include "host/api/AgentResource.h"

#include "base/TraceScope.h"
#include "framework/agent_calls.h"
#include "host/base/TimeText.h"
#include "host/config/Columns.h"
#include "host/config/ConditionBuilder.h"
#include "host/delivery/Delivery.h"
#include "host/diagnose/LogWarnings.h"
#include "host/diagnose/LogWatch.h"
#include "host/framework/TraceControl.h"
#include "host/history/HistoryReader.h"
#include "host/http/JsonFields.h"
#include "host/http/QueryFields.h"
#include "host/http/RequestRefused.h"
#include "host/http/Router.h"

#include <chrono>
#include <string>

#include <signal.h>
#include <unistd.h>

#include <nlohmann/json.hpp>

namespace zrm::host {

namespace {

TRC1_Anchor anchor{"AgentResource.cpp"};

using nlohmann::ordered_json;

constexpr std::size_t longestLevels = 4096; ///< bytes
constexpr int tracedLevels = 200;           ///< bytes of the levels shown in the trace

std::int64_t now() {
    return std::chrono::duration_cast<std::chrono::milliseconds>(
               std::chrono::system_clock::now().time_since_epoch())
        .count();
}

std::string node() {
    char name[128] = "";
    DetermineLocalHost(name, sizeof name);
    return name;
}

ordered_json textOrNull(const std::string& text) {
    return text.empty() ? ordered_json() : ordered_json(text);
}

/// Texts may quote the system or a log: bytes that are not UTF-8 are replaced.
HttpAnswer answerWith(const ordered_json& document) {
    return HttpAnswer::json(document.dump(-1, ' ', false, ordered_json::error_handler_t::replace));
}

ordered_json historyOf(Delivery& delivery) {
    HistoryReader* const reader = delivery.history();
    HistoryState state;
    if (reader != nullptr) {
        state = reader->state();
    } else {
        state.problem = delivery.historyProblem();
    }
    return {{"enabled", reader != nullptr},
            {"events", state.events},
            {"oldest", state.oldest},
            {"newest", state.newest},
            {"bytes", state.bytes},
            {"damaged", state.damaged},
            {"problem", textOrNull(state.problem)}};
}

ordered_json queueOf(const Delivery& delivery) {
    const QueueState state = delivery.queueState();
    return {{"size", state.size},
            {"capacity", state.capacity},
            {"waits", state.waits},
            {"waited_seconds", std::chrono::duration<double>(state.waited).count()}};
}

ordered_json sinksOf(const Delivery& delivery) {
    ordered_json sinks = ordered_json::array();
    for (const SinkState& state : delivery.sinkStates()) {
        ordered_json sink = {{"name", state.name},
                             {"type", state.type},
                             {"state", state.conditionName()},
                             {"lag", state.lag},
                             {"delivered", state.delivered},
                             {"error", textOrNull(state.error)}};
        sink["retry_in_seconds"] = nullptr;
        if (state.retryIn) {
            sink["retry_in_seconds"] = std::chrono::duration<double>(*state.retryIn).count();
        }
        sinks.push_back(std::move(sink));
    }
    return sinks;
}

/// Warnings about logs that are monitored without an error.
ordered_json warningsOf(const LogWatch& watch) {
    ordered_json list = ordered_json::array();
    for (const auto& [log, warnings] : watch.all()) {
        for (const LogWarning& warning : warnings) {
            ordered_json one{{"log", log}};
            one.update(LogWarnings::json(warning));
            list.push_back(std::move(one));
        }
    }
    return list;
}

HttpAnswer setTrace(const HttpRequest& request) {
    TraceScope trace(anchor);
    JsonFields fields(request.body);
    const std::string levels = fields.text("levels");
    fields.refuseUnknown();
    if (levels.size() > longestLevels) {
        fields.refuse("levels", "write at most " + std::to_string(longestLevels) + " bytes");
    }
    if (const Result<void> configured = TraceControl::configure(levels); !configured) {
        fields.refuse("levels", configured.error());
    }
    const std::string inForce = TraceControl::levels();
    trace.always()("Trace levels are now \"%.*s\"%s.", tracedLevels, inForce.c_str(),
                   inForce.size() > tracedLevels ? " and more" : "");
    return answerWith({{"levels", inForce}});
}

HttpAnswer columns(const HttpRequest& request) {
    QueryFields(request).refuseUnknown();
    ordered_json list = ordered_json::array();
    for (const Column& column : columnsOf("RMLOGENT")) {
        const char* const type = column.isNumber ? "number" : column.isTime ? "time" : "text";
        list.push_back({{"name", column.name}, {"type", type}, {"width", column.width}});
    }
    return answerWith(
        {{"columns", std::move(list)}, {"operators", ConditionBuilder::operatorNames()}});
}

/// The agent's log manager waits for this signal, which every thread blocks.
HttpAnswer refresh(const HttpRequest& request) {
    TraceScope trace(anchor);
    JsonFields(request.body).refuseUnknown();
    if (kill(getpid(), SIGHUP) != 0) {
        throw RequestRefused(500, "the agent cannot be notified", "");
    }
    HttpAnswer answer = answerWith({{"status", "asked"}});
    answer.status = 202;
    return answer;
}

} // namespace

AgentResource::AgentResource(Delivery& delivery, const LogWatch& watch)
    : m_delivery(delivery), m_watch(watch), m_started(now()) {}

void AgentResource::addRoutes(Router& router) {
    router.add("GET", "/api/v1/status",
               [this](const HttpRequest& request) { return status(request); });
    router.add("PUT", "/api/v1/trace", setTrace);
    router.add("GET", "/api/v1/columns", columns);
    router.add("POST", "/api/v1/refresh", refresh);
}

HttpAnswer AgentResource::status(const HttpRequest& request) {
    QueryFields(request).refuseUnknown();
    return answerWith({{"version", ZRM_VERSION},
                       {"node", node()},
                       {"started", UtcTime::text(m_started)},
                       {"time", UtcTime::text(now())},
                       {"history", historyOf(m_delivery)},
                       {"queue", queueOf(m_delivery)},
                       {"sinks", sinksOf(m_delivery)},
                       {"warnings", warningsOf(m_watch)},
                       {"trace", TraceControl::levels()}});
}

void HealthResource::addRoutes(Router& router) {
    router.add(
        "GET", "/healthz",
        [problem = m_problem](const HttpRequest&) {
            if (std::string reason = problem(); !reason.empty()) {
                throw RequestRefused(503, std::move(reason), "");
            }
            return HttpAnswer::json(R"({"status":"ok"})");
        },
        Router::PUBLIC, Router::QUICK);
}

} // namespace zrm::host
