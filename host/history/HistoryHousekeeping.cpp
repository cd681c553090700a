// What the history's writer does beside storing events.
#include "host/base/TimeText.h"
#include "host/history/HistoryWriter.h"

#include <cstddef>
#include <utility>

namespace zrm::host {

namespace {

constexpr std::int64_t millisecondsPerDay = 24 * 60 * 60'000;

/// How long the place of a sink that is no longer in the configuration is kept.
constexpr int daysOfUnusedCursors = 30;
constexpr std::chrono::hours tendingInterval{24};

/// Minutes of entries that are kept while they cannot be stored.
constexpr std::size_t mostMinutes = 24 * 60;

} // namespace

void HistoryWriter::addEntries(MinuteCounts counts) {
    const std::lock_guard guard(m_mutex);
    if (m_minutes.size() < mostMinutes) {
        m_minutes.push_back(std::move(counts));
    }
}

void HistoryWriter::storeEntries() {
    std::unique_lock lock(m_mutex);
    const std::vector<MinuteCounts> minutes = m_minutes;
    lock.unlock();
    if (!minutes.empty()) {
        m_file->addEntries(minutes);
        lock.lock();
        m_minutes.erase(m_minutes.begin(),
                        m_minutes.begin() + static_cast<std::ptrdiff_t>(minutes.size()));
    }
}

/// Silences that are over are kept for as long as events.
void HistoryWriter::tendSilences() {
    const std::vector<std::uint64_t> removed = m_silences.removeExpired(limits().time);
    if (!removed.empty()) {
        m_file->removeSilences(removed);
    }
}

HistoryFile::Limits HistoryWriter::limits() {
    const std::int64_t now = m_clock.now(WallClock::now(), Clock::now());
    return {m_config.keepEvents, now - m_config.keepDays * millisecondsPerDay, now};
}

void HistoryWriter::storeCursors() {
    const std::vector<CursorValue> moved = m_cursors.unsaved();
    if (!moved.empty()) {
        m_file->keepCursors(moved);
        m_cursors.saved(moved);
    }
}

/// Marks all running sinks as in use, also those that get no events, and forgets those that have
/// not been in use for long, and silences that are long over.
void HistoryWriter::tendCursors() {
    m_cursors.forgetSaved();
    storeCursors();
    m_file->removeOldCursors(daysOfUnusedCursors);
    tendSilences();
    m_nextTending = Clock::now() + tendingInterval;
}

/// Only what stands behind stored events: an entry whose events are lost is judged again.
void HistoryWriter::storePositions(bool isLast) {
    PositionValues moved;
    moved.logs = m_positions.unsaved(m_recent.newest());
    const bool isNow = isLast || !moved.logs.empty();
    moved.paths = m_positions.paths().unsaved(isNow ? 0 : WatchedPaths::storedEvery);
    moved.shares = m_positions.takeShares();
    if (moved != PositionValues{}) {
        m_file->keepPositions(moved);
        m_positions.saved(moved.logs);
        m_positions.paths().saved(moved.paths);
    }
}

void HistoryWriter::storeExpected(bool isLast) {
    ExpectedGroups& expected = m_positions.expected();
    if (const ExpectedValues values = expected.unsaved(isLast); !values.isEmpty()) {
        m_file->keepExpected(values);
        expected.saved(values);
    }
}

/// The positions of logs that are followed stay new; the others expire as events do.
void HistoryWriter::tendPositions() {
    m_positions.renewFollowed();
    storePositions();
    m_positions.removed(m_file->removeOldPositions(limits().time));
    m_nextTendingOfPositions = Clock::now() + tendingInterval;
}

/// What is done beside storing events, a little at a time.
void HistoryWriter::housekeep(bool idle) {
    const auto now = Clock::now();
    const bool isOver = m_recent.newest() - m_oldest.load() >= m_config.keepEvents;
    if (now < m_nextHousekeeping && !m_hasMoreToDo && !isOver) {
        return;
    }
    m_nextHousekeeping = now + housekeepingInterval;
    m_hasMoreToDo = false;
    if (m_readers.takeCorruption()) {
        replaceFile("a reader found it so");
    }
    leaveRemovedFiles();
    attempt([&] {
        if (now >= m_nextTending) {
            tendCursors();
        } else {
            storeCursors();
        }
        if (now >= m_nextTendingOfPositions) {
            tendPositions();
        } else {
            storePositions();
        }
        storeExpected();
        if (m_silences.areTooManyExpired()) {
            tendSilences();
        }
        storeEntries();
        m_hasMoreToDo = m_file->expire(limits()) || (idle && m_file->shrink());
        m_oldest.store(m_file->oldest());
    });
}

} // namespace zrm::host
