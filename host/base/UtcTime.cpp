#include "host/base/UtcTime.h"

#include <cstdio>
#include <ctime>

namespace zrm::host {

namespace {

void appendUnusual(std::string& text, const std::tm& utc, int millisecond) {
    char buffer[96];
    const int length = std::snprintf(buffer, sizeof buffer, "%04d-%02d-%02dT%02d:%02d:%02d.%03dZ",
                                     utc.tm_year + 1900, utc.tm_mon + 1, utc.tm_mday, utc.tm_hour,
                                     utc.tm_min, utc.tm_sec, millisecond);
    text.append(buffer, static_cast<std::size_t>(length));
}

} // namespace

void UtcTime::append(std::string& text, std::int64_t milliseconds) {
    const auto seconds = static_cast<std::time_t>(milliseconds / 1000);
    std::tm utc{};
    gmtime_r(&seconds, &utc);
    const int year = utc.tm_year + 1900;
    const auto millisecond = static_cast<int>(milliseconds % 1000);
    if (year < 0 || year > 9999 || millisecond < 0) {
        appendUnusual(text, utc, millisecond);
        return;
    }
    char stamp[] = "0000-00-00T00:00:00.000Z"; // called for every event, so without a format string
    const auto put = [&stamp](std::size_t end, int number) {
        for (; number > 0; number /= 10) {
            stamp[--end] = static_cast<char>('0' + number % 10);
        }
    };
    put(4, year);
    put(7, utc.tm_mon + 1);
    put(10, utc.tm_mday);
    put(13, utc.tm_hour);
    put(16, utc.tm_min);
    put(19, utc.tm_sec);
    put(23, millisecond);
    text.append(stamp, sizeof stamp - 1);
}

std::string UtcTime::text(std::int64_t milliseconds) {
    std::string text;
    append(text, milliseconds);
    return text;
}

} // namespace zrm::host
