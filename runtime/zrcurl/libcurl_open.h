/* How the HTTP library opens libcurl at run time; one file per system: libcurl_open_dlfcn.c,
 * libcurl_open_windows.c. ZRCURL_LIBCURL_NAME, when defined, names the file to open instead of
 * the system's libcurl. */
#ifndef ZRCURL_LIBCURL_OPEN_H
#define ZRCURL_LIBCURL_OPEN_H

/* libcurl, opened for good; null when it is missing. */
void* libcurl_open(void);
/* The address of libcurl's function `name`; null when libcurl has none. */
void* libcurl_function(void* libcurl, const char* name);

#endif
