#include "host/diagnose/LogLedgers.h"

#include "base/TraceScope.h"
#include "host/base/UtcTime.h"
#include "host/diagnose/FormatTrial.h"
#include "host/diagnose/LogWarnings.h"
#include "logmgr/LogManager.h"
#include "monitor/LogFile.h"

#include <algorithm>
#include <array>
#include <memory>

#include <nlohmann/json.hpp>

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
    if (const FollowLedger* const follow = log.followLedger()) {
        view.follow = FollowView::of(*follow);
    }
    view.openFile = ledger.file();
    view.bytesRead = ledger.bytesRead();
    // A line is counted before it is found not to fit: in this order there are never more of these.
    view.formatErrors = log.numFormatErrors();
    view.lines = log.numEvents();
    view.rows = view.lines - view.formatErrors;
    view.truncations = ledger.truncations();
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
            {milliseconds(line.time), std::string(line.text, line.length), std::string()});
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

/// Says of each rejected line why it does not fit. A format that is not learned rejects none.
void addReasons(LogLedgerView& view) {
    if (view.rejected.empty()) {
        return;
    }
    if (view.type != 'U') {
        for (LogLedgerView::Rejected& rejected : view.rejected) {
            rejected.reason = "The line does not hold the digits of a time where they belong.";
        }
        return;
    }
    FormatTrial trial(view.procedure, view.log);
    for (LogLedgerView::Rejected& rejected : view.rejected) {
        rejected.reason = trial.isAccepted() ? trial.scan(rejected.line).reason : "";
    }
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

std::string LogLedgers::json(const LogLedgerView& ledger, bool withSamples) {
    nlohmann::ordered_json object{
        {"bytes_read", ledger.bytesRead},
        {"lines", ledger.lines},
        {"rows", ledger.rows},
        {"format_errors", ledger.formatErrors},
        {"without_time", ledger.withoutTime},
        {"truncations", ledger.truncations},
        {"skipped_bytes", ledger.skippedBytes},
        {"restarts", ledger.restarts},
        {"last_entry", nullptr},
    };
    if (ledger.lastEntry) {
        object["last_entry"] = UtcTime::text(*ledger.lastEntry);
    }
    object["follow"] = ledger.follow ? ledger.follow->json(withSamples) : nullptr;
    object["warnings"] = nlohmann::ordered_json::array();
    for (const LogWarning& warning : ledger.warnings) {
        object["warnings"].push_back(LogWarnings::json(warning));
    }
    if (withSamples) {
        object["rejected"] = nlohmann::ordered_json::array();
        for (const LogLedgerView::Rejected& rejected : ledger.rejected) {
            object["rejected"].push_back({{"time", UtcTime::text(rejected.time)},
                                          {"line", rejected.line},
                                          {"reason", rejected.reason}});
        }
        object["skipped"] = nlohmann::ordered_json::array();
        for (const LogLedgerView::Skipped& skipped : ledger.skipped) {
            nlohmann::ordered_json unread;
            if (skipped.unread) {
                unread = *skipped.unread;
            }
            object["skipped"].push_back({{"time", UtcTime::text(skipped.time)},
                                         {"from", skipped.from},
                                         {"to", skipped.to},
                                         {"unread", unread},
                                         {"regrown", skipped.isRegrown}});
        }
    }
    // A line may hold any bytes.
    return object.dump(-1, ' ', false, nlohmann::ordered_json::error_handler_t::replace);
}

} // namespace zrm::host
