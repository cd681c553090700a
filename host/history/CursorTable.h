#ifndef ZRM_HOST_CURSOR_TABLE_H
#define ZRM_HOST_CURSOR_TABLE_H

#include "host/history/Statement.h"

#include <cstdint>
#include <optional>
#include <string_view>

namespace zrm::host {

/// How far each sink has got, as the history keeps it. Used by one thread at a time. Throws
/// DatabaseError.
class CursorTable {
public:
    explicit CursorTable(Database& database);

    /// The id of the last event that a sink has got; none for a sink that is not known.
    std::optional<std::uint64_t> find(std::string_view sink);

    /// Keeps the id of the last event that a sink has got, and that it was in use at this time
    /// (milliseconds since 1970).
    void keep(std::string_view sink, std::uint64_t event, std::int64_t used);

    /// Removes what belongs to sinks that were last in use before this time.
    void removeUnusedSince(std::int64_t time);

private:
    Statement m_find;
    Statement m_keep;
    Statement m_remove;
};

} // namespace zrm::host

#endif
