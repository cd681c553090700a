#ifndef ZRM_HOST_EVENT_ROOM_CONTROL_H
#define ZRM_HOST_EVENT_ROOM_CONTROL_H

#include <chrono>
#include <cstdint>

namespace zrm::host {

/// The host's side of EventRoom: who decides whether there is room. Any thread.
namespace EventRoomControl {

/// Waits for room so far, those under way included.
struct Waits {
    std::uint64_t count = 0;
    std::chrono::nanoseconds waited{0};
};

/// Lets nothing be offered until open: from before the first log is monitored.
void hold();
/// The situations are open; takes back a close too, for the next begin in one process.
void open();
/// Nothing is offered any more; whoever waits is released.
void close();
/// The queue of events is full, or has room again.
void setFull(bool isFull);

/// The waits for a full queue.
Waits waits();
/// Entries that were passed over since the process is ending.
std::uint64_t passedOver() noexcept;

} // namespace EventRoomControl

} // namespace zrm::host

#endif
