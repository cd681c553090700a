#ifndef ZRM_SOURCE_REPORT_H
#define ZRM_SOURCE_REPORT_H

#include "logs/EntrySource.h"
#include "logs/FollowSettings.h"
#include "logtypes/FollowedReport.h"

#include <cstdint>
#include <memory>
#include <string>

namespace zrm {

class LogFile;

/// Reads a log that is not a file for a report, the newest entry first, by seeking in time. One
/// thread; ends when its request does (CTX1_IsCancelled).
class SourceReport {
public:
    /// Why a source without a past cannot be read, as a clause.
    static constexpr const char* noPast = "what a command has printed cannot be read again";

    /// The end of the second of a time stamp, in microseconds since 1970-01-01 UTC; of a time that
    /// occurs twice, the second one.
    static std::int64_t latestOf(const char* stamp);
    /// The begin of the second, the first one of two.
    static std::int64_t earliestOf(const char* stamp);

    /// The log need not outlive the report.
    SourceReport(const LogFile& log, FollowedReport::Options options);
    ~SourceReport();
    SourceReport(const SourceReport&) = delete;
    SourceReport& operator=(const SourceReport&) = delete;

    /// Progress is in seconds of the window.
    void run(FollowedReport::Receiver& receiver);

    std::uint64_t skipped() const noexcept { return m_skipped; }
    bool isLimited() const noexcept { return m_given == m_options.limit; }
    bool isCancelled() const noexcept { return m_isCancelled; }
    /// ENTRYTIME of the oldest entry between the two times, or empty if there was none.
    const std::string& reached() const noexcept { return m_reached; }
    /// Why not all was read, as a clause; empty if all was.
    const std::string& problem() const noexcept;

private:
    struct Log;

    const std::unique_ptr<Log> m_log;                ///< makes the rows; has no thread
    const std::unique_ptr<EntrySource::Past> m_past; ///< null: the source has none
    const FollowedReport::Options m_options;
    std::size_t m_given = 0;
    std::uint64_t m_skipped = 0;
    bool m_isCancelled = false;
    std::string m_reached;
};

} // namespace zrm

#endif
