#ifndef ZRM_HOST_CONDITION_BUILDER_H
#define ZRM_HOST_CONDITION_BUILDER_H

#include "host/base/Result.h"
#include "host/config/Columns.h"
#include "host/config/PatternBudget.h"
#include "host/framework/Condition.h"

#include <array>
#include <cstddef>
#include <cstdint>
#include <span>
#include <string>
#include <string_view>
#include <variant>
#include <vector>

namespace zrm::host {

/// A value as written by the operator: one text or number, or a list of them.
struct ConditionValue {
    using Item = std::variant<std::string, std::int64_t, double>;
    std::vector<Item> items;
    bool isList = false;
};

/// Builds and checks conditions on a table's columns. The only place that knows which operators and
/// values a column accepts. Immutable.
class ConditionBuilder {
public:
    explicit ConditionBuilder(std::string_view table);

    /// The condition COLUMN OP VALUE. Instead of a column it may name a field of log entries,
    /// "field." and the field's name, whose values are texts and numbers. Values of time columns
    /// may be ISO 8601 times; the condition stores them as 16-character time stamps. Conditions of
    /// one situation share a budget for their regular expressions. The field of a problem is
    /// "column", "op" or "value".
    Result<Condition> build(std::string_view column, std::string_view op,
                            const ConditionValue& value, PatternBudget& budget) const;

    /// The conditions that only entries of the log with this path, or this name if it is not a
    /// file, meet: conditions on its directory and its name, in the columns that can hold them.
    static Result<std::vector<Condition>> ofLog(std::string_view path);

    /// The operator as written in conditions; empty for an unknown code.
    static std::string_view nameOf(_IntfOper op) noexcept;

    /// A column or field as written in conditions.
    static std::string written(std::string_view column);
    /// Whether the name of a field needs no quotes in conditions.
    static bool isPlainFieldCharacter(char c) noexcept;

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
    Result<Condition> onField(std::string_view field, std::string_view op,
                              const ConditionValue& value, PatternBudget& budget) const;

    std::span<const Column> m_columns;
    bool m_hasFields; ///< the table's rows are log entries
};

} // namespace zrm::host

#endif
