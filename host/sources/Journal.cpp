#include "host/sources/Journal.h"

#include "framework/LogEntry.h"
#include "host/sources/MapFaults.h"

#include <algorithm>
#include <charconv>
#include <cstdlib>
#include <filesystem>
#include <system_error>
#include <utility>

#include <fnmatch.h>
#include <systemd/sd-id128.h>
#include <systemd/sd-journal.h>

namespace zrm::host {

namespace {

constexpr std::size_t longestText = EntryKeep::longestText;
constexpr std::string_view messageName = "MESSAGE";
constexpr std::size_t mostSteps = 10'000; ///< entries passed over in one call

bool isGlob(std::string_view text) noexcept {
    return text.find_first_of("*?[") != text.npos;
}

/// The program of this process as the journal names it.
std::string ownProgram() {
    std::error_code error;
    std::string path = std::filesystem::read_symlink("/proc/self/exe", error).string();
    constexpr std::string_view replaced = " (deleted)"; // since it was started
    if (path.ends_with(replaced)) {
        path.resize(path.size() - replaced.size());
    }
    return path;
}

std::string ownInvocation() {
    const char* const id = std::getenv("INVOCATION_ID");
    return id == nullptr ? "" : id;
}

} // namespace

Journal::Journal(const JournalConfig& config, std::shared_ptr<const MessageFormat> messages)
    : m_config(config), m_messages(std::move(messages)),
      m_hasGlobs(std::any_of(config.units.begin(), config.units.end(), isGlob)),
      m_ownProgram(ownProgram()), m_ownInvocation(ownInvocation()), m_message(longestText + 1) {
    if (m_messages) {
        m_messageReader.emplace(*m_messages);
    }
}

Journal::~Journal() {
    close();
}

void Journal::close() noexcept {
    const MapFaults tolerated;
    sd_journal_close(m_journal);
    m_journal = nullptr;
}

int Journal::open() {
    const MapFaults tolerated;
    close();
    const int outcome = m_config.directory.empty()
                            ? sd_journal_open(&m_journal, SD_JOURNAL_LOCAL_ONLY)
                            : sd_journal_open_directory(&m_journal, m_config.directory.c_str(), 0);
    if (outcome < 0) {
        m_journal = nullptr;
        return outcome;
    }
    // A compressed value is unpacked no further than it is used.
    sd_journal_set_data_threshold(m_journal, messageName.size() + 1 + longestText + 1);
    addMatches();
    return 0;
}

void Journal::addAlternatives(const char* field, const std::vector<std::string>& values) {
    for (const std::string& value : values) {
        sd_journal_add_match(m_journal, (std::string(field) + '=' + value).c_str(), 0);
    }
    sd_journal_add_conjunction(m_journal);
}

void Journal::addMatches() {
    if (!m_hasGlobs && !m_config.units.empty()) {
        for (const std::string& one : m_config.units) {
            sd_journal_add_match(m_journal, ("_SYSTEMD_UNIT=" + one).c_str(), 0);
            sd_journal_add_disjunction(m_journal);
            // What the manager says of the unit.
            sd_journal_add_match(m_journal, "_PID=1", 0);
            sd_journal_add_match(m_journal, ("UNIT=" + one).c_str(), 0);
            sd_journal_add_disjunction(m_journal);
        }
        sd_journal_add_conjunction(m_journal);
    }
    if (!m_config.identifiers.empty()) {
        addAlternatives("SYSLOG_IDENTIFIER", m_config.identifiers);
    }
    if (m_config.priority < JournalConfig::leastPriority) {
        std::vector<std::string> numbers;
        for (int priority = 0; priority <= m_config.priority; ++priority) {
            numbers.push_back(std::to_string(priority));
        }
        addAlternatives("PRIORITY", numbers);
    }
    if (sd_id128_t boot; m_config.isCurrentBoot && sd_id128_get_boot(&boot) >= 0) {
        char text[SD_ID128_STRING_MAX];
        addAlternatives("_BOOT_ID", {sd_id128_to_string(boot, text)});
    }
}

int Journal::seekHead() {
    const MapFaults tolerated;
    return sd_journal_seek_head(m_journal);
}

int Journal::seekTail() {
    const MapFaults tolerated;
    return sd_journal_seek_tail(m_journal);
}

int Journal::seekTime(std::uint64_t microseconds) {
    const MapFaults tolerated;
    return sd_journal_seek_realtime_usec(m_journal, microseconds);
}

int Journal::seekCursor(const std::string& cursor) {
    const MapFaults tolerated;
    return sd_journal_seek_cursor(m_journal, cursor.c_str());
}

Journal::Step Journal::step(Direction direction) {
    const MapFaults tolerated;
    for (std::size_t steps = 0; steps < mostSteps; ++steps) {
        m_error = direction == Direction::forward ? sd_journal_next(m_journal)
                                                  : sd_journal_previous(m_journal);
        if (m_error <= 0) {
            return m_error == 0 ? Step::none : Step::failed;
        }
        if (!load()) {
            ++m_damaged;
        } else if (isWanted()) {
            return Step::entry;
        }
    }
    return Step::passing;
}

bool Journal::stepBack() {
    const MapFaults tolerated;
    return sd_journal_previous(m_journal) > 0;
}

bool Journal::isAt(const std::string& cursor) const {
    const MapFaults tolerated;
    return sd_journal_test_cursor(m_journal, cursor.c_str()) > 0;
}

std::string Journal::cursor() const {
    const MapFaults tolerated;
    char* text = nullptr;
    if (m_journal == nullptr || sd_journal_get_cursor(m_journal, &text) < 0) {
        return "";
    }
    const std::unique_ptr<char, void (*)(void*)> owner(text, std::free);
    return text;
}

bool Journal::holds(const JournalConfig& config, const std::string& cursor) {
    JournalConfig all;
    all.directory = config.directory;
    const MapFaults tolerated;
    Journal journal(all);
    return journal.open() == 0 && journal.seekCursor(cursor) == 0 &&
           sd_journal_next(journal.m_journal) > 0 && journal.isAt(cursor);
}

std::uint64_t Journal::timeOf(std::string_view cursor) noexcept {
    const std::size_t at = cursor.find(";t=");
    std::uint64_t time = 0;
    if (at != cursor.npos) {
        std::from_chars(cursor.data() + at + 3, cursor.data() + cursor.size(), time, 16);
    }
    return time;
}

bool Journal::wait(std::chrono::milliseconds most) {
    const MapFaults tolerated;
    const int outcome = sd_journal_wait(m_journal, static_cast<std::uint64_t>(most.count()) * 1000);
    return outcome == SD_JOURNAL_INVALIDATE;
}

bool Journal::isWanted() const {
    if (m_isOwn) {
        return false;
    }
    if (!m_hasGlobs) {
        return true;
    }
    const auto matches = [this](Slot slot) {
        const std::string name(of(slot));
        return !name.empty() &&
               std::any_of(m_config.units.begin(), m_config.units.end(),
                           [&name](const std::string& pattern) {
                               return fnmatch(pattern.c_str(), name.c_str(), FNM_NOESCAPE) == 0;
                           });
    };
    return matches(unit) || (of(process) == "1" && matches(managed));
}

} // namespace zrm::host
