#ifndef ZRM_HOST_TIMED_WORK_H
#define ZRM_HOST_TIMED_WORK_H

#include "host/http/Message.h"

#include <chrono>
#include <functional>

namespace zrm::host {

/// Answers within a time limit. The work for each answer runs on its own thread, which is abandoned
/// if it blocks in the system: a file system that hangs delays only the request that needs it. Any
/// thread.
namespace TimedWork {

/// Returns the answer of the work, which must not throw. Throws RequestRefused with status 503 when
/// there is no answer within the limit, or when too much work has already been abandoned. Abandoned
/// work continues when it can, so what it refers to must live as long as the process.
HttpAnswer answer(std::function<HttpAnswer()> work, std::chrono::milliseconds limit);

} // namespace TimedWork

} // namespace zrm::host

#endif
