#ifndef ZRM_HOST_HTTP_DATE_H
#define ZRM_HOST_HTTP_DATE_H

#include <cstdint>
#include <string>

namespace zrm::host {

/// Times in the form of HTTP headers, whatever the locale. Stateless.
class HttpDate {
public:
    /// Formats a time in seconds since 1970-01-01 UTC as in "Sun, 06 Nov 1994 08:49:37 GMT".
    static std::string text(std::int64_t seconds);

    static std::string now();
};

} // namespace zrm::host

#endif
