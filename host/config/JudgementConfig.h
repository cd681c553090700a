#ifndef ZRM_HOST_JUDGEMENT_CONFIG_H
#define ZRM_HOST_JUDGEMENT_CONFIG_H

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace zrm::host {

/// What the host decides about the entries that meet a situation's conditions, where `group_by`,
/// `distinct`, `then`, `resolve_after`, `cooldown` or `absent` ask for more than the table of
/// entries does. Durations are in seconds.
struct JudgementConfig {
    static constexpr std::size_t usualGroups = 10'000;

    std::vector<std::string> groupBy = {}; ///< names of entry values; empty: all are one group
    std::size_t maxGroups = usualGroups;   ///< that are kept at a time
    std::string distinct = {};             ///< counts different values of this name; empty: entries
    std::int64_t frequency = 0;            ///< of the threshold; 0: none
    bool isUpperBound = false;             ///< at most `frequency`, not at least
    std::int64_t period = 0;               ///< of the threshold
    /// Only an entry with a certain value raises an event, if the others within the period before
    /// it meet the threshold: "NAME=VALUE"; empty: every entry may, and counts.
    std::string then = {};
    std::int64_t resolveAfter = 0;     ///< an episode ends this long after its last entry;
                                       ///< 0: there are no episodes
    std::int64_t cooldown = 0;         ///< of a group after an event; 0: none
    std::int64_t absent = 0;           ///< an event when no entry has come for so long; 0: never.
                                       ///< Then there is nothing of the above but groups.
    std::string resolveAfterText = {}; ///< as the operator has written it
    std::string cooldownText = {};
    std::string absentText = {};

    /// Whether the host judges at all.
    bool isUsed() const noexcept {
        return !groupBy.empty() || !distinct.empty() || !then.empty() || resolveAfter > 0 ||
               cooldown > 0 || absent > 0;
    }
    std::string_view thenName() const noexcept {
        return std::string_view(then).substr(0, then.find('='));
    }
    std::string_view thenValue() const noexcept {
        return std::string_view(then).substr(then.find('=') + 1);
    }
    bool operator==(const JudgementConfig&) const = default;
};

} // namespace zrm::host

#endif
