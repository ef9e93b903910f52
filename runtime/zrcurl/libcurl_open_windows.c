/* libcurl opened on Windows: libcurl-4.dll as the process has it loaded already (the SSL
 * initialisation library links it and is loaded first, so both use one libcurl and its global
 * state), else the copy in this library's own folder. The loaded copy gets a reference of its own,
 * so that it stays while this library uses it. */
#include "zrcurl/libcurl_open.h"

#include <stdlib.h>
#include <wchar.h>
#include <windows.h>

#ifndef ZRCURL_LIBCURL_NAME
#define ZRCURL_LIBCURL_NAME "libcurl-4.dll"
#endif
#define WIDE_(text) L##text
#define WIDE(text) WIDE_(text)

/* The path of `name` in the folder of this library; null when out of memory or when the path of
 * this library cannot be had. Free it with free. */
static wchar_t* path_beside_this_library(const wchar_t* name) {
  HMODULE self = NULL;
  DWORD size = MAX_PATH;
  if (!GetModuleHandleExW(GET_MODULE_HANDLE_EX_FLAG_FROM_ADDRESS | GET_MODULE_HANDLE_EX_FLAG_UNCHANGED_REFCOUNT,
                          (LPCWSTR)(void*)&path_beside_this_library, &self)) {
    return NULL;
  }
  for (;;) {
    wchar_t* path = malloc((size + wcslen(name) + 1) * sizeof *path);
    DWORD length = path ? GetModuleFileNameW(self, path, size) : 0;
    if (length > 0 && length < size) {
      wchar_t* slash = wcsrchr(path, L'\\');
      wcscpy(slash ? slash + 1 : path, name);
      return path;
    }
    free(path);
    if (length == 0 || size >= 32768) {
      return NULL;
    }
    size *= 2;
  }
}

void* libcurl_open(void) {
  HMODULE libcurl = NULL;
  wchar_t* path;
  if (GetModuleHandleExW(0, WIDE(ZRCURL_LIBCURL_NAME), &libcurl)) {
    return libcurl;
  }
  path = path_beside_this_library(WIDE(ZRCURL_LIBCURL_NAME));
  if (path != NULL) {
    libcurl = LoadLibraryExW(path, NULL, LOAD_WITH_ALTERED_SEARCH_PATH);
    free(path);
  }
  return libcurl;
}

void* libcurl_function(void* libcurl, const char* name) {
  return (void*)GetProcAddress((HMODULE)libcurl, name);
}
