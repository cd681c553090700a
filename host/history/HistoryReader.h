#ifndef ZRM_HOST_HISTORY_READER_H
#define ZRM_HOST_HISTORY_READER_H

#include "host/history/EventFilter.h"
#include "host/history/EventPage.h"
#include "host/history/HistoryState.h"
#include "host/history/Rates.h"

#include <chrono>
#include <cstdint>
#include <optional>
#include <stdexcept>
#include <stop_token>

namespace zrm::host {

/// The history could not be read; what() says why.
class HistoryError : public std::runtime_error {
    using std::runtime_error::runtime_error;
};

/// The history of events as seen by readers. Any thread. Functions that read the file may throw
/// HistoryError. Readers never delay the writing of events.
class HistoryReader {
public:
    using Clock = std::chrono::steady_clock;

    virtual ~HistoryReader() = default;

    /// The events that pass the filter, in its order. A text search may stop early.
    virtual EventPage query(const EventFilter& filter) = 0;

    /// The event with this id; none when the history does not (or no longer) contain it. Throws for
    /// a damaged event.
    virtual std::optional<StoredEvent> event(std::uint64_t id) = 0;

    /// The id of the newest committed event; 0 when there was none. Very cheap.
    virtual std::uint64_t newest() const = 0;

    /// Waits until an event with a greater id is committed, the time is up, a stop is requested or
    /// the history ends. Returns the id of the newest committed event, which is not greater than
    /// `id` when there is nothing new.
    virtual std::uint64_t waitBeyond(std::uint64_t id, Clock::time_point limit,
                                     const std::stop_token& stop) = 0;

    virtual HistoryState state() = 0;

    /// Entries and events per log from the step in which `from` lies to the one before `to`
    /// (milliseconds since 1970, UTC). `step` is a multiple of 60,000 milliseconds. Counts older
    /// than a day are dropped.
    virtual Rates rates(std::int64_t from, std::int64_t to, std::int64_t step) = 0;
};

} // namespace zrm::host

#endif
