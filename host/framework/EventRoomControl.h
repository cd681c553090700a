#ifndef ZRM_HOST_EVENT_ROOM_CONTROL_H
#define ZRM_HOST_EVENT_ROOM_CONTROL_H

#include <chrono>
#include <cstdint>

namespace zrm::host {

/// The host's side of EventRoom, which decides whether there is room. Any thread.
namespace EventRoomControl {

/// The waits for room so far, including current ones.
struct Waits {
    std::uint64_t count = 0;
    std::chrono::nanoseconds waited{0};
};

/// Holds back all rows until open. Called before the first log is monitored.
void hold();
/// The situations are open. Also undoes a close, for the next begin in the same process.
void open();
/// No more rows are offered; waiting threads are released.
void close();
/// The event queue is full or has room again.
void setFull(bool isFull);

/// The waits for a full queue.
Waits waits();
/// The number of entries skipped because the process is ending.
std::uint64_t passedOver() noexcept;

} // namespace EventRoomControl

} // namespace zrm::host

#endif
