#ifndef ZRM_HOST_TIME_DISPLAY_H
#define ZRM_HOST_TIME_DISPLAY_H

#include <cstdint>
#include <ctime>
#include <string>
#include <string_view>

namespace zrm::host {

/// Times and amounts in human-readable form. Stateless.
class TimeDisplay {
public:
    /// The local time of an ISO 8601 time in UTC: "2026-11-20 07:03:09"; the text unchanged when it
    /// is not such a time.
    static std::string local(std::string_view iso);

    /// The same for a 16-character time stamp; empty for one of all zeros.
    static std::string stamp(std::string_view stamp);

    /// "3 d 4 h", "4 h 12 min", "12 min 3 s", "3 s".
    static std::string duration(std::uint64_t seconds);
    /// The duration from one ISO 8601 time in UTC to another; empty when either is not such a time.
    static std::string between(std::string_view fromIso, std::string_view toIso);

    /// "512 B", "4.2 kB", "81 MB", "3.1 GB".
    static std::string bytes(std::uint64_t count);
};

} // namespace zrm::host

#endif
