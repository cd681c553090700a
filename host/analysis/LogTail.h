#ifndef ZRM_HOST_LOG_TAIL_H
#define ZRM_HOST_LOG_TAIL_H

#include "host/base/Result.h"
#include "logs/EntryClock.h"
#include "logs/zrm_rmlogent_data.h"

#include <cstddef>
#include <functional>
#include <optional>
#include <string>
#include <string_view>

namespace zrm {
class LogFile;
} // namespace zrm

namespace zrm::host {

class JsonWriter;

/// How far back logs were read and why reading stopped.
struct Reach {
    std::string reached; ///< ENTRYTIME of the oldest entry read; empty: none was read
    std::string reason;  ///< why reading stopped early, as a clause; empty: everything was read

    bool isComplete() const noexcept { return reason.empty(); }
    /// Writes `complete`, `reached` and `reason`, members of an object.
    void write(JsonWriter& json) const;
};

/// Reads the end of a log, and lines that it might contain, as its monitor would: of a followed log
/// also older generations, as far as they are not compressed; in the same
/// pieces, or the same lines joined to entries, and with the log's own operation that makes rows.
/// A log that is not a file is read from its source, if that has a past. Ends with the request
/// (CTX1_IsCancelled) there.
/// The monitor is not affected: rows are made in the way of reports, and its counters do not count
/// them. While an entry of a followed log is given, its EntryInstant exists.
class LogTail {
public:
    static constexpr std::size_t longest = 4 * 1024 * 1024; ///< bytes of a text log
    static constexpr std::size_t mostEntries = 10000;       ///< of another log
    static constexpr std::size_t longestLine = 16 * 1024;   ///< bytes of a line passed to read

    /// One entry, oldest first. `line` is its text; none if the log has no lines, `row` null if the
    /// line yields none; both may be changed and are valid until the function returns. The line is
    /// the entry of the thread (LogEntry) that long.
    using Entry =
        std::function<void(std::optional<std::string_view> line, zrm_rmlogent_data_t* row)>;

    /// The log outlives the object.
    explicit LogTail(LogFile& log);

    /// Whether the log is a file of lines; otherwise its entries come from its reports, and no line
    /// can be passed.
    bool hasLines() const noexcept;

    /// Reads the log's end. Of a log that is not a file, entries younger than `until` (16
    /// characters; empty: none) are left out.
    Result<void> read(const Entry& entry, const std::string& until = "");

    /// Reads one line, of at most `longestLine` bytes without a newline, in its pieces.
    Result<void> readLine(std::string_view line, const Entry& entry);

    /// How far `read` has reached back.
    const Reach& reach() const noexcept { return m_reach; }

private:
    std::size_t recordLength() const noexcept;
    Result<void> readLines(int fd, const Entry& entry);
    void readRecords(int fd, const Entry& entry);
    void readOlder(int present, const Entry& entry);
    void pieces(int fd, const Entry& entry);
    void wholeEntries(int fd, const Entry& entry);
    void judge(char* line, std::string text, const Entry& entry);
    void entries(const Entry& entry);
    Result<void> readSource(const std::string& until, const Entry& entry);

    void give(const Entry& entry, std::optional<std::string_view> line, zrm_rmlogent_data_t& row,
              const EntryMoment& moment);
    void note(const zrm_rmlogent_data_t& oldest);

    LogFile& m_log;
    EntryClock m_clock;
    Reach m_reach;
    bool m_isCut = false; ///< the log begins before what is read
    std::string m_older;  ///< the newest generation that is not read; empty: unknown, or none
};

} // namespace zrm::host

#endif
