/* Interface of the HTTP library (zrcurl/libcurlimpl.so) for the code that loads it. Valid C and C++.
 *
 * The library exports the 43 entry points listed in zrcurl/zrcurl_entries.h. Most carry the names
 * and types of libcurl's functions and forward to the system libcurl. The five zrcurl_ functions
 * replace libcurl's variadic calls: they take a pointer to the caller's va_list and read from it
 * the values libcurl's function would read.
 */
#ifndef ZRCURL_ZRCURL_H
#define ZRCURL_ZRCURL_H

#include <stdarg.h>

#include <curl/curl.h>

#ifdef __cplusplus
extern "C" {
#endif

/* curl_easy_setopt: one value, whose type follows the option's band: below CURLOPTTYPE_OBJECTPOINT
 * a long, object pointers and blobs a pointer, function pointers a function pointer,
 * CURLOPTTYPE_OFF_T a curl_off_t. */
CURLcode zrcurl_easy_setopt(CURL* handle, CURLoption option, va_list* args);
/* curl_easy_getinfo: one pointer to the variable that receives the information. */
CURLcode zrcurl_easy_getinfo(CURL* handle, CURLINFO info, va_list* args);
/* curl_multi_setopt: one value, typed by band as for zrcurl_easy_setopt. */
CURLMcode zrcurl_multi_setopt(CURLM* multi, CURLMoption option, va_list* args);
/* curl_share_setopt: an int for CURLSHOPT_SHARE and CURLSHOPT_UNSHARE, the lock or unlock function,
 * or the user data pointer. */
CURLSHcode zrcurl_share_setopt(CURLSH* share, CURLSHoption option, va_list* args);
/* curl_formadd: option/value pairs up to CURLFORM_END. */
CURLFORMcode zrcurl_formadd(struct curl_httppost** first, struct curl_httppost** last, va_list* args);

/* Types of the seven entry points the driver library calls, for the pointers dlsym returns. */
typedef CURL* (*zrcurl_easy_init_fn)(void);
typedef CURLcode (*zrcurl_easy_setopt_fn)(CURL* handle, CURLoption option, va_list* args);
typedef CURLcode (*zrcurl_easy_perform_fn)(CURL* handle);
typedef CURLcode (*zrcurl_easy_getinfo_fn)(CURL* handle, CURLINFO info, va_list* args);
typedef void (*zrcurl_easy_cleanup_fn)(CURL* handle);
typedef struct curl_slist* (*zrcurl_slist_append_fn)(struct curl_slist* list, const char* text);
typedef void (*zrcurl_slist_free_all_fn)(struct curl_slist* list);

#ifdef __cplusplus
}
#endif

#endif
