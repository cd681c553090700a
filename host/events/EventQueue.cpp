#include "host/events/EventQueue.h"

#include <algorithm>
#include <cstring>

namespace {

/// How long a reader that was woken lets more events gather, unless many have come before.
constexpr std::chrono::milliseconds gatherTime{5};

} // namespace

EventQueue::EventQueue(std::size_t capacity, std::size_t rowSize, std::uint64_t last)
    // The rows are left uninitialised: pages that no event has reached cost no memory.
    : m_rowSize(rowSize), m_last(last), m_events(capacity),
      m_rows(std::make_unique_for_overwrite<char[]>(capacity * rowSize)) {
    for (std::size_t slot = 0; slot < capacity; ++slot) {
        m_events[slot].row = m_rows.get() + slot * rowSize;
    }
}

EventQueue::Reader EventQueue::addReader() {
    const std::lock_guard guard(m_mutex);
    m_cursor.push_back(m_next);
    m_awaited.push_back(nobody);
    return m_cursor.size() - 1;
}

std::uint64_t EventQueue::slowest() const {
    const auto slowest = std::min_element(m_cursor.begin(), m_cursor.end());
    return slowest == m_cursor.end() ? m_next : *slowest;
}

bool EventQueue::waitForRoom(std::unique_lock<std::mutex>& lock) {
    if (m_closed || !full()) {
        return !m_closed;
    }
    ++m_waits;
    const Clock::time_point begin = Clock::now();
    ++m_pushesWaiting;
    const bool hasRoom = waitWhileFull(lock);
    --m_pushesWaiting;
    m_waited += Clock::now() - begin;
    return hasRoom;
}

bool EventQueue::waitWhileFull(std::unique_lock<std::mutex>& lock) {
    while (!m_closed && full()) {
        if (m_waitLimit == Clock::time_point::max()) {
            m_roomMade.wait(lock);
        } else if (Clock::now() >= m_waitLimit) {
            return false;
        } else {
            m_roomMade.wait_until(lock, m_waitLimit);
        }
    }
    return !m_closed;
}

bool EventQueue::push(const std::shared_ptr<const SituationLabel>& situation, const char* row) {
    using std::chrono::system_clock;
    bool isAwaited = false;
    {
        std::unique_lock lock(m_mutex);
        if (!waitForRoom(lock)) {
            return false;
        }
        const std::size_t slot = m_next % m_events.size();
        Event& event = m_events[slot];
        event.id = m_last + m_next + 1;
        event.raised = std::chrono::duration_cast<std::chrono::milliseconds>(
                           system_clock::now().time_since_epoch())
                           .count();
        event.situation = situation;
        std::memcpy(m_rows.get() + slot * m_rowSize, row, m_rowSize);
        ++m_next;
        isAwaited = std::any_of(m_awaited.begin(), m_awaited.end(),
                                [this](std::uint64_t awaited) { return m_next >= awaited; });
    }
    if (isAwaited) {
        m_changed.notify_all();
    }
    return true;
}

void EventQueue::waitForEvents(std::unique_lock<std::mutex>& lock, Reader reader,
                               Clock::time_point limit) {
    if (m_closed || m_cursor[reader] != m_next) {
        return;
    }
    m_awaited[reader] = m_cursor[reader] + 1;
    const auto hasThem = [&] { return m_closed || m_next >= m_awaited[reader]; };
    if (limit == Clock::time_point::max()) {
        m_changed.wait(lock, hasThem);
    } else {
        m_changed.wait_until(lock, limit, hasThem);
    }
    if (m_cursor[reader] != m_next) {
        // Waking a thread costs more than an event does, so one wake-up is to serve many.
        m_awaited[reader] = m_cursor[reader] + quarter();
        m_changed.wait_for(lock, gatherTime, hasThem);
    }
    m_awaited[reader] = nobody;
}

std::span<const Event> EventQueue::read(Reader reader, std::size_t most, Clock::time_point limit) {
    std::unique_lock lock(m_mutex);
    waitForEvents(lock, reader, limit);
    const std::size_t first = m_cursor[reader] % m_events.size();
    const auto waiting = static_cast<std::size_t>(m_next - m_cursor[reader]);
    // A run ends at the ring's end, so that it is one span.
    const std::size_t count = std::min({most, waiting, m_events.size() - first});
    return std::span<const Event>(m_events).subspan(first, count);
}

void EventQueue::release(Reader reader, std::size_t count) {
    {
        const std::lock_guard guard(m_mutex);
        m_cursor[reader] += count;
        // A thread that waits for room is woken when there is room for many.
        if (m_pushesWaiting == 0 || m_next - slowest() > m_events.size() - quarter()) {
            return;
        }
    }
    m_roomMade.notify_all();
}

bool EventQueue::ended(Reader reader) const {
    const std::lock_guard guard(m_mutex);
    return m_closed && m_cursor[reader] == m_next;
}

std::size_t EventQueue::backlog(Reader reader) const {
    const std::lock_guard guard(m_mutex);
    return static_cast<std::size_t>(m_next - m_cursor[reader]);
}

QueueState EventQueue::state() const {
    const std::lock_guard guard(m_mutex);
    return {static_cast<std::size_t>(m_next - slowest()), m_events.size(), m_waits, m_waited};
}

void EventQueue::limitWaits(Clock::time_point limit) {
    {
        const std::lock_guard guard(m_mutex);
        m_waitLimit = std::min(m_waitLimit, limit);
    }
    m_roomMade.notify_all();
}

void EventQueue::close() {
    {
        const std::lock_guard guard(m_mutex);
        m_closed = true;
    }
    m_changed.notify_all();
    m_roomMade.notify_all();
}
