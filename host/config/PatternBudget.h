#ifndef ZRM_HOST_PATTERN_BUDGET_H
#define ZRM_HOST_PATTERN_BUDGET_H

#include "host/base/Result.h"
#include "host/framework/Condition.h"

#include <algorithm>
#include <cstddef>
#include <string>

namespace zrm::host {

/// Limits the total size of the regular expressions of several conditions, in instructions of their
/// compiled programs. Each instruction costs microseconds to compile and a few bytes of memory
/// while the condition is in force, and a pattern of a few bytes can have hundreds of thousands.
/// Used by one thread.
class PatternBudget {
public:
    static constexpr std::size_t ofPattern = 10'000;
    static constexpr std::size_t ofSituation = 20'000; ///< also for the filters of one request
    /// For all situations of the configuration file, and for all those made through the API.
    static constexpr std::size_t ofSource = 1'000'000;

    explicit PatternBudget(std::size_t most = ofSituation) noexcept : m_most(most) {}

    /// Checks the value of an operator that looks for a pattern (contains, starts or matches), and
    /// spends what a regular expression costs.
    Result<void> check(_IntfOper op, const std::string& value);
    static constexpr std::size_t longestPattern = 4096; ///< bytes

    void spend(std::size_t size) noexcept { m_used += size; }
    std::size_t used() const noexcept { return m_used; }
    bool isExceeded() const noexcept { return m_used > m_most; }
    /// The part of its source's budget that the next situation may use.
    PatternBudget ofNext() const noexcept {
        return PatternBudget(isSpent() ? 0 : std::min(m_most - m_used, ofSituation));
    }
    /// True if nothing is left for another pattern.
    bool isSpent() const noexcept { return m_used >= m_most; }

private:
    Result<void> checkRegex(const std::string& value);

    std::size_t m_most;
    std::size_t m_used = 0;
};

} // namespace zrm::host

#endif
