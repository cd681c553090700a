#ifndef ZRM_RMMONLOG_AGENT_H
#define ZRM_RMMONLOG_AGENT_H

#include "tables/zrm_rmmonlog_base.h"

#include <memory>

namespace zrm {

class LogFile;

/// One request on the Monitored Logs table. Each sample builds one new row per monitored log. Owned
/// by the framework; used by the thread that takes the sample. The log manager exists before the
/// first request, which notifies it that requests are being served.
class zrm_rmmonlog_agent : public zrm_rmmonlog_base {
public:
    using zrm_rmmonlog_base::zrm_rmmonlog_base;
    ~zrm_rmmonlog_agent() override;

    /// Begins the request. The manager calls it once, right after construction.
    void TakeSampleConstructor();

    /// Inserts the rows of the monitored logs that meet the request's conditions. Failures are only
    /// traced and result in no rows.
    void TakeSample() override;

private:
    void TakeSampleDestructor();
    unsigned getMonitoredLogs(std::unique_ptr<zrm_rmmonlog_data_t[]>& rows);
    unsigned buildTableRows(zrm_rmmonlog_data_t* rows, unsigned room);
    void buildTableRow(zrm_rmmonlog_data_t* row, LogFile* log);
};

} // namespace zrm

#endif
