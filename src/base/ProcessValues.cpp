// The process-wide values are separate from start-up, so that a program can use parts of the agent
// without the framework's main loop.

#include "base/ProcessValues.h"

namespace zrm {

char* gSystemName = nullptr;
char* gHostName = nullptr;
std::int32_t gMaxRows = 1000;

} // namespace zrm
