#include "support/FaultState.h"
#include "support/Faults.h"

#include <atomic>
#include <cerrno>
#include <cstdio>
#include <ctime>

#include <fcntl.h>
#include <pthread.h>
#include <signal.h>
#include <sys/select.h>
#include <sys/stat.h>
#include <sys/utsname.h>
#include <sys/wait.h>
#include <unistd.h>

namespace {

std::atomic<bool> g_fakeClock{false};
std::atomic<std::time_t> g_now{0};
std::atomic<bool> g_fakeSleep{false};
std::atomic<unsigned> g_slept{0};
std::atomic<long> g_blockSize{-1}; // negative: the real one
std::atomic<pid_t> g_waitedId{0};
std::atomic<bool> g_fakeTimedWait{false};
std::atomic<long> g_timedWaitSeconds{0};
std::atomic<int> g_fakeSignal{0};
std::atomic<bool> g_unreadableStreams{false};
std::atomic<bool> g_shortSelect{false};
std::atomic<long> g_selected{-1};
std::string* g_unameSystem = nullptr;
std::string* g_unameNode = nullptr;

} // namespace

FakeClock::FakeClock(std::time_t now) {
    g_now = now;
    g_fakeClock = true;
}
FakeClock::~FakeClock() {
    g_fakeClock = false;
}
void FakeClock::set(std::time_t now) {
    g_now = now;
}

FakeSleep::FakeSleep() {
    g_slept = 0;
    g_fakeSleep = true;
}
FakeSleep::~FakeSleep() {
    g_fakeSleep = false;
}
unsigned FakeSleep::requested() const {
    return g_slept;
}

FakeTimedWait::FakeTimedWait() {
    g_timedWaitSeconds = 0;
    g_fakeTimedWait = true;
}
FakeTimedWait::~FakeTimedWait() {
    g_fakeTimedWait = false;
}
long FakeTimedWait::requested() const {
    return g_timedWaitSeconds;
}

FakeSignal::FakeSignal(int number) {
    g_fakeSignal = number;
}
FakeSignal::~FakeSignal() {
    g_fakeSignal = 0;
}

FakeUname::FakeUname(std::string system, std::string node) {
    const FaultLock guard;
    g_unameSystem = new std::string(std::move(system));
    g_unameNode = new std::string(std::move(node));
}
FakeUname::~FakeUname() {
    const FaultLock guard;
    delete g_unameSystem;
    delete g_unameNode;
    g_unameSystem = g_unameNode = nullptr;
}

FakeBlockSize::FakeBlockSize(long size) {
    g_blockSize = size;
}
FakeBlockSize::~FakeBlockSize() {
    g_blockSize = -1;
}

UnreadableStreams::UnreadableStreams() {
    g_unreadableStreams = true;
}
UnreadableStreams::~UnreadableStreams() {
    g_unreadableStreams = false;
}

ShortSelect::ShortSelect() {
    g_selected = -1;
    g_shortSelect = true;
}
ShortSelect::~ShortSelect() {
    g_shortSelect = false;
}

long ShortSelect::requested() const {
    return g_selected;
}

FakeWaitedId::FakeWaitedId(pid_t pid) {
    g_waitedId = pid;
}
FakeWaitedId::~FakeWaitedId() {
    g_waitedId = 0;
}

// The wrapped calls. Each of them may also be planned to fail.

extern "C" std::FILE* __real_fdopen(int fd, const char* mode);
extern "C" std::FILE* __wrap_fdopen(int fd, const char* mode);
extern "C" std::FILE* __wrap_fdopen(int fd, const char* mode) {
    if (const int error = fault("fdopen")) {
        errno = error;
        return nullptr;
    }
    if (g_unreadableStreams) {
        const int directory = open("/", O_RDONLY | O_CLOEXEC);
        dup2(directory, fd);
        close(directory);
    }
    return __real_fdopen(fd, mode);
}

extern "C" int __real_select(int count, fd_set* readable, fd_set* writable, fd_set* exceptional,
                             struct timeval* limit);
extern "C" int __wrap_select(int count, fd_set* readable, fd_set* writable, fd_set* exceptional,
                             struct timeval* limit);
extern "C" int __wrap_select(int count, fd_set* readable, fd_set* writable, fd_set* exceptional,
                             struct timeval* limit) {
    if (const int error = fault("select")) {
        errno = error;
        return -1;
    }
    if (g_shortSelect) {
        if (limit->tv_usec < 0 || limit->tv_usec >= 1'000'000) {
            errno = EINVAL; // as systems may
            return -1;
        }
        g_selected = limit->tv_sec * 1'000'000 + limit->tv_usec;
        *limit = {0, 2000};
    }
    return __real_select(count, readable, writable, exceptional, limit);
}

extern "C" int __real_stat(const char* path, struct stat* status);
extern "C" int __wrap_stat(const char* path, struct stat* status);
extern "C" int __wrap_stat(const char* path, struct stat* status) {
    if (const int error = fault("stat")) {
        errno = error;
        return -1;
    }
    const int result = __real_stat(path, status);
    if (const long blockSize = g_blockSize; blockSize >= 0) {
        status->st_blksize = blockSize;
    }
    return result;
}

extern "C" pid_t __real_waitpid(pid_t pid, int* status, int options);
extern "C" pid_t __wrap_waitpid(pid_t pid, int* status, int options);
extern "C" pid_t __wrap_waitpid(pid_t pid, int* status, int options) {
    if (const int error = fault("waitpid")) {
        errno = error;
        return -1;
    }
    const pid_t result = __real_waitpid(pid, status, options);
    const pid_t waitedId = g_waitedId;
    return waitedId != 0 && result != 0 ? waitedId : result; // 0: the child still runs
}

extern "C" int __real_pthread_cond_timedwait(pthread_cond_t* condition, pthread_mutex_t* mutex,
                                             const struct timespec* limit);
extern "C" int __wrap_pthread_cond_timedwait(pthread_cond_t* condition, pthread_mutex_t* mutex,
                                             const struct timespec* limit);
extern "C" int __wrap_pthread_cond_timedwait(pthread_cond_t* condition, pthread_mutex_t* mutex,
                                             const struct timespec* limit) {
    if (const int error = fault("pthread_cond_timedwait")) {
        return error;
    }
    if (g_fakeTimedWait) {
        struct timespec now;
        clock_gettime(CLOCK_REALTIME, &now);
        // Rounded, since some of the time is already gone.
        const long nanoseconds = limit->tv_nsec - now.tv_nsec;
        g_timedWaitSeconds = limit->tv_sec - now.tv_sec +
                             (nanoseconds > 500000000 ? 1 : (nanoseconds < -500000000 ? -1 : 0));
        return ETIMEDOUT;
    }
    return __real_pthread_cond_timedwait(condition, mutex, limit);
}

extern "C" int __real_sigwait(const sigset_t* set, int* signal);
extern "C" int __wrap_sigwait(const sigset_t* set, int* signal);
extern "C" int __wrap_sigwait(const sigset_t* set, int* signal) {
    if (const int error = fault("sigwait")) {
        return error;
    }
    if (const int number = g_fakeSignal.exchange(0)) {
        *signal = number;
        return 0;
    }
    return __real_sigwait(set, signal);
}

extern "C" unsigned __real_sleep(unsigned seconds);
extern "C" unsigned __wrap_sleep(unsigned seconds);
extern "C" unsigned __wrap_sleep(unsigned seconds) {
    if (g_fakeSleep) {
        g_slept += seconds;
        return 0;
    }
    return __real_sleep(seconds);
}

extern "C" std::time_t __real_time(std::time_t* out);
extern "C" std::time_t __wrap_time(std::time_t* out);
extern "C" std::time_t __wrap_time(std::time_t* out) {
    if (const int error = fault("time")) {
        errno = error;
        return -1;
    }
    if (!g_fakeClock) {
        return __real_time(out);
    }
    const std::time_t now = g_now;
    if (out != nullptr) {
        *out = now;
    }
    return now;
}

extern "C" int __real_uname(struct utsname* names);
extern "C" int __wrap_uname(struct utsname* names);
extern "C" int __wrap_uname(struct utsname* names) {
    if (const int error = fault("uname")) {
        errno = error;
        return -1;
    }
    const int result = __real_uname(names);
    const FaultLock guard;
    if (g_unameSystem != nullptr) {
        std::snprintf(names->sysname, sizeof names->sysname, "%s", g_unameSystem->c_str());
        std::snprintf(names->nodename, sizeof names->nodename, "%s", g_unameNode->c_str());
    }
    return result;
}
