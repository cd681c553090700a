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

/// Opens and closes situations on a thread of its own. Both wait for the table manager's lock, and
/// so for a log thread that has it and waits for room in a full queue of events: whoever asks for
/// a change must not have to wait as long. Any thread, destruction excepted.
class SituationRunner {
public:
    enum class State {
        ABSENT,  ///< not to run
        OPENING, ///< waits to be opened
        OPEN,
        REFUSED, ///< the table opened no request
        ENDED,   ///< the agent has stopped it
    };

    /// The table's manager and the queue outlive the object.
    SituationRunner(TableManager& entries, EventQueue& queue);
    /// Closes every situation, however long that takes.
    ~SituationRunner();
    SituationRunner(const SituationRunner&) = delete;
    SituationRunner& operator=(const SituationRunner&) = delete;

    /// Lets a situation run under this key, in place of the one that runs under it.
    void start(const std::string& key, SituationConfig config,
               std::shared_ptr<SituationCounts> counts);

    /// Lets it run no more: it raises nothing from now on, and is closed.
    void stop(const std::string& key);

    /// Waits until everything is as it was asked for, at most so long; false when the time is up.
    bool settle(std::chrono::milliseconds limit);

    State state(const std::string& key) const;

    /// Stops and closes every situation; nothing is started any more. Any number of times.
    void close();

private:
    struct Slot {
        SituationConfig config;
        std::shared_ptr<SituationCounts> counts; ///< null: not to run
        std::uint64_t asked = 0;                 ///< number of the last start
        std::unique_ptr<Situation> situation;
        std::uint64_t running = 0; ///< number of the start that opened it
    };

    void work();
    void bringToState(std::unique_lock<std::mutex>& lock, const std::string& key);
    void enqueue(const std::string& key, Slot& slot);

    TableManager& m_entries;
    EventQueue& m_queue;

    mutable std::mutex m_mutex; ///< guards what follows; never held while a situation is opened
    std::condition_variable m_changed;
    std::condition_variable m_settled;
    std::map<std::string, Slot> m_slots;
    std::deque<std::string> m_pending; ///< keys to bring to their state, in the order of asking
    std::uint64_t m_starts = 0;
    bool m_isWorking = false;
    bool m_ends = false;

    std::mutex m_closing; ///< one close at a time
    std::thread m_thread;
};

} // namespace zrm::host

#endif
