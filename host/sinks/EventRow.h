#ifndef ZRM_HOST_EVENT_ROW_H
#define ZRM_HOST_EVENT_ROW_H

#include "host/events/EventRecord.h"

#include <cstdint>
#include <span>
#include <string>
#include <string_view>
#include <variant>
#include <vector>

namespace zrm::host {

/// The row of an event, read back from the event's JSON for the sinks that write it in another
/// form. Immutable, so any thread.
class EventRow {
public:
    struct Column {
        std::string name; ///< upper-case
        std::variant<std::string, std::int64_t> value;
    };

    /// Without columns when the record's JSON has no row.
    explicit EventRow(const EventRecord& event);

    /// The columns in table order.
    std::span<const Column> columns() const noexcept { return m_columns; }

    /// A character column; empty when there is none of this name.
    std::string_view text(std::string_view column) const;

    /// What the entry says.
    std::string_view description() const;

    /// The program or the part of it that wrote the entry.
    std::string_view source() const;

    /// The name of the system on which the entry was written.
    std::string_view node() const;

private:
    std::vector<Column> m_columns;
};

} // namespace zrm::host

#endif
