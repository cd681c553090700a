#ifndef ZRM_RMLOGENT_DATA_H
#define ZRM_RMLOGENT_DATA_H

#include <cstddef>
#include <cstdint>

namespace zrm {

/// One Log Entries row. Character columns are blank-padded and not terminated. The framework reads
/// columns by offset and width, so the layout is fixed.
struct zrm_rmlogent_data_t {
    char originnode[64];
    char logpath[256];
    char logname[128];
    char entrytime[16];
    char entrysys[32];
    char entrysrc[32];
    char entrytype[16];
    char entryclass[16];
    char entrydesc[256];
    std::int32_t freqthresh;
    std::int32_t periodthrs;
    char timestamp[16];
    std::int32_t sampleno;
    std::int32_t rowno;
    char ulogpath[768];
    char ulogname[384];
    char uentrysrc[96];
    char uentrydesc[768];
};

static_assert(sizeof(zrm_rmlogent_data_t) == 2864);
static_assert(offsetof(zrm_rmlogent_data_t, entrytime) == 448);
static_assert(offsetof(zrm_rmlogent_data_t, entrydesc) == 560);
static_assert(offsetof(zrm_rmlogent_data_t, freqthresh) == 816);
static_assert(offsetof(zrm_rmlogent_data_t, timestamp) == 824);
static_assert(offsetof(zrm_rmlogent_data_t, ulogpath) == 848);
static_assert(offsetof(zrm_rmlogent_data_t, uentrydesc) == 2096);

/// The framework has no room, so nothing was offered. Returned to the logs only.
inline constexpr unsigned tableNoRoom = 0x21060008;

} // namespace zrm

#endif
