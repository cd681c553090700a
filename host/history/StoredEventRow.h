#ifndef ZRM_HOST_STORED_EVENT_ROW_H
#define ZRM_HOST_STORED_EVENT_ROW_H

#include "host/events/EventRecord.h"
#include "host/history/Statement.h"

#include <cstdint>

namespace zrm::host {

/// The current row of a statement that begins with `select`: one event as the file has it. Its
/// texts last until the statement's next step or reset.
class StoredEventRow {
public:
    /// "SELECT ... WHERE ", to which the conditions are added. Columns are events.id, raised,
    /// label; a label that a damaged event names may not exist.
    static const char* const select;

    explicit StoredEventRow(const Statement& row) : m_row(row) {}

    EventRecord record() const;

    /// Whether the event is what was written. Of one that was written without a checksum, whether
    /// it is JSON.
    bool isIntact() const;

private:
    const Statement& m_row;
};

} // namespace zrm::host

#endif
