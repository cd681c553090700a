#ifndef ZRM_FRAMEWORK_EVENT_ROOM_H
#define ZRM_FRAMEWORK_EVENT_ROOM_H

#include <atomic>
#include <cstdint>
#include <functional>

/// Reports whether the framework has room for the rows that situations accept. Rows are offered
/// only while it has. Dispatching never blocks: a log's thread waits for room without holding a
/// lock, and only while its log is monitored. One per process; any thread.
namespace EventRoom {

enum class State : std::uint8_t {
    HELD,   ///< the situations are still being opened
    FREE,   ///< rows may be offered
    FULL,   ///< rows accepted earlier have not been taken yet
    CLOSED, ///< the process is ending; no more rows are taken
};

extern std::atomic<State> state;

inline State now() noexcept {
    return state.load(std::memory_order_relaxed);
}

inline bool mayOffer() noexcept {
    return now() == State::FREE;
}

/// Waits until there is room or `isWanted`, polled from time to time, returns false. Returns the
/// state. The queue's metrics include the wait.
State wait(const std::function<bool()>& isWanted);

/// Counts entries that were read but not offered because the process is ending.
void notePassedOver(std::uint64_t entries) noexcept;

} // namespace EventRoom

#endif
