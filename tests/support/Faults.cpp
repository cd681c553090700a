#include "support/Faults.h"

#include "support/FaultState.h"

#include <atomic>
#include <cerrno>
#include <cstdarg>
#include <cstdio>
#include <cstring>
#include <map>
#include <new>

#include <dirent.h>
#include <fcntl.h>
#include <pthread.h>
#include <signal.h>
#include <sys/select.h>
#include <sys/stat.h>
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
std::map<std::string, Plan, std::less<>>* g_plans = nullptr;

std::atomic_flag g_lock = ATOMIC_FLAG_INIT;
thread_local bool g_inside = false;

} // namespace

FaultLock::FaultLock() {
    while (g_lock.test_and_set(std::memory_order_acquire)) {
    }
    g_inside = true;
}

FaultLock::~FaultLock() {
    g_inside = false;
    g_lock.clear(std::memory_order_release);
}

int fault(const char* function) {
    if (g_planned.load(std::memory_order_acquire) == 0 || g_inside) {
        return 0;
    }
    const FaultLock guard;
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

Fault::Fault(std::string function, int error, FaultPlan plan) : m_function(std::move(function)) {
    const FaultLock guard;
    if (g_plans == nullptr) {
        g_plans = new std::map<std::string, Plan, std::less<>>;
    }
    g_plans->insert_or_assign(m_function, Plan{error, plan});
    ++g_planned;
}

Fault::~Fault() {
    const FaultLock guard;
    g_plans->erase(m_function);
    --g_planned;
}

int Fault::failed() const {
    const FaultLock guard;
    return g_plans->at(m_function).failed;
}

int Fault::calls() const {
    const FaultLock guard;
    return g_plans->at(m_function).calls;
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
WRAP_ERRNO(char*, ctime_r, nullptr, (const time_t* time, char* text), (time, text))
WRAP_ERRNO(int, fclose, EOF, (std::FILE * stream), (stream))
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
WRAP_ERRNO(DIR*, opendir, nullptr, (const char* path), (path))
WRAP_ERRNO(off_t, lseek, -1, (int fd, off_t offset, int whence), (fd, offset, whence))
WRAP_ERRNO(int, lstat, -1, (const char* path, struct stat* status), (path, status))
WRAP_ERRNO(long, pathconf, -1, (const char* path, int name), (path, name))
WRAP_ERRNO(int, pipe, -1, (int* fds), (fds))
WRAP_ERRNO(ssize_t, pread, -1, (int fd, void* data, size_t size, off_t offset),
           (fd, data, size, offset))
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
WRAP_ERRNO(long, sysconf, -1, (int name), (name))
WRAP_ERRNO(ssize_t, write, -1, (int fd, const void* data, size_t size), (fd, data, size))

// The state's lock is held meanwhile, so that the child finds it free.
extern "C" pid_t __real_fork();
extern "C" pid_t __wrap_fork();
extern "C" pid_t __wrap_fork() {
    if (const int error = fault("fork")) {
        errno = error;
        return -1;
    }
    const FaultLock guard;
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

// An fcntl command takes nothing, an int or a pointer; a pointer has room for each.
extern "C" int __real_fcntl(int fd, int command, ...);
extern "C" int __wrap_fcntl(int fd, int command, ...);
extern "C" int __wrap_fcntl(int fd, int command, ...) {
    if (const int error = fault("fcntl")) {
        errno = error;
        return -1;
    }
    std::va_list arguments;
    va_start(arguments, command);
    void* const argument = va_arg(arguments, void*);
    va_end(arguments);
    return __real_fcntl(fd, command, argument);
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
