#include "host/api/AnalysisResource.h"

#include "host/analysis/Backtest.h"
#include "host/analysis/Explainer.h"
#include "host/analysis/Explanation.h"
#include "host/analysis/LogTail.h"
#include "host/analysis/MonitoredLogs.h"
#include "host/analysis/SeenFields.h"
#include "host/analysis/StoredRow.h"
#include "host/api/EventQuery.h"
#include "host/api/SituationBody.h"
#include "host/base/JsonWriter.h"
#include "host/base/TimeText.h"
#include "host/diagnose/LogWarnings.h"
#include "host/diagnose/LogWatch.h"
#include "host/framework/TraceCapture.h"
#include "host/history/HistoryReader.h"
#include "host/http/JsonFields.h"
#include "host/http/QueryFields.h"
#include "host/http/RequestRefused.h"
#include "host/http/Router.h"
#include "monitor/LogFile.h"

#include <limits>
#include <optional>
#include <utility>

namespace zrm::host {

namespace {

/// The log named in a body, or else the situation's.
LogFile& logOf(const MonitoredLogs& logs, JsonFields& fields, const SituationConfig& situation) {
    const std::optional<std::string> path = fields.optionalText("log");
    if (!path && !situation.log) {
        fields.refuse("log", "is missing; the situation is not limited to one log");
    }
    LogFile* const log = logs.find(path ? *path : *situation.log);
    if (log == nullptr) {
        throw RequestRefused(404, "the agent does not monitor this log", "log");
    }
    return *log;
}

void requireOpen(bool isOpen) {
    if (!isOpen) {
        throw RequestRefused(503, "there are too many requests: try again", "");
    }
}

std::string timeOf(JsonFields& fields, const char* key) {
    const std::optional<std::string> stamp = TimeText::toStamp(fields.text(key));
    if (!stamp) {
        fields.refuse(key, "write a time like 2026-11-20T07:03:09, followed by Z or +01:00 unless "
                           "it is local, or a 16-digit time stamp");
    }
    return *stamp;
}

void write(JsonWriter& json, const Backtest::FoundEpisode& episode) {
    constexpr std::int64_t milliseconds = 1000; // in a second
    json.beginObject().key("first").time(episode.first * milliseconds);
    json.key("last").time(episode.last * milliseconds).member("count", episode.count);
    json.member("over", episode.isOver);
    if (!episode.group.empty()) {
        json.key("group");
        writeGroup(json, episode.group);
    }
    json.endObject();
}

void writeEpisodes(JsonWriter& json, const Backtest::Result& result) {
    json.member("episode_count", result.episodes).key("episodes").beginArray();
    for (const Backtest::FoundEpisode& episode : result.found) {
        write(json, episode);
    }
    json.endArray().member("dropped_groups", result.droppedGroups);
}

} // namespace

void AnalysisResource::addRoutes(Router& router) {
    router.add("POST", "/api/v1/explain",
               [this](const HttpRequest& request) { return explain(request); });
    router.add("POST", "/api/v1/backtest",
               [this](const HttpRequest& request) { return backtest(request); });
    router.add("GET", "/api/v1/fields", &AnalysisResource::fields);
}

HttpAnswer AnalysisResource::fields(const HttpRequest& request) {
    QueryFields query(request);
    const std::optional<std::string> path = query.text("log");
    query.refuseUnknown();
    if (!path) {
        throw RequestRefused(400, "is missing: name a log", "log");
    }
    const TraceSilence silence;
    const MonitoredLogs logs;
    LogFile* const log = logs.find(*path);
    if (log == nullptr) {
        throw RequestRefused(404, "the agent does not monitor this log", "log");
    }
    SeenFields seen;
    if (const Result<void> read = seen.read(*log); !read) {
        throw RequestRefused(409, {read.error().what, read.error().cure, "log"});
    }
    return HttpAnswer::json(JsonWriter::text([&](JsonWriter& json) {
        json.beginObject().member("log", *path);
        seen.write(json);
        json.endObject();
    }));
}

/// The situation that a body names or defines; `otherwise` is the name if it does neither.
AnalysisResource::Subject AnalysisResource::subject(JsonFields& fields,
                                                    const std::string& otherwise) {
    std::optional<std::string> name = fields.optionalText("situation");
    std::optional<JsonFields> definition = fields.optionalObject("definition");
    if (!name && !definition && !otherwise.empty()) {
        name = otherwise;
    }
    if (name.has_value() == definition.has_value()) {
        fields.refuse("situation", "give the name of a situation, or a definition");
    }
    if (definition) {
        return {SituationBody::situation(*definition, "definition")};
    }
    const std::optional<SituationStatus> status = m_situations.find(*name);
    if (!status) {
        throw RequestRefused(404, "there is no situation '" + *name + "'", "situation");
    }
    if (status->state == SituationStatus::FAILED) {
        throw RequestRefused(409, "the situation has failed: " + status->problem, "situation");
    }
    return {status->config, status->state == SituationStatus::STOPPED};
}

HttpAnswer AnalysisResource::explain(const HttpRequest& request) {
    JsonFields fields(request.body);
    const int ways =
        (fields.has("line") ? 1 : 0) + (fields.has("event") ? 1 : 0) + (fields.has("last") ? 1 : 0);
    if (ways != 1) {
        fields.refuse("line", "give one of line, event and last");
    }
    const Explained explained = fields.has("line")    ? explainLine(fields)
                                : fields.has("event") ? explainEvent(fields)
                                                      : explainLast(fields);
    return HttpAnswer::json(JsonWriter::text([&](JsonWriter& json) {
        json.beginObject().key("explanations").beginArray();
        for (const Explanation& explanation : explained.explanations) {
            explanation.write(json);
        }
        json.endArray();
        explained.reach.write(json);
        json.key("warnings").beginArray();
        for (const LogWarning& warning : m_watch.of(explained.log)) {
            json.beginObject();
            warning.write(json);
            json.endObject();
        }
        json.endArray().endObject();
    }));
}

AnalysisResource::Explained AnalysisResource::explainLine(JsonFields& fields) {
    Subject wanted = subject(fields);
    const std::string line = fields.text("line");
    if (line.size() > LogTail::longestLine || line.find('\n') != std::string::npos) {
        fields.refuse("line", "write one line of at most " + std::to_string(LogTail::longestLine) +
                                  " bytes");
    }
    const TraceSilence silence;
    const MonitoredLogs logs;
    LogFile& log = logOf(logs, fields, wanted.situation);
    fields.refuseUnknown();
    if (!LogTail(log).hasLines()) {
        fields.refuse("line", "the log has no lines; use last");
    }
    Explainer explainer(std::move(wanted.situation), wanted.isStopped, m_entries);
    requireOpen(explainer.isOpen());
    auto explanations = explainer.line(log, line);
    if (!explanations) {
        throw RequestRefused(503, {explanations.error().what, explanations.error().cure, "line"});
    }
    return {std::move(*explanations), explainer.reach(), log.fileNameUTF8()};
}

AnalysisResource::Explained AnalysisResource::explainLast(JsonFields& fields) {
    Subject wanted = subject(fields);
    const auto number = static_cast<std::size_t>(
        fields.number("last", 1, static_cast<std::int64_t>(Explainer::mostEntries)));
    const std::string until = fields.has("to") ? timeOf(fields, "to") : "";
    const TraceSilence silence;
    const MonitoredLogs logs;
    LogFile& log = logOf(logs, fields, wanted.situation);
    fields.refuseUnknown();
    Explainer explainer(std::move(wanted.situation), wanted.isStopped, m_entries);
    requireOpen(explainer.isOpen());
    auto explanations = explainer.last(log, number, until);
    if (!explanations) {
        throw RequestRefused(409, {explanations.error().what, explanations.error().cure, "log"});
    }
    return {std::move(*explanations), explainer.reach(), log.fileNameUTF8()};
}

AnalysisResource::Explained AnalysisResource::explainEvent(JsonFields& fields) {
    const auto id = static_cast<std::uint64_t>(
        fields.number("event", 1, std::numeric_limits<std::int64_t>::max()));
    if (m_history == nullptr) {
        throw RequestRefused(409, "the history is off", "event");
    }
    const std::optional<StoredEvent> event = EventQuery::valueOf(m_history->event(id));
    if (!event) {
        throw RequestRefused(404, "the history does not contain this event", "event");
    }
    const bool isNamed = !fields.has("definition");
    Subject wanted = subject(fields, event->situation);
    fields.refuseUnknown();
    const bool isOwn = isNamed && wanted.situation.name == event->situation;
    const bool isOfAbsence = wanted.situation.judgement.absent > 0;
    const TraceSilence silence;
    Explainer explainer(std::move(wanted.situation), wanted.isStopped, m_entries);
    requireOpen(explainer.isOpen());
    Explainer::EventEntry entry{id, isOwn, {}};
    if (!StoredRow::fill(entry.row, explainer.layout(), event->json)) {
        throw RequestRefused(
            409,
            isOfAbsence ? "no entry raised this event, but their absence: ask for the last "
                          "entries of the log"
                        : "no entry raised this event, so there is none to explain: ask "
                          "for the event that raised the episode",
            "event");
    }
    entry.text = StoredRow::entryText(event->json);
    entry.fields = StoredRow::entryFields(event->json);
    const MonitoredLogs logs;
    std::vector<Explanation> explanations{explainer.event(logs.find(event->log), entry)};
    return {std::move(explanations), explainer.reach(), event->log};
}

HttpAnswer AnalysisResource::backtest(const HttpRequest& request) {
    JsonFields fields(request.body);
    const Subject wanted = subject(fields);
    const std::string from = timeOf(fields, "from");
    const std::string to = timeOf(fields, "to");
    fields.refuseUnknown();
    if (from > to) {
        fields.refuse("to", "is before from");
    }
    if (!m_room.try_acquire()) {
        throw RequestRefused(503, "two backtests are already running: try again", "");
    }
    struct Release {
        std::counting_semaphore<2>& room;
        ~Release() { room.release(); }
    } const release{m_room};
    const TraceSilence silence;
    const MonitoredLogs logs;
    std::vector<LogFile*> read;
    if (wanted.situation.log) {
        read.push_back(logs.find(*wanted.situation.log));
        if (read.front() == nullptr) {
            throw RequestRefused(404, "the agent does not monitor the situation's log", "log");
        }
    } else {
        read = logs.all();
    }
    Backtest test(wanted.situation, m_entries);
    requireOpen(test.isOpen());
    const Backtest::Result result = test.run(read, from, to, [&] {
        return m_isCancelled.load(std::memory_order_relaxed) || logs.areWanted();
    });
    if (result.isTruncated && logs.areWanted()) {
        throw RequestRefused(503, "the agent is re-reading its log configuration: try again", "");
    }
    return HttpAnswer::json(JsonWriter::text([&](JsonWriter& json) {
        json.beginObject().member("entries", result.entries).member("matched", result.matched);
        json.member("raised", result.raised).member("truncated", result.isTruncated);
        json.member("raised_at", result.raisedAt).member("decision", result.decision);
        if (wanted.situation.judgement.isUsed()) {
            writeEpisodes(json, result);
        }
        result.reach.write(json);
        json.endObject();
    }));
}

} // namespace zrm::host
