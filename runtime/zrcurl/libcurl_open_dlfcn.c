/* libcurl opened with dlopen: the system's libcurl.so.4, found by the dynamic loader. */
#include "zrcurl/libcurl_open.h"

#include <dlfcn.h>

#ifndef ZRCURL_LIBCURL_NAME
#define ZRCURL_LIBCURL_NAME "libcurl.so.4"
#endif

void* libcurl_open(void) { return dlopen(ZRCURL_LIBCURL_NAME, RTLD_NOW | RTLD_LOCAL); }

void* libcurl_function(void* libcurl, const char* name) { return dlsym(libcurl, name); }
