#ifndef ZRM_HOST_FILTER_LIST_H
#define ZRM_HOST_FILTER_LIST_H

#include "framework/filters.h"
#include "host/framework/Condition.h"

#include <string>
#include <vector>

namespace zrm::host {

/// Data type of text filter values.
inline constexpr std::int16_t SEL1_CHARACTER = 452;

/// A request's conditions in the form in which the agent reads them. A number is published as 8
/// bytes in host order. A text is published without padding and with a NUL behind it; 16 bytes can
/// be read whatever its length. The values of INTF_IN are one text with a newline between them,
/// which no log entry holds. Not locked: one thread walks at a time.
class FilterList {
public:
    /// The conditions must outlive the list.
    explicit FilterList(const std::vector<Condition>& conditions);
    FilterList(const FilterList&) = delete;
    FilterList& operator=(const FilterList&) = delete;

    /// The next condition of the walk; null at its end.
    SEL1_FILTERINFO* next() noexcept;
    /// Starts the walk afresh.
    void reset() noexcept { m_position = 0; }

    const std::vector<SEL1_FILTERINFO>& all() const noexcept { return m_filters; }

private:
    std::vector<std::string> m_values;
    std::vector<SEL1_FILTERINFO> m_filters;
    std::size_t m_position = 0;
};

} // namespace zrm::host

#endif
