#include "host/diagnose/LogLedgers.h"

#include "base/TraceScope.h"
#include "host/base/JsonWriter.h"
#include "host/diagnose/FormatTrial.h"
#include "host/diagnose/LogWarnings.h"
#include "logmgr/LogManager.h"
#include "logs/FollowSettings.h"
#include "monitor/FollowLedger.h"
#include "monitor/LogFile.h"

#include <algorithm>
#include <array>
#include <cctype>
#include <cmath>
#include <memory>

namespace zrm::host {

namespace {

TRC1_Anchor anchor{"LogLedgers.cpp"};

constexpr std::int64_t nanoseconds = 1'000'000;

/// Holds the chain of logs still.
class ChainOfLogs {
public:
    explicit ChainOfLogs(LogManager& manager) : m_manager(manager) { m_manager.beginRequest(); }
    ~ChainOfLogs() { m_manager.endRequest(); }
    ChainOfLogs(const ChainOfLogs&) = delete;
    ChainOfLogs& operator=(const ChainOfLogs&) = delete;

private:
    LogManager& m_manager;
};

std::int64_t milliseconds(const std::timespec& time) {
    return std::int64_t{time.tv_sec} * 1000 + time.tv_nsec / nanoseconds;
}

LogLedgerView numbersOf(const LogFile& log) {
    const LogLedger& ledger = log.ledger();
    LogLedgerView view;
    view.log = log.fileNameUTF8();
    view.file = log.fileNameLocal();
    view.type = log.type();
    view.procedure = log.procedure();
    view.truncations = ledger.truncations();
    view.settings = log.followSettings();
    if (const FollowLedger* const follow = log.followLedger()) {
        view.follow = FollowView::of(*follow);
        view.truncations = follow->truncations();
    }
    view.openFile = ledger.file();
    view.bytesRead = ledger.bytesRead();
    // A line is counted before it is found not to fit: in this order there are never more of these.
    view.formatErrors = log.numFormatErrors();
    view.lines = log.numEvents();
    view.rows = view.lines - view.formatErrors;
    view.skippedBytes = ledger.skippedBytes();
    view.withoutTime = ledger.withoutTime();
    view.restarts = ledger.restarts();
    if (const std::int64_t time = ledger.lastEntry(); time != 0) {
        view.lastEntry = time / nanoseconds;
    }
    return view;
}

void addSamples(LogLedgerView& view, const LogLedger& ledger) {
    const auto lines = std::make_unique<std::array<LogLedger::RejectedLine, LogLedger::mostKept>>();
    const std::size_t lineCount = ledger.copyRejected(lines->data());
    for (std::size_t i = 0; i < lineCount; ++i) {
        const LogLedger::RejectedLine& line = (*lines)[i];
        view.rejected.push_back(
            {milliseconds(line.time), std::string(line.text, line.length), line.reason});
    }
    std::array<LineShapes::Shape, LineShapes::mostKept> shapes;
    const std::size_t shapeCount = ledger.copyShapes(shapes.data());
    for (std::size_t i = 0; i < shapeCount; ++i) {
        view.shapes.push_back({std::string(shapes[i].view()), shapes[i].count});
    }
    std::array<LogLedger::SkippedRange, LogLedger::mostKept> ranges;
    const std::size_t rangeCount = ledger.copySkipped(ranges.data());
    for (std::size_t i = 0; i < rangeCount; ++i) {
        const LogLedger::SkippedRange& range = ranges[i];
        view.skipped.push_back({milliseconds(range.time), range.from, range.to,
                                range.unread < 0 ? std::nullopt : std::optional(range.unread),
                                range.kind == LogLedger::Truncation::regrown});
    }
}

/// A clause as a sentence.
std::string sentence(std::string clause) {
    if (!clause.empty()) {
        clause.front() =
            static_cast<char>(std::toupper(static_cast<unsigned char>(clause.front())));
        clause += '.';
    }
    return clause;
}

/// Says of each rejected line why it does not fit. A format that is not learned rejects none.
void addReasons(LogLedgerView& view) {
    if (view.rejected.empty()) {
        return;
    }
    if (view.settings && view.settings->format) {
        for (LogLedgerView::Rejected& rejected : view.rejected) {
            rejected.reason = sentence(std::move(rejected.reason));
        }
        return;
    }
    if (view.type != 'U') {
        for (LogLedgerView::Rejected& rejected : view.rejected) {
            rejected.reason = "The line does not hold the digits of a time where they belong.";
        }
        return;
    }
    FormatTrial trial(view.procedure, view.log, view.settings);
    for (LogLedgerView::Rejected& rejected : view.rejected) {
        rejected.reason = trial.isAccepted() ? trial.scan(rejected.line).reason : "";
    }
}

std::string_view nameOf(LogHealth health) noexcept {
    switch (health) {
    case LogHealth::learning:
        return "learning";
    case LogHealth::quiet:
        return "quiet";
    case LogHealth::unparsed:
        return "unparsed";
    case LogHealth::dead:
        return "dead";
    case LogHealth::ok:
        break;
    }
    return "ok";
}

/// The share of lines that matched the format, in percent with one decimal. Rounded down, so that
/// 100 means all.
double percentParsed(const LogLedgerView& ledger) {
    return std::floor(1000.0 * static_cast<double>(ledger.rows) /
                      static_cast<double>(ledger.lines)) /
           10;
}

void writeSamples(JsonWriter& json, const LogLedgerView& ledger) {
    json.key("rejected").beginArray();
    for (const LogLedgerView::Rejected& rejected : ledger.rejected) {
        json.beginObject().key("time").time(rejected.time);
        json.member("line", rejected.line).member("reason", rejected.reason).endObject();
    }
    json.endArray().key("shapes").beginArray();
    for (const LogLedgerView::RejectedShape& shape : ledger.shapes) {
        json.beginObject().member("shape", shape.shape).member("count", shape.count).endObject();
    }
    json.endArray().key("skipped").beginArray();
    for (const LogLedgerView::Skipped& skipped : ledger.skipped) {
        json.beginObject().key("time").time(skipped.time);
        json.member("from", skipped.from).member("to", skipped.to);
        json.member("unread", skipped.unread).member("regrown", skipped.isRegrown).endObject();
    }
    json.endArray();
}

} // namespace

std::vector<LogLedgerView> LogLedgers::read(std::string_view log) {
    TraceScope trace(anchor);
    std::vector<LogLedgerView> views;
    LogManager* const manager = pTheLogManager;
    if (manager == nullptr) {
        return views;
    }
    {
        const ChainOfLogs held(*manager);
        LogFile* file = nullptr;
        unsigned given = 0;
        while ((file = manager->getNextLogObject(file, given++)) != nullptr) {
            if (!log.empty() && log != file->fileNameUTF8()) {
                continue;
            }
            views.push_back(numbersOf(*file));
            if (!log.empty()) {
                addSamples(views.back(), file->ledger());
            }
        }
    }
    for (LogLedgerView& view : views) {
        addReasons(view);
    }
    return views;
}

void LogWarning::write(JsonWriter& json) const {
    json.member("kind", kind).key("since").time(since).member("text", text);
}

void LogLedgers::write(JsonWriter& json, const LogLedgerView& ledger, bool withSamples) {
    json.beginObject().member("bytes_read", ledger.bytesRead);
    json.member("lines", ledger.lines).member("rows", ledger.rows);
    json.member("format_errors", ledger.formatErrors).key("percent_parsed");
    ledger.lines > 0 ? json.value(percentParsed(ledger)) : json.null();
    json.member("without_time", ledger.withoutTime);
    json.member("truncations", ledger.truncations).member("skipped_bytes", ledger.skippedBytes);
    json.member("restarts", ledger.restarts).key("last_entry");
    ledger.lastEntry ? json.time(*ledger.lastEntry) : json.null();
    json.key("follow");
    ledger.follow ? ledger.follow->write(json, withSamples) : static_cast<void>(json.null());
    if (ledger.health) {
        json.member("health", nameOf(*ledger.health));
    }
    json.key("warnings").beginArray();
    for (const LogWarning& warning : ledger.warnings) {
        json.beginObject();
        warning.write(json);
        json.endObject();
    }
    json.endArray();
    if (withSamples) {
        writeSamples(json, ledger);
    }
    json.endObject();
}

} // namespace zrm::host
