#include "host/analysis/Backtest.h"

#include "base/TraceScope.h"
#include "host/analysis/LogReport.h"
#include "host/analysis/MonitoredLogs.h"
#include "host/base/TimeText.h"
#include "host/framework/RequestLimit.h"
#include "logs/EntryClock.h"
#include "logs/FollowSettings.h"
#include "logs/RequestThresholds.h"
#include "logtypes/EntryReader.h"
#include "logtypes/FollowedReport.h"
#include "logtypes/SourceReport.h"
#include "monitor/LogFile.h"
#include "monitor/ReportOutcome.h"

#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <string_view>
#include <utility>

namespace zrm::host {

namespace {

TRC1_Anchor anchor{"Backtest.cpp"};

constexpr std::uint64_t entriesPerLook = 1024; ///< between two looks at the clock

/// Later than the time of any entry.
constexpr std::string_view never = "9999999999999999";

constexpr char errorLog = 'E';

std::string times(std::uint64_t number) {
    return number == 1 ? "once" : std::to_string(number) + " times";
}

std::string entriesText(std::uint64_t number) {
    return std::to_string(number) + (number == 1 ? " entry" : " entries");
}

/// "2026-11-20 07:03:09" of a 16-character time.
std::string readable(const std::string& stamp) {
    return (stamp[0] == '0' ? "19" : "20") + stamp.substr(1, 2) + '-' + stamp.substr(3, 2) + '-' +
           stamp.substr(5, 2) + ' ' + stamp.substr(7, 2) + ':' + stamp.substr(9, 2) + ':' +
           stamp.substr(11, 2);
}

} // namespace

/// What ends the reading early.
struct Backtest::Limits {
    const std::function<bool()>& isCancelled;
    std::chrono::steady_clock::time_point deadline = std::chrono::steady_clock::now() + patience;

    std::uint64_t looked = 0; ///< entries read, including those after the last time
    const char* reason = "";  ///< which limit was reached

    bool areReached(const Result& result, const TextPool& texts) {
        if (texts.bytes() > mostValues) {
            reason = "the entries have too many different values to group by";
        } else if (result.entries >= mostEntries || result.matched >= mostMatched) {
            reason = "the backtest has read as many entries as it may";
        } else if (looked++ % entriesPerLook == 0) {
            isTimeUp();
        }
        return *reason != '\0';
    }
    bool isTimeUp() {
        if (isCancelled()) {
            reason = "the backtest was cancelled";
        } else if (std::chrono::steady_clock::now() >= deadline) {
            reason = "the backtest has taken as long as it may";
        }
        return *reason != '\0';
    }
};

/// Judges the entries of a followed log as its files are read.
class Backtest::Entries : public FollowedReport::Receiver {
public:
    Entries(Backtest& test, std::shared_ptr<const FollowSettings> settings, Limits& limits,
            Result& result)
        : m_test(test), m_settings(std::move(settings)), m_limits(limits), m_result(result),
          m_first(test.m_matched.size()) {}

    void begin(bool isOldestFirst) override {
        end();
        m_isOldestFirst = isOldestFirst;
        m_clock.emplace(m_settings, isOldestFirst ? EntryClock::Reading::forward
                                                  : EntryClock::Reading::backward);
    }
    bool meets(zrm_rmlogent_data_t& row) override {
        if (m_limits.areReached(m_result, m_test.m_texts)) {
            return false;
        }
        const std::int64_t instant = m_clock->next(lastEntryMoment, row.entrytime);
        ++m_result.entries;
        if (m_test.m_replay.matches(row)) {
            ++m_result.matched;
            m_test.add(row, instant);
        }
        return false; // no row is kept
    }
    void give(const zrm_rmlogent_data_t&, const FollowedReport::Detail&) override {}
    void progress(std::int64_t, std::int64_t) override {}

    /// What the last file had is newest first from now on.
    void end() {
        auto& matched = m_test.m_matched;
        if (m_isOldestFirst) {
            std::reverse(matched.begin() + static_cast<std::ptrdiff_t>(m_first), matched.end());
        }
        m_first = matched.size();
    }

private:
    Backtest& m_test;
    const std::shared_ptr<const FollowSettings> m_settings;
    Limits& m_limits;
    Result& m_result;
    std::size_t m_first; ///< match of the file
    bool m_isOldestFirst = false;
    std::optional<EntryClock> m_clock;
};

Backtest::Result Backtest::run(const std::vector<LogFile*>& logs, const std::string& from,
                               const std::string& to, const std::function<bool()>& isCancelled) {
    TraceScope trace(anchor);
    Result result;
    Limits limits{isCancelled};
    m_matched.clear();
    m_texts = {};
    for (LogFile* const log : logs) {
        const auto entries = log->followSettings() ? EntryReader::of(*log) : nullptr;
        if (log->isSource()) {
            SourceReport report(*log, {from, to});
            judge(*log, report, limits, result);
        } else if (entries) {
            readFollowed(*log, *entries, from, to, limits, result);
        } else {
            read(*log, from, to, limits, result);
        }
        if (result.isTruncated) {
            break;
        }
    }
    replay(from, to, result);
    result.decision = m_replay.isOfAbsence() ? absenceDecision(result) : decisionOf(result);
    if (!result.reach.isComplete()) {
        result.decision += "; older entries were not examined: " + result.reach.reason;
    }
    result.decision += '.';
    return result;
}

void Backtest::read(LogFile& log, const std::string& from, const std::string& to, Limits& limits,
                    Result& result) {
    TraceScope trace(anchor);
    _RequestThresholds window{};
    from.copy(window.startTime, sizeof window.startTime - 1);
    // With an end, a log would skip the entries after it in one go, which nothing could
    // interrupt. The error log's command needs the end as its argument.
    const std::string_view end = log.type() == errorLog ? std::string_view(to) : never;
    end.copy(window.endTime, sizeof window.endTime - 1);
    const ReportOutcome outcome(ReportedFile::monitored);
    Reach reach;
    void* report = MonitoredLogs::isReadable(log) ? log.startReportRequest(&window) : nullptr;
    if (report == nullptr) {
        ReportOutcome::note(ReportEnd::notRead); // unless the log is empty
        reach.reason = outcome.reason();
        addReach(log, std::move(reach), result);
        return;
    }
    const auto row = std::make_unique<zrm_rmlogent_data_t>();
    const bool isFollowed = log.followSettings() != nullptr;
    EntryClock clock(log.followSettings(), EntryClock::Reading::backward);
    const std::size_t first = m_matched.size();
    while (log.getNextLogEntry(row.get(), report, &window) != nullptr) {
        if (limits.areReached(result, m_texts)) {
            result.isTruncated = true;
            break;
        }
        std::optional<std::int64_t> instant;
        if (isFollowed) {
            instant = clock.next(lastEntryMoment, row->entrytime);
        }
        if (std::memcmp(row->entrytime, to.data(), sizeof row->entrytime) > 0) {
            continue;
        }
        ++result.entries;
        reach.reached.assign(row->entrytime, sizeof row->entrytime);
        if (m_replay.matches(*row)) {
            ++result.matched;
            add(*row, instant);
        }
    }
    if (isFollowed) {
        keepOrder(first);
    }
    log.endReportRequest(&report);
    reach.reason = result.isTruncated ? limits.reason : outcome.reason();
    addReach(log, std::move(reach), result);
}

/// Ends with the request, the limits, or the oldest generation that has entries of these times.
void Backtest::readFollowed(const LogFile& log, EntryReader& entries, const std::string& from,
                            const std::string& to, Limits& limits, Result& result) {
    TraceScope trace(anchor);
    const auto& settings = log.followSettings();
    FollowedReport report(log.fileNameLocal(), entries,
                          {from, to, 1, settings->rotatedTo, settings->join.value});
    judge(log, report, limits, result);
}

template <typename Report>
void Backtest::judge(const LogFile& log, Report& report, Limits& limits, Result& result) {
    RequestLimit* const outer = RequestLimit::current();
    const RequestLimit limit(limits.deadline, [&] {
        return limits.isTimeUp() || (outer != nullptr && outer->isReached());
    });
    Entries judged(*this, log.followSettings(), limits, result);
    const std::size_t first = m_matched.size();
    report.run(judged);
    judged.end();
    keepOrder(first);
    result.isTruncated = report.isCancelled() || *limits.reason != '\0';
    addReach(log, {report.reached(), *limits.reason != '\0' ? limits.reason : reasonOf(report)},
             result);
}

void Backtest::add(const zrm_rmlogent_data_t& row, std::optional<std::int64_t> instant) {
    Matched& matched = m_matched.emplace_back();
    std::memcpy(matched.time.data(), row.entrytime, matched.time.size());
    matched.order = matched.time;
    matched.instant = instant;
    if (m_replay.isJudged()) {
        const Replay::Values values = m_replay.valuesOf(row);
        matched.group = m_texts.add(values.group);
        matched.distinct = m_texts.add(values.distinct);
        matched.log = m_texts.add(values.log);
        matched.mayRaise = values.mayRaise;
    }
}

/// The first log that was not read whole decides; how far all were read, the one read least.
void Backtest::addReach(const LogFile& log, Reach reach, Result& result) {
    Reach& all = result.reach;
    const std::string reason =
        reach.isComplete() ? "" : std::string(log.fileNameUTF8()) + ": " + reach.reason;
    if (all.isComplete() && reach.isComplete()) {
        const bool isOlder = all.reached.empty() || reach.reached < all.reached;
        if (!reach.reached.empty() && isOlder) {
            all.reached = reach.reached;
        }
    } else if (all.isComplete()) {
        all = {reach.reached, reason};
    } else if (!reach.isComplete() && !all.reached.empty() &&
               (reach.reached.empty() || reach.reached > all.reached)) {
        all.reached = reach.reached;
    }
}

/// Entries of a followed log from this one on stay in the log's order: they count as they are read,
/// also where their times go back.
void Backtest::keepOrder(std::size_t first) {
    Stamp newest{};
    for (std::size_t index = m_matched.size(); index-- > first;) {
        newest = std::max(newest, m_matched[index].order);
        m_matched[index].order = newest;
    }
}

Replay::Verdict Backtest::count(const Matched& matched) {
    Replay::Values values;
    if (m_replay.isJudged()) {
        values = {m_texts.text(matched.group), m_texts.text(matched.distinct),
                  m_texts.text(matched.log), matched.mayRaise};
    }
    if (!matched.instant) {
        return m_replay.count(matched.time.data(), values);
    }
    const EntryInstant instant(*matched.instant);
    return m_replay.count(matched.time.data(), values);
}

/// Entries are expected from the first time on, or where reading has ended: what a log held before
/// that is not known.
void Backtest::beginAbsence(const std::string& from, const Result& result) {
    if (const auto begin = Replay::timeOf(std::max(from, result.reach.reached))) {
        m_replay.beginAt(*begin);
    }
}

/// Until the last time, or until now.
void Backtest::endAbsence(const std::string& to) {
    const std::int64_t now = WallClock::seconds();
    m_replay.endAt(std::min(Replay::timeOf(to).value_or(now), now));
}

void Backtest::addAbsences(Result& result) {
    constexpr std::int64_t milliseconds = 1000; // in a second
    for (const FoundAbsence& absence : m_replay.takeRaised()) {
        ++result.raised;
        const auto stamp = TimeText::toStamp(UtcTime::text(absence.raised * milliseconds));
        if (stamp && result.raisedAt.size() < mostTimes) {
            result.raisedAt.push_back(*stamp);
        }
    }
}

void Backtest::replay(const std::string& from, const std::string& to, Result& result) {
    TraceScope trace(anchor);
    // Entries of one second stay as the log has them, which is newest first here.
    std::reverse(m_matched.begin(), m_matched.end());
    std::stable_sort(
        m_matched.begin(), m_matched.end(),
        [](const Matched& left, const Matched& right) { return left.order < right.order; });
    if (m_replay.isOfAbsence()) {
        beginAbsence(from, result);
    }
    for (const Matched& matched : m_matched) {
        if (count(matched).isRaised) {
            ++result.raised;
            if (result.raisedAt.size() < mostTimes) {
                result.raisedAt.emplace_back(matched.time.data(), matched.time.size());
            }
        }
        if (m_replay.isJudged()) {
            addAbsences(result);
            addEpisodes(m_replay.takeEnded(), true, result);
        }
    }
    if (m_replay.isOfAbsence()) {
        endAbsence(to);
        addAbsences(result);
    }
    if (m_replay.isJudged()) {
        listEpisodes(result);
    }
}

void Backtest::listEpisodes(Result& result) {
    addEpisodes(m_replay.takeLasting(), false, result);
    result.droppedGroups = m_replay.droppedGroups();
    std::sort(result.found.begin(), result.found.end(),
              [](const FoundEpisode& left, const FoundEpisode& right) {
                  return left.first < right.first;
              });
    if (result.found.size() > mostEpisodes) {
        result.found.resize(mostEpisodes);
    }
}

/// Those that have not ended by later entries are over if nothing more has come until now.
void Backtest::addEpisodes(const std::vector<EndedEpisode>& episodes, bool areOver,
                           Result& result) {
    const std::int64_t now = WallClock::seconds();
    for (const EndedEpisode& ended : episodes) {
        const Episode& episode = ended.episode;
        ++result.episodes;
        result.found.push_back(
            {episode.first, episode.last, episode.count, m_replay.groupValues(ended.group),
             areOver || (m_resolveAfter > 0 && episode.last + m_resolveAfter <= now)});
    }
    if (result.found.size() > 2 * mostEpisodes) {
        // The order of their ends is nearly that of their beginnings.
        std::nth_element(
            result.found.begin(), result.found.begin() + static_cast<std::ptrdiff_t>(mostEpisodes),
            result.found.end(), [](const FoundEpisode& left, const FoundEpisode& right) {
                return left.first < right.first;
            });
        result.found.resize(mostEpisodes);
    }
}

std::string Backtest::decisionOf(const Result& result) const {
    const std::string of = entriesText(result.entries);
    std::string text;
    if (result.raised > 0) {
        text = "Would have been raised " + times(result.raised) + ", first at " +
               readable(result.raisedAt.front()) + ": " + std::to_string(result.matched) + " of " +
               of + (result.matched == 1 ? " meets" : " meet") + " every condition";
    } else if (result.entries == 0) {
        text = "Would not have been raised: there are no entries between these times";
    } else if (result.matched == 0) {
        text = "Would not have been raised: none of " + of + " meets every condition";
    } else {
        text = "Would not have been raised: " + std::to_string(result.matched) + " of " + of +
               (result.matched == 1 ? " meets" : " meet") + " every condition, but never " +
               (m_replay.frequency() < 0 ? "<= " : ">= ") +
               std::to_string(std::abs(m_replay.frequency())) + " in " +
               std::to_string(m_replay.periodSeconds()) + " s" +
               (m_then.empty() ? "" : " before one with " + m_then);
    }
    return text;
}

std::string Backtest::absenceDecision(const Result& result) const {
    const std::string of = std::to_string(result.matched) + " of " + entriesText(result.entries) +
                           (result.matched == 1 ? " meets" : " meet") + " every condition";
    if (result.raised == 0) {
        return "Would not have been raised: " + of + ", and never was there none for " + m_absent;
    }
    return "Would have been raised " + times(result.raised) + ", first at " +
           readable(result.raisedAt.front()) + ", since no entry had come for " + m_absent + ": " +
           of;
}

} // namespace zrm::host
