#ifndef ZRM_HOST_CONDITION_BUILDER_H
#define ZRM_HOST_CONDITION_BUILDER_H

#include "host/base/Result.h"
#include "host/config/Columns.h"
#include "host/framework/Condition.h"

#include <algorithm>
#include <array>
#include <cstddef>
#include <cstdint>
#include <span>
#include <string>
#include <string_view>
#include <variant>
#include <vector>

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

    void spend(std::size_t size) noexcept { m_used += size; }
    std::size_t used() const noexcept { return m_used; }
    bool isExceeded() const noexcept { return m_used > m_most; }
    /// The part of its source's budget that the next situation may use.
    PatternBudget ofNext() const noexcept {
        return PatternBudget(isSpent() ? 0 : std::min(m_most - m_used, ofSituation));
    }
    /// Whether there is no budget left for another pattern.
    bool isSpent() const noexcept { return m_used >= m_most; }

private:
    std::size_t m_most;
    std::size_t m_used = 0;
};

/// A value as written by the operator: one text or number, or a list of them.
struct ConditionValue {
    using Item = std::variant<std::string, std::int64_t>;
    std::vector<Item> items;
    bool isList = false;
};

/// Builds and checks conditions on a table's columns. The only place that knows which operators and
/// values a column accepts. Immutable.
class ConditionBuilder {
public:
    explicit ConditionBuilder(std::string_view table);

    /// The condition COLUMN OP VALUE. Values of time columns may be ISO 8601 times; the condition
    /// stores them as 16-character time stamps. Conditions of one situation share a budget for
    /// their regular expressions. The field of a problem is "column", "op" or "value".
    Result<Condition> build(std::string_view column, std::string_view op,
                            const ConditionValue& value, PatternBudget& budget) const;

    /// The conditions that only entries of the log with this path meet: conditions on its directory
    /// and its name, in the columns that can hold them.
    static Result<std::vector<Condition>> ofLog(std::string_view path);

    /// The operator as written in conditions; empty for an unknown code.
    static std::string_view nameOf(_IntfOper op) noexcept;

    /// The operators as written in conditions.
    static std::vector<std::string_view> operatorNames();

private:
    struct Operator;
    static const std::array<Operator, 10>& operators() noexcept;
    static const Operator* findOperator(std::string_view op) noexcept;
    Result<const Column*> column(std::string_view name) const;
    static Result<Condition> single(const Column& column, const Operator& op,
                                    const ConditionValue& value, PatternBudget& budget);
    static Result<Condition> several(const Column& column, const ConditionValue& value);

    std::span<const Column> m_columns;
};

} // namespace zrm::host

#endif
