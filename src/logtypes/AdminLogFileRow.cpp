#include "logtypes/AdminLogFile.h"

#include "base/BrevanTime.h"
#include "base/RowBytes.h"
#include "base/TraceScope.h"
#include "base/UTF8Conv.h"
#include "framework/locale.h"
#include "logs/EntryClock.h"
#include "logs/zrm_rmlogent_data.h"

#include <algorithm>
#include <charconv>
#include <cstring>
#include <string_view>

namespace zrm {

namespace {

TRC1_Anchor anchor{"AdminLogFileRow.cpp"};

// Indexed by record type. The texts are specific to this table: 3 and 4 differ from the system's
// names for these record types.
constexpr std::string_view entryTypes[] = {
    "Unused space", "Run level",     "System boot time", "User logon time", "User idle time",
    "init process", "getty waiting", "User process",     "Zombie process",  "Accounting",
};
constexpr std::string_view unknownEntryType = "Unknown";

/// The text of a NUL-padded field.
template <std::size_t size> std::string_view fieldText(const char (&field)[size]) {
    return {field, strnlen(field, size)};
}

/// Builds a description without the cost of a format string. The buffer fits the longest one: two
/// short names, three numbers of up to six characters, and the words between them. The compiler
/// knows the length of each appended text and copies it inline.
class Description {
public:
    explicit Description(const AdminLogFile::utmp& record) {
        append("user = ");
        append(record.ut_user, fieldText(record.ut_user).size());
        append("; id = ");
        append(record.ut_id, fieldText(record.ut_id).size());
        append("; pid = ");
        append(record.ut_pid);
        append("; term status = ");
        append(record.e_termination);
        append("; exit status = ");
        append(record.e_exit);
    }
    std::string_view text() const noexcept { return {m_text, m_length}; }
    /// Writes at most `room` bytes, without a terminator, and returns their number.
    std::int32_t write(char* dest, std::size_t room, bool toUTF8) const {
        if (toUTF8) {
            return UTF8Conv::Convert_toUTF8(dest, room, m_text, m_length, LOC2_NO_TERMINATOR);
        }
        const std::size_t length = std::min(room, m_length);
        RowBytes::copy(dest, m_text, length);
        return static_cast<std::int32_t>(length);
    }

private:
    /// Copies the whole field but counts only its first `length` characters.
    template <std::size_t size>
    [[gnu::always_inline]] void append(const char (&field)[size], std::size_t length) {
        std::memcpy(m_text + m_length, field, size);
        m_length += length;
    }
    template <std::size_t size> [[gnu::always_inline]] void append(const char (&words)[size]) {
        append(words, size - 1);
    }
    void append(std::int16_t number) {
        char* const place = m_text + m_length;
        m_length += static_cast<std::size_t>(std::to_chars(place, place + 6, number).ptr - place);
    }

    char m_text[100];
    std::size_t m_length = 0;
};

} // namespace

long AdminLogFile::formatEntryAsRow(char* record, void* row, void* /*context*/) {
    TraceScope trace(anchor);
    utmp entry;
    std::memcpy(&entry, record, sizeof entry);
    EntryRow entryRow(*this, row);
    auto& columns = entryRow.columns();

    if (followSettings() != nullptr) {
        lastEntryMoment = {EntryMoment::Kind::instant, entry.ut_time};
    }
    if (entryRow.isOwn()) {
        m_quarterHour.generateTimestamp(entry.ut_time, columns.entrytime);
    } else {
        BrevanTime::generateTimestamp(entry.ut_time, columns.entrytime);
    }
    const std::string_view line = fieldText(entry.ut_line);
    std::memcpy(columns.entrysrc, line.data(), line.size());
    columnToUTF8(columns.uentrysrc, line);
    fillEntryType(columns.entrytype, sizeof columns.entrytype, entry.ut_type);
    const Description description(entry);
    const std::int32_t length =
        description.write(columns.entrydesc, sizeof columns.entrydesc, false);
    const std::int32_t lengthInUTF8 = columnToUTF8(columns.uentrydesc, description.text());
    entryRow.setDescriptionLengths(static_cast<std::size_t>(length), lengthInUTF8);
    return trace.result(0L);
}

void AdminLogFile::fillEntryType(char* dest, unsigned long room, int type) {
    TraceScope trace(anchor);
    const bool known = type >= 0 && static_cast<std::size_t>(type) < std::size(entryTypes);
    const std::string_view text = known ? entryTypes[type] : unknownEntryType;
    std::memcpy(dest, text.data(), std::min(room, text.size()));
}

void AdminLogFile::formatEntryDesc(char* dest, unsigned long room, const utmp* record, int toUTF8) {
    TraceScope trace(anchor);
    Description(*record).write(dest, room, toUTF8 != 0);
}

} // namespace zrm
