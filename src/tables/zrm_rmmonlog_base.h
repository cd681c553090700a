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

    /// Offers `count` rows, back to back: those that meet the request's conditions are inserted.
    /// Returns the last status of an insertion, 0 when there was none.
    virtual unsigned AddData(zrm_rmmonlog_data_t* rows, int count);
};

} // namespace zrm

#endif
