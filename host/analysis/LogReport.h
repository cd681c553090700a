#ifndef ZRM_HOST_LOG_REPORT_H
#define ZRM_HOST_LOG_REPORT_H

#include "host/analysis/EntryFilter.h"
#include "host/analysis/LogTail.h"
#include "host/framework/Condition.h"
#include "logtypes/FollowedReport.h"

#include <cstddef>
#include <cstdint>
#include <memory>
#include <string>
#include <vector>

class TableManager;

namespace zrm {
class EntryReader;
class SourceReport;
struct FollowSettings;
} // namespace zrm

namespace zrm::host {

/// What a report asks for.
struct ReportQuery {
    std::string log;  ///< full path
    std::string from; ///< 16-character time stamp, as `to`
    std::string to;
    std::vector<Condition> where;      ///< all must hold
    std::vector<Condition> conditions; ///< all of the above, in the form that the table takes
    std::size_t limit = 1000;          ///< rows
    std::vector<std::string> fields;   ///< that rows have; "*" means all
};

/// Why a report did not read all that was asked for, as a clause; empty if it did.
std::string reasonOf(const FollowedReport& report);
std::string reasonOf(const SourceReport& report);

/// One report on a monitored log. A followed log is read over all its generations, or backwards
/// from its source, apart from its monitor: no refresh waits for that. A log of the log
/// configuration is read by a sample of Log Entries, as it always is. One thread at a time.
class LogReport {
public:
    /// Bytes of the names and values that a row has of the fields that were asked for.
    static constexpr std::size_t mostFieldBytes = 16 * 1024;

    /// The fields of a row: a JSON object, empty if it has none of them, and whether it is cut.
    using Fields = FollowedReport::Detail;

    class Receiver {
    public:
        virtual ~Receiver() = default;
        /// A row that meets the conditions; they come newest first.
        virtual void row(const char* row, const Fields& fields) = 0;
        /// How many of all bytes were read or passed over so far. Only for a followed log.
        virtual void progress(std::int64_t read, std::int64_t total) = 0;
    };

    struct Result {
        std::size_t count = 0;    ///< rows
        bool isTruncated = false; ///< there may be more: a limit ended the report
        Reach reach;
        std::uint64_t skipped = 0;               ///< lines that are not entries
        std::vector<FollowedReport::File> files; ///< of a followed log, newest first
    };

    /// Null if the log is not monitored. May wait for a refresh. The table's manager outlives the
    /// object, which does not need the log any more.
    static std::unique_ptr<LogReport> open(ReportQuery query, TableManager& entries);
    virtual ~LogReport();
    LogReport(const LogReport&) = delete;
    LogReport& operator=(const LogReport&) = delete;

    /// False if the agent cannot take any more requests; run must not be called then.
    bool isOpen() const noexcept { return m_filter.isOpen(); }
    const RowLayout& layout() const { return m_filter.layout(); }
    /// False for a log of the log configuration, whose entries have no fields.
    bool hasFields() const noexcept { return m_source != nullptr || m_settings != nullptr; }

    /// Reads the log, once. Ends early when the thread's RequestLimit is reached. No row is given
    /// while a refresh would have to wait, so the receiver may wait for its client.
    virtual Result run(Receiver& receiver);

protected:
    LogReport(ReportQuery query, TableManager& entries);

private:
    Result runFollowed(Receiver& receiver);
    Result runSource(Receiver& receiver);
    Result runSample(Receiver& receiver) const;

    const ReportQuery m_query;
    EntryFilter m_filter;
    std::unique_ptr<SourceReport> m_source; ///< of a log that is not a file
    // Of a followed log.
    std::unique_ptr<EntryReader> m_reader; ///< null: the log is not followed
    std::string m_path;                    ///< in the local code page
    std::shared_ptr<const FollowSettings> m_settings;
};

} // namespace zrm::host

#endif
