#ifndef ZRM_RMMONLOG_BASE_H
#define ZRM_RMMONLOG_BASE_H

#include "tables/TableRequest.h"

#include <cstddef>
#include <cstdint>

namespace zrm {

/// One Monitored Logs row. Character columns are blank-padded and not terminated. The framework
/// reads columns by offset and width, so the layout is fixed.
struct zrm_rmmonlog_data_t {
    char originnode[64];
    char logpath[256];
    char logname[128];
    char logtype[1];
    char monstatus[32];
    char montime[16];
    std::int32_t numevents;
    std::int32_t numerrors;
    std::int32_t logsize;
    char logmoddate[16];
    char debugmode[1];
    char formatter[256];
    char timestamp[16];
    std::int32_t sampleno;
    std::int32_t rowno;
    char ulogpath[768];
    char ulogname[384];
};

static_assert(sizeof(zrm_rmmonlog_data_t) == 1964);
static_assert(offsetof(zrm_rmmonlog_data_t, logtype) == 448);
static_assert(offsetof(zrm_rmmonlog_data_t, montime) == 481);
static_assert(offsetof(zrm_rmmonlog_data_t, numevents) == 500);
static_assert(offsetof(zrm_rmmonlog_data_t, logmoddate) == 512);
static_assert(offsetof(zrm_rmmonlog_data_t, timestamp) == 785);
static_assert(offsetof(zrm_rmmonlog_data_t, sampleno) == 804);
static_assert(offsetof(zrm_rmmonlog_data_t, ulogpath) == 812);
static_assert(offsetof(zrm_rmmonlog_data_t, ulogname) == 1580);

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
