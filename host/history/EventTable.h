#ifndef ZRM_HOST_EVENT_TABLE_H
#define ZRM_HOST_EVENT_TABLE_H

#include "host/events/Event.h"
#include "host/history/Statement.h"

#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <string_view>
#include <vector>

namespace zrm::host {

/// The checksum stored beside an event: readers recompute it, so that data corrupted on disk is
/// detected and not served. It covers the event's id, time, label and JSON.
std::int64_t eventChecksum(std::int64_t id, std::int64_t raised, std::int64_t label,
                           std::string_view json) noexcept;

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

/// The events of a history as the writer sees them: appended at one end and removed at the other.
/// Used by the writer's thread. Throws DatabaseError.
class EventTable {
public:
    /// Marks exist per part of this many ids: the part of an event is its id divided by this.
    static constexpr std::uint64_t partSize = 1024;

    /// When an event was raised.
    struct Moment {
        std::uint64_t id = 0;
        std::int64_t raised = 0; ///< milliseconds since 1970, UTC
    };

    explicit EventTable(Database& database);

    /// Adds events; `labels` contains the label of each.
    void append(std::span<const EventRecord> events, std::span<const std::int64_t> labels);

    /// Id of the oldest event; 0 when there is none.
    std::uint64_t oldest();
    /// Id of the newest event; 0 when there is none.
    std::uint64_t newest();

    /// The oldest events, at most `most`, by ascending id.
    std::vector<Moment> oldestMoments(std::size_t most);

    /// When an event of the part of `id`, or of a later one, was raised, not later than `time`: the
    /// earliest of the first part that has one. None when every such event was raised later.
    std::optional<std::int64_t> firstMomentFrom(std::uint64_t id, std::int64_t time);

    /// Removes the events up to this id.
    void removeUntil(std::uint64_t id);

private:
    void mark(std::span<const EventRecord> events);

    Database& m_database;
    Statement m_insert;
    Statement m_mark;
    Statement m_oldestMoments;
    Statement m_firstMoment;
    Statement m_remove;
    Statement m_removeMarks;
};

} // namespace zrm::host

#endif
