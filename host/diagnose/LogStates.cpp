#include "host/diagnose/LogStates.h"

#include "base/TraceScope.h"
#include "host/config/BuiltInSituations.h"
#include "logs/FollowSettings.h"

#include <algorithm>
#include <ctime>
#include <utility>

namespace zrm::host {

namespace {

using std::chrono::seconds;

TRC1_Anchor anchor{"LogStates.cpp"};

constexpr std::int64_t millisecondsPerSecond = 1000;
constexpr int healthyPercent = 90; ///< of lines, before they are called unparsed
constexpr int unparsedPercent = 50;

/// The same time as a clock on the wall shows it, in seconds since 1970.
std::int64_t localTime(std::int64_t wall) {
    const std::time_t time = wall / millisecondsPerSecond;
    std::tm local{};
    return localtime_r(&time, &local) == nullptr ? time : time + local.tm_gmtoff;
}

std::string counted(std::int64_t number, const char* unit) {
    return std::to_string(number) + ' ' + unit + (number == 1 ? "" : "s");
}

/// "45 seconds", "12 minutes", "3 hours 20 minutes", "2 days 4 hours".
std::string duration(seconds length) {
    constexpr std::int64_t minute = 60;
    constexpr std::int64_t hour = 60 * minute;
    constexpr std::int64_t day = 24 * hour;
    const std::int64_t all = length.count();
    const auto two = [all](std::int64_t large, const char* largeUnit, std::int64_t small,
                           const char* smallUnit) {
        const std::int64_t rest = all % large / small;
        return counted(all / large, largeUnit) + (rest == 0 ? "" : ' ' + counted(rest, smallUnit));
    };
    return all < 2 * minute ? counted(all, "second")
           : all < hour     ? counted(all / minute, "minute")
           : all < day      ? two(hour, "hour", minute, "minute")
                            : two(day, "day", hour, "hour");
}

seconds since(LogStates::Clock::time_point begin, LogStates::Clock::time_point now) {
    return std::chrono::duration_cast<seconds>(now - begin);
}

bool hasNoFile(const FollowView& follow) {
    return follow.state == "missing" || follow.state == "waiting";
}

/// A log that never had a file may belong to a program that is not installed: only where silence
/// matters does it matter, too.
bool isWithoutFile(const LogLedgerView& log) {
    const FollowView& follow = *log.follow;
    return follow.state == "missing" || follow.state == "not a file" || !follow.problem.empty() ||
           (log.settings->quiet && hasNoFile(follow));
}

std::string reasonOf(const FollowView& follow) {
    if (!follow.problem.empty()) {
        return follow.problem;
    }
    return hasNoFile(follow) ? "no file has its name" : "it is " + follow.state;
}

int percent(std::int64_t part, std::int64_t whole) {
    return static_cast<int>(100 * part / whole);
}

} // namespace

const char* LogState::situationOf(Kind kind) noexcept {
    return kind == Kind::QUIET  ? BuiltInSituations::quiet
           : kind == Kind::DEAD ? BuiltInSituations::dead
                                : BuiltInSituations::unparsed;
}

LogStates::LogStates(std::map<std::string, std::vector<SilentHour>> rhythms)
    : m_kept(std::move(rhythms)) {}

void LogStates::judge(std::vector<LogLedgerView>& logs, Clock::time_point now, std::int64_t wall) {
    TraceScope trace(anchor);
    for (auto& [path, watched] : m_logs) {
        watched.isSeen = false;
    }
    const std::int64_t local = localTime(wall);
    m_states.clear();
    for (LogLedgerView& log : logs) {
        if (log.follow && log.settings) {
            judge(log, now, local);
        }
    }
    // A log that comes back begins anew: nobody has watched it in the meantime.
    for (auto one = m_logs.begin(); one != m_logs.end();) {
        if (one->second.isSeen) {
            ++one;
            continue;
        }
        one = m_logs.erase(one);
    }
}

LogStates::Watched& LogStates::watched(const LogLedgerView& log, Clock::time_point now) {
    const auto [at, isNew] = m_logs.try_emplace(log.log);
    Watched& watched = at->second;
    watched.isSeen = true;
    if (isNew) {
        if (const auto kept = m_kept.find(log.log); kept != m_kept.end()) {
            watched.rhythm = LogRhythm(kept->second);
        }
        watched.silentSince = watched.windowBegin = now;
        watched.lastEntry = log.lastEntry;
        watched.windowLines = log.lines;
        watched.windowRows = log.rows;
    }
    return watched;
}

void LogStates::judge(LogLedgerView& log, Clock::time_point now, std::int64_t local) {
    Watched& watched = this->watched(log, now);
    log.health = LogHealth::ok;
    judgeSilence(log, watched, now, local);
    judgeLines(log, watched, now);
    judgeFile(log, watched, now);
}

/// Where the operator has not asked for it, nobody hears of it.
void LogStates::addState(const LogLedgerView& log, LogState::Kind kind, std::optional<bool> holds,
                         seconds since, const std::string& text) {
    if (log.settings->quiet) {
        m_states.push_back({log.log, kind, holds, since, text});
    }
}

void LogStates::judgeFile(LogLedgerView& log, Watched& watched, Clock::time_point now) {
    if (!isWithoutFile(log)) {
        watched.deadSince.reset();
        addState(log, LogState::Kind::DEAD, false);
        return;
    }
    if (!watched.deadSince) {
        watched.deadSince = now;
    }
    if (now - *watched.deadSince < longestAbsence) {
        addState(log, LogState::Kind::DEAD, std::nullopt);
        return;
    }
    log.health = LogHealth::dead;
    addState(log, LogState::Kind::DEAD, true, since(*watched.deadSince, now),
             "The log has no file that can be read: " + reasonOf(*log.follow) + '.');
    if (log.settings->quiet && hasNoFile(*log.follow)) {
        log.warnings.push_back(
            {"dead", 0, "No file has had this log's name for a while. The agent waits for one."});
    }
}

void LogStates::judgeLines(LogLedgerView& log, Watched& watched, Clock::time_point now) {
    if (log.lines < watched.windowLines || log.rows < watched.windowRows) { // a new ledger
        watched.windowLines = watched.windowRows = 0;
    }
    const std::int64_t lines = log.lines - watched.windowLines;
    const std::int64_t rows = log.rows - watched.windowRows;
    if (now - watched.windowBegin >= parsedWindow && lines >= fewestLines) {
        const int share = percent(rows, lines);
        const bool wasHealthy =
            watched.isUnparsed ||
            (watched.windowLines >= fewestLines &&
             percent(watched.windowRows, watched.windowLines) >= healthyPercent);
        watched.isUnparsed = wasHealthy && share < unparsedPercent;
        watched.unparsedPercent = share;
        watched.isParsed = share >= unparsedPercent;
        watched.windowBegin = now;
        watched.windowLines = log.lines;
        watched.windowRows = log.rows;
    }
    if (!watched.isUnparsed) {
        addState(log, LogState::Kind::UNPARSED,
                 watched.isParsed ? std::optional(false) : std::nullopt);
    } else {
        log.health = LogHealth::unparsed;
        log.warnings.push_back(
            {"unparsed", 0,
             "Only " + std::to_string(watched.unparsedPercent) +
                 "% of the latest lines match the log's format, and most lines before them did. "
                 "What writes the log may have changed its format; 'zrmctl logs " +
                 log.log + "' shows lines that do not match."});
        addState(log, LogState::Kind::UNPARSED, true, parsedWindow, log.warnings.back().text);
    }
}

void LogStates::judgeSilence(LogLedgerView& log, Watched& watched, Clock::time_point now,
                             std::int64_t local) {
    const QuietRule& rule = log.settings->quiet;
    if (log.lastEntry != watched.lastEntry) {
        if (rule.isLearned) {
            watched.rhythm.add(local - since(watched.silentSince, now).count(), local);
        }
        watched.lastEntry = log.lastEntry;
        watched.silentSince = now;
    }
    if (!rule) {
        return;
    }
    const seconds silence = since(watched.silentSince, now);
    const std::optional<seconds> limit =
        rule.isLearned ? watched.rhythm.limitAt(local) : rule.after;
    // Without an entry in this run, the silence of an earlier one may go on.
    const auto isOver = log.lastEntry ? std::optional(false) : std::nullopt;
    if (!limit || silence < *limit) {
        log.health = limit ? log.health : LogHealth::learning;
        addState(log, LogState::Kind::QUIET, isOver);
    } else {
        log.health = LogHealth::quiet;
        log.warnings.push_back(
            {"quiet", 0,
             "The log has had no entries for " + duration(silence) + ". " +
                 (rule.isLearned
                      ? "At this time of the week it is quiet after " + duration(*limit) +
                            ", by the weeks before."
                      : "The configuration expects one every " + duration(*limit) + '.')});
        addState(log, LogState::Kind::QUIET, true, silence, log.warnings.back().text);
    }
}

std::vector<LogSilence> LogStates::takeLearned() {
    std::vector<LogSilence> learned;
    for (auto& [path, watched] : m_logs) {
        for (const SilentHour& hour : watched.rhythm.takeChanged()) {
            learned.push_back({path, hour});
        }
    }
    return learned;
}

} // namespace zrm::host
