#ifndef ZRM_REPORT_OUTCOME_H
#define ZRM_REPORT_OUTCOME_H

#include <cstddef>
#include <string>

namespace zrm {

/// Why a report ended.
enum class ReportEnd {
    complete, ///< at the beginning of the window or of the log
    notRead,  ///< the log could not be opened, or its format is not known
    formatErrors,
    longLine,
    noTime,
    readError,
    brokenRecord,
    notAnEntry,
    commandFailed,
    rowLimit,
};

/// How far a report reached and why it ended. The operations of reports have no room for it, so
/// whoever wants to know keeps an outcome while the report runs on the same thread; without one
/// nothing is noted. Outcomes may be nested: the innermost is the thread's. Notes cost nothing per
/// entry.
class ReportOutcome {
public:
    ReportOutcome() noexcept;
    ~ReportOutcome();
    ReportOutcome(const ReportOutcome&) = delete;
    ReportOutcome& operator=(const ReportOutcome&) = delete;

    /// Notes on the thread's outcome why the report ends. The first note counts: later ones follow
    /// from it.
    static void note(ReportEnd end) noexcept;
    /// Notes the ENTRYTIME (16 characters) of the oldest entry given so far.
    static void noteReached(const char* entryTime) noexcept;

    ReportEnd end() const noexcept { return m_end; }
    bool isComplete() const noexcept { return m_end == ReportEnd::complete; }
    /// A clause without a capital and a full stop; empty for a complete report.
    const char* reason() const noexcept;
    /// ENTRYTIME of the oldest entry given; empty when there was none.
    const std::string& reached() const noexcept { return m_reached; }

private:
    static constexpr std::size_t stampLength = 16;

    ReportOutcome* const m_outer;
    bool m_isNoted = false;
    ReportEnd m_end = ReportEnd::complete;
    std::string m_reached;
};

} // namespace zrm

#endif
