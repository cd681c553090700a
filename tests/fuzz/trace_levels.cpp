#include "host/framework/TraceControl.h"

#include <cstdlib>

using namespace zrm::host;

// Nobody reads QFW_TRC1 for a fuzz target, which has no start of the host: without a setting, a
// target that feeds on bad input would trace little else.

extern "C" int LLVMFuzzerInitialize(int* /*argc*/, char*** /*argv*/) {
    const char* const levels = std::getenv("QFW_TRC1");
    TraceControl::configure(levels != nullptr ? levels : "none");
    return 0;
}
