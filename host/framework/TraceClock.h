#ifndef ZRM_HOST_TRACE_CLOCK_H
#define ZRM_HOST_TRACE_CLOCK_H

#include <ctime>

namespace zrm::host {

/// Local time of trace records, without the C library's time-zone lock where that could be held by
/// a thread that a forked child does not have. The offset from UTC is remembered and learnt afresh
/// each quarter of an hour, since zones change at no other moments; a forked child uses what its
/// parent last learnt. Any thread.
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

/// The local time of a moment.
Time local(const std::timespec& moment) noexcept;

} // namespace TraceClock

} // namespace zrm::host

#endif
