#ifndef ZRM_RMLOGENT_BASE_H
#define ZRM_RMLOGENT_BASE_H

#include "logs/zrm_rmlogent_data.h"
#include "tables/TableRequest.h"

namespace zrm {

/// Row holder of the Log Entries table: describes the table and filters the rows offered to a
/// request. Owned by the framework. Its rows arrive on the logs' threads, one at a time under the
/// table manager's lock.
class zrm_rmlogent_base : public TableRequest {
public:
    zrm_rmlogent_base(RequestDetail* detail, ContextInfo* context, TableManager* manager);

    /// Offers `count` contiguous rows and inserts those that meet the request's conditions. Returns
    /// the last insertion status, or 0 if nothing was inserted.
    virtual unsigned AddData(zrm_rmlogent_data_t* rows, int count);

protected:
    /// See zrm_rmlogent_agent.
    static bool isTraced();
};

} // namespace zrm

#endif
