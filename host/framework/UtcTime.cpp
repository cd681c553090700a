#include "host/framework/UtcTime.h"

#include <cstdio>
#include <ctime>

void UtcTime::append(std::string& text, std::int64_t milliseconds) {
    const auto seconds = static_cast<std::time_t>(milliseconds / 1000);
    std::tm utc{};
    gmtime_r(&seconds, &utc);
    char buffer[96];
    const int length = std::snprintf(buffer, sizeof buffer, "%04d-%02d-%02dT%02d:%02d:%02d.%03dZ",
                                     utc.tm_year + 1900, utc.tm_mon + 1, utc.tm_mday, utc.tm_hour,
                                     utc.tm_min, utc.tm_sec, static_cast<int>(milliseconds % 1000));
    text.append(buffer, static_cast<std::size_t>(length));
}

std::string UtcTime::text(std::int64_t milliseconds) {
    std::string text;
    append(text, milliseconds);
    return text;
}
