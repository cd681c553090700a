#ifndef ZRM_ZRMMAIN_H
#define ZRM_ZRMMAIN_H

#include <atomic>
#include <cstdint>

class LogManager;

// Process-wide values. All but pTheLogManager are written on the initial thread before any other
// thread exists and are read-only afterwards.

/// The one log manager; null until start-up created it. Atomic, since its own threads already run
/// when start-up stores it. Never cleared.
extern std::atomic<LogManager*> pTheLogManager;
extern char* gSystemName;     ///< managed-system name, 65 bytes with its terminator
extern char* gHostName;       ///< node name, 257 bytes with its terminator; "-1" when unknown
extern std::int32_t gMaxRows; ///< most rows that one Log Entries report returns

#endif
