#ifndef ZRM_HOST_CURSOR_TABLE_H
#define ZRM_HOST_CURSOR_TABLE_H

#include "host/history/Statement.h"

#include <cstdint>
#include <optional>
#include <string_view>

namespace zrm::host {

/// The position of each sink, as stored in the history. Used by one thread at a time. Throws
/// DatabaseError.
class CursorTable {
public:
    explicit CursorTable(Database& database);

    /// The id of the last event delivered to a sink; none for an unknown sink.
    std::optional<std::uint64_t> find(std::string_view sink);

    /// Stores the id of the last event delivered to a sink, and that the sink was in use at this
    /// time (milliseconds since 1970).
    void keep(std::string_view sink, std::uint64_t event, std::int64_t used);

    /// Removes the positions of sinks last used before this time.
    void removeUnusedSince(std::int64_t time);

private:
    Statement m_find;
    Statement m_keep;
    Statement m_remove;
};

} // namespace zrm::host

#endif
