#include "host/sources/Journal.h"

#include "base/EntryFields.h"
#include "framework/LogEntry.h"
#include "host/sources/MapFaults.h"
#include "logs/ZoneTime.h"

#include <algorithm>
#include <cerrno>
#include <charconv>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <optional>
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

constexpr std::array<std::string_view, 8> priorityNames = {"emerg",   "alert",  "crit", "err",
                                                           "warning", "notice", "info", "debug"};

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

/// Takes what the columns need out of the entry. Asking for each field alone would look at all of
/// them each time.
bool Journal::load() {
    for (Text& slot : m_slots) {
        slot.length = 0;
    }
    m_hasMessage = m_isMessageCut = m_isOwn = false;
    m_messageLength = 0;
    m_priority = -1;
    sd_journal_restart_data(m_journal);
    const void* data = nullptr;
    std::size_t length = 0;
    int outcome = 0;
    while ((outcome = sd_journal_enumerate_available_data(m_journal, &data, &length)) > 0) {
        take({static_cast<const char*>(data), length});
    }
    m_message[m_messageLength] = '\0';
    return outcome == 0 && sd_journal_get_realtime_usec(m_journal, &m_time) >= 0;
}

void Journal::keep(Slot slot, std::string_view value) noexcept {
    Text& text = m_slots[slot];
    if (text.length == 0) { // of several values the first counts
        text.length = value.copy(text.text.data(), text.text.size());
    }
}

/// Takes one field, "NAME=value".
void Journal::take(std::string_view data) {
    const auto value = [&data](std::string_view name) {
        return data.starts_with(name) ? std::optional(data.substr(name.size())) : std::nullopt;
    };
    const auto keepIf = [&](Slot slot, std::string_view name) {
        if (const auto found = value(name)) {
            keep(slot, *found);
        }
    };
    if (data.size() < 3) {
        return;
    }
    switch (data[0] == '_' ? data[1] + 128 : data[0]) {
    case 'M':
        if (const auto text = value("MESSAGE="); text && !m_hasMessage) {
            m_hasMessage = true;
            m_isMessageCut = text->size() > longestText;
            m_messageLength = text->copy(m_message.data(), longestText);
        }
        break;
    case 'P':
        if (const auto text = value("PRIORITY=");
            text && text->size() == 1 && (*text)[0] >= '0' && (*text)[0] <= '7') {
            m_priority = (*text)[0] - '0';
        }
        break;
    case 'S':
        keepIf(identifier, "SYSLOG_IDENTIFIER=");
        keepIf(claimed, "SYSLOG_PID=");
        break;
    case 'U':
        keepIf(managed, "UNIT=");
        break;
    case 'C' + 128:
        keepIf(command, "_COMM=");
        break;
    case 'E' + 128:
        m_isOwn = m_isOwn || (!m_ownProgram.empty() && value("_EXE=") == m_ownProgram);
        break;
    case 'H' + 128:
        keepIf(host, "_HOSTNAME=");
        break;
    case 'P' + 128:
        keepIf(process, "_PID=");
        break;
    case 'S' + 128:
        keepIf(unit, "_SYSTEMD_UNIT=");
        m_isOwn = m_isOwn ||
                  (!m_ownInvocation.empty() && value("_SYSTEMD_INVOCATION_ID=") == m_ownInvocation);
        break;
    default:
        break;
    }
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

void Journal::buildSource() {
    m_sourceLength = 0;
    const auto append = [this](std::string_view text) {
        m_sourceLength +=
            text.copy(m_source.data() + m_sourceLength, m_source.size() - m_sourceLength);
    };
    append(!of(identifier).empty() ? of(identifier) : of(command));
    const std::string_view number = !of(process).empty() ? of(process) : of(claimed);
    if (m_sourceLength > 0 && !number.empty()) {
        append("[");
        append(number);
        append("]");
    }
}

void Journal::read(EntryColumns& columns) {
    constexpr std::string_view service = ".service";
    buildSource();
    columns.hasTime = columns.hasYear = true;
    columns.time = CivilTime::of(static_cast<std::int64_t>(m_time / 1'000'000));
    columns.offset = 0;
    columns.system = of(host);
    columns.source = {m_source.data(), m_sourceLength};
    columns.type =
        m_priority < 0 ? std::string_view() : priorityNames[static_cast<std::size_t>(m_priority)];
    // What the manager says of a unit is about that, not about the manager.
    columns.entryClass = of(process) == "1" && !of(managed).empty() ? of(managed) : of(unit);
    if (columns.entryClass.ends_with(service)) {
        columns.entryClass.remove_suffix(service.size());
    }
    columns.description = message();
    if (m_messageReader) {
        m_messageReader->read(columns);
    }
}

void Journal::readFields(EntryFields& fields) {
    const MapFaults tolerated;
    const void* data = nullptr;
    std::size_t length = 0;
    sd_journal_restart_data(m_journal);
    while (sd_journal_enumerate_available_data(m_journal, &data, &length) > 0) {
        const std::string_view field(static_cast<const char*>(data), length);
        const std::size_t end = field.find('=');
        if (end == field.npos) {
            continue;
        }
        if (field.substr(0, end) == messageName) {
            fields.add(messageName, message()); // which is kept here already
            continue;
        }
        if (const auto kept = fields.append(field).takeText()) {
            fields.add(kept->substr(0, end), kept->substr(end + 1));
        } else {
            fields.noteLeftOut();
        }
    }
    if (m_messageReader) {
        m_messageReader->readFields({m_source.data(), m_sourceLength}, message(), fields);
    }
}

} // namespace zrm::host
