#ifndef ZRM_RMLOGENT_AGENT_H
#define ZRM_RMLOGENT_AGENT_H

#include "logs/RequestThresholds.h"
#include "tables/Timestamp.h"
#include "tables/zrm_rmlogent_base.h"

#include <memory>

namespace zrm {

class LogFile;

/// One request on the Log Entries table. A situation receives every log's new rows and passes on
/// those that meet its conditions, if it has frequency and period thresholds only while the
/// entries come often or seldom enough. A report reads one log's entries between two times, and
/// holds the log manager's chain of logs still from its construction to its destruction.
///
/// The framework owns the object. A situation is used on the logs' threads, one at a time under
/// the table manager's lock; a report on the framework's thread that takes its sample.
class zrm_rmlogent_agent : public zrm_rmlogent_base {
public:
    using zrm_rmlogent_base::zrm_rmlogent_base;
    ~zrm_rmlogent_agent() override;

    /// Begins the request; called once, by the manager, right after construction.
    void TakeSampleConstructor();

    /// Reads the report's log and inserts the rows that meet its conditions, newest entries first
    /// and at most gMaxRows read. Failures are only traced and leave fewer rows or none.
    void TakeSample() override;
    /// Inserts one row that met the conditions, subject to the thresholds. A row that they refuse,
    /// or whose time cannot be read, is dropped and gives 0.
    unsigned InsertRow(char* row) override;
    /// Writes the thresholds' columns of the rows in place and offers the rows.
    unsigned AddData(zrm_rmlogent_data_t* rows, int count) override;
    /// Writes the thresholds' columns alone: 0 unless both thresholds are in force.
    void writeThresholds(zrm_rmlogent_data_t* rows, int count) const;
    /// True when it shows in the trace to which requests a row is offered.
    static bool isTraced();

protected:
    const _RequestThresholds& thresholdsInForce() const noexcept { return thresholds; }

    /// Counts the chain's entries within the period, which ends now while logs are monitored. For
    /// entries that are replayed it ends with the newest of them.
    virtual long countEvents(Timestamp& newest, long period);

private:
    void TakeSampleDestructor();

    // Situations.
    bool hasThresholds() const noexcept {
        return thresholds.freqThreshold != 0 && thresholds.periodThreshold != 0;
    }
    void getFreqPeriodThresholds();
    unsigned insertWithinThresholds(char* row);
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
    Timestamp* timestampChain = nullptr; ///< owned; head of the chain of recent entry times
    void* reportHandle = nullptr;        ///< the log's state of a report
};

} // namespace zrm

#endif
