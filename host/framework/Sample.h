#ifndef ZRM_HOST_SAMPLE_H
#define ZRM_HOST_SAMPLE_H

#include "host/framework/Condition.h"
#include "host/framework/RowLayout.h"

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace zrm::host {

/// The rows of one sample of a table, in the table's order.
class Sample {
public:
    /// Takes a sample: a report on log entries, or the monitored logs. `label` names the request in
    /// the agent's trace. None when there is no such table or it opens no request. Any thread,
    /// several at once; waits while the agent refreshes its logs.
    static std::optional<Sample> take(std::string_view table, std::vector<Condition> conditions,
                                      std::string label = "report");

    const RowLayout& layout() const noexcept { return m_layout; }
    std::size_t size() const noexcept { return m_rowSize == 0 ? 0 : m_rows.size() / m_rowSize; }
    /// Number of rows that the table offered, before the conditions were applied.
    std::uint64_t offered() const noexcept { return m_offered; }
    /// The row of this index, less than size().
    const char* row(std::size_t index) const noexcept { return m_rows.data() + index * m_rowSize; }

private:
    Sample(RowLayout layout, std::size_t rowSize, std::vector<char> rows, std::uint64_t offered);

    RowLayout m_layout;
    std::size_t m_rowSize;
    std::vector<char> m_rows;
    std::uint64_t m_offered;
};

} // namespace zrm::host

#endif
