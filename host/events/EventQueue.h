#ifndef ZRM_HOST_EVENT_QUEUE_H
#define ZRM_HOST_EVENT_QUEUE_H

#include "host/events/EntryEvents.h"
#include "host/events/Event.h"

#include <algorithm>
#include <chrono>
#include <condition_variable>
#include <cstddef>
#include <cstdint>
#include <deque>
#include <functional>
#include <limits>
#include <memory>
#include <mutex>
#include <span>
#include <utility>
#include <vector>

namespace zrm::host {

/// The state of the queue between the log threads and its readers.
struct QueueState {
    std::size_t size = 0;               ///< events that some reader has not yet taken
    std::size_t capacity = 0;           ///< events that fit
    std::uint64_t waits = 0;            ///< how often a log thread had to wait for room
    std::chrono::nanoseconds waited{0}; ///< total time of these waits
};

/// The bounded way of events from the log threads to the sinks: one ring of rows with a cursor per
/// reader, so that every reader gets every event in order and the memory does not grow with their
/// number. A push never waits: log threads ask whether there is room before they offer a row, and
/// wait while the ring is full or its events have too many bytes beside their rows, until a quarter
/// of it is free. The log file is the buffer and
/// nothing is dropped. What one entry raises beyond the ring's end is kept aside.
///
/// Readers and the listener are added before the first push. Afterwards push may be called on any
/// thread, and read and release of one reader on that reader's thread alone; the rest on any.
class EventQueue {
public:
    using Clock = std::chrono::steady_clock;
    using Reader = std::size_t;

    /// Bytes of the events' details (EntryDetail) with which the queue is full.
    static constexpr std::size_t detailRoom = std::size_t{16} * 1024 * 1024;

    /// Room for `capacity` events of rows of `rowSize` bytes. The ids of the events follow `last`.
    EventQueue(std::size_t capacity, std::size_t rowSize, std::uint64_t last = 0);
    EventQueue(const EventQueue&) = delete;
    EventQueue& operator=(const EventQueue&) = delete;

    /// Adds a reader, which gets every event from here on.
    Reader addReader();

    /// Sets what to call whenever the ring becomes full or has room again; it must be quick and
    /// must not call the queue.
    void onFull(std::function<void(bool isFull)> listener) { m_listener = std::move(listener); }

    /// Copies one row; null for an event without a row, whose judgement has its log. False when the
    /// queue is closed, so that the event was not taken. Where the calling thread collects the
    /// events of an entry, the event is collected.
    bool push(const std::shared_ptr<const SituationLabel>& situation, const char* row,
              const std::shared_ptr<const EventJudgement>& judgement = nullptr);

    /// Copies all events of an entry, which stay together. The last one carries the position behind
    /// the entry and what the log has added to episodes up to there. Returns its id; 0 if nothing
    /// was taken because the queue is closed.
    std::uint64_t pushEntry(const EntryEvents& events, const std::shared_ptr<FollowedLog>& log,
                            const LogPosition& behind, std::vector<EpisodeShare> shares = {});

    /// Waits for events until the limit, and a few milliseconds for more once the first has
    /// arrived. Returns the oldest ones that the reader has not released, at most `most`; they stay
    /// unchanged until released. Empty only when none arrived in time, when the readers were woken,
    /// or when the queue is closed and the reader has released everything.
    std::span<const Event> read(Reader reader, std::size_t most,
                                Clock::time_point limit = Clock::time_point::max());

    /// Ends the wait of the readers, or the next one of a reader that does not wait now, because
    /// there is something else to do. Any thread.
    void wake();

    /// True when the queue is closed and the reader has released everything.
    bool ended(Reader reader) const;

    /// Moves the reader's cursor past its oldest `count` events.
    void release(Reader reader, std::size_t count);

    /// Number of events that the reader has not released.
    std::size_t backlog(Reader reader) const;

    /// The state of the queue. Any thread.
    QueueState state() const;

    /// Refuses further events; readers get what is left. Any number of times.
    void close();

private:
    struct Aside {
        Event event;
        std::unique_ptr<char[]> row;
    };

    std::uint64_t slowest() const;
    void waitForEvents(std::unique_lock<std::mutex>& lock, Reader reader, Clock::time_point limit);
    std::size_t quarter() const { return std::max<std::size_t>(m_events.size() / 4, 1); }
    static constexpr std::uint64_t nobody = std::numeric_limits<std::uint64_t>::max();
    bool hasSlot() const { return m_next - slowest() < m_events.size(); }
    void announce(std::unique_lock<std::mutex>& lock);
    void add(Event event, const char* row);
    void put(const Event& event, const char* row);
    void takeFromAside();
    void noteRoom();
    void dropDetails(std::uint64_t from);
    bool isAwaited() const;

    const std::size_t m_rowSize;
    const std::uint64_t m_last;     ///< id before the first event's
    std::vector<Event> m_events;    ///< ring; event n lives in slot n % size
    std::unique_ptr<char[]> m_rows; ///< the rows of the slots

    mutable std::mutex m_mutex;
    std::condition_variable m_changed;    ///< events arrived, or the queue was closed
    std::vector<std::uint64_t> m_cursor;  ///< per reader: the next event it will release
    std::vector<std::uint64_t> m_awaited; ///< per reader: m_next at which it is woken
    std::uint64_t m_next = 0;             ///< the next event to be pushed
    std::deque<Aside> m_aside;            ///< events after those of the ring, in order
    std::size_t m_detailBytes = 0;        ///< of all events that some reader has not released
    std::function<void(bool)> m_listener;
    bool m_isFull = false; ///< as last reported to the listener
    bool m_closed = false;
    std::uint64_t m_wakes = 0;          ///< how often the readers were woken
    std::vector<std::uint64_t> m_woken; ///< per reader: m_wakes at its last wait
};

} // namespace zrm::host

#endif
