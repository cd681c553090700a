#include "monitor/LogLedger.h"

#include "base/LockGuard.h"
#include "base/WallTime.h"

#include <algorithm>
#include <cstring>

namespace zrm {

namespace {

/// Adds without an atomic read-modify-write: only one thread writes the counter.
void add(std::atomic<std::int64_t>& counter, std::int64_t count) noexcept {
    counter.store(counter.load(std::memory_order_relaxed) + count, std::memory_order_relaxed);
}

} // namespace

void LogLedger::noteFile(const std::optional<FileIdentity>& file) noexcept {
    const LockGuard guard(&m_lock);
    m_file = file;
}

std::optional<FileIdentity> LogLedger::file() const noexcept {
    const LockGuard guard(&m_lock);
    return m_file;
}

void LogLedger::addBytes(std::int64_t count) noexcept {
    add(m_bytes, count);
}

void LogLedger::noteEntries() noexcept {
    constexpr std::int64_t nanoseconds = 1'000'000'000;
    const std::timespec time = wallTime();
    m_lastEntry.store(time.tv_sec * nanoseconds + time.tv_nsec, std::memory_order_relaxed);
}

void LogLedger::noteRejected(const char* line, std::string_view reason) noexcept {
    std::size_t length = strnlen(line, sizeof RejectedLine::text);
    length -= length > 0 && line[length - 1] == '\n' ? 1 : 0;
    const LockGuard guard(&m_lock);
    if (length > 0) { // records are not texts
        m_rejectedShapes.note({line, length});
    }
    if (RejectedLine* const rejected = m_rejectedLines.next()) {
        rejected->time = wallTime();
        rejected->length = length;
        std::memcpy(rejected->text, line, length);
        rejected->reason[reason.copy(rejected->reason, sizeof rejected->reason - 1)] = '\0';
    }
}

void LogLedger::noteTruncated(Truncation kind, std::int64_t from, std::int64_t unread) noexcept {
    add(m_truncations, 1);
    add(m_skipped, from + std::max<std::int64_t>(unread, 0));
    const LockGuard guard(&m_lock);
    if (SkippedRange* const skipped = m_skippedRanges.next()) {
        *skipped = {wallTime(), 0, from, unread, kind};
    }
}

std::int64_t LogLedger::restarts() const noexcept {
    return std::max<std::int64_t>(m_starts.load(std::memory_order_relaxed) - 1, 0);
}

std::size_t LogLedger::copyRejected(RejectedLine* lines) const noexcept {
    const LockGuard guard(&m_lock);
    return m_rejectedLines.copy(lines);
}

std::size_t LogLedger::copyShapes(LineShapes::Shape* shapes) const noexcept {
    const LockGuard guard(&m_lock);
    return m_rejectedShapes.copy(shapes);
}

std::size_t LogLedger::copySkipped(SkippedRange* ranges) const noexcept {
    const LockGuard guard(&m_lock);
    return m_skippedRanges.copy(ranges);
}

} // namespace zrm
