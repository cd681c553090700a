#include "host/config/TimeZones.h"

#include <chrono>
#include <exception>
#include <limits>

#include <date/tz.h>

namespace zrm::host {

std::vector<ZoneOffset> TimeZones::offsetsOf(const std::string& name) {
    constexpr std::int64_t always = std::numeric_limits<std::int64_t>::min();
    if (name == "UTC") { // known without a database
        return {{always, 0}};
    }
    std::vector<ZoneOffset> offsets;
    try {
        const date::time_zone* const zone = date::locate_zone(name);
        const date::sys_seconds last = date::sys_days(date::year(2100) / 1 / 1);
        date::sys_seconds time{};
        while (time < last) {
            const date::sys_info info = zone->get_info(time);
            offsets.push_back({offsets.empty() ? always : time.time_since_epoch().count(),
                               static_cast<std::int32_t>(info.offset.count())});
            if (info.end <= time) {
                break;
            }
            time = info.end;
        }
    } catch (const std::exception&) { // no such zone, or no database
        offsets.clear();
    }
    return offsets;
}

} // namespace zrm::host
