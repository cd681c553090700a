#ifndef ZRM_HOST_CURSORS_H
#define ZRM_HOST_CURSORS_H

#include "host/history/Statement.h"

#include <atomic>
#include <cstdint>
#include <deque>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

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

/// The position of one sink.
struct CursorValue {
    std::string sink;
    std::uint64_t event = 0; ///< id of the last event delivered to it
    bool operator==(const CursorValue&) const = default;
};

/// The position of one sink; moved by its thread, read by any.
using Cursor = std::atomic<std::uint64_t>;

/// The cursors of the running sinks, and which of them are not stored yet. Cursors are added before
/// the first call of unsaved or saved, which are used by one thread at a time.
class Cursors {
public:
    /// Adds a cursor for a sink; it lives as long as the object.
    Cursor& add(std::string sink, std::uint64_t event) {
        Entry& entry = m_entries.emplace_back(std::move(sink), event);
        return entry.cursor;
    }

    /// The cursors that have moved since they were saved.
    std::vector<CursorValue> unsaved() const {
        std::vector<CursorValue> values;
        for (const Entry& entry : m_entries) {
            if (const std::uint64_t event = entry.cursor.load(); event != entry.saved) {
                values.push_back({entry.sink, event});
            }
        }
        return values;
    }

    void saved(const std::vector<CursorValue>& values) {
        for (const CursorValue& value : values) {
            for (Entry& entry : m_entries) {
                if (entry.sink == value.sink) {
                    entry.saved = value.event;
                }
            }
        }
    }

    /// The saved values are lost, or must be saved again.
    void forgetSaved() {
        for (Entry& entry : m_entries) {
            entry.saved = notSaved;
        }
    }

private:
    static constexpr std::uint64_t notSaved = UINT64_MAX;

    struct Entry {
        Entry(std::string name, std::uint64_t event) : sink(std::move(name)), cursor(event) {}
        std::string sink;
        Cursor cursor;
        std::uint64_t saved = notSaved;
    };
    std::deque<Entry> m_entries;
};

} // namespace zrm::host

#endif
