#ifndef ZRM_RMMONLOG_MANAGER_H
#define ZRM_RMMONLOG_MANAGER_H

#include "framework/TableManager.h"

namespace zrm {

struct zrm_rmmonlog_data_t;

/// Manager of the Monitored Logs table: creates its request objects. One per process, never
/// destroyed.
class zrm_rmmonlog_manager : public TableManager {
public:
    zrm_rmmonlog_manager(const char* application, const char* table);
    ctreq* CreateCtreq(RequestDetail* detail, ContextInfo* context) override;

    /// Passes `count` rows to every open request, like zrm_rmlogent_manager::EventArrived. The
    /// table's rows come from samples; nothing in the agent raises events on it.
    static unsigned EventArrived(zrm_rmmonlog_data_t* rows, int count);

    unsigned AddDataToEvent(zrm_rmmonlog_data_t* rows, int count);
};

/// Creates and registers the Monitored Logs table's manager. Returns 0 or a framework status.
unsigned zrm_rmmonlog_init();

} // namespace zrm

#endif
