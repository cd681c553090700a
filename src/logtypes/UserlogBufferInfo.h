#ifndef ZRM_USERLOG_BUFFER_INFO_H
#define ZRM_USERLOG_BUFFER_INFO_H

#include "monitor/LogBufferInfo.h"

#include <memory>

namespace zrm {

/// The state of one report on a user log. Besides the reading state it holds a date, initially
/// today, then that of the last entry read. It supplies the year for entries without one.
struct UserlogBufferInfo : _LogBufferInfo {
    long century; ///< 1 for the years 2000 to 2069, 0 for 1970 to 1999
    long year;    ///< two digits
    long month;
    long day;
    std::unique_ptr<char[]> block; ///< owns what pBuffer points to
};

} // namespace zrm

#endif
