/* Preloaded into the agent: while the file that FULL_DISK names exists, positioned writes, which
   are those of a database, find no room. */

#define _GNU_SOURCE
#include <dlfcn.h>
#include <errno.h>
#include <stdlib.h>
#include <unistd.h>

static int is_full(void) {
    const char* flag = getenv("FULL_DISK");
    return flag != NULL && access(flag, F_OK) == 0;
}

ssize_t pwrite(int fd, const void* data, size_t size, off_t offset) {
    static ssize_t (*next)(int, const void*, size_t, off_t);
    if (is_full()) {
        errno = ENOSPC;
        return -1;
    }
    if (next == NULL) {
        next = (ssize_t(*)(int, const void*, size_t, off_t))dlsym(RTLD_NEXT, "pwrite");
    }
    return next(fd, data, size, offset);
}

ssize_t pwrite64(int fd, const void* data, size_t size, off64_t offset) {
    static ssize_t (*next)(int, const void*, size_t, off64_t);
    if (is_full()) {
        errno = ENOSPC;
        return -1;
    }
    if (next == NULL) {
        next = (ssize_t(*)(int, const void*, size_t, off64_t))dlsym(RTLD_NEXT, "pwrite64");
    }
    return next(fd, data, size, offset);
}
