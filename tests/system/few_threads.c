/* Preloaded into the agent: no thread can be started after THREADS others, nor while there is a file
   NO_THREADS. */

#define _GNU_SOURCE
#include <dlfcn.h>
#include <errno.h>
#include <pthread.h>
#include <stdatomic.h>
#include <stdlib.h>
#include <unistd.h>

int pthread_create(pthread_t* thread, const pthread_attr_t* attributes, void* (*run)(void*),
                   void* argument) {
    static int (*next)(pthread_t*, const pthread_attr_t*, void* (*)(void*), void*);
    static atomic_int started;
    const char* const most = getenv("THREADS");
    const char* const file = getenv("NO_THREADS");
    if ((most != NULL && started++ >= atoi(most)) || (file != NULL && access(file, F_OK) == 0)) {
        return EAGAIN;
    }
    if (next == NULL) {
        next = (int (*)(pthread_t*, const pthread_attr_t*, void* (*)(void*), void*))dlsym(
            RTLD_NEXT, "pthread_create");
    }
    return next(thread, attributes, run, argument);
}
