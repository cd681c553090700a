#include "logtypes/SourceReport.h"

#include "framework/LogEntry.h"
#include "framework/cancellation.h"
#include "logs/FurtherLogs.h"
#include "logs/ValidLog.h"
#include "logs/ZoneTime.h"
#include "logtypes/SourceEntry.h"
#include "logtypes/SourceLogFile.h"

#include <algorithm>
#include <cstring>

namespace zrm {

namespace {

constexpr std::int64_t second = 1'000'000; ///< in microseconds
constexpr unsigned entriesPerLook = 1024;  ///< entries between two looks at the caller
constexpr std::size_t stampLength = sizeof zrm_rmlogent_data_t::entrytime;

ZoneTime::UtcTimes utcOf(const char* stamp) {
    return ZoneTime::utcTimes(ZoneTime::ofStamp(stamp).seconds(), {});
}

} // namespace

struct SourceReport::Log : SourceLogFile {
    explicit Log(const LogFile& log)
        : SourceLogFile(ValidLog(FurtherLog{log.fileNameUTF8(), log.type(), 'N', log.procedure(),
                                            log.followSettings()}),
                        Unmonitored{}) {}
};

std::int64_t SourceReport::latestOf(const char* stamp) {
    return (utcOf(stamp).second + 1) * second - 1;
}

std::int64_t SourceReport::earliestOf(const char* stamp) {
    return utcOf(stamp).first * second;
}

SourceReport::SourceReport(const LogFile& log, FollowedReport::Options options)
    : m_log(std::make_unique<Log>(log)), m_past(log.followSettings()->source->past()),
      m_options(std::move(options)) {}

SourceReport::~SourceReport() = default;

const std::string& SourceReport::problem() const noexcept {
    static const std::string whyNone = noPast;
    return m_past ? m_past->problem() : whyNone;
}

void SourceReport::run(FollowedReport::Receiver& receiver) {
    const std::int64_t newest = latestOf(m_options.to.c_str());
    const std::int64_t oldest = earliestOf(m_options.from.c_str());
    if (!m_past || !m_past->begin(newest)) {
        return;
    }
    receiver.begin(false);
    SourceEntry current(*m_past, m_log->followSettings()->keep);
    const LogEntry::Offer offer(current);
    EntryStamp stamp(m_log->followSettings());
    zrm_rmlogent_data_t row{};
    std::int64_t first = newest; ///< the time of the newest entry
    for (unsigned entries = 0; m_given < m_options.limit; ++entries) {
        if (entries % entriesPerLook == 0 && CTX1_IsCancelled()) {
            m_isCancelled = true;
            return;
        }
        if (m_past->previous() == nullptr) {
            m_isCancelled = CTX1_IsCancelled();
            return;
        }
        if (m_past->time() < oldest) {
            return;
        }
        first = entries == 0 ? m_past->time() : first;
        if (entries % entriesPerLook == 0) {
            receiver.progress((first - m_past->time()) / second, 1 + (first - oldest) / second);
        }
        current.begin();
        if (!m_log->makeRow(*m_past, stamp, row)) {
            ++m_skipped;
        } else if (std::strncmp(row.entrytime, m_options.from.c_str(), stampLength) >= 0 &&
                   std::strncmp(row.entrytime, m_options.to.c_str(), stampLength) <= 0) {
            m_reached.assign(row.entrytime, stampLength);
            if (receiver.meets(row)) {
                ++m_given;
                receiver.give(row, receiver.describe());
            }
        }
    }
}

} // namespace zrm
