#ifndef ZRM_HOST_EVENT_QUEUE_H
#define ZRM_HOST_EVENT_QUEUE_H

#include "host/events/Event.h"
#include "host/events/QueueState.h"

#include <algorithm>
#include <chrono>
#include <condition_variable>
#include <cstddef>
#include <cstdint>
#include <limits>
#include <memory>
#include <mutex>
#include <span>
#include <vector>

/// The bounded way of events from the log threads to the sinks: one ring of rows with a cursor per
/// reader, so that every reader gets every event in order and the memory does not grow with their
/// number. A full ring makes the log thread wait until a quarter of it is free: the log file is
/// the buffer and nothing is dropped. Nothing is allocated per event.
///
/// Readers are added before the first push. Afterwards push may be called on any thread, and
/// read and release of one reader on that reader's thread alone; the rest on any.
class EventQueue {
public:
    using Clock = std::chrono::steady_clock;
    using Reader = std::size_t;

    /// Room for `capacity` events of rows of `rowSize` bytes. The ids of the events follow `last`.
    EventQueue(std::size_t capacity, std::size_t rowSize, std::uint64_t last = 0);
    EventQueue(const EventQueue&) = delete;
    EventQueue& operator=(const EventQueue&) = delete;

    /// Adds a reader, which gets every event from here on.
    Reader addReader();

    /// Copies one row in; waits while the ring is full. False when the row was not taken because
    /// the queue is closed or the limit of the waits has passed.
    bool push(const std::shared_ptr<const SituationLabel>& situation, const char* row);

    /// Waits for events, until the limit, and a few milliseconds for more once the first has come.
    /// Gives the oldest ones that the reader has not released, at most `most`; they stay as they
    /// are until released. Empty only when there was none in time, or when the queue is closed and
    /// the reader has released everything.
    std::span<const Event> read(Reader reader, std::size_t most,
                                Clock::time_point limit = Clock::time_point::max());

    /// True when the queue is closed and the reader has released everything.
    bool ended(Reader reader) const;

    /// Moves the reader's cursor past its oldest `count` events.
    void release(Reader reader, std::size_t count);

    /// Number of events that the reader has not released.
    std::size_t backlog(Reader reader) const;

    /// How the queue stands. Any thread.
    QueueState state() const;

    /// From now on nobody waits for room beyond this time; a waiting push gives up then. The
    /// earliest limit that was set holds.
    void limitWaits(Clock::time_point limit);

    /// Takes no more events; readers get what is left. Waiting pushes give up. Any number of times.
    void close();

private:
    std::uint64_t slowest() const;
    void waitForEvents(std::unique_lock<std::mutex>& lock, Reader reader, Clock::time_point limit);
    std::size_t quarter() const { return std::max<std::size_t>(m_events.size() / 4, 1); }
    bool waitWhileFull(std::unique_lock<std::mutex>& lock);
    static constexpr std::uint64_t nobody = std::numeric_limits<std::uint64_t>::max();
    bool full() const { return m_next - slowest() >= m_events.size(); }
    bool waitForRoom(std::unique_lock<std::mutex>& lock);

    const std::size_t m_rowSize;
    const std::uint64_t m_last;     ///< id before the first event's
    std::vector<Event> m_events;    ///< ring; event n lives in slot n % size
    std::unique_ptr<char[]> m_rows; ///< the rows of the slots

    mutable std::mutex m_mutex;
    std::condition_variable m_changed;    ///< events came, or the queue was closed
    std::condition_variable m_roomMade;   ///< a reader moved on, or the waits have a new limit
    std::vector<std::uint64_t> m_cursor;  ///< per reader: the next event it will release
    std::vector<std::uint64_t> m_awaited; ///< per reader: when m_next is so far, it is woken
    std::uint64_t m_next = 0;             ///< the next event to be pushed
    Clock::time_point m_waitLimit = Clock::time_point::max();
    unsigned m_pushesWaiting = 0;        ///< threads that wait for room
    std::uint64_t m_waits = 0;           ///< pushes that had to wait
    std::chrono::nanoseconds m_waited{}; ///< for how long, those under way excepted
    bool m_closed = false;
};

#endif
