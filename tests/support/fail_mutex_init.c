/* Preloaded into a test process: pthread_mutex_init fails with ENOMEM when called from inside
 * libtiktal.so and works as usual for everyone else. The library creates its locks while it is
 * loaded, so this makes its process-wide initialization fail. */
#define _GNU_SOURCE
#include <dlfcn.h>
#include <errno.h>
#include <pthread.h>
#include <string.h>

typedef int (*MutexInit)(pthread_mutex_t*, const pthread_mutexattr_t*);

__attribute__((visibility("default"))) int pthread_mutex_init(pthread_mutex_t* mutex,
                                                              const pthread_mutexattr_t* attributes) {
    Dl_info caller;
    if (dladdr(__builtin_return_address(0), &caller) != 0 && caller.dli_fname != NULL &&
        strstr(caller.dli_fname, "libtiktal") != NULL)
        return ENOMEM;
    MutexInit real = (MutexInit)dlsym(RTLD_NEXT, "pthread_mutex_init");
    return real != NULL ? real(mutex, attributes) : ENOSYS;
}
