/* The SSL initialisation library of the shared directory.
 *
 * The driver library calls ZRSSLINIT_Init before it loads the HTTP library, and keeps the handle.
 * Init starts libcurl's global state, which includes the TLS library, with
 * curl_global_init(CURL_GLOBAL_ALL); Uninit ends it with curl_global_cleanup. A count of the
 * handles handed out makes pairs nest: only the first Init starts the state and only the release
 * of the last handle ends it. libcurl's own global functions are not thread-safe on every build,
 * so one mutex serialises both.
 *
 * Broken builds for the loading tests, chosen by compile definitions:
 *   ZRSSLINIT_INIT_RETURNS_NULL  Init fails: it starts nothing and returns null;
 *   ZRSSLINIT_WITHOUT_UNINIT     the library has no ZRSSLINIT_Uninit.
 */
#include "zrssl/zrsslinit.h"

#include <pthread.h>
#include <stdlib.h>

#include <curl/curl.h>

#ifndef ZRSSLINIT_EXPORT
#define ZRSSLINIT_EXPORT __attribute__((visibility("default")))
#endif

/* What Init hands out: one reference on the global state, given back by Uninit. */
struct zrsslinit_handle {
  char unused;
};

static pthread_mutex_t state_lock = PTHREAD_MUTEX_INITIALIZER;
static unsigned long handles_out;

ZRSSLINIT_EXPORT void* ZRSSLINIT_Init(void) {
#ifdef ZRSSLINIT_INIT_RETURNS_NULL
  return NULL;
#else
  struct zrsslinit_handle* handle = malloc(sizeof *handle);
  if (handle == NULL) {
    return NULL;
  }
  pthread_mutex_lock(&state_lock);
  if (handles_out == 0 && curl_global_init(CURL_GLOBAL_ALL) != CURLE_OK) {
    pthread_mutex_unlock(&state_lock);
    free(handle);
    return NULL;
  }
  ++handles_out;
  pthread_mutex_unlock(&state_lock);
  return handle;
#endif
}

#ifndef ZRSSLINIT_WITHOUT_UNINIT
ZRSSLINIT_EXPORT void ZRSSLINIT_Uninit(void* handle) {
  if (handle == NULL) {
    return;
  }
  pthread_mutex_lock(&state_lock);
  if (handles_out > 0 && --handles_out == 0) {
    curl_global_cleanup();
  }
  pthread_mutex_unlock(&state_lock);
  free(handle);
}
#endif
