#include "host/history/HistorySource.h"

#include "base/TraceScope.h"
#include "host/base/Say.h"
#include "host/history/EventTable.h"
#include "host/history/Statement.h"

#include <algorithm>
#include <chrono>
#include <cinttypes>
#include <utility>

namespace zrm::host {

namespace {

TRC1_Anchor anchor{"HistorySource.cpp"};

constexpr std::uint64_t readAtOnce = 256;
constexpr std::size_t bytesAtOnce = std::size_t{8} * 1024 * 1024;
constexpr std::chrono::seconds pauseAfterFailure{1};

} // namespace

HistorySource::HistorySource(std::string sink, RecentEvents& recent, ReaderPool& readers,
                             Cursor& cursor)
    : m_sink(std::move(sink)), m_recent(recent), m_readers(readers), m_cursor(cursor) {}

std::span<const EventRecord> HistorySource::read(std::size_t most) {
    while (m_batch == nullptr || m_position == m_batch->size()) {
        if (!fetch()) {
            return {};
        }
    }
    const auto rest = m_batch->records().subspan(m_position);
    return rest.first(std::min(most, rest.size()));
}

/// False at the end; otherwise events may have arrived.
bool HistorySource::fetch() {
    m_batch.reset();
    const std::uint64_t id = m_cursor.load();
    // Read `ended` first, so that everything committed before the end is seen.
    const bool ended = m_recent.ended();
    if (m_recent.newest() <= id) {
        if (!ended) {
            m_recent.waitBeyond(id, RecentEvents::Clock::time_point::max(), {});
        }
        return !ended;
    }
    if (auto batch = m_recent.after(id)) {
        use(std::move(batch));
        return true;
    }
    return load() || !ended;
}

void HistorySource::use(std::shared_ptr<const EventBatch> batch) {
    const std::uint64_t id = m_cursor.load();
    if (batch->first() > id + 1) {
        passOver(batch->first());
    }
    m_position = static_cast<std::size_t>(m_cursor.load() + 1 - batch->first());
    m_batch = std::move(batch);
}

/// Continues at event `next`: those before it are gone.
void HistorySource::passOver(std::uint64_t next) {
    say("%s did not get the events %" PRIu64 " to %" PRIu64 ": the history no longer contains them",
        m_sink.c_str(), m_cursor.load() + 1, next - 1);
    m_cursor.store(next - 1);
}

/// False when the file could not be read; logs that once, and pauses.
bool HistorySource::load() {
    TraceScope trace(anchor);
    try {
        const std::uint64_t newest = m_recent.newest();
        std::shared_ptr<const EventBatch> batch = readFile();
        if (m_failing) {
            trace.error()("The history can be read again for %s.", m_sink.c_str());
        }
        m_failing = false;
        // After a corrupt file was replaced, memory reaches further back than the new file.
        const std::shared_ptr<const EventBatch> recent = m_recent.oldest();
        if (recent != nullptr && (batch->empty() || recent->first() < batch->first())) {
            batch = recent;
        }
        if (batch->empty()) {
            passOver(newest + 1);
        } else {
            use(std::move(batch));
        }
        return true;
    } catch (const DatabaseError& error) {
        if (!m_failing) {
            trace.error()("Error reading the history for %s: %s. Trying again.", m_sink.c_str(),
                          error.what());
        }
        m_failing = true;
        if (error.isCorruption()) {
            m_readers.noteCorruption();
        }
    }
    m_recent.waitBeyond(UINT64_MAX, RecentEvents::Clock::now() + pauseAfterFailure, {});
    return false;
}

/// The events after the cursor, up to the first damaged one; damaged ones at the front are skipped.
std::shared_ptr<const EventBatch> HistorySource::readFile() {
    auto batch = std::make_shared<EventBatch>();
    ReaderPool::Lease lease = m_readers.take();
    Statement events(*lease, std::string(StoredEventRow::select) +
                                 "events.id > ? ORDER BY events.id LIMIT ?");
    for (bool isMore = true; isMore && batch->empty();) {
        events.bind(1, m_cursor.load()).bind(2, readAtOnce);
        for (isMore = false; events.step() && addTo(*batch, StoredEventRow(events));) {
            isMore = true;
        }
        events.reset();
    }
    batch->seal();
    return batch;
}

/// False when the batch is to end: it is large, or the event is damaged and others must be
/// delivered before it.
bool HistorySource::addTo(EventBatch& batch, const StoredEventRow& row) {
    const EventRecord event = row.record();
    if (row.isIntact()) {
        batch.add(event);
        return batch.textBytes() < bytesAtOnce;
    }
    if (!batch.empty()) {
        return false;
    }
    if (event.id > m_cursor.load() + 1) {
        passOver(event.id);
    }
    say("%s did not get the event %" PRIu64
        ": it is damaged in the history, its content is not what was written",
        m_sink.c_str(), event.id);
    m_cursor.store(event.id);
    return true;
}

void HistorySource::release(std::size_t count) {
    m_position += count;
    if (count > 0) {
        m_cursor.store(m_batch->records()[m_position - 1].id);
    }
}

std::uint64_t HistorySource::backlog() const {
    const std::uint64_t cursor = m_cursor.load();
    const std::uint64_t newest = m_recent.newest();
    return newest > cursor ? newest - cursor : 0;
}

} // namespace zrm::host
