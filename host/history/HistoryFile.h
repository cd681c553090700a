#ifndef ZRM_HOST_HISTORY_FILE_H
#define ZRM_HOST_HISTORY_FILE_H

#include "host/events/LogRhythm.h"
#include "host/history/Cursors.h"
#include "host/history/Database.h"
#include "host/history/EpisodeTable.h"
#include "host/history/EventBatch.h"
#include "host/history/EventTable.h"
#include "host/history/ExpectedTable.h"
#include "host/history/LabelTable.h"
#include "host/history/OpenFiles.h"
#include "host/history/PositionTable.h"
#include "host/history/RateTable.h"
#include "host/history/RhythmTable.h"
#include "host/history/SilenceTable.h"

#include <cstdint>
#include <map>
#include <string>
#include <utility>
#include <vector>

namespace zrm::host {

/// The entries of one minute, per log.
struct MinuteCounts {
    std::int64_t minute = 0;                                    ///< since 1970, UTC
    std::vector<std::pair<std::string, std::uint64_t>> entries; ///< path and number of entries read
    std::vector<LogSilence> silences = {};                      ///< learned in that minute
};

/// An open history as seen by its only writer. Each operation is one transaction: all or nothing.
/// Used by one thread at a time. Throws DatabaseError.
class HistoryFile {
public:
    /// Opens the file, creating it if necessary, and updates its schema. Also throws SchemaTooNew.
    explicit HistoryFile(const std::string& path);

    /// Id of the newest event ever stored; 0 when there was none.
    std::uint64_t newest() const noexcept { return m_newest; }
    /// Id of the oldest event held; 0 when there is none.
    std::uint64_t oldest() const noexcept { return m_oldest; }

    /// Makes the ids of a history without events start after this one.
    void continueAfter(std::uint64_t id);

    /// Stores events, whose ids follow the newest, their part of the rates and of the silences'
    /// counts, cursors, and the positions behind the events' entries.
    void store(const EventBatch& batch, const std::vector<CursorValue>& cursors,
               const std::vector<PositionValue>& positions = {},
               const std::vector<EpisodeChange>& episodes = {});

    void keepCursors(const std::vector<CursorValue>& cursors);
    std::optional<std::uint64_t> cursor(const std::string& sink) { return m_cursors.find(sink); }
    /// Removes sinks that have not been used for this many days.
    void removeOldCursors(int days);

    void keepPositions(const PositionValues& positions);
    PositionValues positions() { return PositionTable::read(m_database); }

    /// The episodes that last, as they were stored.
    std::vector<StoredEpisode> openEpisodes() { return EpisodeTable::open(m_database); }
    AcknowledgementChange acknowledge(std::uint64_t episode, const Acknowledgement& by);
    AcknowledgementChange withdraw(std::uint64_t episode);

    /// Removes the positions of logs last followed before this time (milliseconds since 1970), and
    /// returns their names. Also removes the paths last watched before it.
    std::vector<std::string> removeOldPositions(std::int64_t time);

    /// The groups from which entries are expected.
    void keepExpected(const ExpectedValues& values);
    ExpectedValues expected() { return ExpectedTable::read(m_database); }

    /// Stores silences. One that is there keeps its count of events, which store adds to.
    void keepSilences(const std::vector<Silence>& silences);
    /// The silence of an event; 0: none, or there is no such event.
    std::uint64_t silenceOf(std::uint64_t event);
    void removeSilences(const std::vector<std::uint64_t>& ids);
    KeptSilences silences() { return SilenceTable::read(m_database); }

    /// Adds the entries of minutes that are over.
    void addEntries(const std::vector<MinuteCounts>& minutes);

    /// Removes a limited number of expired events: those older than the newest `events`, and those
    /// raised before `time` given that it is `now`, both in milliseconds since 1970. The newest
    /// event always stays. False when no more events have expired.
    struct Limits {
        std::uint64_t events;
        std::int64_t time;
        std::int64_t now;
    };
    bool expire(const Limits& limits);

    /// The files as they were opened.
    const OpenFiles& files() const noexcept { return m_files; }

    /// Moves the write-ahead log into the file when there are no readers.
    void emptyLog();

    /// Returns a little of the space of removed events to the file system, once there is a lot of
    /// it. False when there is nothing to do.
    bool shrink();

private:
    template <class Work> void inTransaction(Work&& work);
    std::uint64_t lastExpired(const Limits& limits);
    void putCursors(const std::vector<CursorValue>& cursors);
    void putPositions(const std::vector<PositionValue>& positions);
    void putEvents(const EventBatch& batch);

    Database m_database;
    LabelTable m_labels;
    EventTable m_events;
    CursorTable m_cursors;
    PositionTable m_positions;
    EpisodeTable m_episodes;
    ExpectedTable m_expected;
    RateTable m_rates;
    RhythmTable m_rhythms;
    SilenceTable m_silences;
    const OpenFiles m_files;
    std::uint64_t m_oldest = 0;
    std::uint64_t m_newest = 0;
    std::vector<std::int64_t> m_labelIds; ///< of one batch
};

} // namespace zrm::host

#endif
