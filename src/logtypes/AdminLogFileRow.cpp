#include "logtypes/AdminLogFile.h"

#include "agent/TraceScope.h"
#include "agent/framework/locale.h"
#include "monitor/BrevanTime.h"
#include "monitor/UTF8Conv.h"
#include "tables/zrm_rmlogent_data.h"

#include <algorithm>
#include <charconv>
#include <cstring>
#include <string_view>

namespace {

TRC1_Anchor anchor{"AdminLogFileRow.cpp"};

// Indexed by record type. The words are this table's own: 3 and 4 do not follow the system's names
// of these record types.
constexpr std::string_view entryTypes[] = {
    "Unused space", "Run level",     "System boot time", "User logon time", "User idle time",
    "init process", "getty waiting", "User process",     "Zombie process",  "Accounting",
};
constexpr std::string_view unknownEntryType = "Unknown";

/// The text of a NUL-padded field.
template <std::size_t size> std::string_view fieldText(const char (&field)[size]) {
    return {field, strnlen(field, size)};
}

/// Builds a description without the cost of a format string. The buffer holds the longest one: two
/// short names, three numbers of up to six characters, and the words between them.
class Description {
public:
    explicit Description(const AdminLogFile::utmp& record) {
        append("user = ");
        append(fieldText(record.ut_user));
        append("; id = ");
        append(fieldText(record.ut_id));
        append("; pid = ");
        append(record.ut_pid);
        append("; term status = ");
        append(record.e_termination);
        append("; exit status = ");
        append(record.e_exit);
    }
    const char* text() const { return m_text; }
    std::size_t length() const { return m_length; }

private:
    void append(std::string_view text) {
        std::memcpy(m_text + m_length, text.data(), text.size());
        m_length += text.size();
    }
    void append(std::int16_t number) {
        char digits[6];
        append({digits, std::to_chars(digits, digits + sizeof digits, number).ptr});
    }

    char m_text[100];
    std::size_t m_length = 0;
};

} // namespace

long AdminLogFile::formatEntryAsRow(char* record, void* row, void* /*context*/) {
    TraceScope trace(anchor);
    utmp entry;
    std::memcpy(&entry, record, sizeof entry);
    auto& columns = *static_cast<zrm_rmlogent_data_t*>(row);
    std::memset(&columns, ' ', sizeof columns);

    BrevanTime::generateTimestamp(entry.ut_time, columns.entrytime);
    const std::string_view line = fieldText(entry.ut_line);
    std::memcpy(columns.entrysrc, line.data(), line.size());
    UTF8Conv::Convert_toUTF8(columns.uentrysrc, sizeof columns.uentrysrc, line.data(), line.size(),
                             LOC2_NO_TERMINATOR);
    fillEntryType(columns.entrytype, sizeof columns.entrytype, entry.ut_type);
    formatEntryDesc(columns.entrydesc, sizeof columns.entrydesc, &entry, 0);
    formatEntryDesc(columns.uentrydesc, sizeof columns.uentrydesc, &entry, 1);
    fillCommonColumns(&columns);
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
    const Description description(*record);
    if (toUTF8 == 0) {
        std::memcpy(dest, description.text(), std::min(room, description.length()));
    } else {
        UTF8Conv::Convert_toUTF8(dest, room, description.text(), description.length(),
                                 LOC2_NO_TERMINATOR);
    }
}
