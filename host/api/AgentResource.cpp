#include "host/api/AgentResource.h"

#include "base/TraceScope.h"
#include "host/base/JsonWriter.h"
#include "host/base/TimeText.h"
#include "host/config/Columns.h"
#include "host/config/ConditionBuilder.h"
#include "host/delivery/Delivery.h"
#include "host/diagnose/LogWarnings.h"
#include "host/diagnose/LogWatch.h"
#include "host/events/AgentNode.h"
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

namespace zrm::host {

namespace {

TRC1_Anchor anchor{"AgentResource.cpp"};

constexpr std::size_t longestLevels = 4096; ///< bytes
constexpr int tracedLevels = 200;           ///< bytes of the levels shown in the trace

void writeHistory(JsonWriter& json, Delivery& delivery) {
    HistoryReader* const reader = delivery.history();
    HistoryState state;
    if (reader != nullptr) {
        state = reader->state();
    } else {
        state.problem = delivery.historyProblem();
    }
    json.beginObject().member("enabled", reader != nullptr).member("events", state.events);
    json.member("oldest", state.oldest).member("newest", state.newest);
    json.member("bytes", state.bytes).member("damaged", state.damaged);
    json.textOrNull("problem", state.problem).endObject();
}

void writeQueue(JsonWriter& json, const Delivery& delivery) {
    const QueueState state = delivery.queueState();
    json.beginObject().member("size", state.size).member("capacity", state.capacity);
    json.member("waits", state.waits);
    json.member("waited_seconds", std::chrono::duration<double>(state.waited).count());
    json.endObject();
}

void writeSinks(JsonWriter& json, const Delivery& delivery) {
    json.beginArray();
    for (const SinkState& state : delivery.sinkStates()) {
        json.beginObject().member("name", state.name).member("type", state.type);
        json.member("state", state.conditionName()).member("lag", state.lag);
        json.member("delivered", state.delivered).textOrNull("error", state.error);
        json.key("retry_in_seconds");
        state.retryIn ? json.value(std::chrono::duration<double>(*state.retryIn).count())
                      : json.null();
        json.endObject();
    }
    json.endArray();
}

/// Warnings about logs that are monitored without an error.
void writeWarnings(JsonWriter& json, const LogWatch& watch) {
    json.beginArray();
    for (const auto& [log, warnings] : watch.all()) {
        for (const LogWarning& warning : warnings) {
            json.beginObject().member("log", log);
            warning.write(json);
            json.endObject();
        }
    }
    json.endArray();
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
    return HttpAnswer::json(JsonWriter::text(
        [&](JsonWriter& json) { json.beginObject().member("levels", inForce).endObject(); }));
}

HttpAnswer columns(const HttpRequest& request) {
    QueryFields(request).refuseUnknown();
    return HttpAnswer::json(JsonWriter::text([](JsonWriter& json) {
        json.beginObject().key("columns").beginArray();
        for (const Column& column : columnsOf("RMLOGENT")) {
            const char* const type = column.isNumber ? "number" : column.isTime ? "time" : "text";
            json.beginObject().member("name", column.name).member("type", type);
            json.member("width", column.width).endObject();
        }
        json.endArray().member("operators", ConditionBuilder::operatorNames()).endObject();
    }));
}

/// The agent's log manager waits for this signal, which every thread blocks.
HttpAnswer refresh(const HttpRequest& request) {
    TraceScope trace(anchor);
    JsonFields(request.body).refuseUnknown();
    if (kill(getpid(), SIGHUP) != 0) {
        throw RequestRefused(500, "the agent cannot be notified", "");
    }
    HttpAnswer answer = HttpAnswer::json(R"({"status":"asked"})");
    answer.status = 202;
    return answer;
}

} // namespace

AgentResource::AgentResource(Delivery& delivery, const LogWatch& watch)
    : m_delivery(delivery), m_watch(watch), m_started(WallClock::now()) {}

void AgentResource::addRoutes(Router& router) {
    router.add("GET", "/api/v1/status",
               [this](const HttpRequest& request) { return status(request); });
    router.add("PUT", "/api/v1/trace", setTrace);
    router.add("GET", "/api/v1/columns", columns);
    router.add("POST", "/api/v1/refresh", refresh);
}

HttpAnswer AgentResource::status(const HttpRequest& request) {
    QueryFields(request).refuseUnknown();
    return HttpAnswer::json(JsonWriter::text([this](JsonWriter& json) {
        json.beginObject().member("version", ZRM_VERSION).member("node", AgentNode::name());
        json.key("started").time(m_started).key("time").time(WallClock::now());
        json.key("history");
        writeHistory(json, m_delivery);
        json.key("queue");
        writeQueue(json, m_delivery);
        json.key("sinks");
        writeSinks(json, m_delivery);
        json.key("warnings");
        writeWarnings(json, m_watch);
        json.member("trace", TraceControl::levels()).endObject();
    }));
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
