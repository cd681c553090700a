#ifndef ZRM_HOST_EPISODE_H
#define ZRM_HOST_EPISODE_H

#include <atomic>
#include <cstdint>
#include <memory>
#include <string>
#include <utility>
#include <vector>

namespace zrm::host {

/// The id of an episode, which is the id of the event that raised it, and when that was. The queue
/// sets both when it takes that event; 0 until then. Shared by all that refer to the episode. Any
/// thread.
class EpisodeId {
public:
    explicit EpisodeId(std::uint64_t value = 0, std::int64_t raised = 0) noexcept
        : m_raised(raised), m_value(value) {}
    std::uint64_t value() const noexcept { return m_value.load(std::memory_order_acquire); }
    /// Milliseconds since 1970, UTC.
    std::int64_t raised() const noexcept { return m_raised.load(std::memory_order_acquire); }
    void set(std::uint64_t value, std::int64_t raised = 0) noexcept {
        m_raised.store(raised, std::memory_order_release);
        m_value.store(value, std::memory_order_release);
    }

private:
    std::atomic<std::int64_t> m_raised;
    std::atomic<std::uint64_t> m_value;
};

/// One value of an event's group, in UTF-8.
struct GroupValue {
    std::string name;
    std::string value;
    bool operator==(const GroupValue&) const = default;
};

/// What one log has contributed to an episode. Times are the entries' own, in seconds since 1970.
struct EpisodeShare {
    std::shared_ptr<const EpisodeId> episode;
    std::string log; ///< its name
    std::uint64_t count = 0;
    std::int64_t first = 0;
    std::int64_t last = 0;
    bool operator==(const EpisodeShare&) const = default;
};

/// A share as it grows, on its log's thread alone.
struct GrowingShare : EpisodeShare {
    explicit GrowingShare(EpisodeShare begin) : EpisodeShare(std::move(begin)) {}
    /// It has grown since it was handed over to be stored. Any thread reads it.
    std::atomic<bool> isNoted{false};
};

/// An episode as the history keeps it while it lasts.
struct StoredEpisode {
    std::uint64_t id = 0;
    bool isPause = false; ///< not an episode: a group cools down
    std::string situation;
    std::string severity;
    std::int64_t definition = 0; ///< of SituationLabel
    std::string log;
    std::string node;
    std::vector<GroupValue> group;
    std::vector<GroupValue> values; ///< as in EventJudgement
    std::int64_t raised = 0;        ///< milliseconds since 1970, UTC
    // Of the event that raised it, in seconds since 1970.
    std::int64_t first = 0;
    std::int64_t last = 0;            ///< of a pause: time of its entry
    std::vector<EpisodeShare> shares; ///< of each log; without the episode's id
};

/// What the judgement of groups and episodes adds to an event. Immutable.
struct EventJudgement {
    enum class State {
        SINGLE, ///< the situation has no episodes
        RAISED,
        RESOLVED,
        PAUSED, ///< as SINGLE, and nothing more is raised for the group for a while
    };
    using enum State;

    State state = SINGLE;
    std::shared_ptr<EpisodeId> episode; ///< null: no episodes
    std::uint64_t count = 0;            ///< of the episode, or those that met a threshold; 0: none
    std::int64_t first = 0;             ///< time of the first of them, in seconds since 1970
    std::int64_t last = 0;              ///< time of the last
    std::vector<GroupValue> group;      ///< empty: the situation has no groups
    std::vector<GroupValue> values;     ///< of the entry: what the text of the end needs
    std::string text;                   ///< rendered for this event; empty: the situation's
    std::string reason;                 ///< why it is resolved; empty: nothing more has come

    // Of events without a row.
    std::string log;  ///< full path of the log that raised the episode
    std::string node; ///< as the rows have it in ORIGINNODE
};

} // namespace zrm::host

#endif
