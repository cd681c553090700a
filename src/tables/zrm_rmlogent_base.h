#ifndef ZRM_RMLOGENT_BASE_H
#define ZRM_RMLOGENT_BASE_H

#include "logs/zrm_rmlogent_data.h"
#include "tables/TableRequest.h"

namespace zrm {

/// Row holder of the Log Entries table: describes the table and filters the rows that are offered
/// to a request. Owned by the framework; its rows arrive on the logs' threads, one at a time under
/// the table manager's lock.
class zrm_rmlogent_base : public TableRequest {
public:
    zrm_rmlogent_base(RequestDetail* detail, ContextInfo* context, TableManager* manager);

    /// Offers `count` rows, back to back: those that meet the request's conditions are inserted.
    /// Returns the last status of an insertion, 0 when there was none.
    virtual unsigned AddData(zrm_rmlogent_data_t* rows, int count);

protected:
    /// See zrm_rmlogent_agent.
    static bool isTraced();
};

} // namespace zrm

#endif
