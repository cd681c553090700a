#include "logtypes/ErrLogFile.h"

#include "base/ProcessValues.h"
#include "base/TraceScope.h"
#include "base/UTF8Conv.h"
#include "framework/locale.h"
#include "logs/zrm_rmlogent_data.h"

#include <algorithm>
#include <cctype>
#include <cstring>

namespace zrm {

namespace {

TRC1_Anchor anchor{"ErrLogFileLine.cpp"};

// A line: identifier (10 characters, 8 significant), blank, time as mmddhhmmyy, blank, fields.
constexpr std::size_t identifierLength = 8;
constexpr std::size_t timeStart = 11;
constexpr std::size_t yearStart = 19;
constexpr std::size_t timeEnd = 21;

// White space as isspace defines it in the POSIX locale, without checking the process's locale.
bool isWhiteSpace(char character) {
    return character == ' ' || (character >= '\t' && character <= '\r');
}

bool isDigit(char character) {
    return character >= '0' && character <= '9';
}

} // namespace

long ErrLogFile::formatEntryAsRow(char* entry, void* row, void* /*context*/) {
    TraceScope trace(anchor);
    auto& columns = *static_cast<zrm_rmlogent_data_t*>(row);
    const char* const end = reinterpret_cast<const char*>(&columns + 1);
    std::memset(&columns, ' ', sizeof columns);
    const char* position = formatEntryTime(columns.entrytime, entry);
    if (position == nullptr) {
        return trace.result(-1L);
    }
    const char* const host = gHostName != nullptr ? gHostName : "";
    std::memcpy(columns.entrysys, host, strnlen(host, sizeof columns.entrysys));
    position = extractNextField(columns.entrytype, position, sizeof columns.entrytype, end);
    position = extractNextField(columns.entryclass, position, sizeof columns.entryclass, end);
    position = extractNextField(columns.entrysrc, position, sizeof columns.entrysrc, end);
    UTF8Conv::Convert_toUTF8(columns.uentrysrc, sizeof columns.uentrysrc, columns.entrysrc,
                             sizeof columns.entrysrc, LOC2_NO_TERMINATOR);
    formatDescription(columns.entrydesc, entry, position, sizeof columns.entrydesc, 0);
    formatDescription(columns.uentrydesc, entry, position, sizeof columns.uentrydesc, 1);
    fillCommonColumns(&columns);
    return trace.result(0L);
}

const char* ErrLogFile::formatEntryTime(char* dest, const char* line) {
    TraceScope trace(anchor);
    if (strnlen(line, timeEnd) < timeEnd ||
        !std::all_of(line + timeStart, line + timeEnd, isDigit)) {
        return trace.result(static_cast<const char*>(nullptr));
    }
    std::memset(dest, '0', sizeof zrm_rmlogent_data_t::entrytime);
    const bool isNewCentury = line[yearStart] < '7';
    if (isNewCentury) {
        dest[0] = '1';
    }
    std::memcpy(dest + 1, line + yearStart, timeEnd - yearStart);
    std::memcpy(dest + 3, line + timeStart, yearStart - timeStart);
    const bool endsAtTime = line[timeEnd] == '\0';
    return trace.result(line + timeEnd + (endsAtTime ? 0 : 1));
}

const char* ErrLogFile::extractNextField(char* dest, const char* position, unsigned long maximum,
                                         const char* end) {
    TraceScope trace(anchor);
    // Counting down, 0 drops one character and wraps to the largest value.
    for (; *position != '\0' && !isWhiteSpace(*position); ++position) {
        if (maximum-- > 0 && dest < end) {
            *dest++ = *position;
        }
    }
    while (isWhiteSpace(*position)) {
        ++position;
    }
    return trace.result(position);
}

void ErrLogFile::formatDescription(char* dest, const char* line, const char* rest,
                                   unsigned long size, int toUtf8) {
    TraceScope trace(anchor);
    char text[sizeof zrm_rmlogent_data_t::uentrydesc];
    char* const start = toUtf8 != 0 ? text : dest;
    const std::size_t room = toUtf8 != 0 ? std::min(size, sizeof text) : size;
    std::size_t length = 0;
    const auto append = [&](const char* source, std::size_t count) {
        const std::size_t fitting = std::min(count, room - length);
        std::memcpy(start + length, source, fitting);
        length += fitting;
    };
    append(line, strnlen(line, identifierLength));
    append(": ", 2);
    const std::size_t restLength = std::strlen(rest);
    append(rest, restLength > 0 ? restLength - 1 : 0);
    if (toUtf8 != 0) {
        UTF8Conv::Convert_toUTF8(dest, size, text, length, LOC2_NO_TERMINATOR);
    }
}

} // namespace zrm
