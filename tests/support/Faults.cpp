#include "support/Faults.h"

#include <atomic>
#include <cerrno>
#include <cstdarg>
#include <cstdio>
#include <cstring>
#include <map>
#include <mutex>
#include <new>
#include <optional>

#include <fcntl.h>
#include <pthread.h>
#include <signal.h>
#include <sys/select.h>
#include <sys/stat.h>
#include <sys/utsname.h>
#include <sys/wait.h>
#include <unistd.h>

// The wrapped calls may be made before main and inside the allocator: the state is found through
// constant-initialised objects, and no lock is taken while no fault is planned. The lock is a spin
// lock of its own, since pthread_mutex_lock is one of the wrapped calls.

namespace {

struct Plan {
    int error;
    FaultPlan plan;
    int calls = 0;
    int failed = 0;
};

std::atomic<int> g_planned{0};
std::atomic_flag g_lock = ATOMIC_FLAG_INIT;
std::map<std::string, Plan, std::less<>>* g_plans = nullptr;
thread_local bool g_inside = false;

std::atomic<bool> g_fakeClock{false};
std::atomic<std::time_t> g_now{0};
std::atomic<bool> g_fakeSleep{false};
std::atomic<unsigned> g_slept{0};
std::atomic<long> g_blockSize{-1}; // negative: the real one
std::atomic<pid_t> g_waitedId{0};
std::atomic<bool> g_fakeTimedWait{false};
std::atomic<long> g_timedWaitSeconds{0};
std::atomic<int> g_fakeSignal{0};
std::string* g_unameSystem = nullptr;
std::string* g_unameNode = nullptr;

class SpinGuard {
public:
    SpinGuard() {
        while (g_lock.test_and_set(std::memory_order_acquire)) {
        }
        g_inside = true;
    }
    ~SpinGuard() {
        g_inside = false;
        g_lock.clear(std::memory_order_release);
    }
};

/// The error with which this call is to fail, 0 when it is to pass.
int fault(const char* function) {
    if (g_planned.load(std::memory_order_acquire) == 0 || g_inside) {
        return 0;
    }
    const SpinGuard guard;
    const auto found = g_plans->find(std::string_view(function));
    if (found == g_plans->end()) {
        return 0;
    }
    Plan& plan = found->second;
    const int call = plan.calls++;
    if (call < plan.plan.skip ||
        (plan.plan.times >= 0 && call >= plan.plan.skip + plan.plan.times)) {
        return 0;
    }
    ++plan.failed;
    return plan.error;
}

} // namespace

Fault::Fault(std::string function, int error, FaultPlan plan) : m_function(std::move(function)) {
    const SpinGuard guard;
    if (g_plans == nullptr) {
        g_plans = new std::map<std::string, Plan, std::less<>>;
    }
    g_plans->insert_or_assign(m_function, Plan{error, plan});
    ++g_planned;
}

Fault::~Fault() {
    const SpinGuard guard;
    g_plans->erase(m_function);
    --g_planned;
}

int Fault::failed() const {
    const SpinGuard guard;
    return g_plans->at(m_function).failed;
}

int Fault::calls() const {
    const SpinGuard guard;
    return g_plans->at(m_function).calls;
}

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
    const SpinGuard guard;
    g_unameSystem = new std::string(std::move(system));
    g_unameNode = new std::string(std::move(node));
}
FakeUname::~FakeUname() {
    const SpinGuard guard;
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

FakeWaitedId::FakeWaitedId(pid_t pid) {
    g_waitedId = pid;
}
FakeWaitedId::~FakeWaitedId() {
    g_waitedId = 0;
}

// Replaceable allocation functions. The real operator new allocates, so that the matching operator
// delete of the library or of a sanitizer frees.
void* operator new(std::size_t size, const std::nothrow_t&) noexcept {
    if (const int error = fault("new")) {
        errno = error;
        return nullptr;
    }
    try {
        return ::operator new(size);
    } catch (...) {
        return nullptr;
    }
}
void* operator new[](std::size_t size, const std::nothrow_t&) noexcept {
    if (const int error = fault("new")) {
        errno = error;
        return nullptr;
    }
    try {
        return ::operator new[](size);
    } catch (...) {
        return nullptr;
    }
}

// A function that fails with `failure` and errno.
#define WRAP_ERRNO(type, name, failure, parameters, arguments)                                     \
    extern "C" type __real_##name parameters;                                                      \
    extern "C" type __wrap_##name parameters;                                                      \
    extern "C" type __wrap_##name parameters {                                                     \
        if (const int error = fault(#name)) {                                                      \
            errno = error;                                                                         \
            return failure;                                                                        \
        }                                                                                          \
        return __real_##name arguments;                                                            \
    }

// A function whose result is the error code.
#define WRAP_CODE(name, parameters, arguments)                                                     \
    extern "C" int __real_##name parameters;                                                       \
    extern "C" int __wrap_##name parameters;                                                       \
    extern "C" int __wrap_##name parameters {                                                      \
        if (const int error = fault(#name)) {                                                      \
            return error;                                                                          \
        }                                                                                          \
        return __real_##name arguments;                                                            \
    }

WRAP_CODE(atexit, (void (*routine)()), (routine))
WRAP_ERRNO(int, close, -1, (int fd), (fd))
WRAP_ERRNO(int, fclose, EOF, (std::FILE * stream), (stream))
WRAP_ERRNO(std::FILE*, fdopen, nullptr, (int fd, const char* mode), (fd, mode))
WRAP_ERRNO(std::FILE*, fopen, nullptr, (const char* path, const char* mode), (path, mode))
WRAP_ERRNO(size_t, fread, 0, (void* data, size_t size, size_t count, std::FILE* stream),
           (data, size, count, stream))
WRAP_ERRNO(int, ftruncate, -1, (int fd, off_t size), (fd, size))
WRAP_ERRNO(size_t, fwrite, 0, (const void* data, size_t size, size_t count, std::FILE* stream),
           (data, size, count, stream))
WRAP_ERRNO(char*, getcwd, nullptr, (char* buffer, size_t size), (buffer, size))
WRAP_ERRNO(int, gethostname, -1, (char* name, size_t size), (name, size))
WRAP_ERRNO(int, kill, -1, (pid_t pid, int signal), (pid, signal))
WRAP_ERRNO(struct tm*, localtime_r, nullptr, (const time_t* time, struct tm* result),
           (time, result))
WRAP_ERRNO(off_t, lseek, -1, (int fd, off_t offset, int whence), (fd, offset, whence))
WRAP_ERRNO(long, pathconf, -1, (const char* path, int name), (path, name))
WRAP_ERRNO(int, pipe, -1, (int* fds), (fds))
WRAP_CODE(pthread_attr_destroy, (pthread_attr_t * attributes), (attributes))
WRAP_CODE(pthread_attr_init, (pthread_attr_t * attributes), (attributes))
WRAP_CODE(pthread_attr_setdetachstate, (pthread_attr_t * attributes, int state),
          (attributes, state))
WRAP_CODE(pthread_cancel, (pthread_t thread), (thread))
WRAP_CODE(pthread_cond_broadcast, (pthread_cond_t * condition), (condition))
WRAP_CODE(pthread_cond_destroy, (pthread_cond_t * condition), (condition))
WRAP_CODE(pthread_cond_init, (pthread_cond_t * condition, const pthread_condattr_t* attributes),
          (condition, attributes))
WRAP_CODE(pthread_cond_signal, (pthread_cond_t * condition), (condition))
WRAP_CODE(pthread_cond_wait, (pthread_cond_t * condition, pthread_mutex_t* mutex),
          (condition, mutex))
WRAP_CODE(pthread_condattr_destroy, (pthread_condattr_t * attributes), (attributes))
WRAP_CODE(pthread_condattr_init, (pthread_condattr_t * attributes), (attributes))
WRAP_CODE(pthread_create,
          (pthread_t * thread, const pthread_attr_t* attributes, void* (*routine)(void*),
           void* argument),
          (thread, attributes, routine, argument))
WRAP_CODE(pthread_join, (pthread_t thread, void** result), (thread, result))
WRAP_CODE(pthread_mutex_destroy, (pthread_mutex_t * mutex), (mutex))
WRAP_CODE(pthread_mutex_init, (pthread_mutex_t * mutex, const pthread_mutexattr_t* attributes),
          (mutex, attributes))
WRAP_CODE(pthread_mutex_lock, (pthread_mutex_t * mutex), (mutex))
WRAP_CODE(pthread_mutex_unlock, (pthread_mutex_t * mutex), (mutex))
WRAP_CODE(pthread_mutexattr_destroy, (pthread_mutexattr_t * attributes), (attributes))
WRAP_CODE(pthread_mutexattr_init, (pthread_mutexattr_t * attributes), (attributes))
WRAP_ERRNO(ssize_t, read, -1, (int fd, void* data, size_t size), (fd, data, size))
WRAP_ERRNO(int, select, -1,
           (int count, fd_set* readable, fd_set* writable, fd_set* exceptional,
            struct timeval* limit),
           (count, readable, writable, exceptional, limit))
WRAP_ERRNO(long, sysconf, -1, (int name), (name))

// The state's lock is held meanwhile, so that the child finds it free.
extern "C" pid_t __real_fork();
extern "C" pid_t __wrap_fork();
extern "C" pid_t __wrap_fork() {
    if (const int error = fault("fork")) {
        errno = error;
        return -1;
    }
    const SpinGuard guard;
    return __real_fork();
}

extern "C" int __wrap_execl(const char* path, const char* first, ...);
extern "C" int __wrap_execl(const char* path, const char* first, ...) {
    if (const int error = fault("execl")) {
        errno = error;
        return -1;
    }
    char* arguments[8] = {const_cast<char*>(first)};
    std::va_list list;
    va_start(list, first);
    for (std::size_t i = 1; i < 7 && arguments[i - 1] != nullptr; ++i) {
        arguments[i] = va_arg(list, char*);
    }
    va_end(list);
    return execv(path, arguments);
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
    return waitedId != 0 ? waitedId : result;
}
WRAP_ERRNO(ssize_t, write, -1, (int fd, const void* data, size_t size), (fd, data, size))

extern "C" int __real_open(const char* path, int flags, ...);
extern "C" int __wrap_open(const char* path, int flags, ...);
extern "C" int __wrap_open(const char* path, int flags, ...) {
    if (const int error = fault("open")) {
        errno = error;
        return -1;
    }
    mode_t mode = 0;
    if ((flags & O_CREAT) != 0) {
        std::va_list arguments;
        va_start(arguments, flags);
        mode = va_arg(arguments, mode_t);
        va_end(arguments);
    }
    return __real_open(path, flags, mode);
}

// Every fcntl command of this project takes an int or nothing.
extern "C" int __real_fcntl(int fd, int command, ...);
extern "C" int __wrap_fcntl(int fd, int command, ...);
extern "C" int __wrap_fcntl(int fd, int command, ...) {
    if (const int error = fault("fcntl")) {
        errno = error;
        return -1;
    }
    std::va_list arguments;
    va_start(arguments, command);
    const int argument = va_arg(arguments, int);
    va_end(arguments);
    return __real_fcntl(fd, command, argument);
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

// Every caller's arguments reach the C library through its list form.
extern "C" int __wrap_snprintf(char* out, size_t size, const char* format, ...);
extern "C" int __wrap_snprintf(char* out, size_t size, const char* format, ...) {
    if (const int error = fault("snprintf")) {
        errno = error;
        return -1;
    }
    std::va_list arguments;
    va_start(arguments, format);
    const int length = std::vsnprintf(out, size, format, arguments);
    va_end(arguments);
    return length;
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
    const SpinGuard guard;
    if (g_unameSystem != nullptr) {
        std::snprintf(names->sysname, sizeof names->sysname, "%s", g_unameSystem->c_str());
        std::snprintf(names->nodename, sizeof names->nodename, "%s", g_unameNode->c_str());
    }
    return result;
}
