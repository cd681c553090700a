#include "host/history/EntryRecorder.h"

#include "base/TraceScope.h"
#include "host/events/RowText.h"
#include "host/framework/Sample.h"

#include <utility>

namespace zrm::host {

namespace {

TRC1_Anchor anchor{"EntryRecorder.cpp"};

constexpr std::int64_t millisecondsPerMinute = 60'000;

/// Entries since the last sample. A log that is monitored again counts from zero.
std::uint64_t difference(std::int32_t before, std::int32_t now) {
    return static_cast<std::uint32_t>(now < before ? now : now - before);
}

} // namespace

void EntryRecorder::tick(std::int64_t now) {
    const std::int64_t minute = now / millisecondsPerMinute;
    if (m_minute && *m_minute != minute) {
        record();
    }
    m_minute = minute;
}

void EntryRecorder::finish() {
    if (m_minute) {
        record();
    }
}

void EntryRecorder::record() {
    TraceScope trace(anchor);
    const std::optional<Sample> logs = Sample::take("RMMONLOG", {}, "rates");
    const RowColumn* const count = logs ? logs->layout().find("NUMEVENTS") : nullptr;
    if (count == nullptr) {
        return;
    }
    MinuteCounts minute;
    minute.minute = *m_minute;
    std::map<std::string, std::int32_t> counts;
    for (std::size_t index = 0; index < logs->size(); ++index) {
        const std::string log = LogPath::of(logs->layout(), logs->row(index));
        const std::int32_t now = count->integer(logs->row(index));
        const auto before = m_counts.find(log);
        if (const std::uint64_t entries =
                difference(before == m_counts.end() ? 0 : before->second, now);
            entries > 0) {
            minute.entries.emplace_back(log, entries);
        }
        counts[log] = now;
    }
    m_counts = std::move(counts);
    minute.silences = m_learned();
    m_history.addEntries(std::move(minute));
}

} // namespace zrm::host
