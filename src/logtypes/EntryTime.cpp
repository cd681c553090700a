#include "logtypes/EntryTime.h"

#include "base/DigitPairs.h"

#include <cstdio>
#include <cstring>
#include <ctime>
#include <limits>

namespace zrm {

namespace {

constexpr long yearsOfCentury = 100;

/// The local time of the second that the thread last asked for.
struct LocalTime {
    std::time_t second = std::numeric_limits<std::time_t>::min();
    std::tm parts{};
};

constinit thread_local LocalTime localTime;

/// The current local time. Null, with errno set, if it is unavailable.
const std::tm* currentTime() {
    const std::time_t now = std::time(nullptr);
    if (now == static_cast<std::time_t>(-1)) {
        return nullptr;
    }
    if (now != localTime.second) {
        std::tm parts;
        if (localtime_r(&now, &parts) == nullptr) {
            return nullptr;
        }
        localTime.parts = parts;
        localTime.second = now;
    }
    return &localTime.parts;
}

void setYear(EntryTime& time, int yearsSince1900) {
    time.century = yearsSince1900 < yearsOfCentury ? 0 : 1;
    time.year = yearsSince1900 - time.century * yearsOfCentury;
}

bool isDigitPair(long number) {
    return static_cast<unsigned long>(number) <= 99;
}

char* writePair(char* out, long pair) {
    DigitPairs::put(out, static_cast<unsigned>(pair));
    return out + 2;
}

} // namespace

bool EntryTime::completeFromClock() noexcept {
    const std::tm* const now = currentTime();
    if (now == nullptr) {
        return false;
    }
    if (year == unknown) {
        setYear(*this, now->tm_year);
    }
    const auto complete = [](long& part, int current) {
        if (part == unknown) {
            part = current;
        }
    };
    complete(month, now->tm_mon + 1);
    complete(day, now->tm_mday);
    complete(hour, now->tm_hour);
    complete(minute, now->tm_min);
    return true;
}

bool EntryTime::today(EntryTime& date) noexcept {
    const std::tm* const now = currentTime();
    if (now == nullptr) {
        return false;
    }
    date.year = now->tm_year % yearsOfCentury;
    date.century = date.year < 70 ? 1 : 0;
    date.month = now->tm_mon + 1;
    date.day = now->tm_mday;
    return true;
}

int EntryTime::write(char* out) const noexcept {
    const long pairs[] = {year, month, day, hour, minute, second, 0};
    bool isUsual = century >= 0 && century <= 9;
    for (const long pair : pairs) {
        isUsual &= isDigitPair(pair);
    }
    if (isUsual) {
        *out++ = static_cast<char>('0' + century);
        for (const long pair : pairs) {
            out = writePair(out, pair);
        }
        return textLength;
    }
    char text[7 * 24];
    const int length = std::snprintf(text, sizeof text, "%ld%02ld%02ld%02ld%02ld%02ld%02ld00",
                                     century, year, month, day, hour, minute, second);
    if (length == textLength) {
        std::memcpy(out, text, textLength);
    }
    return length;
}

} // namespace zrm
