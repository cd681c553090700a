#ifndef ZRM_HOST_UTC_TIME_H
#define ZRM_HOST_UTC_TIME_H

#include <cstdint>
#include <string>

namespace zrm::host {

/// The host's times in the form that other systems read. Stateless.
class UtcTime {
public:
    /// Appends a time in milliseconds since 1970-01-01 UTC, formatted as
    /// "2026-11-20T07:03:09.412Z".
    static void append(std::string& text, std::int64_t milliseconds);

    /// The same as a new text.
    static std::string text(std::int64_t milliseconds);
};

} // namespace zrm::host

#endif
