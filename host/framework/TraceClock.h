#ifndef ZRM_HOST_TRACE_CLOCK_H
#define ZRM_HOST_TRACE_CLOCK_H

#include <ctime>

namespace zrm::host {

/// Local time for trace records. Does not take the C library's time-zone lock in a forked child,
/// where a thread that no longer exists could hold it. The offset from UTC is cached and updated
/// every quarter of an hour, the only moments at which zones change; a forked child uses its
/// parent's last value. Any thread.
namespace TraceClock {

struct Time {
    long year;
    unsigned month; ///< 1 to 12
    unsigned day;   ///< 1 to 31
    int hour;
    int minute;
    int second;
    long microsecond;
};

/// The local time of a point in time.
Time local(const std::timespec& moment) noexcept;

} // namespace TraceClock

} // namespace zrm::host

#endif
