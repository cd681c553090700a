#ifndef ZRM_HOST_COMPILED_CONDITION_H
#define ZRM_HOST_COMPILED_CONDITION_H

#include "framework/filters.h"
#include "host/framework/RowLayout.h"

#include <cstdint>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

namespace re2 {
class RE2;
}

class ctreq;

namespace zrm::host {

class FieldCondition;

/// One condition prepared for evaluation: column found, numbers parsed, pattern compiled. A column
/// is compared without its padding; a value longer than the column is cut to the column's width
/// when compared by order, since that is all the column can hold. An invalid condition (no number
/// for an integer column, a bad pattern, an unknown operator) never holds. Evaluation neither locks
/// nor allocates, except in RE2 for patterns.
class CompiledCondition {
public:
    /// `column` is null for a field, and for a column that the table does not describe: then the
    /// table itself evaluates it. The filter's texts must outlive the object.
    CompiledCondition(const SEL1_FILTERINFO& filter, const RowColumn* column);
    CompiledCondition(CompiledCondition&&) noexcept;
    CompiledCondition& operator=(CompiledCondition&&) noexcept;
    ~CompiledCondition();

    /// Whether the row meets the condition. `request` is asked about columns unknown here.
    bool holds(ctreq* request, char* row) const;

    /// The same for a condition with isOnText(), given the text of its column in that row
    /// (ColumnText::unpadded).
    bool holdsFor(const char* row, std::string_view text) const noexcept;

    /// For a condition on a field; null for any other.
    const FieldCondition* onField() const noexcept { return m_field.get(); }

    /// True for a condition on a column that names a log: its result is the same for all rows of
    /// that log.
    bool isOnLog() const noexcept { return m_isOnLog; }
    bool neverHolds() const noexcept { return m_kind == Kind::NEVER; }
    /// True for a condition on a character column that is cheap to evaluate.
    bool isOnText() const noexcept;
    /// For a condition on a character column: the prefix, cut to the column's width, without which
    /// the condition cannot hold. Empty when there is none.
    std::string_view prefix() const noexcept;
    /// Offset of the column in the row, in bytes.
    std::size_t offset() const noexcept { return m_offset; }
    std::size_t width() const noexcept { return m_width; }

    /// Rank in the order of evaluation: cheap conditions that refuse most rows come first.
    int rank() const noexcept { return m_rank; }

private:
    enum class Kind : unsigned char {
        NEVER,
        INTEGER,
        INTEGER_IN,
        TEXT_EQUAL,
        TEXT_ORDER,
        TEXT_IN,
        STARTS,
        CONTAINS,
        FIELD, ///< may have to read the entry's fields, but once for all conditions
        MATCHES,
        FOREIGN,
    };

    void compileInteger(const SEL1_FILTERINFO& filter);
    void compileText(const RowColumn& column);
    void compilePattern(const RowColumn& column);
    int rankOf(const RowColumn* column) const noexcept;

    bool isEqual(const char* field) const noexcept;
    bool startsWith(const char* field) const noexcept;
    bool contains(const char* field) const noexcept;
    bool isOneOf(const char* field) const noexcept;
    bool matches(const char* field) const;

    Kind m_kind = Kind::NEVER;
    bool m_isOnLog = false;
    _IntfOper m_op;
    int m_rank;
    std::size_t m_offset = 0;
    std::size_t m_width = 0;
    std::string_view m_value;
    std::int64_t m_number = 0;
    std::vector<std::int64_t> m_numbers;     ///< of INTEGER_IN
    std::vector<std::string_view> m_values;  ///< of TEXT_IN
    std::unique_ptr<re2::RE2> m_pattern;     ///< of MATCHES
    std::unique_ptr<FieldCondition> m_field; ///< of FIELD
    const SEL1_FILTERINFO* m_filter;
};

} // namespace zrm::host

#endif
