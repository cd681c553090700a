// The part of Journal for what an entry contains.

#include "base/EntryFields.h"
#include "framework/LogEntry.h"
#include "host/sources/Journal.h"
#include "host/sources/MapFaults.h"
#include "logs/ZoneTime.h"

#include <optional>

#include <systemd/sd-journal.h>

namespace zrm::host {

namespace {

constexpr std::size_t longestText = EntryKeep::longestText;
constexpr std::string_view messageName = "MESSAGE";

constexpr std::array<std::string_view, 8> priorityNames = {"emerg",   "alert",  "crit", "err",
                                                           "warning", "notice", "info", "debug"};

} // namespace

void Journal::forget() noexcept {
    for (Text& slot : m_slots) {
        slot.length = 0;
    }
    m_hasMessage = m_isMessageCut = m_isOwn = false;
    m_messageLength = 0;
    m_priority = -1;
    m_shown = nullptr;
}

/// Takes what the columns need out of the entry. Asking for each field alone would look at all of
/// them each time.
bool Journal::load() {
    forget();
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

JournalLine Journal::line() {
    const MapFaults tolerated;
    JournalLine line;
    line.cursor = cursor();
    line.time = m_time;
    line.message = message();
    line.isCut = m_isMessageCut;
    for (const Slot slot : {unit, managed, identifier, command, process, claimed}) {
        line.writer.append(of(slot)).append(1, '\0');
    }
    const void* data = nullptr;
    std::size_t length = 0;
    sd_journal_restart_data(m_journal);
    while (sd_journal_enumerate_available_data(m_journal, &data, &length) > 0) {
        const std::string_view field(static_cast<const char*>(data), length);
        if (!field.starts_with("MESSAGE=")) {
            line.addField(field);
        }
    }
    return line;
}

void Journal::show(const JournalEntry& entry) {
    forget();
    entry.first.forEachField([this](std::string_view field) { take(field); });
    m_isMessageCut = entry.first.isCut;
    m_messageLength = entry.text.copy(m_message.data(), longestText);
    m_message[m_messageLength] = '\0';
    m_time = entry.first.time;
    m_shown = &entry.first;
}

void Journal::addField(std::string_view field, EntryFields& fields) const {
    const std::size_t end = field.find('=');
    if (end == field.npos) {
        return;
    }
    if (field.substr(0, end) == messageName) {
        fields.add(messageName, message()); // which is kept here already
        return;
    }
    if (const auto kept = fields.append(field).takeText()) {
        fields.add(kept->substr(0, end), kept->substr(end + 1));
    } else {
        fields.noteLeftOut();
    }
}

void Journal::readFields(EntryFields& fields) {
    if (m_shown != nullptr) {
        fields.add(messageName, message());
        m_shown->forEachField([&](std::string_view field) { addField(field, fields); });
        for (std::size_t count = 0; count < m_shown->leftOut; ++count) {
            fields.noteLeftOut();
        }
    } else {
        const MapFaults tolerated;
        const void* data = nullptr;
        std::size_t length = 0;
        sd_journal_restart_data(m_journal);
        while (sd_journal_enumerate_available_data(m_journal, &data, &length) > 0) {
            addField({static_cast<const char*>(data), length}, fields);
        }
    }
    if (m_messageReader) {
        m_messageReader->readFields({m_source.data(), m_sourceLength}, message(), fields);
    }
}

} // namespace zrm::host
