// The part of LogTail for logs that are not files.

#include "base/TraceScope.h"
#include "framework/cancellation.h"
#include "host/analysis/LogTail.h"
#include "logs/FollowSettings.h"
#include "logtypes/EntryStamp.h"
#include "logtypes/SourceEntry.h"
#include "logtypes/SourceLogFile.h"
#include "logtypes/SourceReport.h"

#include <limits>
#include <memory>
#include <string>

namespace zrm::host {

namespace {

TRC1_Anchor anchor{"LogTailSource.cpp"};

} // namespace

/// Goes back as far as the entries are wanted, and gives them on the way forward, so that none has
/// to be kept.
Result<void> LogTail::readSource(const std::string& until, const Entry& entry) {
    TraceScope trace(anchor);
    const std::shared_ptr<const FollowSettings>& settings = m_log.followSettings();
    const std::unique_ptr<EntrySource::Past> past = settings->source->past();
    if (!past) {
        const Problem problem{SourceReport::noPast, "explain one of the log's events"};
        m_reach.reason = problem.what;
        return tl::unexpected(problem);
    }
    const std::int64_t newest = until.empty() ? std::numeric_limits<std::int64_t>::max()
                                              : SourceReport::latestOf(until.c_str());
    if (!past->begin(newest)) {
        m_reach.reason = past->problem();
        return refused(past->problem());
    }
    std::size_t count = 0;
    while (count <= mostEntries && past->previous() != nullptr) {
        ++count;
    }
    const bool isWhole = count <= mostEntries;
    auto& log = static_cast<SourceLogFile&>(m_log);
    SourceEntry current(*past, settings->keep);
    const LogEntry::Offer offer(current);
    EntryStamp stamp(settings);
    zrm_rmlogent_data_t row;
    if (count > 0 && past->turn() && (isWhole || past->next() != nullptr)) {
        // No further than the way back began: a busy source would never end.
        for (count -= isWhole ? 0 : 1; count > 0 && past->next() != nullptr; --count) {
            current.begin();
            if (!log.makeRow(*past, stamp, row)) {
                entry(past->text(), nullptr);
                continue;
            }
            if (m_reach.reached.empty()) {
                note(row);
            }
            give(entry, past->text(), row, lastEntryMoment);
        }
    }
    m_reach.reason = CTX1_IsCancelled() ? "the request was cancelled"
                     : isWhole
                         ? past->problem()
                         : "no more than " + std::to_string(mostEntries) + " entries are read";
    return {};
}

} // namespace zrm::host
