#ifndef ZRM_HOST_EPISODE_JUDGE_H
#define ZRM_HOST_EPISODE_JUDGE_H

#include "host/config/JudgementConfig.h"
#include "host/events/Episode.h"
#include "host/situations/GroupTable.h"

#include <cstddef>
#include <cstdint>
#include <functional>
#include <limits>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

namespace zrm::host {

/// Decides about the entries that meet a situation's conditions: which of them raise an event, and
/// which belong to an episode that lasts. Knows entries' times, groups and values alone, so that
/// live monitoring, explanations and backtests find the same. One thread at a time.
///
/// Entries may come in any order. Within a group, thresholds count as EntryWindows does. An entry
/// belongs to an episode if it is less than `resolveAfter` later than its last entry and earlier
/// than its first one; otherwise it may begin another, so that a group has several episodes where
/// logs are read at different times. An entry of a log ends the earlier episodes of its group that
/// have entries of this log only; the others end when their caller says so (takeOver).
class EpisodeJudge {
public:
    /// Of one group at a time: what lasts longest without an entry goes first.
    static constexpr std::size_t mostEpisodes = 4;
    /// Events of one group whose cooldown is remembered, the latest.
    static constexpr std::size_t mostPauses = 4;

    struct Entry {
        std::int64_t time = 0; ///< seconds since 1970
        std::string_view group = {};
        std::string_view distinct = {}; ///< the value that is counted, if any is
        std::string_view log = {};      ///< its name
        /// Whether it has the value of `then`. Without one, every entry may raise an event.
        bool mayRaise = true;
    };

    enum class Decision {
        NONE,      ///< the threshold is not met, or the group cools down
        RAISES,    ///< an event; with episodes one begins
        CONTINUES, ///< an episode that lasts
    };
    struct Verdict {
        Decision decision = Decision::NONE;
        std::int64_t count = 0;     ///< what the threshold compares; 0: there is none
        std::int64_t first = 0;     ///< time of the first of them
        Episode* episode = nullptr; ///< begun or continued; valid until the judge is used again
        /// What the entry has added to; null if nothing.
        std::shared_ptr<GrowingShare> share = nullptr;
    };

    explicit EpisodeJudge(JudgementConfig rules);

    /// Judges the next entry. Episodes that end by it are added to `ended`.
    Verdict judge(const Entry& entry, std::vector<EndedEpisode>& ended);

    /// Counts an entry that an earlier run has judged: it raises nothing and belongs to no episode.
    void recount(const Entry& entry);

    /// Continues with an episode that an earlier run has begun. Where there are more groups than
    /// are kept, others end.
    void restore(std::string_view group, Episode episode, std::vector<EndedEpisode>& ended);
    /// Continues with the pause of a group that raised an event at this time.
    void restorePause(std::string_view group, std::int64_t raised,
                      std::vector<EndedEpisode>& ended);

    /// Ends every episode of which the caller says that it is over.
    void takeOver(const std::function<bool(Episode&)>& isOver, std::vector<EndedEpisode>& ended);

    /// No episode's last entry is earlier; the largest number if there is none.
    std::int64_t earliestLast() const noexcept { return m_earliestLast; }

    std::size_t episodes() const noexcept { return m_episodes; }
    std::size_t groups() const noexcept { return m_groups.size(); }
    /// Groups that made room for others while they counted.
    std::uint64_t droppedGroups() const noexcept { return m_dropped; }
    const JudgementConfig& rules() const noexcept { return m_rules; }

private:
    Group& groupOf(const Entry& entry, std::vector<EndedEpisode>& ended);
    bool isIdle(const Group& group, std::int64_t time) const;
    bool count(Group& group, const Entry& entry, Verdict& verdict) const;
    bool isAfterOthers(const Entry& entry) const { return !m_rules.then.empty() && entry.mayRaise; }
    EntryWindows::Counted countedWith(const Group& group, const Entry& entry) const;
    void judgeEpisode(Group& group, const Entry& entry, bool isMet, Verdict& verdict,
                      std::vector<EndedEpisode>& ended);
    Episode* lastingAt(Group::Extra& extra, std::int64_t time) const;
    void end(const Group& group, Episode& episode, std::vector<EndedEpisode>& ended,
             bool isDropped = false);
    void endEarlier(Group& group, const Entry& entry, std::vector<EndedEpisode>& ended);
    Episode& begin(Group& group, std::vector<EndedEpisode>& ended);
    bool cools(Group& group, std::int64_t time) const;

    static constexpr std::int64_t none = std::numeric_limits<std::int64_t>::max();

    const JudgementConfig m_rules;
    GroupTable m_groups;
    std::size_t m_episodes = 0;
    std::uint64_t m_entries = 0; ///< judged so far
    std::uint64_t m_dropped = 0;
    std::int64_t m_earliestLast = none; ///< a lower bound, renewed by takeOver
};

} // namespace zrm::host

#endif
