#ifndef ZRM_RMMONLOG_BASE_H
#define ZRM_RMMONLOG_BASE_H

#include "tables/TableRequest.h"
#include "tables/zrm_rmmonlog_data.h"

namespace zrm {

/// Row holder of the Monitored Logs table: describes the table and filters the rows of a sample.
/// Owned by the framework; used by the thread that takes the sample.
class zrm_rmmonlog_base : public TableRequest {
public:
    zrm_rmmonlog_base(RequestDetail* detail, ContextInfo* context, TableManager* manager);

    /// Offers `count` contiguous rows and inserts those that meet the request's conditions. Returns
    /// the last insertion status, or 0 if nothing was inserted.
    virtual unsigned AddData(zrm_rmmonlog_data_t* rows, int count);
};

} // namespace zrm

#endif
