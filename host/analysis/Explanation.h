#ifndef ZRM_HOST_EXPLANATION_H
#define ZRM_HOST_EXPLANATION_H

#include "host/analysis/ConditionVerdict.h"
#include "host/events/Episode.h"

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

    /// The episode that the entry begins or belongs to.
    struct EpisodePart {
        std::int64_t first;  ///< seconds since 1970
        std::uint64_t count; ///< entries up to this one
    };

    std::optional<std::string> line;    ///< none: the entry did not come from a line
    std::optional<std::uint64_t> event; ///< none: the entry does not belong to an event
    std::string row;                    ///< JSON object; empty: the line yields no row
    std::string reason;                 ///< why there is no row; empty: there is one
    std::vector<ConditionVerdict> conditions;
    bool matches = false; ///< every condition holds
    std::optional<Window> window;
    std::vector<GroupValue> group = {}; ///< empty: none
    std::optional<EpisodePart> episode = std::nullopt;
    bool isRaised = false;
    std::string decision; ///< one sentence

    /// Writes it as an object.
    void write(JsonWriter& json) const;
};

/// The values of a group as an object.
void writeGroup(JsonWriter& json, const std::vector<GroupValue>& group);

} // namespace zrm::host

#endif
