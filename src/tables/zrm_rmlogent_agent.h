#ifndef ZRM_RMLOGENT_AGENT_H
#define ZRM_RMLOGENT_AGENT_H

#include "logs/RequestThresholds.h"
#include "tables/EntryWindows.h"
#include "tables/Timestamp.h"
#include "tables/zrm_rmlogent_base.h"

#include <cstdint>
#include <memory>

namespace zrm {

class LogFile;

/// One request on the Log Entries table. A situation receives the new rows of every log and passes
/// on those that meet its conditions; with frequency and period thresholds, only while entries are
/// frequent or rare enough. A report reads one log's entries between two times. It keeps the log
/// manager's chain of logs unchanged from its construction to its destruction.
///
/// The framework owns the object. A situation is used on the logs' threads, one at a time under the
/// table manager's lock; a report is used on the framework's thread that takes its sample.
class zrm_rmlogent_agent : public zrm_rmlogent_base {
public:
    using zrm_rmlogent_base::zrm_rmlogent_base;
    ~zrm_rmlogent_agent() override;

    /// Begins the request. The manager calls it once, right after construction.
    void TakeSampleConstructor();

    /// Reads the report's log and inserts the rows that meet its conditions, newest entries first.
    /// Reads at most gMaxRows rows. Failures are only traced and result in fewer rows or none.
    void TakeSample() override;
    /// Inserts one row that met the conditions, subject to the thresholds. Drops the row and
    /// returns 0 if they reject it or its time cannot be read.
    unsigned InsertRow(char* row) override;
    /// Writes the threshold columns of the rows in place and offers the rows.
    unsigned AddData(zrm_rmlogent_data_t* rows, int count) override;
    /// Writes only the threshold columns. They are 0 unless both thresholds are in force.
    void writeThresholds(zrm_rmlogent_data_t* rows, int count) const;
    /// The period, in seconds, in which the situation counts entries of the log that the row's
    /// columns name; 0: it counts none of them.
    std::int64_t periodOn(zrm_rmlogent_data_t& row);
    /// Counts an entry of a followed log that was judged before, if it meets the conditions.
    void countEarlier(zrm_rmlogent_data_t& row);
    /// True if the trace shows to which requests a row is offered.
    static bool isTraced();

protected:
    const _RequestThresholds& thresholdsInForce() const noexcept { return thresholds; }

    /// Counts the chain's entries within the period. For monitored logs the period ends now; for
    /// replayed entries it ends with the newest of them.
    virtual long countEvents(Timestamp& newest, long period);
    /// Counts an entry of a followed log. 0 if memory runs out.
    virtual long countFollowed(std::int64_t instant);

private:
    void TakeSampleDestructor();

    // Situations.
    bool hasThresholds() const noexcept {
        return thresholds.freqThreshold != 0 && thresholds.periodThreshold != 0;
    }
    void getFreqPeriodThresholds();
    unsigned insertWithinThresholds(char* row);
    long countByArrival(const char* entrytime);
    bool addEventTime(const char* entrytime);
    void dropTimestampChain();

    // Reports.
    LogFile* validateFileName();
    bool getEntrytimeThresholds();
    void insertReportRows(int batch);
    int getLogEntries(long maxRows);

    std::unique_ptr<zrm_rmlogent_data_t[]> reportRows; ///< one batch of a report's sample
    LogFile* logFile = nullptr;                        ///< the log that a report reads
    _RequestThresholds thresholds{};
    /// Owned; head of the chain of recent entry times in logs of the log configuration.
    Timestamp* timestampChain = nullptr;
    EntryWindows followedTimes;   ///< recent entries of logs that are followed
    void* reportHandle = nullptr; ///< the log's state for a report
};

} // namespace zrm

#endif
