#ifndef ZRM_HOST_HISTORY_FILE_H
#define ZRM_HOST_HISTORY_FILE_H

#include "host/history/CursorTable.h"
#include "host/history/Database.h"
#include "host/history/EventBatch.h"
#include "host/history/EventTable.h"
#include "host/history/LabelTable.h"
#include "host/history/OpenFiles.h"
#include "host/history/RateTable.h"

#include <cstdint>
#include <map>
#include <string>
#include <utility>
#include <vector>

namespace zrm::host {

/// How far one sink has got.
struct CursorValue {
    std::string sink;
    std::uint64_t event = 0; ///< id of the last event that it has got
    bool operator==(const CursorValue&) const = default;
};

/// What one minute brought, log by log.
struct MinuteCounts {
    std::int64_t minute = 0;                                    ///< since 1970, UTC
    std::vector<std::pair<std::string, std::uint64_t>> entries; ///< path and entries read
};

/// An open history, as its one writer sees it. Each operation is one transaction: it is done as a
/// whole or not at all. Used by one thread at a time. Throws DatabaseError.
class HistoryFile {
public:
    /// Opens the file and brings it up to date; a new one is made. Throws SchemaTooNew, too.
    explicit HistoryFile(const std::string& path);

    /// Id of the newest event that was ever stored; 0 when there was none.
    std::uint64_t newest() const noexcept { return m_newest; }
    /// Id of the oldest event held; 0 when there is none.
    std::uint64_t oldest() const noexcept { return m_oldest; }

    /// Lets the ids of a history without events follow this one.
    void continueAfter(std::uint64_t id);

    /// Stores events whose ids follow the newest, what they add to the rates, and cursors.
    void store(const EventBatch& batch, const std::vector<CursorValue>& cursors);

    void keepCursors(const std::vector<CursorValue>& cursors);
    std::optional<std::uint64_t> cursor(const std::string& sink) { return m_cursors.find(sink); }
    /// Forgets sinks that were not in use for so many days.
    void removeOldCursors(int days);

    /// Adds the entries of minutes that are over.
    void addEntries(const std::vector<MinuteCounts>& minutes);

    /// Removes expired events, a limited number: those before the newest `events`, and those
    /// raised before `time` as `now` has it, both in milliseconds since 1970. The newest event
    /// always stays. False when there are no more such events.
    struct Limits {
        std::uint64_t events;
        std::int64_t time;
        std::int64_t now;
    };
    bool expire(const Limits& limits);

    /// The files as they were opened.
    const OpenFiles& files() const noexcept { return m_files; }

    /// Puts what is in the write-ahead log into the file, when nobody reads it.
    void emptyLog();

    /// Gives the file system back a little of what removed events leave, once that is much. False
    /// when there is nothing to do.
    bool shrink();

private:
    template <class Work> void inTransaction(Work&& work);
    std::uint64_t lastExpired(const Limits& limits);
    void putCursors(const std::vector<CursorValue>& cursors);
    void putEvents(const EventBatch& batch);

    Database m_database;
    LabelTable m_labels;
    EventTable m_events;
    CursorTable m_cursors;
    RateTable m_rates;
    const OpenFiles m_files;
    std::uint64_t m_oldest = 0;
    std::uint64_t m_newest = 0;
    std::vector<std::int64_t> m_labelIds; ///< of one batch
};

} // namespace zrm::host

#endif
