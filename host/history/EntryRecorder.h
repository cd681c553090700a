#ifndef ZRM_HOST_ENTRY_RECORDER_H
#define ZRM_HOST_ENTRY_RECORDER_H

#include "host/history/History.h"

#include <cstdint>
#include <map>
#include <optional>
#include <string>

namespace zrm::host {

/// Gives the history, once a minute, the entries that the minute brought, log by log: what the
/// Monitored Logs table counts, less what it counted before. One thread.
class EntryRecorder {
public:
    /// The history outlives the object.
    explicit EntryRecorder(History& history) : m_history(history) {}

    /// Records the minute that is over, if one is. Called more often than that; `now` is in
    /// milliseconds since 1970.
    void tick(std::int64_t now);

    /// Records what there is of the current minute.
    void finish();

private:
    void record();

    History& m_history;
    std::optional<std::int64_t> m_minute;         ///< the current one, since 1970
    std::map<std::string, std::int32_t> m_counts; ///< per log, as last sampled
};

} // namespace zrm::host

#endif
