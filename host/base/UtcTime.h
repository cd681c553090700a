#ifndef ZRM_HOST_UTC_TIME_H
#define ZRM_HOST_UTC_TIME_H

#include <cstdint>
#include <string>

namespace zrm::host {

/// Times of the host as other systems read them. Stateless.
class UtcTime {
public:
    /// Appends a time that is given in milliseconds since 1970-01-01 UTC, as in
    /// "2026-11-20T07:03:09.412Z".
    static void append(std::string& text, std::int64_t milliseconds);

    /// The same as a text of its own.
    static std::string text(std::int64_t milliseconds);
};

} // namespace zrm::host

#endif
