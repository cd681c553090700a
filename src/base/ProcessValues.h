#ifndef ZRM_PROCESS_VALUES_H
#define ZRM_PROCESS_VALUES_H

#include <cstdint>

namespace zrm {

// Process-wide values. The initial thread writes them before any other thread exists; they are
// read-only from then on.

extern char* gSystemName;     ///< managed-system name, 65 bytes with its terminator
extern char* gHostName;       ///< node name, 257 bytes with its terminator; "-1" when unknown
extern std::int32_t gMaxRows; ///< maximum number of rows in one Log Entries report

} // namespace zrm

#endif
