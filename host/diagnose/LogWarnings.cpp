#include "host/diagnose/LogWarnings.h"

#include "base/TraceScope.h"
#include "host/base/TimeText.h"
#include "host/diagnose/LastLines.h"
#include "host/diagnose/MonitoredLogFile.h"
#include "host/framework/TraceCapture.h"
#include "logs/FurtherLogs.h"
#include "logs/ValidLog.h"
#include "logtypes/AdminLogFile.h"
#include "logtypes/SysLogFile.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstring>
#include <ctime>
#include <memory>
#include <optional>
#include <string_view>

#include <sys/stat.h>
#include <unistd.h>

namespace zrm::host {

namespace {

TRC1_Anchor anchor{"LogWarnings.cpp"};

constexpr std::size_t linesTried = 20;
constexpr std::size_t byteLimit = 64 * 1024; ///< bytes read from the end of the file
constexpr std::size_t recordsTried = 50;

constexpr const char* syslogCure =
    "Describe the file as a text log with a format, or let the system logger write traditional "
    "times (RSYSLOG_TraditionalFileFormat).";
constexpr const char* accountingCure = "Linux's wtmp has other records and cannot be read as type "
                                       "A: remove its line from the log configuration.";
constexpr const char* tableAccountingCure =
    "Linux's wtmp has other records and cannot be read as type \"accounting\": remove it from the "
    "[[log]] table, or exclude it there.";

/// A syslog file that is not monitored.
class TrialSyslog : public SysLogFile {
public:
    explicit TrialSyslog(const ValidLog& line) : SysLogFile(line, Unmonitored{}) {}
};

/// What has become of the name of an open file; none while it still leads to the file.
std::optional<LogWarning> ofName(const LogLedgerView& log) {
    constexpr const char* cure =
        " Rotate with copytruncate. To have the new file read, restart the agent, or remove the "
        "log's line from the log configuration, refresh, add it again, and refresh once more.";
    struct stat status;
    if (!log.openFile) {
        return std::nullopt;
    }
    if (::stat(log.file.c_str(), &status) != 0) {
        if (errno != ENOENT && errno != ENOTDIR) {
            return std::nullopt;
        }
        return LogWarning{"missing", 0,
                          "No file has this log's name any more. The agent continues to read the "
                          "file that it has opened, and will not read a new one of this name." +
                              std::string(cure)};
    }
    if (FileIdentity{status.st_dev, status.st_ino} == *log.openFile) {
        return std::nullopt;
    }
    return LogWarning{"replaced", 0,
                      "Another file now has this log's name and is not read: the agent continues "
                      "to read the file that it has opened." +
                          std::string(cure)};
}

/// What keeps a log of a [[log]] table from being read.
std::optional<LogWarning> ofFollowing(const FollowView& follow) {
    if (follow.state == "not a file") {
        return LogWarning{"failing", 0,
                          "What has this log's name is not a regular file. The agent waits for "
                          "one."};
    }
    if (follow.problem.empty()) {
        return std::nullopt;
    }
    return LogWarning{"failing", 0,
                      "The log cannot be read at present: " + follow.problem +
                          (follow.isSource ? "." : ". Check the file's permissions and the disk.")};
}

/// A time as the operator's clock shows it, with its difference from UTC.
std::string localTime(std::int64_t milliseconds) {
    const std::time_t seconds = milliseconds / 1000;
    std::tm local{};
    char text[64];
    localtime_r(&seconds, &local);
    return {text, std::strftime(text, sizeof text, "%Y-%m-%d %H:%M:%S %z", &local)};
}

/// What was lost lately of a log of a [[log]] table.
std::optional<LogWarning> ofLosses(const FollowView& follow) {
    constexpr std::int64_t day = 24 * 60 * 60 * 1000;
    const std::int64_t since = WallClock::now() - day;
    const auto count = std::count_if(follow.lost.begin(), follow.lost.end(),
                                     [since](const auto& range) { return range.time >= since; });
    if (count == 0) {
        return std::nullopt;
    }
    const FollowView::Range& last = follow.lost.back();
    if (!last.text.empty()) {
        return LogWarning{"lost", 0,
                          last.text + " This was noticed at " + localTime(last.time) + '.'};
    }
    const std::string what =
        last.from == last.to
            ? "What followed byte " + std::to_string(last.from) + " was"
            : "Bytes " + std::to_string(last.from) + " to " + std::to_string(last.to) + " were";
    const std::string losses =
        count == 1 ? "" : ", the latest of " + std::to_string(count) + " losses in 24 hours";
    const std::string lost = what + " lost at " + localTime(last.time) + losses;
    if (!last.source.empty()) {
        return LogWarning{"lost", 0,
                          lost + ": " + last.source +
                              " cannot be read. Check the file and its permissions; once it is "
                              "readable, a report on the log shows its entries."};
    }
    return LogWarning{
        "lost", 0,
        lost + ": removed or rotated away before they were read, and not readable in any "
               "older file. Rotate by renaming, or keep the older files in the log's directory or "
               "name theirs in rotated_to."};
}

/// Whether a log of the log configuration is also in the list of logs to follow.
bool isNamedTwice(const LogLedgerView& log) {
    const std::shared_ptr<const FurtherLogs::List> further = FurtherLogs::published();
    return !log.follow && further != nullptr &&
           std::any_of(further->begin(), further->end(),
                       [&log](const FurtherLog& one) { return one.name == log.log; });
}

bool isText(const char* text, std::size_t size) {
    return std::all_of(text, text + strnlen(text, size), [](char character) {
        const auto code = static_cast<unsigned char>(character);
        return code >= ' ' && code != 0x7f;
    });
}

bool isPlausible(const AdminLogFile::utmp& record, std::time_t now) {
    constexpr std::int64_t day = 24 * 60 * 60;
    constexpr int mostTypes = 10;
    return record.ut_type >= 0 && record.ut_type < mostTypes && record.ut_time >= 0 &&
           record.ut_time <= now + day && isText(record.ut_user, sizeof record.ut_user) &&
           isText(record.ut_id, sizeof record.ut_id) &&
           isText(record.ut_line, sizeof record.ut_line);
}

/// Why a file does not consist of accounting records; none if it may.
std::optional<std::string> notRecords(const std::string& path,
                                      const std::optional<FileIdentity>& opened) {
    constexpr std::size_t length = AdminLogFile::recordLength;
    struct stat status {};
    std::array<AdminLogFile::utmp, recordsTried> records;
    ssize_t count = 0;
    const Result<MonitoredLogFile> file = MonitoredLogFile::open(path, opened);
    if (file && ::fstat(file->descriptor(), &status) == 0) {
        const off_t from = std::max<off_t>(0, status.st_size - static_cast<off_t>(sizeof records));
        count = ::pread(file->descriptor(), records.data(), sizeof records,
                        from - from % off_t{length});
    }
    if (count <= 0) {
        return std::nullopt;
    }
    if (status.st_size % off_t{length} != 0) {
        return "The file does not consist of login records of 40 bytes: its size, " +
               std::to_string(status.st_size) + " bytes, is not a multiple of 40. ";
    }
    const std::time_t now = WallClock::seconds();
    const AdminLogFile::utmp* const first = records.data();
    const AdminLogFile::utmp* const end = first + static_cast<std::size_t>(count) / length;
    const bool isRight = std::all_of(
        first, end, [now](const AdminLogFile::utmp& record) { return isPlausible(record, now); });
    if (isRight) {
        return std::nullopt;
    }
    return "The file does not consist of login records of 40 bytes: what it holds cannot be "
           "such records. ";
}

} // namespace

std::vector<LogWarning> LogWarnings::of(const LogLedgerView& log) {
    TraceScope trace(anchor);
    std::vector<LogWarning> warnings;
    if (isNamedTwice(log)) {
        warnings.push_back({"named_twice", 0,
                            "The log configuration and a [[log]] table both name this file; the "
                            "line of the log configuration applies. Remove one of them."});
    }
    if (std::optional<LogWarning> warning = log.follow ? ofFollowing(*log.follow) : ofName(log)) {
        warnings.push_back(std::move(*warning));
    }
    if (std::optional<LogWarning> warning = log.follow ? ofLosses(*log.follow) : std::nullopt) {
        warnings.push_back(std::move(*warning));
    }
    if (log.type == 'S' && log.withoutTime > 0 && log.withoutTime * 2 > log.rows) {
        warnings.push_back(
            {"without_time", 0,
             std::to_string(log.withoutTime) + " of " + std::to_string(log.rows) +
                 (log.follow ? " entries have no time: their lines are in no form that system "
                               "loggers write. \"zrmctl suggest " +
                                   log.file + "\" names the format to put into its [[log]] table."
                             : " entries have no time: their lines do not begin like \"Oct "
                               " 5 07:03:09\". " +
                                   std::string(syslogCure))});
    }
    if (log.type == 'A') {
        if (const std::optional<std::string> text = notRecords(log.file, log.openFile)) {
            warnings.push_back(
                {"not_records", 0, *text + (log.follow ? tableAccountingCure : accountingCure)});
        }
    }
    return warnings;
}

std::optional<std::string>
LogWarnings::ofAccountingFile(const std::string& path, const std::optional<FileIdentity>& opened) {
    TraceScope trace(anchor);
    std::optional<std::string> text = notRecords(path, opened);
    if (text) {
        *text += accountingCure;
    }
    return text;
}

std::optional<std::string> LogWarnings::ofSyslogFile(const std::string& path) {
    TraceScope trace(anchor);
    const Result<MonitoredLogFile> file = MonitoredLogFile::open(path, std::nullopt);
    const auto lines =
        file ? LastLines::read(file->descriptor(), linesTried, byteLimit) : std::nullopt;
    if (!lines) {
        return std::nullopt;
    }
    const TraceCapture quiet;
    char noLine[] = "";
    const ValidLog unnamed(CONFIG_USER, noLine, nullptr);
    TrialSyslog syslog(unnamed);
    const auto row = std::make_unique<zrm_rmlogent_data_t>();
    std::size_t tried = 0;
    for (const std::string& line : *lines) {
        std::string piece = line + '\n';
        if (line.empty() || syslog.formatEntryAsRow(piece.data(), row.get(), nullptr) != 0) {
            continue;
        }
        if (row->entrytime[0] != ' ') {
            return std::nullopt;
        }
        ++tried;
    }
    if (tried == 0) {
        return std::nullopt;
    }
    return std::string("None of the file's last lines begins with a time like \"Oct  "
                       "5 07:03:09\", so its entries would have none. ") +
           syslogCure;
}

} // namespace zrm::host
