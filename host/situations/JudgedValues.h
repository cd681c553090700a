#ifndef ZRM_HOST_JUDGED_VALUES_H
#define ZRM_HOST_JUDGED_VALUES_H

#include "host/config/HostConfig.h"
#include "host/framework/RowLayout.h"
#include "host/situations/EntryValue.h"

#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace zrm {
class LogEntry;
} // namespace zrm

namespace zrm::host {

/// Reads the group of each row that meets a situation's conditions, and the value that is counted.
/// One thread at a time.
class JudgedValues {
public:
    explicit JudgedValues(const SituationConfig& config);

    /// Goes on to a row. `entry` is null if the row is all there is.
    void read(const RowLayout& layout, const char* row, LogEntry* entry);

    // Of that row, valid until the next one.

    /// The key of its group (GroupKey).
    const std::string& group() const noexcept { return m_group; }
    /// Empty if the situation counts entries.
    const std::string& distinct() const noexcept { return m_distinct; }
    /// Whether it has the value that raises events; true if any does.
    bool mayRaise() const noexcept { return m_mayRaise; }
    /// For further values, without matching patterns again.
    EntryReading& reading() noexcept { return m_reading; }

private:
    std::string_view valueOf(const EntryValue& value);

    std::vector<EntryValue> m_groupValues;
    std::optional<EntryValue> m_distinctValue;
    std::optional<EntryValue> m_thenValue;
    const std::string m_then; ///< what m_thenValue is to be
    EntryReading m_reading;
    std::string m_group;
    std::string m_distinct;
    bool m_mayRaise = true;
    std::string m_room; ///< of a value
    std::string m_utf8;
};

} // namespace zrm::host

#endif
