#ifndef ZRM_FRAMEWORK_EVENT_ROOM_H
#define ZRM_FRAMEWORK_EVENT_ROOM_H

#include <atomic>
#include <cstdint>
#include <functional>

/// Whether the framework has room for what situations accept. Rows are offered only while it has:
/// dispatching never waits, so that a log's thread waits for room with no lock held, and only for
/// as long as its log is monitored. One for the process; any thread.
namespace EventRoom {

enum class State : std::uint8_t {
    HELD,   ///< the situations are still being opened
    FREE,   ///< rows may be offered
    FULL,   ///< what was accepted before has still to be taken
    CLOSED, ///< the process is ending: no row is taken any more
};

extern std::atomic<State> state;

inline State now() noexcept {
    return state.load(std::memory_order_relaxed);
}

inline bool mayOffer() noexcept {
    return now() == State::FREE;
}

/// Waits while there is no room yet and the row is still `isWanted`, which is asked now and then,
/// and returns the state. The wait can be seen in the numbers of the queue.
State wait(const std::function<bool()>& isWanted);

/// Entries of a log were not offered because the process is ending: read and passed over.
void notePassedOver(std::uint64_t entries) noexcept;

} // namespace EventRoom

#endif
