#ifndef ZRM_LOG_LEDGER_H
#define ZRM_LOG_LEDGER_H

#include "framework/locks.h"
#include "monitor/FileIdentity.h"

#include <atomic>
#include <cstddef>
#include <cstdint>
#include <ctime>
#include <memory>
#include <optional>

namespace zrm {

/// What one log's monitor has read and what it has passed over, since the log is monitored; beside
/// the numbers of lines and of format errors, which the log itself counts. The log's thread writes,
/// any thread reads. Reading costs the log's thread nothing: it takes the lock only for a line that
/// does not fit and for a truncation, and memory for these is allocated by the first of them.
/// Without memory they are counted, but not kept.
class LogLedger {
public:
    /// A line that did not fit, without its line end.
    struct RejectedLine {
        std::timespec time; ///< when it was read
        std::size_t length;
        char text[2048];
    };
    enum class Truncation {
        seen,    ///< the file was shorter than before
        regrown, ///< it was not, but no longer held the bytes read last
    };
    /// What a truncation keeps from the monitor: the bytes in front of the place from which the
    /// file is followed now, and those that were appended before it and never read.
    struct SkippedRange {
        std::timespec time; ///< when the truncation was noticed
        std::int64_t from;
        std::int64_t to;     ///< behind the last byte
        std::int64_t unread; ///< bytes of the old contents; -1: not known
        Truncation kind;
    };
    static constexpr std::size_t mostKept = 16; ///< lines and ranges that are kept, the latest

    LogLedger() = default;
    LogLedger(const LogLedger&) = delete;
    LogLedger& operator=(const LogLedger&) = delete;

    // On the log's thread.

    /// The log's file was opened, or, with none, closed.
    void noteFile(const std::optional<FileIdentity>& file) noexcept;
    void addBytes(std::int64_t count) noexcept;
    /// Entries have just been read.
    void noteEntries() noexcept;
    /// A line did not fit.
    void noteRejected(const char* line) noexcept;
    /// A row has this first character in its ENTRYTIME.
    void noteTime(char first) noexcept {
        if (first == ' ') {
            m_withoutTime.store(m_withoutTime.load(std::memory_order_relaxed) + 1,
                                std::memory_order_relaxed);
        }
    }
    /// The log was truncated; reading goes on at `from`, and `unread` bytes of the old contents are
    /// lost (-1: not known).
    void noteTruncated(Truncation kind, std::int64_t from, std::int64_t unread) noexcept;

    // On the thread that starts the monitor.

    void noteStart() noexcept { m_starts.fetch_add(1, std::memory_order_relaxed); }

    // On any thread.

    /// The file that the monitor has open; none while it has none.
    std::optional<FileIdentity> file() const noexcept;
    std::int64_t bytesRead() const noexcept { return m_bytes.load(std::memory_order_relaxed); }
    std::int64_t truncations() const noexcept {
        return m_truncations.load(std::memory_order_relaxed);
    }
    /// Rows without a time.
    std::int64_t withoutTime() const noexcept {
        return m_withoutTime.load(std::memory_order_relaxed);
    }
    std::int64_t skippedBytes() const noexcept { return m_skipped.load(std::memory_order_relaxed); }
    /// How often the monitor was started again.
    std::int64_t restarts() const noexcept;
    /// When entries were read last, in nanoseconds since the epoch; 0: never.
    std::int64_t lastEntry() const noexcept { return m_lastEntry.load(std::memory_order_relaxed); }
    /// Copies the lines kept, the oldest first, to an array of KEPT. Returns their number.
    std::size_t copyRejected(RejectedLine* lines) const noexcept;
    /// The same for the ranges.
    std::size_t copySkipped(SkippedRange* ranges) const noexcept;

private:
    template <typename Entry> struct Latest {
        std::unique_ptr<Entry[]> entries; ///< KEPT of them, or null
        std::size_t count = 0;            ///< written so far

        Entry* next() noexcept;
        std::size_t copy(Entry* out) const noexcept;
    };

    std::atomic<std::int64_t> m_bytes{0};
    std::atomic<std::int64_t> m_truncations{0};
    std::atomic<std::int64_t> m_skipped{0};
    std::atomic<std::int64_t> m_withoutTime{0};
    std::atomic<std::int64_t> m_starts{0};
    std::atomic<std::int64_t> m_lastEntry{0};
    mutable SYS1_Lock m_lock; ///< guards what follows
    std::optional<FileIdentity> m_file;
    Latest<RejectedLine> m_rejectedLines;
    Latest<SkippedRange> m_skippedRanges;
};

} // namespace zrm

#endif
