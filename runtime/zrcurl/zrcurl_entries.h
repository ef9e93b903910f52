/* The 43 entry points of the HTTP library (zrcurl/libcurlimpl.so), in the order in which the
 * driver library resolves them. This is the one list of them: the HTTP library defines its
 * functions from it and the driver library's loader takes the names from it.
 *
 * ZRCURL_ENTRIES expands ZRCURL_ENTRY(name) once per entry point, in order, with whatever
 * ZRCURL_ENTRY is defined where ZRCURL_ENTRIES is used:
 *
 *   #define ZRCURL_ENTRY(name) #name,
 *   static const char* const names[] = {ZRCURL_ENTRIES};
 *   #undef ZRCURL_ENTRY
 *
 * Including this file while ZRCURL_ENTRY is defined also expands ZRCURL_ENTRIES at that place.
 *
 * ZRCURL_TABLE(FORWARD, FORWARD_VOID, VARIADIC) gives the signatures too; each argument names a
 * macro, and the table calls, for each entry point in order, one of
 *   FORWARD(type, name, params, args, failure)  an entry point that calls libcurl's function of the
 *                                              same name with its arguments unchanged; `failure`
 *                                              is its result when libcurl is not available
 *   FORWARD_VOID(name, params, args)           the same for a function without a result
 *   VARIADIC(type, name, params)               one of the five zrcurl_ functions that take a
 *                                              pointer to the caller's va_list
 * Expanding the signatures needs <curl/curl.h> and <stdarg.h> (zrcurl/zrcurl.h includes both), with
 * CURL_ALLOW_OLD_MULTI_SOCKET defined before <curl/curl.h> so that curl_multi_socket is not a macro.
 */
#ifndef ZRCURL_ZRCURL_ENTRIES_H
#define ZRCURL_ZRCURL_ENTRIES_H

#define ZRCURL_ENTRY_COUNT 43

#define ZRCURL_TABLE(FORWARD, FORWARD_VOID, VARIADIC) \
  FORWARD(CURLcode, curl_easy_pause, (CURL* handle, int bitmask), (handle, bitmask), CURLE_FAILED_INIT)              \
  FORWARD(const char*, curl_easy_strerror, (CURLcode code), (code), "libcurl is not available")                      \
  FORWARD(char*, curl_easy_escape, (CURL* handle, const char* text, int length), (handle, text, length), NULL)       \
  FORWARD(char*, curl_easy_unescape, (CURL* handle, const char* text, int length, int* out_length),                  \
          (handle, text, length, out_length), NULL)                                                                  \
  VARIADIC(CURLFORMcode, zrcurl_formadd, (struct curl_httppost** first, struct curl_httppost** last, va_list* args)) \
  FORWARD_VOID(curl_formfree, (struct curl_httppost* form), (form))                                                  \
  FORWARD_VOID(curl_free, (void* memory), (memory))                                                                  \
  FORWARD(time_t, curl_getdate, (const char* text, const time_t* unused), (text, unused), (time_t)-1)                \
  FORWARD(CURLcode, curl_global_init_mem,                                                                            \
          (long flags, curl_malloc_callback m, curl_free_callback f, curl_realloc_callback r,                        \
           curl_strdup_callback s, curl_calloc_callback c),                                                          \
          (flags, m, f, r, s, c), CURLE_FAILED_INIT)                                                                 \
  FORWARD(struct curl_slist*, curl_slist_append, (struct curl_slist* list, const char* text), (list, text), NULL)    \
  FORWARD_VOID(curl_slist_free_all, (struct curl_slist* list), (list))                                               \
  FORWARD(char*, curl_version, (void), (), NULL)                                                                     \
  FORWARD(curl_version_info_data*, curl_version_info, (CURLversion stamp), (stamp), NULL)                            \
  FORWARD(CURL*, curl_easy_init, (void), (), NULL)                                                                   \
  VARIADIC(CURLcode, zrcurl_easy_setopt, (CURL* handle, CURLoption option, va_list* args))                           \
  FORWARD(CURLcode, curl_easy_perform, (CURL* handle), (handle), CURLE_FAILED_INIT)                                  \
  FORWARD_VOID(curl_easy_cleanup, (CURL* handle), (handle))                                                          \
  VARIADIC(CURLcode, zrcurl_easy_getinfo, (CURL* handle, CURLINFO info, va_list* args))                              \
  FORWARD(CURL*, curl_easy_duphandle, (CURL* handle), (handle), NULL)                                                \
  FORWARD_VOID(curl_easy_reset, (CURL* handle), (handle))                                                            \
  FORWARD(CURLcode, curl_easy_recv, (CURL* handle, void* buffer, size_t length, size_t* received),                   \
          (handle, buffer, length, received), CURLE_FAILED_INIT)                                                     \
  FORWARD(CURLcode, curl_easy_send, (CURL* handle, const void* buffer, size_t length, size_t* sent),                 \
          (handle, buffer, length, sent), CURLE_FAILED_INIT)                                                         \
  FORWARD(CURLcode, curl_global_init, (long flags), (flags), CURLE_FAILED_INIT)                                      \
  FORWARD_VOID(curl_global_cleanup, (void), ())                                                                      \
  FORWARD(CURLM*, curl_multi_init, (void), (), NULL)                                                                 \
  FORWARD(CURLMcode, curl_multi_add_handle, (CURLM* multi, CURL* handle), (multi, handle), CURLM_INTERNAL_ERROR)     \
  FORWARD(CURLMcode, curl_multi_remove_handle, (CURLM* multi, CURL* handle), (multi, handle), CURLM_INTERNAL_ERROR)  \
  FORWARD(CURLMcode, curl_multi_fdset,                                                                               \
          (CURLM* multi, fd_set* read_fds, fd_set* write_fds, fd_set* except_fds, int* max_fd),                      \
          (multi, read_fds, write_fds, except_fds, max_fd), CURLM_INTERNAL_ERROR)                                    \
  FORWARD(CURLMcode, curl_multi_wait,                                                                                \
          (CURLM* multi, struct curl_waitfd extra_fds[], unsigned int extra_count, int timeout_ms, int* ready),      \
          (multi, extra_fds, extra_count, timeout_ms, ready), CURLM_INTERNAL_ERROR)                                  \
  FORWARD(CURLMcode, curl_multi_perform, (CURLM* multi, int* running), (multi, running), CURLM_INTERNAL_ERROR)       \
  FORWARD(CURLMcode, curl_multi_cleanup, (CURLM* multi), (multi), CURLM_INTERNAL_ERROR)                              \
  FORWARD(CURLMsg*, curl_multi_info_read, (CURLM* multi, int* queued), (multi, queued), NULL)                        \
  FORWARD(const char*, curl_multi_strerror, (CURLMcode code), (code), "libcurl is not available")                    \
  FORWARD(CURLMcode, curl_multi_socket, (CURLM* multi, curl_socket_t fd, int* running),                              \
          (multi, fd, running), CURLM_INTERNAL_ERROR)                                                                \
  FORWARD(CURLMcode, curl_multi_socket_action, (CURLM* multi, curl_socket_t fd, int events, int* running),           \
          (multi, fd, events, running), CURLM_INTERNAL_ERROR)                                                        \
  FORWARD(CURLMcode, curl_multi_socket_all, (CURLM* multi, int* running), (multi, running), CURLM_INTERNAL_ERROR)    \
  FORWARD(CURLMcode, curl_multi_timeout, (CURLM* multi, long* milliseconds), (multi, milliseconds),                  \
          CURLM_INTERNAL_ERROR)                                                                                      \
  VARIADIC(CURLMcode, zrcurl_multi_setopt, (CURLM* multi, CURLMoption option, va_list* args))                        \
  FORWARD(CURLMcode, curl_multi_assign, (CURLM* multi, curl_socket_t fd, void* data), (multi, fd, data),             \
          CURLM_INTERNAL_ERROR)                                                                                      \
  FORWARD(CURLSH*, curl_share_init, (void), (), NULL)                                                                \
  VARIADIC(CURLSHcode, zrcurl_share_setopt, (CURLSH* share, CURLSHoption option, va_list* args))                     \
  FORWARD(CURLSHcode, curl_share_cleanup, (CURLSH* share), (share), CURLSHE_NOT_BUILT_IN)                            \
  FORWARD(const char*, curl_share_strerror, (CURLSHcode code), (code), "libcurl is not available")

#define ZRCURL_ENTRY_OF_FORWARD(type, name, params, args, failure) ZRCURL_ENTRY(name)
#define ZRCURL_ENTRY_OF_FORWARD_VOID(name, params, args) ZRCURL_ENTRY(name)
#define ZRCURL_ENTRY_OF_VARIADIC(type, name, params) ZRCURL_ENTRY(name)
#define ZRCURL_ENTRIES ZRCURL_TABLE(ZRCURL_ENTRY_OF_FORWARD, ZRCURL_ENTRY_OF_FORWARD_VOID, ZRCURL_ENTRY_OF_VARIADIC)

#endif

#ifdef ZRCURL_ENTRY
ZRCURL_ENTRIES
#endif
