#ifndef ZRM_LOG_LEDGER_H
#define ZRM_LOG_LEDGER_H

#include "framework/locks.h"
#include "monitor/FileIdentity.h"
#include "monitor/Latest.h"
#include "monitor/LineShapes.h"

#include <atomic>
#include <cstddef>
#include <cstdint>
#include <ctime>
#include <optional>
#include <string_view>

namespace zrm {

/// Records what a log's monitor has read and skipped since monitoring began. The log itself
/// counts lines and format errors. The log's thread writes, any thread reads. Ordinary
/// lines need no lock: only a line that does not match and a truncation take it, and the
/// first of these allocates the memory to keep them. Without memory they are counted but
/// not kept.
class LogLedger {
public:
    /// A line that did not match, without its line end.
    struct RejectedLine {
        std::timespec time; ///< when it was read
        std::size_t length;
        char text[2048];
        char reason[128]; ///< terminated; empty: it does not match the format
    };
    enum class Truncation {
        seen,    ///< the file became shorter
        regrown, ///< the file did not, but no longer held the bytes last read
    };
    /// What a truncation hides from the monitor: the bytes before the position from which the file
    /// is now followed, and the bytes appended before the truncation and never read.
    struct SkippedRange {
        std::timespec time; ///< when the truncation was noticed
        std::int64_t from;
        std::int64_t to;     ///< one past the last byte
        std::int64_t unread; ///< bytes of the old contents; -1: unknown
        Truncation kind;
    };
    static constexpr std::size_t mostKept = 16; ///< number of lines and ranges kept (the latest)

    LogLedger() = default;
    LogLedger(const LogLedger&) = delete;
    LogLedger& operator=(const LogLedger&) = delete;

    // On the log's thread.

    /// The log's file was opened (or closed, if there is none).
    void noteFile(const std::optional<FileIdentity>& file) noexcept;
    void addBytes(std::int64_t count) noexcept;
    /// Entries were just read.
    void noteEntries() noexcept;
    /// A line did not match the format. `reason`: why not, if there is more to say.
    void noteRejected(const char* line, std::string_view reason = {}) noexcept;
    /// `first` is the first character of a row's ENTRYTIME.
    void noteTime(char first) noexcept {
        if (first == ' ') {
            m_withoutTime.store(m_withoutTime.load(std::memory_order_relaxed) + 1,
                                std::memory_order_relaxed);
        }
    }
    /// The log was truncated. Reading continues at `from`, and `unread` bytes of the old contents
    /// are lost (-1: unknown).
    void noteTruncated(Truncation kind, std::int64_t from, std::int64_t unread) noexcept;

    // On the thread that starts the monitor.

    void noteStart() noexcept { m_starts.fetch_add(1, std::memory_order_relaxed); }

    // On any thread.

    /// The file that the monitor has open, if any.
    std::optional<FileIdentity> file() const noexcept;
    std::int64_t bytesRead() const noexcept { return m_bytes.load(std::memory_order_relaxed); }
    std::int64_t truncations() const noexcept {
        return m_truncations.load(std::memory_order_relaxed);
    }
    /// The number of rows without a time.
    std::int64_t withoutTime() const noexcept {
        return m_withoutTime.load(std::memory_order_relaxed);
    }
    std::int64_t skippedBytes() const noexcept { return m_skipped.load(std::memory_order_relaxed); }
    /// How often the monitor was restarted.
    std::int64_t restarts() const noexcept;
    /// When entries were last read, in nanoseconds since the epoch; 0: never.
    std::int64_t lastEntry() const noexcept { return m_lastEntry.load(std::memory_order_relaxed); }
    /// Copies the kept lines, oldest first, to an array of mostKept. Returns their number.
    std::size_t copyRejected(RejectedLine* lines) const noexcept;
    /// Does the same for the ranges.
    std::size_t copySkipped(SkippedRange* ranges) const noexcept;
    /// Copies the most frequent shapes of the lines that did not match, the most frequent first, to
    /// an array of LineShapes::mostKept. Returns their number.
    std::size_t copyShapes(LineShapes::Shape* shapes) const noexcept;

private:
    std::atomic<std::int64_t> m_bytes{0};
    std::atomic<std::int64_t> m_truncations{0};
    std::atomic<std::int64_t> m_skipped{0};
    std::atomic<std::int64_t> m_withoutTime{0};
    std::atomic<std::int64_t> m_starts{0};
    std::atomic<std::int64_t> m_lastEntry{0};
    mutable SYS1_Lock m_lock; ///< guards the members below
    std::optional<FileIdentity> m_file;
    Latest<RejectedLine, mostKept> m_rejectedLines;
    LineShapes m_rejectedShapes;
    Latest<SkippedRange, mostKept> m_skippedRanges;
};

} // namespace zrm

#endif
