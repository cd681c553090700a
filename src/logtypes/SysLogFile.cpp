#include "logtypes/SysLogFile.h"

#include "base/BrevanTime.h"
#include "base/RowBytes.h"
#include "base/TraceScope.h"
#include "base/UTF8Conv.h"
#include "framework/locale.h"
#include "logs/ValidLog.h"
#include "logs/zrm_rmlogent_data.h"
#include "logtypes/MonthNames.h"

#include <algorithm>
#include <array>
#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string_view>

namespace zrm {

namespace {

TRC1_Anchor anchor{"SysLogFile.cpp"};

constexpr std::string_view repeatNotice = "last message repeated ";
constexpr std::size_t timeLength = 15; // Mmm dd hh:mm:ss
constexpr std::size_t yearLength = 3;
constexpr std::size_t stampLength = 16;

/// If a line's description begins within this many characters, its host and source do not overrun
/// ENTRYDESC into the common columns.
constexpr std::ptrdiff_t longestHeader =
    offsetof(zrm_rmlogent_data_t, freqthresh) - offsetof(zrm_rmlogent_data_t, entrysrc);

/// Within this many, neither overruns its own column.
constexpr std::ptrdiff_t shortHeader = timeLength + std::min(sizeof(zrm_rmlogent_data_t::entrysys),
                                                             sizeof(zrm_rmlogent_data_t::entrysrc));

unsigned twoDigits(const char* text) {
    return static_cast<unsigned>((text[0] - '0') * 10 + (text[1] - '0'));
}

/// Sets the year of a report entry from the newer entry read before it, then stores its stamp in
/// `newer`. A later month and day means that reading backwards crossed a new year.
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

/// The characters that end a field, indexed by code: the end of the line, white space whatever the
/// locale, and others.
using FieldEnds = std::array<bool, 256>;

constexpr FieldEnds endsAt(std::string_view others) {
    FieldEnds ends{};
    ends[0] = ends[' '] = true;
    for (unsigned character = '\t'; character <= '\r'; ++character) {
        ends[character] = true;
    }
    for (const char character : others) {
        ends[static_cast<unsigned char>(character)] = true;
    }
    return ends;
}

constexpr FieldEnds systemEnds = endsAt("");
constexpr FieldEnds sourceEnds = endsAt(":");

/// Copies a field's characters and returns the end of the field. After `max` characters, skips one
/// and continues to copy up to `limit`.
char* copyField(char* out, char* text, unsigned int max, const char* limit, const FieldEnds& ends) {
    const auto isEnd = [&ends](char character) {
        return ends[static_cast<unsigned char>(character)];
    };
    const std::size_t room = std::min<std::size_t>(max, static_cast<std::size_t>(limit - out));
    std::size_t length = 0;
    for (; length < room; ++length) {
        if (isEnd(text[length])) {
            return text + length;
        }
        out[length] = text[length];
    }
    out += length;
    text += length;
    if (length == max && !isEnd(*text)) {
        ++text;
    }
    for (; !isEnd(*text); ++text) {
        if (out < limit) {
            *out++ = *text;
        }
    }
    return text;
}

} // namespace

SysLogFile::SysLogFile(const ValidLog& log, LogFile* chainHead)
    : LogFile(log, chainHead), m_lineClock(followSettings()) {
    TraceScope trace(anchor);
    if (trace.isOn(TRC1_DETAIL)) {
        printSelf();
    }
    startThread();
}

SysLogFile::SysLogFile(const ValidLog& log, Unmonitored)
    : LogFile(log, nullptr), m_lineClock(followSettings()) {
    const TraceScope trace(anchor);
}

SysLogFile::~SysLogFile() {
    TraceScope trace(anchor);
    stopThread();
}

void SysLogFile::processLogData() {
    TraceScope trace(anchor);
    if (isFollowed()) {
        followLog(0);
        return;
    }
    openLogAndSeek();
    if (LogFileP != nullptr) {
        waitForEventLoop(timeval{1, 0});
        closeLog();
    }
}

long SysLogFile::formatEntryAsRow(char* line, void* row, void* reportState) {
    TraceScope trace(anchor);
    EntryRow entryRow(*this, row);
    auto& entry = entryRow.columns();
    if (followSettings() != nullptr) {
        return trace.result(formatFollowedEntry(line, entryRow, reportState));
    }
    char* const columns = static_cast<char*>(row); // host and source may overrun their columns
    const char* const limit = columns + sizeof entry;
    char* text = formatEntryTime(entry.entrytime, line, reportState);
    if (text == nullptr) {
        return trace.result(-1L);
    }
    text = extractSystem(columns + offsetof(zrm_rmlogent_data_t, entrysys), text,
                         sizeof entry.entrysys, limit);
    text = extractSource(columns + offsetof(zrm_rmlogent_data_t, entrysrc), text,
                         sizeof entry.entrysrc, limit);
    // Read the source, which was written last, only at the end: reading it back immediately stalls
    // the processor.
    const std::size_t rest = std::strlen(text);
    const std::size_t length = std::min(rest > 0 ? rest - 1 : 0, sizeof entry.entrydesc);
    RowBytes::copy(entry.entrydesc, text, length);
    UTF8Conv::Convert_toUTF8(entry.uentrysrc, sizeof entry.uentrysrc, entry.entrysrc,
                             sizeof entry.entrysrc, LOC2_NO_TERMINATOR);
    const std::int32_t lengthInUTF8 = UTF8Conv::Convert_toUTF8(
        entry.uentrydesc, sizeof entry.uentrydesc, text, length, LOC2_NO_TERMINATOR);
    if (text - line <= shortHeader) {
        entryRow.setDescriptionLengths(length, lengthInUTF8);
    } else if (text - line > longestHeader) {
        entryRow.restoreCommonColumns();
    }
    return trace.result(0L);
}

char* SysLogFile::formatEntryTime(char* out, char* line, void* reportState) {
    TraceScope trace(anchor);
    if (followSettings() != nullptr) {
        return trace.result(formatFollowedTime(out, line, reportState));
    }
    char now[stampLength];
    BrevanTime::generateCurrentTimestamp(now); // monitoring uses its year
    // A time cut off by the end of the line is not a time. The newline is not its last digit.
    const bool isWhole =
        std::memchr(line, '\0', timeLength) == nullptr && line[timeLength - 1] != '\n';
    const unsigned month = isWhole ? MonthNames::number(line, twoDigits(now + yearLength)) : 0;
    if (month == 0) {
        return trace.result(line + std::strlen(line));
    }
    std::memcpy(out, now, stampLength);
    const auto place = [out](std::size_t at, char tens, char units) {
        out[at] = tens;
        out[at + 1] = units;
    };
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
    char* const end = copyField(out, text, max, limit, systemEnds);
    return trace.result(*end != '\0' ? end + 1 : end);
}

char* SysLogFile::extractSource(char* out, char* text, unsigned int max, const char* limit) {
    TraceScope trace(anchor);
    if (*text == repeatNotice.front() &&
        std::strncmp(text, repeatNotice.data(), repeatNotice.size()) == 0) {
        return trace.result(text);
    }
    char* end = copyField(out, text, max, limit, sourceEnds);
    if (*end == ':' && end[1] != '\0') {
        ++end; // the blank after it
    }
    return trace.result(*end != '\0' ? end + 1 : end);
}

} // namespace zrm
