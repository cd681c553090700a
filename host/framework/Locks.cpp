// The host's implementation of locks.h.
#include "framework/locks.h"

#include "base/ErrorText.h"
#include "base/TraceScope.h"

#include <cstdlib>

using namespace zrm;

namespace {

TRC1_Anchor anchor{"Locks.cpp"};

/// Continuing without the lock would corrupt what it guards, so a failing lock ends the process.
[[noreturn]] void fail(const char* call, int code) {
    const ErrorText error(code);
    TRC1_Printf(anchor, __LINE__, "Error calling %s(); Return code = %d; %s", call, error.number(),
                error.text());
    std::abort();
}

} // namespace

void SYS1_GetLock(SYS1_Lock* lock) {
    if (const int code = pthread_mutex_lock(&lock->mutex)) {
        fail("pthread_mutex_lock", code);
    }
}

void SYS1_ReleaseLock(SYS1_Lock* lock) {
    if (const int code = pthread_mutex_unlock(&lock->mutex)) {
        fail("pthread_mutex_unlock", code);
    }
}
