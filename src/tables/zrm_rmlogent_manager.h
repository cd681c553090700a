#ifndef ZRM_RMLOGENT_MANAGER_H
#define ZRM_RMLOGENT_MANAGER_H

#include "framework/TableManager.h"
#include "logs/zrm_rmlogent_data.h"

#include <cstdint>

namespace zrm {

/// Manager of the Log Entries table: creates its request objects and passes new rows to every open
/// situation. One per process, never destroyed.
class zrm_rmlogent_manager : public TableManager {
public:
    zrm_rmlogent_manager(const char* application, const char* table);
    ctreq* CreateCtreq(RequestDetail* detail, ContextInfo* context) override;

    /// Passes `count` contiguous new rows to every open situation. Called by the threads of all
    /// logs. Writes the threshold columns of the rows in place. Returns 0 or the last non-zero
    /// dispatch status. Before the table is registered, does nothing and returns 0. Returns
    /// tableNoRoom if nothing was offered because the framework has no room (EventRoom).
    static unsigned EventArrived(zrm_rmlogent_data_t* rows, int count);

    /// The longest period, in seconds, in which an open situation counts entries of the log that
    /// the row's columns name; 0: none does.
    static std::int64_t LongestPeriod(zrm_rmlogent_data_t& row);
    /// Counts an entry that was judged before towards the thresholds of the open situations.
    /// Nothing is raised. Called by the threads of all logs.
    static void CountEarlier(zrm_rmlogent_data_t& row);

    unsigned AddDataToEvent(zrm_rmlogent_data_t* rows, int count);

private:
    bool areOffersTraced();

    // Under the lock.
    unsigned m_traceGeneration = 0; ///< of the trace levels reflected in m_areOffersTraced
    bool m_areOffersTraced = false;
};

/// Creates and registers the table's manager. Returns 0 or a framework status.
unsigned zrm_rmlogent_init();

} // namespace zrm

#endif
