#ifndef ZRM_HOST_ENTRY_RECORDER_H
#define ZRM_HOST_ENTRY_RECORDER_H

#include "host/history/History.h"

#include <cstdint>
#include <functional>
#include <map>
#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace zrm::host {

/// Records in the history, once a minute, how many entries each log had in that minute: the count
/// in the Monitored Logs table minus the previous one; and what was learned of their silences. Used
/// by one thread.
class EntryRecorder {
public:
    /// The history must outlive the object.
    /// `learned` returns what was learned of the logs' silences since it was called last.
    EntryRecorder(History& history, std::function<std::vector<LogSilence>()> learned)
        : m_history(history), m_learned(std::move(learned)) {}

    /// Records the last minute if it is over. Called more than once a minute; `now` is in
    /// milliseconds since 1970.
    void tick(std::int64_t now);

    /// Records the current minute so far.
    void finish();

private:
    void record();

    History& m_history;
    const std::function<std::vector<LogSilence>()> m_learned;
    std::optional<std::int64_t> m_minute;         ///< the current one, since 1970
    std::map<std::string, std::int32_t> m_counts; ///< per log, as last sampled
};

} // namespace zrm::host

#endif
