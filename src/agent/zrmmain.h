#ifndef ZRM_ZRMMAIN_H
#define ZRM_ZRMMAIN_H

#include <cstdint>

class LogManager;

// Process-wide values. Written on the initial thread before any other thread exists, read-only
// afterwards.

extern LogManager* pTheLogManager; ///< the one log manager; null until start-up created it
extern char* gSystemName;          ///< managed-system name, 65 bytes with its terminator
extern char* gHostName;            ///< node name, 257 bytes with its terminator; "-1" when unknown
extern std::int32_t gMaxRows;      ///< most rows that one Log Entries report returns

#endif
