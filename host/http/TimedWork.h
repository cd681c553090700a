#ifndef ZRM_HOST_TIMED_WORK_H
#define ZRM_HOST_TIMED_WORK_H

#include "host/http/HttpAnswer.h"

#include <chrono>
#include <functional>

namespace zrm::host {

/// Answers that come in time. The work for one is done on a thread of its own, which is left behind
/// when the system does not let it go on: a file system that does not answer holds up the request
/// that needs it and no other. Any thread.
namespace TimedWork {

/// The answer of the work, or whatever it throws; RequestRefused with status 503 when it has none
/// within the limit, or when too much work is left behind already. Work that is left behind goes on
/// when it can: what it refers to lives as long as the process.
HttpAnswer answer(std::function<HttpAnswer()> work, std::chrono::milliseconds limit);

} // namespace TimedWork

} // namespace zrm::host

#endif
