#ifndef ZRM_HOST_SITUATION_VALIDATOR_H
#define ZRM_HOST_SITUATION_VALIDATOR_H

#include "host/base/Result.h"
#include "host/config/ConditionBuilder.h"
#include "host/config/HostConfig.h"
#include "host/config/JudgementRules.h"

#include <cstddef>
#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace zrm::host {

/// A situation as written; none for a field that was left out.
struct SituationText {
    std::optional<std::string> name;
    std::optional<std::string> text;
    std::optional<std::string> severity;
    std::optional<std::string> log;
    std::vector<std::string> when;
    std::optional<std::string> frequency;
    std::optional<std::string> period;
    std::optional<std::int64_t> context;
    std::optional<std::string> runbook;
    std::map<std::string, std::string> labels;
    /// A text may have unknown names in braces, but no known ones beside them, and is then kept as
    /// it is.
    bool mayHaveBraces = false;
    JudgementText judgement = {};
};

/// What is wrong with a situation, in a field such as "name" or "when[0]".
struct SituationProblem : Problem {
    std::optional<std::size_t> condition = std::nullopt; ///< index, in the field "when"
};

/// The only place that knows what makes a valid situation, wherever it comes from. Stateless.
class SituationValidator {
public:
    static constexpr std::size_t longestName = 128;  ///< bytes
    static constexpr std::size_t longestText = 1024; ///< bytes
    static constexpr std::size_t mostConditions = 100;
    static constexpr std::int64_t mostContext = 100;
    static constexpr std::size_t longestConditions = 65536; ///< bytes of all of them

    /// What the text says, and everything that is wrong with it.
    struct Verdict {
        SituationConfig situation; ///< cannot be run if there are problems
        std::vector<SituationProblem> problems;
    };
    /// The budget is for the situation's regular expressions.
    static Verdict check(const SituationText& text, PatternBudget budget = PatternBudget());
};

} // namespace zrm::host

#endif
