#include "host/analysis/LogTail.h"

#include "base/TraceScope.h"
#include "host/analysis/LineEntry.h"
#include "host/base/JsonWriter.h"
#include "host/diagnose/MonitoredLogFile.h"
#include "logs/FollowSettings.h"
#include "logs/RequestThresholds.h"
#include "monitor/LineReader.h"
#include "monitor/LogFile.h"
#include "monitor/ReportOutcome.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <utility>
#include <vector>

#include <fcntl.h>
#include <unistd.h>

namespace zrm::host {

namespace {

TRC1_Anchor anchor{"LogTail.cpp"};

} // namespace

void Reach::write(JsonWriter& json) const {
    json.member("complete", isComplete());
    json.textOrNull("reached", reached).textOrNull("reason", reason);
}

namespace {

constexpr char errorLog = 'E'; ///< this log is read through a command

/// A descriptor closed at the end of its scope.
class Descriptor {
public:
    explicit Descriptor(int fd) : m_fd(fd) {}
    ~Descriptor() { close(); }
    Descriptor(const Descriptor&) = delete;
    Descriptor& operator=(const Descriptor&) = delete;
    int get() const noexcept { return m_fd; }
    void close() {
        if (m_fd != -1) {
            ::close(m_fd);
            m_fd = -1;
        }
    }

private:
    int m_fd;
};

/// Seeks to the first complete line among the file's last bytes; false with errno set.
bool seekTail(int fd) {
    const off_t end = lseek(fd, 0, SEEK_END);
    if (end == -1) {
        return false;
    }
    const auto room = static_cast<off_t>(LogTail::longest);
    if (end <= room) {
        return lseek(fd, 0, SEEK_SET) != -1;
    }
    // A line may begin exactly there: check for a newline before it.
    off_t at = lseek(fd, end - room - 1, SEEK_SET);
    char block[4096];
    ssize_t count = 0;
    while (at != -1 && (count = read(fd, block, sizeof block)) > 0) {
        if (const void* const newline = std::memchr(block, '\n', static_cast<std::size_t>(count))) {
            return lseek(fd, at + (static_cast<const char*>(newline) - block) + 1, SEEK_SET) != -1;
        }
        at += count;
    }
    return at != -1 && count != -1;
}

} // namespace

LogTail::LogTail(LogFile& log) : m_log(log), m_clock(log.followSettings()) {}

bool LogTail::hasLines() const noexcept {
    const auto& settings = m_log.followSettings();
    return m_log.type() == 'U' || m_log.type() == 'S' ||
           (settings && settings->format && settings->format->recordLength() == 0);
}

Result<void> LogTail::read(const Entry& entry) {
    TraceScope trace(anchor);
    m_reach = {};
    if (m_log.type() == errorLog) {
        entries(entry);
        return {};
    }
    const auto file = MonitoredLogFile::open(m_log.fileNameLocal(), m_log.ledger().file());
    if (file && !hasLines()) {
        entries(entry);
        return {};
    }
    const Result<void> lines =
        file ? readLines(file->descriptor(), entry) : tl::unexpected(file.error());
    if (!lines) {
        m_reach.reason = lines.error().text();
    } else if (m_isCut) {
        m_reach.reason = "only the end of the log is read, 4 MiB";
    }
    return lines;
}

/// Reads the lines at the end of a file.
Result<void> LogTail::readLines(int fd, const Entry& entry) {
    if (!seekTail(fd)) {
        return refused(because("the log cannot be read", errno));
    }
    m_isCut = lseek(fd, 0, SEEK_CUR) > 0;
    pieces(fd, entry);
    return {};
}

Result<void> LogTail::readLine(std::string_view line, const Entry& entry) {
    TraceScope trace(anchor);
    int ends[2];
    if (pipe2(ends, O_CLOEXEC | O_NONBLOCK) == -1) {
        return refused(because("no pipe", errno));
    }
    const Descriptor readEnd(ends[0]);
    Descriptor writeEnd(ends[1]);
    const std::string text = std::string(line) + '\n';
    // An empty pipe takes this much at once.
    if (write(writeEnd.get(), text.data(), text.size()) != static_cast<ssize_t>(text.size())) {
        return refused(because("the line cannot be read", errno));
    }
    writeEnd.close();
    pieces(readEnd.get(), entry);
    return {};
}

void LogTail::pieces(int fd, const Entry& entry) {
    LineReader reader;
    reader.start(fd);
    zrm_rmlogent_data_t row;
    std::string line;
    // A busy log that grows meanwhile must not keep this loop from ending.
    std::size_t bytes = 0;
    bool isLineBegun = false;
    for (char* piece; bytes < 2 * longest && (piece = reader.next()) != nullptr;) {
        line = piece; // building the row may change it
        bytes += line.size() + 1;
        const bool isRest = std::exchange(isLineBegun, !line.ends_with('\n'));
        if (isRest && m_log.followSettings() != nullptr) {
            continue; // a line of a followed log is one entry
        }
        const bool isRow = m_log.formatEntryAsRow(piece, &row, nullptr) == 0;
        if (isRow && m_reach.reached.empty()) {
            note(row);
        }
        if (line.ends_with('\n')) {
            line.pop_back();
        }
        LineEntry read(&m_log, line);
        const LogEntry::Offer offer(read);
        if (isRow) {
            give(entry, line, row, lastEntryMoment);
        } else {
            entry(line, nullptr);
        }
    }
}

void LogTail::give(const Entry& entry, std::optional<std::string_view> line,
                   zrm_rmlogent_data_t& row, const EntryMoment& moment) {
    if (m_log.followSettings() == nullptr) {
        entry(line, &row);
        return;
    }
    const EntryInstant instant(m_clock.next(moment, row.entrytime));
    entry(line, &row);
}

/// The entries of a report over all times, newest first.
void LogTail::entries(const Entry& entry) {
    _RequestThresholds always{};
    std::strcpy(always.startTime, "0000000000000000");
    std::strcpy(always.endTime, "1991231235959000");
    const ReportOutcome outcome(ReportedFile::monitored);
    void* report = m_log.startReportRequest(&always);
    if (report == nullptr) {
        ReportOutcome::note(ReportEnd::notRead);
        m_reach.reason = outcome.reason();
        return;
    }
    std::vector<zrm_rmlogent_data_t> rows(1);
    std::vector<EntryMoment> moments;
    while (rows.size() <= mostEntries &&
           m_log.getNextLogEntry(&rows.back(), report, &always) != nullptr) {
        moments.push_back(lastEntryMoment);
        rows.emplace_back();
    }
    if (rows.size() > mostEntries) {
        ReportOutcome::note(ReportEnd::rowLimit);
    }
    m_log.endReportRequest(&report);
    m_reach.reason = outcome.reason();
    rows.pop_back();
    if (!rows.empty()) {
        note(rows.back());
    }
    for (std::size_t index = rows.size(); index-- > 0;) {
        give(entry, std::nullopt, rows[index], moments[index]);
    }
}

void LogTail::note(const zrm_rmlogent_data_t& oldest) {
    if (oldest.entrytime[0] != ' ') {
        m_reach.reached.assign(oldest.entrytime, sizeof oldest.entrytime);
    }
}

} // namespace zrm::host
