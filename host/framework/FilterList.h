#ifndef ZRM_HOST_FILTER_LIST_H
#define ZRM_HOST_FILTER_LIST_H

#include "framework/filters.h"
#include "host/framework/Condition.h"

#include <string>
#include <vector>

namespace zrm::host {

/// Data type of text filter values.
inline constexpr std::int16_t SEL1_CHARACTER = 452;
/// Data type of the numbers that fields are compared with: decimal text.
inline constexpr std::int16_t SEL1_DECIMAL = 484;

/// A request's conditions in the form that the agent reads. A number is published as 8 bytes in
/// host order. A text is published without padding, followed by a NUL; 16 bytes are readable
/// whatever its length. The values of INTF_IN are one text, separated by newlines, which no log
/// entry contains. Not locked: one thread iterates at a time.
class FilterList {
public:
    /// The conditions must outlive the list.
    explicit FilterList(const std::vector<Condition>& conditions);
    FilterList(const FilterList&) = delete;
    FilterList& operator=(const FilterList&) = delete;

    /// The next condition; null after the last one.
    SEL1_FILTERINFO* next() noexcept;
    /// Restarts the iteration.
    void reset() noexcept { m_position = 0; }

    const std::vector<SEL1_FILTERINFO>& all() const noexcept { return m_filters; }

private:
    std::vector<std::string> m_values;
    std::vector<SEL1_FILTERINFO> m_filters;
    std::size_t m_position = 0;
};

} // namespace zrm::host

#endif
