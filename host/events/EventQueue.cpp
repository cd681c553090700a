#include "host/events/EventQueue.h"

#include "host/base/TimeText.h"
#include "host/events/Episode.h"
#include "host/framework/EventRoomControl.h"

#include <algorithm>
#include <cstring>
#include <utility>

namespace zrm::host {

namespace {

/// How long a woken reader waits for more events, unless many have already arrived.
constexpr std::chrono::milliseconds gatherTime{5};

std::size_t bytesOf(const Event& event) {
    std::size_t bytes = event.detail == nullptr ? 0 : event.detail->bytes();
    if (event.judgement != nullptr) {
        bytes += event.judgement->text.size();
        for (const GroupValue& group : event.judgement->group) {
            bytes += group.name.size() + group.value.size();
        }
    }
    return bytes;
}

} // namespace

EventQueue::EventQueue(std::size_t capacity, std::size_t rowSize, std::uint64_t last)
    // The rows are left uninitialised: pages not yet used by an event cost no memory.
    : m_rowSize(rowSize), m_last(last), m_events(capacity),
      m_rows(std::make_unique_for_overwrite<char[]>(capacity * rowSize)) {}

EventQueue::Reader EventQueue::addReader() {
    const std::lock_guard guard(m_mutex);
    m_cursor.push_back(m_next);
    m_awaited.push_back(nobody);
    m_woken.push_back(0);
    return m_cursor.size() - 1;
}

std::uint64_t EventQueue::slowest() const {
    const auto slowest = std::min_element(m_cursor.begin(), m_cursor.end());
    return slowest == m_cursor.end() ? m_next : *slowest;
}

bool EventQueue::push(const std::shared_ptr<const SituationLabel>& situation, const char* row,
                      const std::shared_ptr<const EventJudgement>& judgement) {
    if (EntryEvents* const entry = EntryEvents::ofThisThread) {
        entry->add(situation, row, m_rowSize, judgement);
        return true;
    }
    std::unique_lock lock(m_mutex);
    if (m_closed) {
        return false;
    }
    Event event;
    event.raised = WallClock::now();
    event.situation = situation;
    event.judgement = judgement;
    add(std::move(event), row);
    announce(lock);
    return true;
}

std::uint64_t EventQueue::pushEntry(const EntryEvents& events,
                                    const std::shared_ptr<FollowedLog>& log,
                                    const LogPosition& behind, std::vector<EpisodeShare> shares) {
    std::unique_lock lock(m_mutex);
    if (m_closed || events.empty()) {
        return 0;
    }
    const std::int64_t raised = WallClock::now();
    for (std::size_t index = 0; index < events.size(); ++index) {
        Event event;
        event.raised = raised;
        event.situation = events.situation(index);
        event.detail = events.detail(index);
        event.judgement = events.judgement(index);
        event.endsEntry = index + 1 == events.size();
        if (event.endsEntry) {
            event.log = log;
            event.behind = behind;
            if (!shares.empty()) {
                event.shares = std::make_shared<const std::vector<EpisodeShare>>(std::move(shares));
            }
        }
        add(std::move(event), events.row(index));
    }
    const std::uint64_t last = m_last + m_next + m_aside.size();
    announce(lock);
    return last;
}

/// After a push: wakes the readers that have waited for so many events.
void EventQueue::announce(std::unique_lock<std::mutex>& lock) {
    noteRoom();
    const bool isReaderAwaiting = isAwaited();
    lock.unlock();
    if (isReaderAwaiting) {
        m_changed.notify_all();
    }
}

/// Gives an event its id and its place, behind all others.
void EventQueue::add(Event event, const char* row) {
    event.id = m_last + m_next + m_aside.size() + 1;
    if (event.judgement != nullptr && event.judgement->state == EventJudgement::RAISED) {
        event.judgement->episode->set(event.id, event.raised);
    }
    m_detailBytes += bytesOf(event);
    if (m_aside.empty() && hasSlot()) {
        put(event, row);
    } else {
        std::unique_ptr<char[]> copy;
        if (row != nullptr) {
            copy = std::make_unique_for_overwrite<char[]>(m_rowSize);
            std::memcpy(copy.get(), row, m_rowSize);
        }
        m_aside.push_back({std::move(event), std::move(copy)});
    }
}

/// Puts an event into the next, free slot of the ring.
void EventQueue::put(const Event& event, const char* row) {
    const std::size_t number = m_next % m_events.size();
    Event& slot = m_events[number];
    slot = event;
    slot.row = nullptr;
    if (row != nullptr) {
        char* const room = m_rows.get() + number * m_rowSize;
        std::memcpy(room, row, m_rowSize);
        slot.row = room;
    }
    ++m_next;
}

void EventQueue::takeFromAside() {
    while (!m_aside.empty() && hasSlot()) {
        put(m_aside.front().event, m_aside.front().row.get());
        m_aside.pop_front();
    }
}

/// Threads waiting for room are woken when there is room for many events.
void EventQueue::noteRoom() {
    const std::uint64_t used = m_next - slowest();
    const bool isFull = m_isFull ? !m_aside.empty() || used > m_events.size() - quarter() ||
                                       m_detailBytes > detailRoom - detailRoom / 4
                                 : !hasSlot() || m_detailBytes >= detailRoom;
    if (isFull != m_isFull) {
        m_isFull = isFull;
        if (m_listener) {
            m_listener(isFull);
        }
    }
}

bool EventQueue::isAwaited() const {
    return std::any_of(m_awaited.begin(), m_awaited.end(),
                       [this](std::uint64_t awaited) { return m_next >= awaited; });
}

void EventQueue::waitForEvents(std::unique_lock<std::mutex>& lock, Reader reader,
                               Clock::time_point limit) {
    if (m_closed || m_cursor[reader] != m_next) {
        return;
    }
    m_awaited[reader] = m_cursor[reader] + 1;
    const auto hasThem = [&] { return m_closed || m_next >= m_awaited[reader]; };
    const auto isOver = [&] { return hasThem() || m_woken[reader] != m_wakes; };
    if (limit == Clock::time_point::max()) {
        m_changed.wait(lock, isOver);
    } else {
        m_changed.wait_until(lock, limit, isOver);
    }
    m_woken[reader] = m_wakes;
    if (m_cursor[reader] != m_next) {
        // Waking a thread costs more than an event, so one wake-up should serve many.
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
    // Stops at the end of the ring, so that the events are one span.
    const std::size_t count = std::min({most, waiting, m_events.size() - first});
    return std::span<const Event>(m_events).subspan(first, count);
}

void EventQueue::release(Reader reader, std::size_t count) {
    const std::lock_guard guard(m_mutex);
    const std::uint64_t before = slowest();
    m_cursor[reader] += count;
    dropDetails(before);
    if (m_isFull) {
        takeFromAside();
        noteRoom();
        if (isAwaited()) {
            m_changed.notify_all(); // other readers waiting for the events kept aside
        }
    }
}

void EventQueue::wake() {
    {
        const std::lock_guard guard(m_mutex);
        ++m_wakes;
    }
    m_changed.notify_all();
}

/// Frees the details of the events that every reader has released now.
void EventQueue::dropDetails(std::uint64_t from) {
    for (const std::uint64_t end = slowest(); from < end; ++from) {
        Event& event = m_events[from % m_events.size()];
        m_detailBytes -= bytesOf(event);
        event.detail.reset();
        event.judgement.reset();
        event.shares.reset();
    }
}

bool EventQueue::ended(Reader reader) const {
    const std::lock_guard guard(m_mutex);
    return m_closed && m_cursor[reader] == m_next && m_aside.empty();
}

std::size_t EventQueue::backlog(Reader reader) const {
    const std::lock_guard guard(m_mutex);
    return static_cast<std::size_t>(m_next - m_cursor[reader]) + m_aside.size();
}

QueueState EventQueue::state() const {
    const std::lock_guard guard(m_mutex);
    const EventRoomControl::Waits waits = EventRoomControl::waits();
    return {static_cast<std::size_t>(m_next - slowest()) + m_aside.size(), m_events.size(),
            waits.count, waits.waited};
}

void EventQueue::close() {
    {
        const std::lock_guard guard(m_mutex);
        m_closed = true;
    }
    m_changed.notify_all();
}

} // namespace zrm::host
