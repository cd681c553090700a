// The host's implementation of LogPositions.h.
#include "framework/LogPositions.h"

#include "framework/LogEntry.h"

#include "host/base/TimeText.h"
#include "host/events/ContextDemand.h"
#include "host/events/EntryContext.h"
#include "host/events/EntryEvents.h"
#include "host/events/EventQueue.h"
#include "host/events/PositionBook.h"

using namespace zrm::host;

namespace zrm {

class LogPositions::State {
public:
    explicit State(const char* name)
        : book(PositionBook::current()), log(book->log(name)), isFirst(!log->isOfRun()),
          follower(log->begin()) {
        events.setLog(log->name());
    }
    State(const State&) = delete;
    State& operator=(const State&) = delete;
    ~State() {
        leaveEntry();
        log->end(follower);
    }

    void leaveEntry() noexcept {
        if (EntryEvents::ofThisThread == &events) {
            EntryEvents::ofThisThread = nullptr;
        }
        events.clear();
    }

    /// Keeps the entry that begins for the events of later ones, if a situation wants that.
    void noteContext() {
        if (ContextDemand::generation() != demand) [[unlikely]] {
            noteDemand();
        }
        if (context.isKept()) {
            addContext();
        }
    }
    // Apart from what runs for each entry.
    [[gnu::noinline]] void noteDemand() {
        demand = ContextDemand::generation();
        context.keep(ContextDemand::of(log->name()));
    }
    [[gnu::noinline]] void addContext() {
        const LogEntry* const entry = LogEntry::ofThisThread;
        if (entry != nullptr) {
            context.add(entry->text());
        }
    }

    const std::shared_ptr<PositionBook> book;
    const std::shared_ptr<FollowedLog> log;
    const bool isFirst;
    const FollowedLog::Follower follower;
    EntryEvents events;
    EntryContext context;
    std::int64_t look = 0;    ///< when the last look at the log began
    std::uint64_t demand = 0; ///< generation of ContextDemand that `context` meets
};

LogPositions::LogPositions(const char* log) : m_state(std::make_unique<State>(log)) {}

LogPositions::~LogPositions() = default;

bool LogPositions::areKept() const noexcept {
    return m_state->book->isKept();
}

bool LogPositions::isFirstOfRun() const noexcept {
    return m_state->isFirst;
}

std::optional<LogPosition> LogPositions::stored() const {
    std::optional<LogPosition> position = m_state->log->newest();
    if (position && m_state->isFirst) {
        position->late = m_state->book->lateOf(m_state->log->name(), position->late);
    }
    return position;
}

void LogPositions::beginEntry() noexcept {
    m_state->events.clear();
    EntryEvents::ofThisThread = &m_state->events;
    m_state->noteContext();
}

bool LogPositions::hasEvents() const noexcept {
    return !m_state->events.empty();
}

void LogPositions::endEntry(const LogPosition& behind) {
    if (hasEvents() && !m_state->book->isClosed()) {
        if (LogEntry* const entry = LogEntry::ofThisThread) {
            m_state->events.describe(*entry, m_state->context);
        }
        m_state->log->push(m_state->follower, m_state->book->queue(), m_state->events, m_state->log,
                           behind);
    }
    m_state->leaveEntry();
}

void LogPositions::reached(const LogPosition& position) {
    if (m_state->book->isClosed()) {
        return;
    }
    const bool isFirst = m_state->log->reached(m_state->follower, position, m_state->events);
    EventQueue* const queue = m_state->book->queue();
    if (isFirst && queue != nullptr && m_state->book->isKept()) {
        queue->wake(); // until it is stored, a crash would lose where the log began
    }
}

void LogPositions::beginLook() noexcept {
    m_state->look = WallClock::now();
}

void LogPositions::endLook() noexcept {
    m_state->log->caughtUp(m_state->follower, m_state->look);
}

void LogPositions::left(const LogPosition& position, bool isWatched) {
    if (!m_state->book->isClosed()) {
        m_state->book->left(*m_state->log, m_state->follower, position, isWatched);
    }
}

} // namespace zrm
