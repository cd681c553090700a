#ifndef ZRM_HOST_CURSORS_H
#define ZRM_HOST_CURSORS_H

#include "host/history/HistoryFile.h"

#include <atomic>
#include <cstdint>
#include <deque>
#include <string>
#include <utility>
#include <vector>

namespace zrm::host {

/// How far one sink has got; moved by its thread, looked at by any.
using Cursor = std::atomic<std::uint64_t>;

/// The cursors of the sinks that run, and which of them are not stored yet. Cursors are added
/// before the first use of unsaved and saved, which one thread at a time calls.
class Cursors {
public:
    /// Adds a sink's cursor, which lives as long as the object.
    Cursor& add(std::string sink, std::uint64_t event) {
        Entry& entry = m_entries.emplace_back(std::move(sink), event);
        return entry.cursor;
    }

    /// Those that moved since they were saved.
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

    /// What was saved is gone, or is to be saved anew.
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
