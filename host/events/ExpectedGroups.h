#ifndef ZRM_HOST_EXPECTED_GROUPS_H
#define ZRM_HOST_EXPECTED_GROUPS_H

#include <atomic>
#include <chrono>
#include <cstddef>
#include <cstdint>
#include <functional>
#include <map>
#include <mutex>
#include <string>
#include <utility>
#include <vector>

namespace zrm::host {

/// A group of a situation with `absent`, as the history keeps it between two runs.
struct ExpectedGroup {
    std::string situation;
    std::string key;             ///< GroupKey
    std::int64_t definition = 0; ///< of SituationLabel
    /// When its last entry came: watched time. Of an absent group negative, since its next entry
    /// may be stored before it is.
    std::int64_t seen = 0;
    std::int64_t since = 0; ///< the same by the clock, in seconds since 1970
    std::string log = {};   ///< full path of the log that the entry came from
    std::string node = {};  ///< as the rows have it in ORIGINNODE
    bool operator==(const ExpectedGroup&) const = default;
};

/// What the history is to keep of such groups.
struct ExpectedValues {
    std::int64_t watched = 0; ///< the watched time; 0: as stored before
    std::vector<std::pair<std::string, std::string>> forgotten = {}; ///< situation and key
    std::vector<ExpectedGroup> groups = {}; ///< new or changed, and not among the forgotten
    bool isEmpty() const noexcept { return watched == 0 && forgotten.empty() && groups.empty(); }
    bool operator==(const ExpectedValues&) const = default;
};

/// The groups from which entries are expected, between the situations and the writer of the
/// history, and the watched time: the milliseconds in which an agent has run with this history, by
/// the steady clock. So neither a stop of the agent nor a clock that is set nor a suspended machine
/// makes a silence longer. Any thread.
class ExpectedGroups {
public:
    using Clock = std::chrono::steady_clock;

    /// The watched time is stored this often (milliseconds) where nothing else is. A crash loses so
    /// much of it at most.
    static constexpr std::int64_t storedEvery = 10'000;

    /// `isKept`: the writer takes what is noted. `clock` is the steady clock, except in tests.
    explicit ExpectedGroups(bool isKept, std::function<Clock::time_point()> clock = &Clock::now);

    /// What an earlier run has stored. Before anything else.
    void load(ExpectedValues stored);

    /// Milliseconds. Takes no lock: every entry that is expected asks for it.
    std::int64_t watched() const;

    /// The groups that an earlier run has stored of a situation with this definition, once. Those
    /// of another definition are forgotten.
    std::vector<ExpectedGroup> take(const std::string& situation, std::int64_t definition);
    /// Forgets the groups that nobody has taken.
    void forgetLeft();

    void note(ExpectedGroup group);
    void forget(const std::string& situation, const std::string& key);

    /// How often the store has lost what it had: everything is to be noted again.
    std::uint64_t losses() const;

    // For the writer of the store.

    /// What is to be stored. `isLast`: now or never.
    ExpectedValues unsaved(bool isLast) const;
    void saved(const ExpectedValues& values);
    void forgetSaved();

private:
    using Key = std::pair<std::string, std::string>; ///< situation and key
    const bool m_isKept;
    const std::function<Clock::time_point()> m_clock;
    const Clock::time_point m_begin;

    std::atomic<std::int64_t> m_before{0}; ///< watched by earlier runs

    mutable std::mutex m_mutex;          ///< guards what follows
    std::int64_t m_saved = 0;            ///< the watched time that is stored
    bool m_isUsed = false;               ///< there are groups, so that the watched time matters
    std::vector<ExpectedGroup> m_stored; ///< of an earlier run, not taken yet
    std::map<Key, ExpectedGroup> m_changed;
    std::vector<Key> m_forgotten;
    std::uint64_t m_losses = 0;
};

} // namespace zrm::host

#endif
