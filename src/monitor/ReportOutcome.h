#ifndef ZRM_REPORT_OUTCOME_H
#define ZRM_REPORT_OUTCOME_H

#include <cstddef>
#include <string>

namespace zrm {

/// Why a report ended.
enum class ReportEnd {
    complete,  ///< at the start of the window or of the log
    notRead,   ///< the log could not be opened, or its format is unknown
    otherFile, ///< its name belongs to another file, and only the monitored one may be read
    formatErrors,
    longLine,
    noTime,
    readError,
    brokenRecord,
    notAnEntry,
    commandFailed,
    rowLimit,
};

/// Which file a report on a log reads.
enum class ReportedFile {
    named,     ///< whichever file has the log's name now
    monitored, ///< only the file that the monitor has open; if it has none, not a symbolic link
};

/// How far a report reached and why it ended. The report functions cannot return this, so a
/// caller who needs it keeps an outcome on the same thread while the report runs; without one,
/// nothing is recorded. Outcomes may be nested; the innermost one records. Costs nothing per
/// entry.
class ReportOutcome {
public:
    explicit ReportOutcome(ReportedFile file = ReportedFile::named) noexcept;
    ~ReportOutcome();
    ReportOutcome(const ReportOutcome&) = delete;
    ReportOutcome& operator=(const ReportOutcome&) = delete;

    /// Which file a report on this thread may read.
    static ReportedFile file() noexcept;
    /// Records on the thread's outcome why the report ends. Only the first call counts; later
    /// reasons follow from it.
    static void note(ReportEnd end) noexcept;
    /// Records the ENTRYTIME (16 characters) of the oldest entry returned so far.
    static void noteReached(const char* entryTime) noexcept;

    ReportEnd end() const noexcept { return m_end; }
    bool isComplete() const noexcept { return m_end == ReportEnd::complete; }
    /// A clause without a capital letter and a full stop. Empty for a complete report.
    const char* reason() const noexcept;
    /// ENTRYTIME of the oldest entry returned, or empty if there was none.
    const std::string& reached() const noexcept { return m_reached; }

private:
    static constexpr std::size_t stampLength = 16;

    ReportOutcome* const m_outer;
    const ReportedFile m_file;
    bool m_isNoted = false;
    ReportEnd m_end = ReportEnd::complete;
    std::string m_reached;
};

} // namespace zrm

#endif
