#include "host/cli/TimeDisplay.h"

#include <algorithm>
#include <array>
#include <cctype>
#include <cstdio>
#include <optional>

namespace zrm::host {

namespace {

std::optional<std::time_t> parsed(std::string_view iso) {
    std::tm utc{};
    const std::string text(iso);
    int end = 0;
    if (std::sscanf(text.c_str(), "%4d-%2d-%2dT%2d:%2d:%2d%n", &utc.tm_year, &utc.tm_mon,
                    &utc.tm_mday, &utc.tm_hour, &utc.tm_min, &utc.tm_sec, &end) != 6 ||
        !text.ends_with('Z')) {
        return std::nullopt;
    }
    utc.tm_year -= 1900;
    utc.tm_mon -= 1;
    return timegm(&utc);
}

} // namespace

std::string TimeDisplay::local(std::string_view iso) {
    const std::optional<std::time_t> when = parsed(iso);
    if (!when) {
        return std::string(iso);
    }
    std::tm local{};
    localtime_r(&*when, &local);
    char text[32];
    const std::size_t length = std::strftime(text, sizeof text, "%Y-%m-%d %H:%M:%S", &local);
    return {text, length};
}

std::string TimeDisplay::stamp(std::string_view stamp) {
    const bool isStamp = stamp.size() == 16 && std::all_of(stamp.begin(), stamp.end(), [](char c) {
                             return c >= '0' && c <= '9';
                         });
    if (!isStamp) {
        return std::string(stamp);
    }
    if (stamp.find_first_not_of('0') == std::string_view::npos) {
        return "";
    }
    const auto part = [&](std::size_t at) { return std::string(stamp.substr(at, 2)); };
    return (stamp[0] == '0' ? "19" : "20") + part(1) + '-' + part(3) + '-' + part(5) + ' ' +
           part(7) + ':' + part(9) + ':' + part(11);
}

std::string TimeDisplay::duration(std::uint64_t seconds) {
    struct Unit {
        std::uint64_t seconds;
        const char* name;
    };
    constexpr std::array<Unit, 4> units = {{{86400, " d"}, {3600, " h"}, {60, " min"}, {1, " s"}}};
    for (std::size_t at = 0; at + 1 < units.size(); ++at) {
        if (seconds >= units[at].seconds) {
            const std::uint64_t rest = seconds % units[at].seconds / units[at + 1].seconds;
            return std::to_string(seconds / units[at].seconds) + units[at].name +
                   (rest > 0 ? ' ' + std::to_string(rest) + units[at + 1].name : "");
        }
    }
    return std::to_string(seconds) + " s";
}

std::string TimeDisplay::between(std::string_view fromIso, std::string_view toIso) {
    const std::optional<std::time_t> from = parsed(fromIso);
    const std::optional<std::time_t> to = parsed(toIso);
    return from && to ? duration(static_cast<std::uint64_t>(std::max<std::time_t>(*to - *from, 0)))
                      : "";
}

std::string TimeDisplay::bytes(std::uint64_t count) {
    constexpr std::array units = {" B", " kB", " MB", " GB", " TB"};
    auto amount = static_cast<double>(count);
    std::size_t unit = 0;
    while (amount >= 999.5 && unit + 1 < units.size()) {
        amount /= 1000;
        ++unit;
    }
    char text[32];
    std::snprintf(text, sizeof text, unit > 0 && amount < 9.95 ? "%.1f%s" : "%.0f%s", amount,
                  units[unit]);
    return text;
}

} // namespace zrm::host
