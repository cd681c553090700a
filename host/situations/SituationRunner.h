#ifndef ZRM_HOST_SITUATION_RUNNER_H
#define ZRM_HOST_SITUATION_RUNNER_H

#include "host/config/HostConfig.h"
#include "host/situations/Situation.h"

#include <chrono>
#include <condition_variable>
#include <cstdint>
#include <deque>
#include <map>
#include <memory>
#include <mutex>
#include <string>
#include <thread>

class TableManager;

namespace zrm::host {

class EventQueue;

/// Opens and closes situations on its own thread. Both wait for the table manager's lock, and so
/// for fan-out; a caller that requests a change must not have to wait that long. Any thread, except
/// for destruction.
class SituationRunner {
public:
    enum class State {
        ABSENT,  ///< should not run
        OPENING, ///< waiting to be opened
        OPEN,
        REFUSED, ///< the table opened no request
        ENDED,   ///< stopped by the agent
    };

    /// The table's manager and the queue outlive the object.
    SituationRunner(TableManager& entries, EventQueue& queue);
    /// Closes every situation, however long that takes.
    ~SituationRunner();
    SituationRunner(const SituationRunner&) = delete;
    SituationRunner& operator=(const SituationRunner&) = delete;

    /// Runs a situation under this key, in place of the one that may already run under it.
    void start(const std::string& key, SituationConfig config,
               std::shared_ptr<SituationCounts> counts);

    /// Stops it: it raises nothing from now on and is closed.
    void stop(const std::string& key);

    /// Waits until all requested changes are made, at most this long; false when the time is up.
    bool settle(std::chrono::milliseconds limit);

    State state(const std::string& key) const;

    /// What the situations judge together now.
    JudgeCounts judgeCounts() const;

    /// Stops and closes every situation; nothing can be started afterwards. Any number of times.
    void close();

private:
    struct Slot {
        SituationConfig config;
        std::shared_ptr<SituationCounts> counts; ///< null: should not run
        std::uint64_t asked = 0;                 ///< number of the last start
        std::unique_ptr<Situation> situation;
        std::uint64_t running = 0; ///< number of the start that opened it
    };

    void work();
    void tick();
    void bringToState(std::unique_lock<std::mutex>& lock, const std::string& key);
    void enqueue(const std::string& key, Slot& slot);

    TableManager& m_entries;
    EventQueue& m_queue;

    mutable std::mutex m_mutex; ///< guards what follows; never held while a situation is opened
    std::condition_variable m_changed;
    std::condition_variable m_settled;
    std::map<std::string, Slot> m_slots;
    std::deque<std::string> m_pending; ///< keys with a pending change, in the order of the requests
    std::uint64_t m_starts = 0;
    bool m_isWorking = false;
    std::uint64_t m_droppedGroups = 0; ///< of situations that were closed
    const std::int64_t m_begin;        ///< milliseconds since 1970, UTC
    bool m_hasLeftEpisodes = true; ///< of an earlier run, of situations that do not run any more
    bool m_ends = false;

    std::mutex m_closing; ///< one close at a time
    std::thread m_thread;
};

} // namespace zrm::host

#endif
