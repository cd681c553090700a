/* Preloaded into the agent: while the file that FROZEN_DISK names exists, positioned writes, which
   are those of a database, wait, as on a file system that is frozen. */

#define _GNU_SOURCE
#include <dlfcn.h>
#include <stdlib.h>
#include <unistd.h>

static void wait_while_frozen(void) {
    const char* flag = getenv("FROZEN_DISK");
    while (flag != NULL && access(flag, F_OK) == 0) {
        usleep(10000);
    }
}

ssize_t pwrite(int fd, const void* data, size_t size, off_t offset) {
    static ssize_t (*next)(int, const void*, size_t, off_t);
    wait_while_frozen();
    if (next == NULL) {
        next = (ssize_t(*)(int, const void*, size_t, off_t))dlsym(RTLD_NEXT, "pwrite");
    }
    return next(fd, data, size, offset);
}

ssize_t pwrite64(int fd, const void* data, size_t size, off64_t offset) {
    static ssize_t (*next)(int, const void*, size_t, off64_t);
    wait_while_frozen();
    if (next == NULL) {
        next = (ssize_t(*)(int, const void*, size_t, off64_t))dlsym(RTLD_NEXT, "pwrite64");
    }
    return next(fd, data, size, offset);
}
