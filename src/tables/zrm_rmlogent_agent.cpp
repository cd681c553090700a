#include "tables/zrm_rmlogent_agent.h"

#include "base/TraceScope.h"
#include "logmgr/LogManager.h"
#include "logs/EntryClock.h"

#include <algorithm>
#include <cstdlib>
#include <ctime>
#include <iterator>
#include <new>
#include <string_view>

namespace zrm {

namespace {

TRC1_Anchor anchor{"zrm_rmlogent_agent.cpp"};

// Reasons of ctreq::Stopped.
constexpr unsigned stoppedCorruptedChain = 1;
constexpr unsigned stoppedInvalidSampleType = 2;

/// True if all rows of a log have the same value in the condition's column.
bool isOnLog(const SEL1_FILTERINFO& filter) {
    constexpr std::string_view columns[] = {"ORIGINNODE", "LOGPATH", "LOGNAME", "ULOGPATH",
                                            "ULOGNAME"};
    return std::ranges::find(columns, std::string_view(filter.columnName)) != std::end(columns);
}

/// Traces an event of a situation, with the time as ctime prints it, including the newline.
void traceSituation(const TraceScope& trace, const char* event, const char* name) {
    if (!trace.isOn(TRC1_DETAIL)) {
        return;
    }
    const std::time_t now = std::time(nullptr);
    char text[26] = "";
    ctime_r(&now, text);
    trace.detail()("Object %s for situation %s at %s", event, name, text);
}

} // namespace

zrm_rmlogent_agent::~zrm_rmlogent_agent() {
    TakeSampleDestructor();
}

void zrm_rmlogent_agent::TakeSampleConstructor() {
    const TraceScope trace(anchor);
    switch (sampleType()) {
    case SAMPLE_REPORT:
        if (LogManager* const logManager = pTheLogManager) {
            logManager->beginRequest();
        }
        break;
    case SAMPLE_SITUATION:
        traceSituation(trace, "created", name());
        getFreqPeriodThresholds();
        break;
    default:
        trace.error()("Invalid request received; sample type = %d", static_cast<int>(sampleType()));
        Stopped(stoppedInvalidSampleType);
    }
}

void zrm_rmlogent_agent::TakeSampleDestructor() {
    const TraceScope trace(anchor);
    switch (sampleType()) {
    case SAMPLE_REPORT:
        if (LogManager* const logManager = pTheLogManager) {
            logManager->endRequest();
        }
        break;
    case SAMPLE_SITUATION:
        dropTimestampChain();
        traceSituation(trace, "destroyed", name());
        break;
    default:
        break;
    }
}

unsigned zrm_rmlogent_agent::AddData(zrm_rmlogent_data_t* rows, int count) {
    TraceScope trace(anchor);
    if (trace.isOn(TRC1_FINE)) {
        trace.fine()("Event passed to situation %s for evaluation.", name());
    }
    writeThresholds(rows, count);
    return trace.result(zrm_rmlogent_base::AddData(rows, count));
}

void zrm_rmlogent_agent::writeThresholds(zrm_rmlogent_data_t* rows, int count) const {
    const bool inForce = hasThresholds();
    const auto frequency =
        static_cast<std::int32_t>(inForce ? std::abs(thresholds.freqThreshold) : 0);
    const auto period = static_cast<std::int32_t>(inForce ? thresholds.periodThreshold : 0);
    for (int i = 0; i < count; ++i) {
        rows[i].freqthresh = frequency;
        rows[i].periodthrs = period;
    }
}

bool zrm_rmlogent_agent::isTraced() {
    return zrm_rmlogent_base::isTraced() || tracesRows(anchor);
}

unsigned zrm_rmlogent_agent::InsertRow(char* row) {
    TraceScope trace(anchor);
    return trace.result(hasThresholds() ? insertWithinThresholds(row) : ctreq::InsertRow(row));
}

unsigned zrm_rmlogent_agent::insertWithinThresholds(char* row) {
    TraceScope trace(anchor);
    trace.fine()("Performing frequency/period threshold checks for situation %s.", name());
    auto* const entry = reinterpret_cast<zrm_rmlogent_data_t*>(row);
    const std::optional<std::int64_t>& instant = EntryInstant::ofThisThread();
    const long frequency = instant ? countFollowed(*instant) : countByArrival(entry->entrytime);
    if (frequency == -1) {
        trace.error()("Timestamp chain corrupted.  Stopping situation.");
        Stopped(stoppedCorruptedChain);
        Stop();
        return trace.result(0U);
    }
    if (frequency == 0) {
        return trace.result(0U);
    }
    const bool isUpperBound = thresholds.freqThreshold < 0;
    const auto bound = static_cast<long>(std::abs(thresholds.freqThreshold));
    if (isUpperBound ? frequency > bound : frequency < bound) {
        trace.detail()("Event frequency of %ld is %s the thresholdof %ld for situation %s. Event "
                       "discarded.",
                       frequency, isUpperBound ? ">" : "<", bound, name());
        return trace.result(0U);
    }
    trace.detail()("Event frequency of %ld is %s the threshold of %ld for situation %s. Event "
                   "accepted.",
                   frequency, isUpperBound ? "<=" : ">=", bound, name());
    entry->freqthresh = static_cast<std::int32_t>(frequency);
    return trace.result(ctreq::InsertRow(row));
}

/// For logs of the log configuration: adds the time to the chain and counts what arrived in the
/// period. 0: the entry does not count; -1: the chain is corrupted.
long zrm_rmlogent_agent::countByArrival(const char* entrytime) {
    if (!addEventTime(entrytime)) {
        return 0;
    }
    const long frequency =
        countEvents(*timestampChain, static_cast<long>(thresholds.periodThreshold));
    if (frequency == 0) {
        dropTimestampChain();
    }
    return frequency;
}

long zrm_rmlogent_agent::countFollowed(std::int64_t instant) {
    TraceScope trace(anchor);
    try {
        return trace.result(
            static_cast<long>(followedTimes.add(instant, thresholds.periodThreshold)));
    } catch (const std::bad_alloc&) {
        trace.error()("Memory for the times of situation %s could not be allocated. Event "
                      "discarded.",
                      name());
        return trace.result(0L);
    }
}

long zrm_rmlogent_agent::countEvents(Timestamp& newest, long period) {
    return newest.countEvents(period);
}

std::int64_t zrm_rmlogent_agent::periodOn(zrm_rmlogent_data_t& row) {
    TraceScope trace(anchor);
    const std::int64_t period = hasThresholds() ? thresholds.periodThreshold : EarlierPeriod();
    if (period == 0) {
        return trace.result(period);
    }
    ResetFilterIndex();
    SEL1_FILTERINFO* filter = nullptr;
    while (GetFilterInfo(&filter) == 0) {
        if (isOnLog(*filter) &&
            ColumnIsException(reinterpret_cast<char*>(&row), const_cast<char*>(filter->columnName),
                              filter->compareOperator, const_cast<char*>(filter->value)) == 0) {
            return trace.result(std::int64_t{0});
        }
    }
    return trace.result(period);
}

void zrm_rmlogent_agent::countEarlier(zrm_rmlogent_data_t& row) {
    TraceScope trace(anchor);
    const bool isCounted = hasThresholds() || EarlierPeriod() > 0;
    if (!isCounted || !EntryInstant::ofThisThread() ||
        !MeetsConditions(reinterpret_cast<char*>(&row))) {
        return;
    }
    if (hasThresholds()) {
        countFollowed(*EntryInstant::ofThisThread());
    } else {
        CountEarlier(reinterpret_cast<char*>(&row));
    }
}

/// Adds the entry's time to the chain. False if the time does not convert or memory runs out.
bool zrm_rmlogent_agent::addEventTime(const char* entrytime) {
    TraceScope trace(anchor);
    auto* const timestamp = new (std::nothrow) Timestamp(&timestampChain, entrytime);
    if (timestamp == nullptr) {
        trace.error()("Memory allocation for %d bytes failed. Event discarded.",
                      static_cast<int>(sizeof(Timestamp)));
        return trace.result(false);
    }
    if (timestamp->eventTime() < 0) {
        delete timestamp; // it is not on the chain
        return trace.result(false);
    }
    return trace.result(true);
}

void zrm_rmlogent_agent::dropTimestampChain() {
    delete timestampChain;
    timestampChain = nullptr;
}

} // namespace zrm
