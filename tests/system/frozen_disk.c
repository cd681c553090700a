/* Preloaded into the agent: while the file that FROZEN_DISK names exists, writes wait, as on a file
   system that is frozen: to the files whose names end with FROZEN_FILES, or, without it, positioned
   writes, which are those of a database. */

#define _GNU_SOURCE
#include <dlfcn.h>
#include <limits.h>
#include <stdio.h>
#include <stdlib.h>
#include <string.h>
#include <unistd.h>

static int is_on_disk(int fd, int is_positioned) {
    const char* end = getenv("FROZEN_FILES");
    if (end == NULL) {
        return is_positioned;
    }
    char link[64];
    char path[PATH_MAX];
    snprintf(link, sizeof link, "/proc/self/fd/%d", fd);
    const ssize_t length = readlink(link, path, sizeof path);
    const size_t wanted = strlen(end);
    return length >= (ssize_t)wanted && memcmp(path + length - wanted, end, wanted) == 0;
}

static void wait_while_frozen(int fd, int is_positioned) {
    const char* flag = getenv("FROZEN_DISK");
    while (is_on_disk(fd, is_positioned) && flag != NULL && access(flag, F_OK) == 0) {
        usleep(10000);
    }
}

ssize_t pwrite(int fd, const void* data, size_t size, off_t offset) {
    static ssize_t (*next)(int, const void*, size_t, off_t);
    wait_while_frozen(fd, 1);
    if (next == NULL) {
        next = (ssize_t(*)(int, const void*, size_t, off_t))dlsym(RTLD_NEXT, "pwrite");
    }
    return next(fd, data, size, offset);
}

ssize_t pwrite64(int fd, const void* data, size_t size, off64_t offset) {
    static ssize_t (*next)(int, const void*, size_t, off64_t);
    wait_while_frozen(fd, 1);
    if (next == NULL) {
        next = (ssize_t(*)(int, const void*, size_t, off64_t))dlsym(RTLD_NEXT, "pwrite64");
    }
    return next(fd, data, size, offset);
}

ssize_t write(int fd, const void* data, size_t size) {
    static ssize_t (*next)(int, const void*, size_t);
    wait_while_frozen(fd, 0);
    if (next == NULL) {
        next = (ssize_t(*)(int, const void*, size_t))dlsym(RTLD_NEXT, "write");
    }
    return next(fd, data, size);
}
