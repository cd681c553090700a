// The one log manager stands apart from its class, so that a test can put its own in its place.

#include "logmgr/LogManager.h"

namespace zrm {

std::atomic<LogManager*> pTheLogManager{nullptr};

} // namespace zrm
