// The log manager instance is separate from its class, so that a test can define its own.

#include "logmgr/LogManager.h"

namespace zrm {

std::atomic<LogManager*> pTheLogManager{nullptr};

} // namespace zrm
