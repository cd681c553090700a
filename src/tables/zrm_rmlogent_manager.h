#ifndef ZRM_RMLOGENT_MANAGER_H
#define ZRM_RMLOGENT_MANAGER_H

#include "framework/TableManager.h"
#include "logs/zrm_rmlogent_data.h"

namespace zrm {

/// Manager of the Log Entries table: creates its request objects and hands fresh rows to every
/// open situation. One per process, never destroyed.
class zrm_rmlogent_manager : public TableManager {
public:
    zrm_rmlogent_manager(const char* application, const char* table);
    ctreq* CreateCtreq(RequestDetail* detail, ContextInfo* context) override;

    /// Hands `count` fresh rows, back to back, to every open situation; called by the threads of
    /// all logs. The thresholds' columns of the rows are written in place. Returns 0, or the last
    /// non-zero status of a dispatch; 0 and nothing else before the table was registered.
    /// TABLE_NO_ROOM when nothing was offered, since the framework has no room (EventRoom).
    static unsigned EventArrived(zrm_rmlogent_data_t* rows, int count);

    unsigned AddDataToEvent(zrm_rmlogent_data_t* rows, int count);

private:
    bool areOffersTraced();

    // Under the lock.
    unsigned m_traceGeneration = 0; ///< of the trace levels that m_areOffersTraced follows
    bool m_areOffersTraced = false;
};

/// Creates and registers the table's manager. Returns 0 or a framework status.
unsigned zrm_rmlogent_init();

} // namespace zrm

#endif
