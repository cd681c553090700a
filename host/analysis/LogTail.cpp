#include "host/analysis/LogTail.h"

#include "base/TraceScope.h"
#include "host/analysis/LineEntry.h"
#include "host/base/JsonWriter.h"
#include "host/diagnose/MonitoredLogFile.h"
#include "logs/FollowSettings.h"
#include "logs/LineJoin.h"
#include "logs/RequestThresholds.h"
#include "monitor/Generation.h"
#include "monitor/GenerationNames.h"
#include "monitor/LineReader.h"
#include "monitor/LogFile.h"
#include "monitor/ReportOutcome.h"

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <utility>
#include <vector>

#include <fcntl.h>
#include <sys/stat.h>
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

/// Seeks to the first complete line among the file's last `room` bytes; false with errno set.
bool seekTail(int fd, off_t room) {
    const off_t end = lseek(fd, 0, SEEK_END);
    if (end == -1) {
        return false;
    }
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

/// The lines of an entry.
class JoinedLines {
public:
    /// Null: each line is an entry. Outlives the object.
    explicit JoinedLines(const LineJoin* join) : m_join(join) {}

    bool isEmpty() const noexcept { return m_lines == 0; }
    /// Whether a line belongs to the entry.
    bool takes(std::string_view line) const {
        return m_join != nullptr && m_lines < m_join->limits().lines &&
               m_text.size() + line.size() + 2 <= m_join->limits().bytes &&
               m_join->joins(std::string_view(m_text).substr(m_last), line);
    }
    void add(std::string_view line) {
        m_text += m_lines > 0 ? "\n" : "";
        m_last = m_text.size();
        m_text += line.substr(0, EntryKeep::longestText);
        ++m_lines;
    }
    /// The first line as a log's monitor judges it.
    std::string first() const {
        constexpr std::size_t longestLine = 2046;
        return m_text.substr(0, std::min(m_text.find('\n'), longestLine)) + '\n';
    }
    /// The whole entry, after which there is none.
    std::string take() {
        m_lines = 0;
        std::string text = std::exchange(m_text, {});
        text.resize(text.size() - (text.ends_with('\r') ? 1 : 0));
        return text;
    }

private:
    const LineJoin* const m_join;
    std::string m_text;
    std::size_t m_last = 0; ///< where the last line begins
    std::size_t m_lines = 0;
};

} // namespace

LogTail::LogTail(LogFile& log) : m_log(log), m_clock(log.followSettings()) {}

bool LogTail::hasLines() const noexcept {
    const auto& settings = m_log.followSettings();
    if (m_log.isSource()) {
        return false;
    }
    return m_log.type() == 'U' || m_log.type() == 'S' ||
           (settings && settings->format && recordLength() == 0);
}

/// Of a format of records; 0 for other logs.
std::size_t LogTail::recordLength() const noexcept {
    const auto& settings = m_log.followSettings();
    return settings && settings->format ? settings->format->recordLength() : 0;
}

Result<void> LogTail::read(const Entry& entry, const std::string& until) {
    TraceScope trace(anchor);
    m_reach = {};
    if (m_log.isSource()) {
        return readSource(until, entry);
    }
    if (m_log.type() == errorLog) {
        entries(entry);
        return {};
    }
    const auto file = MonitoredLogFile::open(m_log.fileNameLocal(), m_log.ledger().file());
    if (file && recordLength() != 0) {
        readRecords(file->descriptor(), entry);
        return {};
    }
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
    } else if (!m_older.empty()) {
        m_reach.reason = m_older + " and older generations are not read";
    }
    return lines;
}

/// Reads the generations before the present file, if that leaves room.
void LogTail::readOlder(int present, const Entry& entry) {
    struct stat status {};
    if (m_log.followSettings() == nullptr || fstat(present, &status) != 0) {
        return;
    }
    const std::string path = m_log.fileNameLocal();
    const std::unique_ptr<char, void (*)(void*)> real(realpath(path.c_str(), nullptr), std::free);
    const std::vector<GenerationFile> generations = newestFirst(
        findGenerations(real ? real.get() : path, {}, m_log.followSettings()->rotatedTo));
    const std::unique_ptr<Generation> named = Generation::open(path);
    off_t room = static_cast<off_t>(longest) - status.st_size;
    std::vector<std::unique_ptr<MonitoredLogFile>> files; // newest first
    for (const GenerationFile& generation : generations) {
        const auto opened = generation.isCompressed ? nullptr : Generation::open(generation.path);
        if (generation.identity == FileIdentity{status.st_dev, status.st_ino} ||
            (opened && named && opened->isCopyOf(*named))) {
            continue;
        }
        auto file = generation.isCompressed || room <= 0
                        ? Result<MonitoredLogFile>(refused("it is not read"))
                        : MonitoredLogFile::open(generation.path, generation.identity);
        if (!file || !seekTail(file->descriptor(), room)) {
            m_older = generation.path;
            break;
        }
        room -= generation.size;
        files.push_back(std::make_unique<MonitoredLogFile>(std::move(*file)));
    }
    m_isCut = room < 0;
    for (auto file = files.rbegin(); file != files.rend(); ++file) {
        wholeEntries((*file)->descriptor(), entry);
    }
}

/// Reads the lines at the end of a file.
Result<void> LogTail::readLines(int fd, const Entry& entry) {
    if (!seekTail(fd, static_cast<off_t>(longest))) {
        return refused(because("the log cannot be read", errno));
    }
    m_isCut = lseek(fd, 0, SEEK_CUR) > 0;
    if (!m_isCut) {
        readOlder(fd, entry);
    }
    pieces(fd, entry);
    return {};
}

/// Reads the newest records of a file.
void LogTail::readRecords(int fd, const Entry& entry) {
    const auto length = static_cast<off_t>(recordLength());
    const off_t count = std::max<off_t>(lseek(fd, 0, SEEK_END), 0) / length;
    const off_t passedOver = std::max<off_t>(count - static_cast<off_t>(mostEntries), 0);
    std::string record(recordLength(), '\0');
    for (off_t number = passedOver; number < count; ++number) {
        if (pread(fd, record.data(), record.size(), number * length) != length) {
            m_reach.reason = because("the log cannot be read", errno);
            return;
        }
        LineEntry read = LineEntry::ofRecord(&m_log, record);
        const LogEntry::Offer offer(read);
        zrm_rmlogent_data_t row;
        if (m_log.formatEntryAsRow(record.data(), &row, nullptr) == 0) {
            if (m_reach.reached.empty()) {
                note(row);
            }
            give(entry, std::nullopt, row, lastEntryMoment);
        }
    }
    if (passedOver > 0) {
        m_reach.reason = "only the newest " + std::to_string(mostEntries) + " records are read";
    }
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
    if (m_log.followSettings() != nullptr) {
        wholeEntries(fd, entry);
        return;
    }
    LineReader reader;
    reader.start(fd);
    // A busy log that grows meanwhile must not keep this loop from ending.
    std::size_t bytes = 0;
    for (char* piece; bytes < 2 * longest && (piece = reader.next()) != nullptr;) {
        std::string line = piece; // building the row may change it
        bytes += line.size() + 1;
        judge(piece, line, entry);
    }
}

/// The entries of a log that is followed: lines of any length, joined as the log's settings say.
void LogTail::wholeEntries(int fd, const Entry& entry) {
    JoinedLines lines(m_log.followSettings()->join.value.get());
    const auto end = [&] {
        std::string first = lines.first();
        judge(first.data(), lines.take(), entry);
    };
    LineReader reader;
    reader.start(fd);
    std::size_t bytes = 0;
    std::string line;
    const auto add = [&] {
        if (!lines.isEmpty() && !lines.takes(line)) {
            end();
        }
        lines.add(line);
        line.clear();
    };
    for (char* piece; bytes < 2 * longest && (piece = reader.next()) != nullptr;) {
        const std::string_view part(piece);
        bytes += part.size() + 1;
        line += part;
        if (line.ends_with('\n')) {
            line.pop_back();
            add();
        }
    }
    if (!line.empty()) {
        add();
    }
    if (!lines.isEmpty()) {
        end();
    }
}

/// Makes the row of an entry, of which the text begins with the line, and gives both.
void LogTail::judge(char* line, std::string text, const Entry& entry) {
    text.resize(text.size() - (text.ends_with('\n') ? 1 : 0));
    LineEntry read(&m_log, text);
    const LogEntry::Offer offer(read);
    zrm_rmlogent_data_t row;
    if (m_log.formatEntryAsRow(line, &row, nullptr) != 0) {
        entry(text, nullptr);
        return;
    }
    if (m_reach.reached.empty()) {
        note(row);
    }
    give(entry, text, row, lastEntryMoment);
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
