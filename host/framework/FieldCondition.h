#ifndef ZRM_HOST_FIELD_CONDITION_H
#define ZRM_HOST_FIELD_CONDITION_H

#include "framework/filters.h"

#include <cstdint>
#include <memory>
#include <optional>
#include <string_view>
#include <vector>

namespace re2 {
class RE2;
}

namespace zrm::host {

/// A number as fields and conditions write it: decimal digits with an optional minus sign, fraction
/// and exponent. Whole numbers of 64 bits compare exactly, others as floating point.
class FieldNumber {
public:
    /// None if the text is anything else.
    static std::optional<FieldNumber> of(std::string_view text) noexcept;

    /// -1, 0 or 1 if this number is less than, equal to or greater than the other.
    int order(const FieldNumber& other) const noexcept;

private:
    std::int64_t m_whole = 0;
    double m_value = 0;
    bool m_isWhole = false;
};

/// A condition on a field of the entry whose row the calling thread offers, prepared for
/// evaluation. A value that was written as a number is compared with the field's number, any other
/// with its text, byte by byte. An entry without the field meets only `!=`; so does, for a number,
/// a field that is not a number. Evaluation neither locks nor allocates, except in RE2.
class FieldCondition {
public:
    /// `field` is the field's name. The texts must outlive the object.
    FieldCondition(std::string_view field, const SEL1_FILTERINFO& filter);
    FieldCondition(const FieldCondition&) = delete;
    FieldCondition& operator=(const FieldCondition&) = delete;
    ~FieldCondition();

    /// Whether the entry meets the condition.
    bool holds() const;
    /// The field's value in that entry, until the next one. None if it does not have the field.
    std::optional<std::string_view> value() const;

private:
    bool isMetBy(std::string_view value) const;
    bool isMetBy(const FieldNumber& number) const;

    const std::string_view m_field;
    const _IntfOper m_op;
    bool m_isUsable = true; ///< false: the condition never holds
    bool m_isNumber = false;
    std::vector<std::string_view> m_values; ///< of INTF_IN; otherwise one
    std::vector<FieldNumber> m_numbers;     ///< the same as numbers
    std::unique_ptr<re2::RE2> m_pattern;    ///< of INTF_MATCHES
};

} // namespace zrm::host

#endif
