#ifndef ZRM_HOST_REPLAY_H
#define ZRM_HOST_REPLAY_H

#include "host/config/HostConfig.h"
#include "host/framework/RowLayout.h"
#include "host/situations/AbsenceJudge.h"
#include "host/situations/EpisodeJudge.h"
#include "host/situations/JudgedValues.h"

#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

class TableManager;

namespace zrm {
struct zrm_rmlogent_data_t;
} // namespace zrm

namespace zrm::host {

/// What groups, episodes and pauses make of an entry that meets every condition.
struct JudgedEntry {
    EpisodeJudge::Decision decision = EpisodeJudge::Decision::NONE;
    bool mayRaise = true;               ///< it has the value of `then`, if there is one
    std::vector<GroupValue> group = {}; ///< empty: the situation has no groups
    // Of the episode that it begins or continues.
    bool hasEpisode = false;
    std::int64_t first = 0; ///< seconds since 1970
    std::uint64_t count = 0;
    /// Of a situation with `absent`: for how long entries had been missing when this one ended
    /// that, in seconds.
    std::optional<std::int64_t> absence = std::nullopt;
};

/// An absence that would have raised an event. Times are in seconds since 1970.
struct FoundAbsence {
    std::int64_t seen = 0;   ///< the last entry before it, or when waiting began
    std::int64_t raised = 0; ///< the time of the event
};

/// By what a matching entry is judged, beside its time.
struct JudgedBy {
    std::string group; ///< its key
    std::string distinct;
    std::string log;
    bool mayRaise = true; ///< it has the value of `then`, if there is one
};

/// Judges entries as a situation would, without being one: a request of the agent's own, which no
/// log offers anything to and which raises nothing. Conditions and thresholds are judged by the
/// very code that monitors. Of a log of the log configuration, the period in which entries are
/// counted ends at the time of the newest entry and not now, as if each entry had been read when it
/// was written. While an EntryInstant exists, an entry is one of a followed log. One thread.
class Replay {
public:
    using Judged = JudgedEntry;
    struct Verdict {
        bool matches = false;          ///< every condition holds
        bool isRaised = false;         ///< and the thresholds let it pass
        std::optional<long> frequency; ///< entries counted in the period; none without thresholds
        std::optional<Judged> judged = std::nullopt; ///< only with isJudged(), if it matches
    };
    using Values = JudgedBy;

    /// The table's manager outlives the object.
    Replay(const SituationConfig& situation, TableManager& entries);
    ~Replay();
    Replay(const Replay&) = delete;
    Replay& operator=(const Replay&) = delete;

    /// Whether the table has given a request; nothing else may be called without.
    bool isOpen() const noexcept { return m_request != nullptr; }
    /// The columns of the rows.
    const RowLayout& layout() const { return *m_layout; }

    /// Whether the host judges groups, episodes, pauses or absences.
    bool isJudged() const noexcept { return m_values.has_value(); }
    /// Whether it is the absence of entries that raises events.
    bool isOfAbsence() const noexcept { return m_rules.absent > 0; }

    /// Both thresholds are in force.
    bool hasThresholds() const noexcept;
    /// N: at least N entries in the period; -N: at most N.
    std::int64_t frequency() const noexcept;
    std::int64_t periodSeconds() const noexcept;

    /// Whether every condition holds; counts nothing. Writes the row's threshold columns.
    bool matches(zrm_rmlogent_data_t& row);
    /// The next entry, counted when every condition holds. Writes the row's threshold columns.
    Verdict judge(zrm_rmlogent_data_t& row);
    /// The next entry, of which it is known that every condition holds: its ENTRYTIME. With
    /// isJudged() it is judged by the values.
    Verdict count(const char* entryTime, const Values& values = {});

    // With isJudged().

    /// The values of a row that matches.
    Values valuesOf(const zrm_rmlogent_data_t& row);
    /// The episodes that have ended since the last call.
    std::vector<EndedEpisode> takeEnded();
    /// Those that have not. Nothing is judged after it.
    std::vector<EndedEpisode> takeLasting();
    std::uint64_t droppedGroups() const noexcept {
        return m_absence ? m_absence->droppedGroups() : m_judge->droppedGroups();
    }

    // With isOfAbsence(). Times are in seconds since 1970.

    /// Entries are expected from this time on. Before anything is judged.
    void beginAt(std::int64_t time);
    /// Nothing more has come until this time.
    void endAt(std::int64_t time);
    /// What was raised since the last call, oldest first.
    std::vector<FoundAbsence> takeRaised();
    /// A 16-character local time; none if it is not a time.
    static std::optional<std::int64_t> timeOf(const std::string& stamp);
    std::vector<GroupValue> groupValues(std::string_view key) const;

private:
    class Request;
    struct Surroundings;
    Verdict take();
    void judgeGroup(std::int64_t time, const Values& values, Verdict& verdict);
    void judgeAbsence(std::int64_t time, const Values& values, Verdict& verdict);
    void endAbsence(const AbsenceJudge::Group& group, std::int64_t time);

    const JudgementConfig m_rules;
    std::optional<JudgedValues> m_values; ///< only if the host judges
    std::optional<EpisodeJudge> m_judge;
    std::optional<AbsenceJudge> m_absence; ///< in its place
    std::int64_t m_newest = 0;             ///< of the entries that it has judged
    std::vector<FoundAbsence> m_raised;
    std::vector<EndedEpisode> m_ended;
    std::unique_ptr<Surroundings> m_surroundings;
    std::unique_ptr<Request> m_request;
    std::optional<RowLayout> m_layout;
};

} // namespace zrm::host

#endif
