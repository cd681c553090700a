#ifndef ZRM_HOST_STORED_EVENT_ROW_H
#define ZRM_HOST_STORED_EVENT_ROW_H

#include "host/events/EventRecord.h"
#include "host/history/Statement.h"

#include <cstdint>

namespace zrm::host {

/// The current row of a statement that begins with `select`: one event as stored. Its texts are
/// valid until the statement's next step or reset.
class StoredEventRow {
public:
    /// "SELECT ... WHERE ", to which conditions are appended. Columns are events.id, raised, label;
    /// the label of a damaged event may not exist.
    static const char* const select;

    explicit StoredEventRow(const Statement& row) : m_row(row) {}

    EventRecord record() const;

    /// Whether the event is as it was written. For an event without a checksum, whether it is valid
    /// JSON.
    bool isIntact() const;

private:
    const Statement& m_row;
};

} // namespace zrm::host

#endif
