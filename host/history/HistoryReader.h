#ifndef ZRM_HOST_HISTORY_READER_H
#define ZRM_HOST_HISTORY_READER_H

#include "host/base/Result.h"
#include "host/history/EpisodeReader.h"

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <stop_token>
#include <string>
#include <vector>

namespace zrm::host {

/// Selects events of the history; everything that is set must match.
struct EventFilter {
    std::uint64_t after = 0;                            ///< only ids above this one
    std::optional<std::uint64_t> before = std::nullopt; ///< only ids below this one
    std::optional<std::int64_t> from =
        std::nullopt; ///< raised then or later: milliseconds since 1970, UTC
    std::optional<std::int64_t> to = std::nullopt; ///< raised then or earlier
    std::vector<std::string> situations = {};      ///< any of these names; empty: all
    std::vector<std::string> logs = {};            ///< any of these full paths; empty: all
    std::vector<std::string> severities = {};      ///< any of these; empty: all
    std::optional<bool> silenced = std::nullopt;   ///< held back by a silence, or not
    std::string text = {};                         ///< text that EventText must find; empty: all
    std::size_t limit = 100;                       ///< the most events to return
    bool newestFirst = true; ///< true: by descending id; false: by ascending id
};

/// One event as returned by the history to a reader, which owns the texts.
struct StoredEvent {
    std::uint64_t id = 0;
    std::int64_t raised = 0; ///< milliseconds since 1970-01-01, UTC
    std::string situation;   ///< its name
    std::string severity;    ///< info, minor, warning, major or critical
    std::string log;         ///< the monitored log's full path
    std::string json;        ///< the event as one JSON object, on one line, without a newline
    bool operator==(const StoredEvent&) const = default;
};

/// The result of one query of the history.
struct EventPage {
    std::vector<StoredEvent> events; ///< in the filter's order
    /// Ids of corrupted events, which are not among the events.
    std::vector<std::uint64_t> damaged = {};
    /// Set when the page ended early, because a text search took long or the events are large: the
    /// id of the last event examined.
    std::optional<std::uint64_t> reached = std::nullopt;
};

/// The contents and condition of the history.
struct HistoryState {
    std::uint64_t events = 0;  ///< number of events held
    std::uint64_t oldest = 0;  ///< id of the oldest event held; 0 when there is none
    std::uint64_t newest = 0;  ///< id of the newest event ever committed; 0 when there was none
    std::uint64_t bytes = 0;   ///< on disk, over all its files
    std::uint64_t damaged = 0; ///< number of damaged events found by readers since the start
    std::string problem;       ///< why it cannot store events now; empty: it can
};

/// How much came in of one log, step by step. A step of which nothing is known, because no agent
/// ran, has no value.
struct LogRates {
    using Counts = std::vector<std::optional<std::uint64_t>>;

    std::string log; ///< the monitored log's full path
    Counts entries;  ///< entries read
    Counts events;   ///< events raised
};

/// How much came in of every log that had an entry or an event in a window of time.
struct Rates {
    std::int64_t start = 0;     ///< of the first step: milliseconds since 1970-01-01, UTC
    std::int64_t step = 0;      ///< milliseconds
    std::vector<LogRates> logs; ///< by path; each has as many counts as the window has steps
};

/// The history of events as seen by readers. Any thread. Readers never delay the writing of events.
class HistoryReader {
public:
    using Clock = std::chrono::steady_clock;

    virtual ~HistoryReader() = default;

    /// The events that pass the filter, in its order. The page may end early.
    virtual Result<EventPage> query(const EventFilter& filter) = 0;

    /// The event with this id; none when the history does not (or no longer) contain it. A
    /// damaged one is refused.
    virtual Result<std::optional<StoredEvent>> event(std::uint64_t id) = 0;

    /// The id of the newest committed event; 0 when there was none. Very cheap.
    virtual std::uint64_t newest() const = 0;

    /// Waits until an event with a greater id is committed, the time is up, a stop is requested or
    /// the history ends. Returns the id of the newest committed event, which is not greater than
    /// `id` when there is nothing new.
    virtual std::uint64_t waitBeyond(std::uint64_t id, Clock::time_point limit,
                                     const std::stop_token& stop) = 0;

    /// The episodes that pass the filter, the newest first.
    virtual Result<std::vector<EpisodeRecord>> episodes(const EpisodeFilter& filter) = 0;

    /// How many of the open episodes somebody has acknowledged.
    virtual Result<std::uint64_t> acknowledgedEpisodes() = 0;

    virtual HistoryState state() = 0;

    /// Entries and events per log from the step in which `from` lies to the one before `to`
    /// (milliseconds since 1970, UTC). `step` is a multiple of 60,000 milliseconds. Counts older
    /// than a day are dropped.
    virtual Result<Rates> rates(std::int64_t from, std::int64_t to, std::int64_t step) = 0;
};

} // namespace zrm::host

#endif
