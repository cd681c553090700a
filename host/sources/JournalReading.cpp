#include "host/sources/JournalReading.h"

#include "base/ErrorText.h"
#include "host/base/TimeText.h"
#include "host/sources/MapFaults.h"

#include <algorithm>
#include <thread>

#include <sys/stat.h>

namespace zrm::host {

namespace {

using namespace std::chrono_literals;

constexpr auto firstPause = 1s;
constexpr auto longestPause = 60s;
constexpr auto lookInterval = 5s;
constexpr std::uint64_t second = 1'000'000;    ///< in microseconds
constexpr std::size_t mostRemarks = 16;        ///< that wait to be taken
constexpr const char* beforeAll = "beginning"; ///< the position before the first entry

} // namespace

JournalReading::JournalReading(const JournalConfig& config,
                               std::shared_ptr<const MessageFormat> messages,
                               std::shared_ptr<const LineJoin> join)
    : m_config(config), m_journal(config, std::move(messages)), m_rules(std::move(join)),
      m_faults(MapFaults::count()), m_pause(firstPause, longestPause) {
    if (m_rules) {
        m_join.emplace(*m_rules);
    }
}

void JournalReading::startAt(Start start) {
    m_position = start == Start::beginning ? beforeAll : "";
    open();
}

void JournalReading::resumeAt(const std::string& position) {
    m_position = JournalJoin::cursorOf(position);
    if (m_join) {
        m_join->begin(position);
    }
    open();
    if (m_journal.isOpen() && m_position != beforeAll && !Journal::holds(m_config, m_position)) {
        noteLoss();
    }
}

void JournalReading::recall(const std::string& position, std::chrono::seconds period) {
    const auto length = static_cast<std::uint64_t>(period.count()) * second;
    m_last = JournalJoin::cursorOf(position);
    const std::uint64_t time = Journal::timeOf(*m_last);
    m_recallFrom = time > length ? time - length : 0;
    m_isRecalled = *m_last == beforeAll;
    open();
}

void JournalReading::noteLoss() {
    const std::uint64_t time = Journal::timeOf(m_position);
    remark({true, "Entries of the journal may have been lost: the entry at which reading stopped" +
                      (time == 0 ? std::string()
                                 : ", of " + UtcTime::text(static_cast<std::int64_t>(time / 1000)) +
                                       ",") +
                      " has been removed, and with it perhaps younger ones."});
}

void JournalReading::fail(std::string problem) {
    m_journal.close();
    m_problem = std::move(problem);
    m_retry = Clock::now() + m_pause.next();
}

bool JournalReading::open() {
    hasNewDirectory(); // looked at before the files, so that none is missed between the two
    lookAtFiles();
    if (!m_problem.empty()) {
        return false;
    }
    int outcome = m_journal.open();
    outcome = outcome < 0 ? outcome : seek();
    if (outcome < 0) {
        fail(std::string("the journal cannot be opened: ") + ErrorText(-outcome).text());
        return false;
    }
    if (m_join && !m_join->hasBegun()) {
        m_join->begin(m_position);
    }
    m_pause.reset();
    return true;
}

/// Says which files cannot be read, each once. The others are read.
void JournalReading::lookAtFiles() {
    const JournalFiles found = JournalFiles::look(m_config.directory, m_files);
    m_problem.clear();
    if (!found.isReadable()) {
        m_wasAbsent = m_wasAbsent || (found.files.empty() && found.unreadable.empty());
        fail(found.problem());
        return;
    }
    m_files.clear();
    const JournalFiles::File* unreadable = nullptr;
    std::size_t count = 0;
    for (const JournalFiles::File& file : found.files) {
        m_files.insert(file.path);
        if (!file.problem.empty()) {
            unreadable = unreadable == nullptr ? &file : unreadable;
            ++count;
        }
    }
    if (unreadable != nullptr) {
        remark({false, std::to_string(count) + " of " + std::to_string(found.files.size()) +
                           " files of the journal cannot be read, " + unreadable->path +
                           " for one: " + unreadable->problem + ". The others are read."});
    }
}

int JournalReading::seek() {
    if (m_last) {
        return m_journal.seekTime(m_recallFrom);
    }
    if (m_position.empty()) {
        return seekEnd();
    }
    return m_position == beforeAll ? m_journal.seekHead() : seekPosition();
}

/// Behind the last entry. All is new in a journal that appears later.
int JournalReading::seekEnd() {
    if (!m_wasAbsent) {
        const int outcome = m_journal.seekTail();
        if (outcome < 0) {
            return outcome;
        }
        if (m_journal.stepBack()) {
            m_position = m_journal.cursor();
            return 0;
        }
    }
    m_position = beforeAll;
    return m_journal.seekHead();
}

/// Behind the entry of the position; where that is gone, at the one that came after it.
int JournalReading::seekPosition() {
    const int outcome = m_journal.seekCursor(m_position);
    if (outcome < 0) {
        return outcome;
    }
    if (m_journal.next() == Journal::Step::entry && m_journal.isAt(m_position)) {
        return 0;
    }
    return m_journal.seekCursor(m_position);
}

char* JournalReading::next() {
    if (!m_join) {
        return nextLine();
    }
    for (bool isMore = true;;) {
        const bool isOver = m_last && !isMore; // what is recalled has no further lines
        if (const JournalEntry* const entry = m_join->next(Clock::now(), isOver)) {
            m_journal.show(*entry);
            return m_journal.text();
        }
        if (!isMore) {
            return nullptr;
        }
        isMore = nextLine() != nullptr;
        if (isMore) {
            m_join->add(m_journal.line(), Clock::now());
        }
    }
}

/// The next entry of the journal, which may be one of several lines that are joined.
char* JournalReading::nextLine() {
    if (m_isRecalled || (!m_journal.isOpen() && (Clock::now() < m_retry || !open()))) {
        return nullptr;
    }
    Journal::Step step = m_journal.next();
    while (m_last && step == Journal::Step::passing) { // null would end the recollection
        step = m_journal.next();
    }
    m_isPassing = step == Journal::Step::passing;
    noteDamage();
    if (step == Journal::Step::failed) {
        notePosition();
        fail(std::string("the journal cannot be read: ") + ErrorText(-m_journal.error()).text());
    }
    if (step != Journal::Step::entry) {
        return nullptr;
    }
    if (m_last) {
        m_isRecalled = m_journal.isAt(*m_last) || m_journal.time() > Journal::timeOf(*m_last);
        return m_journal.time() > Journal::timeOf(*m_last) ? nullptr : m_journal.text();
    }
    return m_journal.text();
}

void JournalReading::noteDamage() {
    if (const std::uint64_t faults = MapFaults::count(); faults > m_faults) {
        m_faults = faults;
        remark({true, "A file of the journal was cut off, or the disk cannot read it: its entries "
                      "from there on are lost. The other files are read."});
    }
    constexpr std::uint64_t growth = 10; // from remark to remark
    if (m_journal.damaged() > growth * m_damaged) {
        m_damaged = m_journal.damaged();
        remark({true, std::to_string(m_damaged) + (m_damaged == 1 ? " entry" : " entries") +
                          " of the journal cannot be read, because a file is damaged. The others "
                          "are read."});
    }
}

void JournalReading::remark(EntrySource::Remark remark) {
    if (m_remarks.size() < mostRemarks && !m_last) { // what is recalled was remarked upon
        m_remarks.push_back(std::move(remark));
    }
}

void JournalReading::notePosition() {
    if (std::string cursor = m_journal.cursor(); !cursor.empty()) {
        m_position = std::move(cursor);
    }
}

std::string JournalReading::position() {
    notePosition();
    return m_join ? m_join->position() : m_position;
}

std::string JournalReading::takeBack() {
    if (m_join) {
        m_join->takeBack();
        return m_join->position();
    }
    return m_journal.isOpen() && m_journal.stepBack() ? m_journal.cursor() : m_position;
}

void JournalReading::wait(std::chrono::milliseconds most) {
    if (m_isPassing) {
        return;
    }
    if (!m_journal.isOpen()) {
        const auto pause = std::chrono::ceil<std::chrono::milliseconds>(m_retry - Clock::now());
        std::this_thread::sleep_for(std::clamp<std::chrono::milliseconds>(pause, 0ms, most));
        return;
    }
    notePosition(); // the library forgets the entry if its file is removed
    if (m_journal.wait(m_join ? m_join->patience(Clock::now(), most) : most)) {
        lookAtFiles();
    }
    if (Clock::now() >= m_look && hasNewDirectory()) {
        m_journal.close(); // the library watches only directories that it knows
        m_retry = {};
    }
}

/// True if a directory of the journal has come or gone since the last look.
bool JournalReading::hasNewDirectory() {
    m_look = Clock::now() + lookInterval;
    std::vector<ino_t> now;
    for (const std::string& path : m_config.directory.empty() ? JournalFiles::directories()
                                                              : std::vector{m_config.directory}) {
        struct stat status;
        now.push_back(::stat(path.c_str(), &status) == 0 ? status.st_ino : 0);
    }
    std::swap(now, m_directories);
    return now != m_directories;
}

bool JournalReading::read(EntryColumns& columns) {
    m_journal.read(columns);
    return true;
}

std::optional<EntrySource::Remark> JournalReading::takeRemark() {
    if (m_remarks.empty()) {
        return std::nullopt;
    }
    EntrySource::Remark remark = std::move(m_remarks.front());
    m_remarks.pop_front();
    return remark;
}

} // namespace zrm::host
