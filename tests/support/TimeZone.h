#ifndef ZRM_TESTS_TIME_ZONE_H
#define ZRM_TESTS_TIME_ZONE_H

#include <cstdlib>
#include <ctime>
#include <optional>
#include <string>

/// While it lives, the process's local time is that of this zone (a POSIX TZ text). Not for use
/// while other threads run.
class TimeZone {
public:
    explicit TimeZone(const char* zone) {
        if (const char* before = std::getenv("TZ")) {
            m_before = before;
        }
        setenv("TZ", zone, 1);
        tzset();
    }
    ~TimeZone() {
        if (m_before) {
            setenv("TZ", m_before->c_str(), 1);
        } else {
            unsetenv("TZ");
        }
        tzset();
    }
    TimeZone(const TimeZone&) = delete;
    TimeZone& operator=(const TimeZone&) = delete;

private:
    std::optional<std::string> m_before;
};

#endif
