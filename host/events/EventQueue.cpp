#include "host/events/EventQueue.h"

#include <algorithm>
#include <cstring>

EventQueue::EventQueue(std::size_t capacity, std::size_t rowSize)
    // The rows are left uninitialised: pages that no event has reached cost no memory.
    : m_rowSize(rowSize), m_events(capacity),
      m_rows(std::make_unique_for_overwrite<char[]>(capacity * rowSize)) {
    for (std::size_t slot = 0; slot < capacity; ++slot) {
        m_events[slot].row = m_rows.get() + slot * rowSize;
    }
}

EventQueue::Reader EventQueue::addReader() {
    const std::lock_guard guard(m_mutex);
    m_cursor.push_back(m_next);
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
    const bool hasRoom = waitWhileFull(lock);
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
    {
        std::unique_lock lock(m_mutex);
        if (!waitForRoom(lock)) {
            return false;
        }
        const std::size_t slot = m_next % m_events.size();
        Event& event = m_events[slot];
        event.id = m_next + 1;
        event.raised = std::chrono::duration_cast<std::chrono::milliseconds>(
                           system_clock::now().time_since_epoch())
                           .count();
        event.situation = situation;
        std::memcpy(m_rows.get() + slot * m_rowSize, row, m_rowSize);
        ++m_next;
    }
    m_changed.notify_all();
    return true;
}

std::span<const Event> EventQueue::read(Reader reader, std::size_t most) {
    std::unique_lock lock(m_mutex);
    m_changed.wait(lock, [&] { return m_closed || m_cursor[reader] != m_next; });
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
    }
    m_roomMade.notify_all();
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
