#ifndef ZRM_HOST_SEVERITY_CODES_H
#define ZRM_HOST_SEVERITY_CODES_H

#include <algorithm>
#include <array>
#include <string_view>

namespace zrm::host {

/// The codes of a severity in other systems.
struct SeverityCodes {
    std::string_view severity;
    int syslog; ///< RFC 5424: 6 informational, 5 notice, 4 warning, 3 error, 2 critical
    int otel;   ///< SeverityNumber of OpenTelemetry: 9 INFO, 10 INFO2, 13 WARN, 17 ERROR, 21 FATAL

    /// The codes of a severity; those of "warning" for an unknown name.
    static constexpr const SeverityCodes& of(std::string_view severity) noexcept;
};

inline constexpr std::array severityCodes = {
    SeverityCodes{"info", 6, 9},      SeverityCodes{"minor", 5, 10},
    SeverityCodes{"warning", 4, 13},  SeverityCodes{"major", 3, 17},
    SeverityCodes{"critical", 2, 21},
};

constexpr const SeverityCodes& SeverityCodes::of(std::string_view severity) noexcept {
    const auto found =
        std::find_if(severityCodes.begin(), severityCodes.end(),
                     [&](const SeverityCodes& codes) { return codes.severity == severity; });
    return found == severityCodes.end() ? severityCodes[2] : *found;
}

} // namespace zrm::host

#endif
