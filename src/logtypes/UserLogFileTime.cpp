#include "logtypes/UserLogFile.h"

#include "base/ErrorText.h"
#include "base/TraceScope.h"
#include "logs/EntryClock.h"
#include "logs/FollowSettings.h"
#include "logs/ZoneTime.h"
#include "logtypes/EntryTime.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <iterator>
#include <optional>
#include <string_view>

namespace zrm {

namespace {

TRC1_Anchor anchor{"UserLogFileTime.cpp"};

constexpr const char* monthNames[] = {
    "Jan", "Feb", "Mar", "Apr", "May", "Jun", "Jul", "Aug", "Sep", "Oct", "Nov", "Dec",
    "JAN", "FEB", "MAR", "APR", "MAY", "JUN", "JUL", "AUG", "SEP", "OCT", "NOV", "DEC",
};
constexpr long monthsOfYear = 12;
/// February always has 29 days, because the year may be unknown.
constexpr long daysOfMonth[] = {31, 29, 31, 30, 31, 30, 31, 31, 30, 31, 30, 31};
constexpr long mostDays = 31;

bool isSpace(char character) {
    return character == ' ' || (character >= '\t' && character <= '\r');
}

bool isDigit(char character) {
    return character >= '0' && character <= '9';
}

/// A text parsed as strtol does with base 10.
struct Number {
    explicit Number(const char* text) : end(text) {
        const char* next = text;
        bool isNegative = false;
        if (!isDigit(*next)) {
            while (isSpace(*next)) {
                ++next;
            }
            isNegative = *next == '-';
            next += isNegative || *next == '+' ? 1 : 0;
        }
        if (isDigit(*next)) {
            for (; isDigit(*next); ++next) {
                value = value * 10 + (*next - '0');
            }
            end = next;
        }
        value = isNegative ? -value : value;
        isWhole = end != text && *end == '\0';
    }

    long value = 0;
    const char* end; ///< one past the number, or the start of the text if there is none
    bool isWhole;    ///< the number is the whole text
};

/// The month name that the text begins with; 0: none.
long monthByName(const char* text) {
    for (std::size_t index = 0; index < std::size(monthNames); ++index) {
        if (std::strncmp(text, monthNames[index], 3) == 0) {
            return static_cast<long>(index) % monthsOfYear + 1;
        }
    }
    return 0;
}

/// Sets the year of a report entry without one from the newer entry read before it. A later day of
/// the year means that reading backwards crossed a new year.
void takeYearFromReport(EntryTime& time, UserlogBufferInfo& context) {
    const bool isDateKnown = time.month != EntryTime::unknown && time.day != EntryTime::unknown;
    if (isDateKnown) {
        if (time.month > context.month || (time.month == context.month && time.day > context.day)) {
            if (context.year >= 1) {
                --context.year;
            } else {
                context.year = 99;
                context.century = 0;
            }
        }
        context.month = time.month;
        context.day = time.day;
    }
    time.century = context.century;
    time.year = context.year;
}

} // namespace

long UserLogFile::formatEntryTime(char* entryTime, _EntryTimeBuffers* texts, void* reportContext) {
    TraceScope trace(anchor);
    EntryTime time;
    readYear(texts->year, time);
    readMonth(texts->month, time);
    readDay(texts->day, time);
    readHour(texts->hour, time);
    readMinute(texts->minute, time);
    readSecond(texts->second, time);
    if (reportContext != nullptr && time.year == EntryTime::unknown) {
        takeYearFromReport(time, *static_cast<UserlogBufferInfo*>(reportContext));
    }
    if (!time.isComplete() && !time.completeFromClock()) {
        const ErrorText error(errno);
        trace.error()("Error: unable to determine current time to complete event entrytime. errno "
                      "= %d; %s.",
                      error.number(), error.text());
        return trace.result(-1L);
    }
    if (followSettings() != nullptr) {
        convertToLocalTime(texts->zone, time);
    }
    const int length = time.write(entryTime);
    if (length != EntryTime::textLength) {
        trace.error()("Error: formatting of entrytime into table row failed; expected to write %d "
                      "characters but wrote %d.",
                      EntryTime::textLength, length);
        return trace.result(-1L);
    }
    entryTime[EntryTime::textLength] = '0';
    return trace.result(0L);
}

void UserLogFile::readYear(const char* text, EntryTime& time) const {
    if (*text == '\0') {
        return;
    }
    const Number number(text);
    if (!number.isWhole) {
        TraceScope trace(anchor);
        trace.error()("Error: invalid year found in event entrytime; '%s'", text);
        return;
    }
    time.year = number.value % 100;
    time.century = time.year < 70 ? 1 : 0;
}

/// Tries the kind of month that worked last, number or name, then the other one.
void UserLogFile::readMonth(const char* text, EntryTime& time) {
    if (*text == '\0') {
        return;
    }
    for (;;) {
        if (NumericMonth && readMonthNumber(text, time)) {
            return;
        }
        const long month = monthByName(text);
        if (month != 0) {
            NumericMonth = false;
            time.month = month;
            return;
        }
        if (NumericMonth) {
            TraceScope trace(anchor);
            trace.error()("Error: invalid month found in event entrytime; '%s'", text);
            return;
        }
        NumericMonth = true;
    }
}

/// False if the text does not begin with a number and so may be a name.
bool UserLogFile::readMonthNumber(const char* text, EntryTime& time) const {
    const Number number(text);
    if (number.isWhole && number.value >= 1 && number.value <= monthsOfYear) {
        time.month = number.value;
        return true;
    }
    if (number.isWhole || number.value != 0) {
        TraceScope trace(anchor);
        trace.error()("Error: invalid month found in event entrytime; '%s'", text);
        return true;
    }
    return false;
}

void UserLogFile::readDay(const char* text, EntryTime& time) const {
    if (*text == '\0') {
        return;
    }
    const Number number(text);
    const long last = time.month == EntryTime::unknown ? mostDays : daysOfMonth[time.month - 1];
    if (!number.isWhole || number.value < 1 || number.value > last) {
        TraceScope trace(anchor);
        trace.error()("Error: invalid day found in event entrytime; '%s'", text);
        return;
    }
    time.day = number.value;
}

/// A number up to 24, or 1 to 12 followed by "a" or "p". With "p", 12 becomes hour 24.
void UserLogFile::readHour(const char* text, EntryTime& time) const {
    if (*text == '\0') {
        return;
    }
    const Number number(text);
    if (number.isWhole && number.value >= 0 && number.value <= 24) {
        time.hour = number.value;
        return;
    }
    const char* half = number.end;
    while (isSpace(*half)) {
        ++half;
    }
    const bool isMorning = *half == 'a' || *half == 'A';
    const bool isAfternoon = *half == 'p' || *half == 'P';
    if (number.isWhole || number.value < 1 || number.value > 12 || (!isMorning && !isAfternoon)) {
        TraceScope trace(anchor);
        trace.error()("Error: invalid hour found in event entrytime; '%s'", text);
        return;
    }
    time.hour = number.value + (isAfternoon ? 12 : 0);
}

void UserLogFile::readMinute(const char* text, EntryTime& time) const {
    if (*text == '\0') {
        return;
    }
    const Number number(text);
    if (!number.isWhole || number.value < 0 || number.value > 59) {
        TraceScope trace(anchor);
        trace.error()("Error: invalid minute found in event entrytime; '%s'", text);
        return;
    }
    time.minute = number.value;
}

/// An invalid second becomes 0. Unlike the other parts, it never comes from the clock.
void UserLogFile::readSecond(const char* text, EntryTime& time) const {
    if (*text == '\0') {
        return;
    }
    const Number number(text);
    if (!number.isWhole || number.value < 0 || number.value > 59) {
        TraceScope trace(anchor);
        trace.error()("Error: invalid second found in event entrytime; '%s'", text);
        return;
    }
    time.second = number.value;
}

/// Converts a time that has a zone, by the entry's text or by the log's settings. A text that is
/// not a zone counts as missing. Before it there may be the fraction of the second.
void UserLogFile::convertToLocalTime(const char* zone, EntryTime& time) const {
    const std::vector<ZoneOffset>& offsets = followSettings()->zone;
    if (*zone == '\0' && offsets.empty()) {
        return;
    }
    CivilTime civil{static_cast<int>(1900 + time.century * 100 + time.year),
                    static_cast<unsigned>(time.month),
                    static_cast<unsigned>(time.day),
                    static_cast<unsigned>(time.hour),
                    static_cast<unsigned>(time.minute),
                    static_cast<unsigned>(time.second)};
    if (!civil.isValid()) {
        return;
    }
    std::string_view text = zone;
    text.remove_prefix(std::min(text.find_first_not_of(" .,0123456789"), text.size()));
    std::int64_t seconds = civil.seconds();
    if (const std::optional<std::int32_t> offset = ZoneTime::takeOffset(text)) {
        seconds -= *offset;
        lastEntryMoment = {EntryMoment::Kind::instant, seconds};
        seconds = ZoneTime::toLocal(seconds);
    } else if (!offsets.empty()) {
        lastEntryMoment = {EntryMoment::Kind::zoned, seconds};
        seconds = ZoneTime::toLocal(ZoneTime::toUtc(seconds, offsets));
    }
    civil = CivilTime::of(seconds);
    time.century = civil.year / 100 - 19;
    time.year = civil.year % 100;
    time.month = civil.month;
    time.day = civil.day;
    time.hour = civil.hour;
    time.minute = civil.minute;
    time.second = civil.second;
}

} // namespace zrm
