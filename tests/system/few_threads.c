/* Preloaded into the agent: after THREADS threads no other can be started. */

#define _GNU_SOURCE
#include <dlfcn.h>
#include <errno.h>
#include <pthread.h>
#include <stdatomic.h>
#include <stdlib.h>

int pthread_create(pthread_t* thread, const pthread_attr_t* attributes, void* (*run)(void*),
                   void* argument) {
    static int (*next)(pthread_t*, const pthread_attr_t*, void* (*)(void*), void*);
    static atomic_int started;
    if (started++ >= atoi(getenv("THREADS"))) {
        return EAGAIN;
    }
    if (next == NULL) {
        next = (int (*)(pthread_t*, const pthread_attr_t*, void* (*)(void*), void*))dlsym(
            RTLD_NEXT, "pthread_create");
    }
    return next(thread, attributes, run, argument);
}
