#ifndef ZRM_HOST_EXPLANATION_H
#define ZRM_HOST_EXPLANATION_H

#include "host/analysis/ConditionVerdict.h"

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

namespace zrm::host {

class JsonWriter;

/// Why an entry does or does not raise a situation.
struct Explanation {
    struct Window {
        std::string frequency;     ///< ">= 5"
        std::string period;        ///< "60s"
        std::optional<long> count; ///< entries in the period; none when they were not counted
    };

    std::optional<std::string> line;    ///< none: the entry did not come from a line
    std::optional<std::uint64_t> event; ///< none: the entry does not belong to an event
    std::string row;                    ///< JSON object; empty: the line yields no row
    std::string reason;                 ///< why there is no row; empty: there is one
    std::vector<ConditionVerdict> conditions;
    bool matches = false; ///< every condition holds
    std::optional<Window> window;
    bool isRaised = false;
    std::string decision; ///< one sentence

    /// Writes it as an object.
    void write(JsonWriter& json) const;
};

} // namespace zrm::host

#endif
