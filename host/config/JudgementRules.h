#ifndef ZRM_HOST_JUDGEMENT_RULES_H
#define ZRM_HOST_JUDGEMENT_RULES_H

#include "host/base/Result.h"
#include "host/config/JudgementConfig.h"
#include "host/framework/Condition.h"

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <vector>

namespace zrm::host {

/// How a situation judges, as written; none for what was left out.
struct JudgementText {
    std::vector<std::string> groupBy = {};
    std::optional<std::int64_t> maxGroups = std::nullopt;
    std::optional<std::string> distinct = std::nullopt;
    std::optional<std::string> then = std::nullopt;
    std::optional<std::string> resolveAfter = std::nullopt;
    std::optional<std::string> cooldown = std::nullopt;
    std::optional<std::string> absent = std::nullopt;
};

/// The rules of groups and episodes as operators write them. Stateless.
namespace JudgementRules {

inline constexpr std::size_t mostNames = 8; ///< that a situation groups by
inline constexpr std::int64_t mostGroups = 1'000'000;

/// What the text says. The host counts then, not the table: if anything is used, the conditions
/// that state a threshold are taken out of `conditions`. Appends what is wrong to `problems`.
JudgementConfig check(const JudgementText& text, std::vector<Condition>& conditions,
                      std::vector<Problem>& problems);

} // namespace JudgementRules

} // namespace zrm::host

#endif
