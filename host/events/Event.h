#ifndef ZRM_HOST_EVENT_H
#define ZRM_HOST_EVENT_H

#include "framework/LogPositions.h"

#include <cstddef>
#include <cstdint>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

namespace zrm::host {

class FollowedLog;
struct EpisodeShare;
struct EventJudgement;

/// What a situation adds to its events. Immutable; shared by the situation and its undelivered
/// events.
struct SituationLabel {
    std::string name;
    std::string severity;                 ///< info, minor, warning, major or critical
    std::string text = {};                ///< its description for people; may be empty
    std::vector<std::string> fields = {}; ///< names of the fields that its conditions name
    std::size_t context = 0;              ///< earlier entries that its events have
    std::int64_t definition = 0; ///< a hash of what decides when its episodes begin and end
    std::string runbook = {};    ///< URL of what to do about them; empty: none
    std::string labels = {};     ///< of its events: a JSON object; empty: none
};

/// What an event has of its entry beside the row, as JSON values. Immutable.
struct EntryDetail {
    std::string fields;  ///< an object; empty: none
    std::string text;    ///< a string; empty: none
    bool isCut = false;  ///< the entry is longer than its text
    std::string context; ///< an array of strings, the oldest entry first; empty: none

    std::size_t bytes() const noexcept { return fields.size() + text.size() + context.size(); }
};

/// One event in the queue.
struct Event {
    std::uint64_t id = 0;    ///< counted from 1 in the order of arrival
    std::int64_t raised = 0; ///< milliseconds since 1970-01-01, UTC
    std::shared_ptr<const SituationLabel> situation;
    const char* row = nullptr; ///< the row's bytes, owned by the queue; null: no entry raised it
    std::shared_ptr<const EntryDetail> detail;       ///< null: the row is all there is
    std::shared_ptr<const EventJudgement> judgement; ///< null: the conditions alone decided
    bool endsEntry = true;            ///< false: its entry has raised the next event, too
    std::shared_ptr<FollowedLog> log; ///< with the last event of an entry of a followed log
    LogPosition behind;               ///< where the log's next entry begins
    /// With the last event of an entry: what changed in episodes up to there; null: nothing.
    std::shared_ptr<const std::vector<EpisodeShare>> shares;
};

/// One event in the form in which it leaves the process. The texts belong to the provider of the
/// record, which says how long they are valid.
struct EventRecord {
    std::uint64_t id = 0;       ///< increases from event to event
    std::int64_t raised = 0;    ///< milliseconds since 1970-01-01, UTC
    std::string_view situation; ///< its name
    std::string_view severity;  ///< info, minor, warning, major or critical
    std::string_view log;       ///< the monitored log's full path
    std::string_view json;      ///< the event as one JSON object, on one line, without a newline
    std::string_view text = {}; ///< the situation's description for people; may be empty
    std::uint64_t silence = 0;  ///< the silence that keeps it from the sinks; 0: none
};

} // namespace zrm::host

#endif
