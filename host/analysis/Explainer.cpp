#include "host/analysis/Explainer.h"

#include "base/TraceScope.h"
#include "host/analysis/LineEntry.h"
#include "host/analysis/LogTail.h"
#include "host/analysis/StoredRow.h"
#include "host/base/TimeText.h"
#include "host/events/RowJson.h"
#include "host/events/RowText.h"
#include "logs/EntryClock.h"

#include <algorithm>
#include <cstdlib>
#include <deque>
#include <optional>
#include <string_view>
#include <utility>

namespace zrm::host {

namespace {

TRC1_Anchor anchor{"Explainer.cpp"};

std::string stampOf(const zrm_rmlogent_data_t& row) {
    return {row.entrytime, sizeof row.entrytime};
}

std::vector<Condition> withoutThresholds(std::vector<Condition> conditions) {
    std::erase_if(conditions,
                  [](const Condition& condition) { return isThresholdColumn(condition.column); });
    return conditions;
}

std::string numberOf(long count, const char* one, const char* several) {
    return std::to_string(count) + ' ' + (count == 1 ? one : several);
}

/// Whether a line, of which a piece is given, may be the entry of an event, which has its text as
/// far as it is kept.
bool isSameText(std::string_view line, std::string_view text) {
    std::string room;
    line.remove_suffix(line.ends_with('\r') ? 1 : 0);
    const std::string_view shown = RowText::ofLocal(line, room);
    const std::size_t length = std::min(shown.size(), text.size());
    return shown.substr(0, length) == text.substr(0, length);
}

constexpr std::int64_t millisecondsPerSecond = 1000;

/// " of ip=10.0.0.1, user=root"; empty without groups.
std::string groupText(const std::vector<GroupValue>& group) {
    std::string text;
    for (const GroupValue& one : group) {
        text += (text.empty() ? " of " : ", ") + one.name + '=' + one.value;
    }
    return text;
}

std::string boundOf(const Replay& replay) {
    return (replay.frequency() < 0 ? "<= " : ">= ") + std::to_string(std::abs(replay.frequency()));
}

} // namespace

struct Explainer::Seen {
    std::optional<std::string> line;
    std::string record;              ///< if it is not a line
    std::unique_ptr<KeptEntry> kept; ///< if it is of a log that is not a file
    std::optional<std::uint64_t> event;
    bool isRow = false;
    zrm_rmlogent_data_t row{};
    Replay::Verdict verdict;
};

Explainer::Explainer(SituationConfig situation, bool isStopped, TableManager& entries)
    : m_situation(std::move(situation)), m_isStopped(isStopped), m_entries(entries),
      m_replay(m_situation, entries) {
    if (isOpen()) {
        m_judge.emplace(withoutThresholds(m_situation.conditions), layout());
    }
}

Explainer::Seen Explainer::judge(Replay& replay, std::optional<std::string_view> line,
                                 zrm_rmlogent_data_t* row) {
    Seen seen;
    seen.line = line;
    LogEntry* const current = LogEntry::ofThisThread;
    if (const auto* const entry = dynamic_cast<const LineEntry*>(current)) {
        seen.record = line ? "" : entry->entry();
    } else if (current != nullptr) {
        seen.kept = std::make_unique<KeptEntry>(*current, usesFields());
    }
    if (row != nullptr) {
        seen.isRow = true;
        seen.row = *row; // judging modifies the row
        seen.verdict = replay.judge(*row);
    }
    return seen;
}

/// Whether a condition is on a field.
bool Explainer::usesFields() const {
    return std::any_of(m_situation.conditions.begin(), m_situation.conditions.end(),
                       [](const Condition& condition) { return condition.isOnField(); });
}

Result<void> Explainer::read(LogFile& log, const LogTail::Entry& entry, const std::string& until) {
    LogTail tail(log);
    Result<void> result = tail.read(entry, until);
    m_reach = tail.reach();
    return result;
}

Result<std::vector<Explanation>> Explainer::last(LogFile& log, std::size_t number,
                                                 const std::string& until) {
    TraceScope trace(anchor);
    std::deque<Seen> seen;
    bool isWanted = true; // a line that yields no entry: as the one before it
    const auto take = [&](auto line, zrm_rmlogent_data_t* row) {
        isWanted = row == nullptr ? isWanted : until.empty() || stampOf(*row) <= until;
        Seen entry = judge(m_replay, line, row);
        if (isWanted) {
            seen.push_back(std::move(entry));
        }
        if (seen.size() > number) {
            seen.pop_front();
        }
    };
    const Result<void> whole = read(log, take, until);
    if (!whole) {
        return tl::unexpected(whole.error());
    }
    std::vector<Explanation> explanations;
    explanations.reserve(seen.size());
    for (Seen& entry : seen) {
        explanations.push_back(describe(&log, entry));
    }
    return explanations;
}

Result<std::vector<Explanation>> Explainer::line(LogFile& log, std::string_view line) {
    TraceScope trace(anchor);
    std::optional<Seen> found;
    Times matched;
    // If the log cannot be read, no entries precede the line.
    read(log, [&](auto text, zrm_rmlogent_data_t* row) {
        Seen seen = judge(m_replay, text, row);
        if (seen.verdict.matches && m_replay.isJudged()) {
            matched.push_back(
                {stampOf(seen.row), EntryInstant::ofThisThread(), m_replay.valuesOf(seen.row)});
        } else if (seen.verdict.matches && m_replay.hasThresholds()) {
            matched.push_back({stampOf(seen.row), EntryInstant::ofThisThread()});
        }
        if (text == line) {
            found = std::move(seen);
        }
    });
    if (found) {
        return std::vector{describe(&log, *found)};
    }
    return nextLine(log, line, matched);
}

/// Counts the entries up to that of the last time.
void Explainer::countBefore(Replay& replay, const Times& before, const Written& last) {
    for (const Written& written : before) {
        if (written.instant) {
            const EntryInstant instant(*written.instant);
            if (*written.instant <= last.instant) {
                replay.count(written.stamp.data(), written.values);
            }
        } else if (written.stamp <= last.stamp) {
            replay.count(written.stamp.data(), written.values);
        }
    }
}

/// The line as if it came after all entries up to its time.
Result<std::vector<Explanation>> Explainer::nextLine(LogFile& log, std::string_view line,
                                                     const Times& before) {
    TraceScope trace(anchor);
    Replay replay(m_situation, m_entries);
    bool isFirst = true;
    std::vector<Explanation> explanations;
    if (!replay.isOpen()) {
        return refused("there are too many requests");
    }
    const Result<void> whole =
        LogTail(log).readLine(line, [&](auto text, zrm_rmlogent_data_t* row) {
            if (row != nullptr && std::exchange(isFirst, false)) {
                countBefore(replay, before, {stampOf(*row), EntryInstant::ofThisThread()});
            }
            Seen seen = judge(replay, text, row);
            explanations.push_back(describe(&log, seen));
        });
    if (!whole) {
        return tl::unexpected(whole.error());
    }
    return explanations;
}

Explanation Explainer::event(LogFile* log, const EventEntry& entry) {
    TraceScope trace(anchor);
    std::optional<Seen> found;
    bool isExact = false;
    if (log != nullptr) {
        const auto take = [&](auto line, zrm_rmlogent_data_t* row) {
            const bool isEntry = row != nullptr &&
                                 StoredRow::isSameEntry(layout(), *row, entry.row) &&
                                 (!line || !entry.text || isSameText(*line, *entry.text));
            Seen seen = judge(m_replay, line, row);
            // Among identical entries, take the one with the same count as the event.
            if (isEntry && !isExact) {
                isExact = entry.isOwn && seen.verdict.frequency == entry.row.freqthresh;
                found = std::move(seen);
            }
        };
        read(*log, take, stampOf(entry.row));
    }
    if (log == nullptr) {
        m_reach = {"", "the log is no longer monitored"};
    }
    if (!found) {
        found.emplace();
        found->isRow = true;
        found->row = entry.row;
        found->line = entry.text;
        if (log == nullptr || log->isSource()) { // the text alone does not have the fields
            found->kept = std::make_unique<KeptEntry>(entry.text.value_or(""), entry.fields);
        }
        LineEntry line(log, entry.text ? std::string_view(*entry.text) : "");
        const LogEntry::Offer offer(found->kept ? static_cast<LogEntry&>(*found->kept) : line);
        zrm_rmlogent_data_t row = entry.row;
        found->verdict.matches = m_replay.matches(row);
        if (!m_replay.hasThresholds()) {
            found->verdict.isRaised = found->verdict.matches;
        } else if (entry.isOwn && found->verdict.matches) {
            found->verdict.isRaised = true;
            found->verdict.frequency = entry.row.freqthresh;
        }
    }
    found->event = entry.id;
    return describe(log, *found);
}

Explanation Explainer::describe(const LogFile* log, Seen& seen) {
    Explanation explanation;
    explanation.line = std::move(seen.line);
    LineEntry entry = explanation.line ? LineEntry(log, *explanation.line)
                                       : LineEntry::ofRecord(log, seen.record);
    const LogEntry::Offer offer(seen.kept ? static_cast<LogEntry&>(*seen.kept) : entry);
    explanation.event = seen.event;
    if (m_replay.hasThresholds()) {
        explanation.window = {
            m_situation.frequency.value_or(boundOf(m_replay)),
            m_situation.period.value_or(std::to_string(m_replay.periodSeconds()) + "s"),
            seen.verdict.frequency};
    }
    if (const auto& judged = seen.verdict.judged) {
        explanation.group = judged->group;
        if (judged->hasEpisode) {
            explanation.episode = {judged->first, judged->count};
        }
    }
    if (!seen.isRow) {
        explanation.reason =
            "the line does not match the log's format, or its time cannot be determined";
    } else {
        char* const row = reinterpret_cast<char*>(&seen.row);
        explanation.row =
            JsonWriter::text([&](JsonWriter& json) { RowJson(layout()).write(json, row); });
        m_replay.matches(seen.row); // writes the situation's thresholds into the row
        explanation.conditions = m_judge->judge(row);
    }
    explanation.matches = seen.verdict.matches;
    explanation.isRaised = seen.verdict.isRaised;
    decide(explanation, seen);
    return explanation;
}

/// Why groups, episodes and pauses make of an entry what they do.
std::string Explainer::reasonOf(const Replay::Verdict& verdict) const {
    using enum EpisodeJudge::Decision;
    const Replay::Judged& judged = *verdict.judged;
    const std::string group = groupText(judged.group);
    if (m_replay.isOfAbsence()) {
        const std::string& limit = m_situation.judgement.absentText;
        return judged.absence
                   ? "it ends an absence" + group + ": no entry had met every condition for " +
                         std::to_string(*judged.absence) + " s, and the limit is " + limit
                   : "every condition holds" + group + "; it would be raised " + limit +
                         " after this entry unless another one comes";
    }
    if (judged.decision == CONTINUES) {
        return "it belongs to the episode" + group + " that began at " +
               UtcTime::text(judged.first * millisecondsPerSecond) + " and has " +
               numberOf(static_cast<long>(judged.count), "entry", "entries") + " so far";
    }
    const JudgementConfig& rules = m_situation.judgement;
    std::string reason = "every condition holds" + group;
    bool isMet = true;
    if (verdict.frequency) {
        const bool isDistinct = !rules.distinct.empty();
        reason = numberOf(*verdict.frequency, isDistinct ? "value" : "entry",
                          isDistinct ? "different values" : "entries") +
                 (isDistinct ? " of " + rules.distinct : "") + group + " in " +
                 std::to_string(m_replay.periodSeconds()) + " s" +
                 (rules.then.empty() || !judged.mayRaise ? "" : " before it") +
                 ", the threshold is " + boundOf(m_replay);
        isMet = rules.isUpperBound ? *verdict.frequency <= rules.frequency
                                   : *verdict.frequency >= rules.frequency;
    }
    if (!judged.mayRaise) {
        return reason + ", and only an entry with " + rules.then + " raises an event";
    }
    if (judged.decision == RAISES) {
        return reason + (judged.hasEpisode ? ", and an episode begins" : "");
    }
    return isMet ? "an event" + group + " was raised less than " + rules.cooldownText + " before"
                 : reason;
}

void Explainer::decide(Explanation& explanation, const Seen& seen) const {
    const std::string would = explanation.isRaised ? "Would be raised" : "Would not be raised";
    std::string because;
    if (!seen.isRow) {
        because = "the line yields no entry";
    } else if (!explanation.matches) {
        because = "a condition does not hold";
        for (const ConditionVerdict& verdict : explanation.conditions) {
            if (!verdict.holds) {
                because = verdict.refusal;
                break;
            }
        }
    } else if (seen.verdict.judged) {
        because = reasonOf(seen.verdict);
    } else if (!explanation.window) {
        because = explanation.conditions.empty() ? "the situation has no conditions"
                                                 : "every condition holds";
    } else if (seen.verdict.frequency) {
        because = numberOf(*seen.verdict.frequency, "entry", "entries") + " in " +
                  std::to_string(m_replay.periodSeconds()) + " s, the threshold is " +
                  boundOf(m_replay);
    } else if (seen.event) {
        explanation.decision = "Cannot be determined: every condition holds, but the log no longer "
                               "contains the entry, so the ones before it cannot be counted.";
        return;
    } else {
        because = "the time of the entry cannot be counted";
    }
    explanation.decision =
        would + (explanation.isRaised && m_isStopped ? " if the situation were started" : "") +
        ": " + because + '.';
}

} // namespace zrm::host
