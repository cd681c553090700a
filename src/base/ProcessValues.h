#ifndef ZRM_PROCESS_VALUES_H
#define ZRM_PROCESS_VALUES_H

#include <cstdint>

namespace zrm {

// Process-wide values. They are written on the initial thread before any other thread exists and
// are read-only afterwards.

extern char* gSystemName;     ///< managed-system name, 65 bytes with its terminator
extern char* gHostName;       ///< node name, 257 bytes with its terminator; "-1" when unknown
extern std::int32_t gMaxRows; ///< most rows that one Log Entries report returns

} // namespace zrm

#endif
