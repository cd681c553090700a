#include "logtypes/SysLogFile.h"

#include "agent/TraceScope.h"
#include "agent/framework/locale.h"
#include "logmgr/ValidLog.h"
#include "logtypes/SyslogBufferInfo.h"
#include "monitor/BrevanTime.h"
#include "monitor/RowBytes.h"
#include "monitor/UTF8Conv.h"
#include "tables/zrm_rmlogent_data.h"

#include <algorithm>
#include <cstddef>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string_view>

namespace {

TRC1_Anchor anchor{"SysLogFile.cpp"};

constexpr std::string_view monthNames = "JanFebMarAprMayJunJulAugSepOctNovDec";
constexpr std::string_view repeatNotice = "last message repeated ";
constexpr std::size_t timeLength = 15; // Mmm dd hh:mm:ss
constexpr std::size_t yearLength = 3;
constexpr std::size_t stampLength = 16;

/// Host and source of a line whose description begins within so many characters do not run past
/// ENTRYDESC into the common columns.
constexpr std::ptrdiff_t longestHeader =
    offsetof(zrm_rmlogent_data_t, freqthresh) - offsetof(zrm_rmlogent_data_t, entrysrc);

/// The month's number, 1 to 12; 0 when the text begins with none.
unsigned monthNumber(const char* text) {
    for (std::size_t at = 0; at < monthNames.size(); at += 3) {
        if (std::memcmp(text, monthNames.data() + at, 3) == 0) {
            return static_cast<unsigned>(at / 3 + 1);
        }
    }
    return 0;
}

/// Dates an entry of a report by the newer entry read before it, and becomes that entry's stamp:
/// a later month and day means that a new year was crossed going backwards.
void followYear(char* stamp, char* newer) {
    constexpr std::size_t monthAndDay = 4;
    if (std::memcmp(stamp + yearLength, newer + yearLength, monthAndDay) <= 0) {
        std::memcpy(stamp, newer, yearLength);
    } else {
        char year[16];
        std::memcpy(year, newer, yearLength);
        year[yearLength] = '\0';
        std::snprintf(year, sizeof year, "%03d", std::atoi(year) - 1);
        std::memcpy(stamp, year, yearLength);
    }
    std::memcpy(newer, stamp, stampLength);
}

/// White space of the line's layout, whatever the locale.
bool isSpace(char character) {
    return character == ' ' || (character >= '\t' && character <= '\r');
}

/// Copies a field's characters. Once `max` were copied one is skipped, and then copying goes on.
class FieldCopy {
public:
    FieldCopy(char* out, unsigned int max, const char* limit)
        : m_out(out), m_max(max), m_limit(limit) {}
    void add(char character) {
        if (m_max-- != 0 && m_out < m_limit) {
            *m_out++ = character;
        }
    }

private:
    char* m_out;
    unsigned int m_max; ///< wraps around, after which it is no limit any more
    const char* m_limit;
};

} // namespace

SysLogFile::SysLogFile(const ValidLog& log, LogFile* chainHead) : LogFile(log, chainHead) {
    TraceScope trace(anchor);
    if (trace.isOn(TRC1_DETAIL)) {
        printSelf();
    }
    startThread();
}

SysLogFile::~SysLogFile() {
    TraceScope trace(anchor);
    stopThread();
}

void SysLogFile::processLogData() {
    TraceScope trace(anchor);
    openLogAndSeek();
    if (LogFileP != nullptr) {
        waitForEventLoop(timeval{1, 0});
        closeLog();
    }
}

long SysLogFile::formatEntryAsRow(char* line, void* row, void* reportState) {
    TraceScope trace(anchor);
    auto& entry = *static_cast<zrm_rmlogent_data_t*>(row);
    char* const columns = static_cast<char*>(row); // host and source may run over their columns
    const char* const limit = columns + sizeof entry;
    prepareRow(&entry);
    char* text = formatEntryTime(entry.entrytime, line, reportState);
    if (text == nullptr) {
        return trace.result(-1L);
    }
    text = extractSystem(columns + offsetof(zrm_rmlogent_data_t, entrysys), text,
                         sizeof entry.entrysys, limit);
    text = extractSource(columns + offsetof(zrm_rmlogent_data_t, entrysrc), text,
                         sizeof entry.entrysrc, limit);
    UTF8Conv::Convert_toUTF8(entry.uentrysrc, sizeof entry.uentrysrc, entry.entrysrc,
                             sizeof entry.entrysrc, LOC2_NO_TERMINATOR);
    const std::size_t rest = std::strlen(text);
    const std::size_t length = std::min(rest > 0 ? rest - 1 : 0, sizeof entry.entrydesc);
    RowBytes::copy(entry.entrydesc, text, length);
    UTF8Conv::Convert_toUTF8(entry.uentrydesc, sizeof entry.uentrydesc, text, length,
                             LOC2_NO_TERMINATOR);
    if (text - line > longestHeader) {
        repairRow(&entry);
    }
    return trace.result(0L);
}

char* SysLogFile::formatEntryTime(char* out, char* line, void* reportState) {
    TraceScope trace(anchor);
    const bool isWhole = std::memchr(line, '\0', timeLength) == nullptr;
    const unsigned month = isWhole ? monthNumber(line) : 0;
    if (month == 0) {
        return trace.result(line + std::strlen(line));
    }
    const auto place = [out](std::size_t at, char tens, char units) {
        out[at] = tens;
        out[at + 1] = units;
    };
    BrevanTime::generateCurrentTimestamp(out); // its year counts while monitoring
    place(3, static_cast<char>('0' + month / 10), static_cast<char>('0' + month % 10));
    place(5, line[4] == ' ' ? '0' : line[4], line[5]);
    place(7, line[7], line[8]);
    place(9, line[10], line[11]);
    place(11, line[13], line[14]);
    if (reportState != nullptr) {
        followYear(out, static_cast<SyslogBufferInfo*>(reportState)->timestamp);
    }
    return trace.result(line + timeLength + (line[timeLength] != '\0' ? 1 : 0));
}

char* SysLogFile::extractSystem(char* out, char* text, unsigned int max, const char* limit) {
    TraceScope trace(anchor);
    FieldCopy field(out, max, limit);
    for (; *text != '\0'; ++text) {
        if (isSpace(*text)) {
            return trace.result(text + 1);
        }
        field.add(*text);
    }
    return trace.result(text);
}

char* SysLogFile::extractSource(char* out, char* text, unsigned int max, const char* limit) {
    TraceScope trace(anchor);
    if (*text == repeatNotice.front() &&
        std::strncmp(text, repeatNotice.data(), repeatNotice.size()) == 0) {
        return trace.result(text);
    }
    FieldCopy field(out, max, limit);
    for (; *text != '\0'; ++text) {
        if (*text == ':') { // and the blank after it
            return trace.result(text + (text[1] != '\0' ? 2 : 1));
        }
        if (isSpace(*text)) {
            return trace.result(text + 1);
        }
        field.add(*text);
    }
    return trace.result(text);
}
