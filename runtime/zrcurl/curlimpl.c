/* The HTTP library of the shared directory: the 43 entry points of zrcurl/zrcurl_entries.h over
 * the system libcurl.
 *
 * Most entry points carry libcurl's own names, so this library does not link libcurl. If it did,
 * its call to libcurl's curl_easy_init could bind to its own curl_easy_init whenever the program
 * itself does not provide the name (the dynamic linker then searches this library before its
 * dependencies) and call itself forever. Instead libcurl is opened once at run time (libcurl_open.h),
 * and every entry point calls through a pointer looked up in it. Without libcurl the entry points
 * return failure values: CURLE_FAILED_INIT, CURLM_INTERNAL_ERROR, CURLSHE_NOT_BUILT_IN,
 * CURL_FORMADD_DISABLED, a null pointer, or a fixed text for the strerror functions.
 *
 * Build choices by compile definition:
 *   ZRCURL_LIBCURL_NAME             the file opened (see libcurl_open.h);
 *   ZRCURL_WITHOUT_SHARE_SETOPT     a broken build for the loading tests: zrcurl_share_setopt is
 *                                   left out, so one of the 43 names is missing.
 */
#define CURL_ALLOW_OLD_MULTI_SOCKET /* curl_multi_socket stays a function, not a macro */

#include "zrcurl/libcurl_open.h"
#include "zrcurl/zrcurl.h"
#include "zrcurl/zrcurl_entries.h"

#include <pthread.h>
#include <stdint.h>
#include <stdlib.h>

#ifndef ZRCURL_EXPORT
#define ZRCURL_EXPORT __attribute__((visibility("default")))
#endif

static pthread_once_t libcurl_once = PTHREAD_ONCE_INIT;
static void open_libcurl(void);

/* libcurl's functions, filled in once by open_libcurl; null when libcurl or the name is missing. */
#define DECLARE_REAL(type, name, params, args, failure) static type(*real_##name) params;
#define DECLARE_REAL_VOID(name, params, args) static void(*real_##name) params;
#define NOTHING_FOR_VARIADIC(type, name, params)
ZRCURL_TABLE(DECLARE_REAL, DECLARE_REAL_VOID, NOTHING_FOR_VARIADIC)

static CURLcode (*real_easy_setopt)(CURL*, CURLoption, ...);
static CURLcode (*real_easy_getinfo)(CURL*, CURLINFO, ...);
static CURLMcode (*real_multi_setopt)(CURLM*, CURLMoption, ...);
static CURLSHcode (*real_share_setopt)(CURLSH*, CURLSHoption, ...);
static CURLFORMcode (*real_formadd)(struct curl_httppost**, struct curl_httppost**, ...);

static void open_libcurl(void) {
  /* Never closed: the entry points may be called until the process ends. */
  void* libcurl = libcurl_open();
  if (libcurl == NULL) {
    return;
  }
#define FIND_REAL(type, name, params, args, failure) real_##name = (type(*) params)libcurl_function(libcurl, #name);
#define FIND_REAL_VOID(name, params, args) real_##name = (void(*) params)libcurl_function(libcurl, #name);
  ZRCURL_TABLE(FIND_REAL, FIND_REAL_VOID, NOTHING_FOR_VARIADIC)
  real_easy_setopt = (CURLcode(*)(CURL*, CURLoption, ...))libcurl_function(libcurl, "curl_easy_setopt");
  real_easy_getinfo = (CURLcode(*)(CURL*, CURLINFO, ...))libcurl_function(libcurl, "curl_easy_getinfo");
  real_multi_setopt = (CURLMcode(*)(CURLM*, CURLMoption, ...))libcurl_function(libcurl, "curl_multi_setopt");
  real_share_setopt = (CURLSHcode(*)(CURLSH*, CURLSHoption, ...))libcurl_function(libcurl, "curl_share_setopt");
  real_formadd =
      (CURLFORMcode(*)(struct curl_httppost**, struct curl_httppost**, ...))libcurl_function(libcurl, "curl_formadd");
}

/* The forwarders: open libcurl on the first call, then pass the arguments on unchanged. */
#define DEFINE_FORWARDER(type, name, params, args, failure) \
  ZRCURL_EXPORT type name params {                          \
    pthread_once(&libcurl_once, open_libcurl);              \
    return real_##name ? real_##name args : (failure);      \
  }
#define DEFINE_FORWARDER_VOID(name, params, args) \
  ZRCURL_EXPORT void name params {                \
    pthread_once(&libcurl_once, open_libcurl);    \
    if (real_##name) {                            \
      real_##name args;                           \
    }                                             \
  }
ZRCURL_TABLE(DEFINE_FORWARDER, DEFINE_FORWARDER_VOID, NOTHING_FOR_VARIADIC)

/* libcurl numbers the options of easy and multi handles in bands of 10000 by the type of the one
 * value that follows: long, object pointer, function pointer, curl_off_t, blob (a pointer). Any
 * function pointer type travels the same way; this one stands for all of them. */
typedef void (*any_function)(void);

ZRCURL_EXPORT CURLcode zrcurl_easy_setopt(CURL* handle, CURLoption option, va_list* args) {
  long band = (long)option;
  pthread_once(&libcurl_once, open_libcurl);
  if (!real_easy_setopt) {
    return CURLE_FAILED_INIT;
  }
  if (band < CURLOPTTYPE_OBJECTPOINT) {
    return real_easy_setopt(handle, option, va_arg(*args, long));
  }
  if (band < CURLOPTTYPE_FUNCTIONPOINT) {
    return real_easy_setopt(handle, option, va_arg(*args, void*));
  }
  if (band < CURLOPTTYPE_OFF_T) {
    return real_easy_setopt(handle, option, va_arg(*args, any_function));
  }
  if (band < CURLOPTTYPE_BLOB) {
    return real_easy_setopt(handle, option, va_arg(*args, curl_off_t));
  }
  return real_easy_setopt(handle, option, va_arg(*args, void*));
}

ZRCURL_EXPORT CURLcode zrcurl_easy_getinfo(CURL* handle, CURLINFO info, va_list* args) {
  pthread_once(&libcurl_once, open_libcurl);
  if (!real_easy_getinfo) {
    return CURLE_FAILED_INIT;
  }
  return real_easy_getinfo(handle, info, va_arg(*args, void*));
}

ZRCURL_EXPORT CURLMcode zrcurl_multi_setopt(CURLM* multi, CURLMoption option, va_list* args) {
  long band = (long)option;
  pthread_once(&libcurl_once, open_libcurl);
  if (!real_multi_setopt) {
    return CURLM_INTERNAL_ERROR;
  }
  if (band < CURLOPTTYPE_OBJECTPOINT) {
    return real_multi_setopt(multi, option, va_arg(*args, long));
  }
  if (band < CURLOPTTYPE_FUNCTIONPOINT) {
    return real_multi_setopt(multi, option, va_arg(*args, void*));
  }
  if (band < CURLOPTTYPE_OFF_T) {
    return real_multi_setopt(multi, option, va_arg(*args, any_function));
  }
  return real_multi_setopt(multi, option, va_arg(*args, curl_off_t));
}

#ifndef ZRCURL_WITHOUT_SHARE_SETOPT
/* Share options are not banded; each has its own type. An unknown option is refused before its
 * value is read, as libcurl refuses it. */
ZRCURL_EXPORT CURLSHcode zrcurl_share_setopt(CURLSH* share, CURLSHoption option, va_list* args) {
  pthread_once(&libcurl_once, open_libcurl);
  if (!real_share_setopt) {
    return CURLSHE_NOT_BUILT_IN;
  }
  switch (option) {
    case CURLSHOPT_SHARE:
    case CURLSHOPT_UNSHARE:
      return real_share_setopt(share, option, va_arg(*args, int));
    case CURLSHOPT_LOCKFUNC:
      return real_share_setopt(share, option, va_arg(*args, curl_lock_function));
    case CURLSHOPT_UNLOCKFUNC:
      return real_share_setopt(share, option, va_arg(*args, curl_unlock_function));
    case CURLSHOPT_USERDATA:
      return real_share_setopt(share, option, va_arg(*args, void*));
    default:
      return CURLSHE_BAD_OPTION;
  }
}
#endif

/* The form interface is deprecated in libcurl but is part of this library's entry points. */
#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wdeprecated-declarations"

/* Appends one entry to a growing array of form entries; 0 when memory runs out. */
static int append_form_entry(struct curl_forms** forms, size_t* count, size_t* capacity,
                             CURLformoption option, const char* value) {
  if (*count == *capacity) {
    size_t grown = *capacity ? 2 * *capacity : 16;
    struct curl_forms* bigger = realloc(*forms, grown * sizeof **forms);
    if (bigger == NULL) {
      return 0;
    }
    *forms = bigger;
    *capacity = grown;
  }
  (*forms)[*count].option = option;
  (*forms)[*count].value = value;
  ++*count;
  return 1;
}

/* Reads the option/value pairs of one curl_formadd call, up to CURLFORM_END, into an array that
 * goes to libcurl as CURLFORM_ARRAY. In an array every value travels in the pointer-sized `value`
 * member, and libcurl reads the length options back from it as numbers. An array the caller
 * passes is copied in, so its entries act as if they had been listed one by one; an option libcurl
 * does not accept in an array (such as a nested array) is passed on for libcurl to refuse. An
 * option without a known value type ends the call with CURL_FORMADD_UNKNOWN_OPTION, as libcurl
 * does. */
ZRCURL_EXPORT CURLFORMcode zrcurl_formadd(struct curl_httppost** first, struct curl_httppost** last,
                                          va_list* args) {
  struct curl_forms* forms = NULL;
  size_t count = 0;
  size_t capacity = 0;
  CURLFORMcode result = CURL_FORMADD_OK;
  pthread_once(&libcurl_once, open_libcurl);
  if (!real_formadd) {
    return CURL_FORMADD_DISABLED;
  }
  for (;;) {
    /* Read as an int: an enumeration travels as one through a variable argument list. */
    CURLformoption option = (CURLformoption)va_arg(*args, int);
    const char* value = NULL;
    const struct curl_forms* items;
    switch (option) {
      case CURLFORM_END:
        break;
      case CURLFORM_COPYNAME:
      case CURLFORM_PTRNAME:
      case CURLFORM_COPYCONTENTS:
      case CURLFORM_PTRCONTENTS:
      case CURLFORM_FILECONTENT:
      case CURLFORM_FILE:
      case CURLFORM_BUFFER:
      case CURLFORM_BUFFERPTR:
      case CURLFORM_CONTENTTYPE:
      case CURLFORM_FILENAME:
        value = va_arg(*args, const char*);
        break;
      case CURLFORM_STREAM:
        value = (const char*)va_arg(*args, void*);
        break;
      case CURLFORM_CONTENTHEADER:
        value = (const char*)va_arg(*args, struct curl_slist*);
        break;
      case CURLFORM_NAMELENGTH:
      case CURLFORM_CONTENTSLENGTH:
      case CURLFORM_BUFFERLENGTH:
        value = (const char*)(uintptr_t)va_arg(*args, long);
        break;
      case CURLFORM_CONTENTLEN:
        value = (const char*)(uintptr_t)va_arg(*args, curl_off_t);
        break;
      case CURLFORM_ARRAY:
        items = va_arg(*args, const struct curl_forms*);
        if (items == NULL) {
          result = CURL_FORMADD_NULL;
          goto done;
        }
        for (; items->option != CURLFORM_END; ++items) {
          if (!append_form_entry(&forms, &count, &capacity, items->option, items->value)) {
            result = CURL_FORMADD_MEMORY;
            goto done;
          }
        }
        continue;
      default:
        result = CURL_FORMADD_UNKNOWN_OPTION;
        goto done;
    }
    if (!append_form_entry(&forms, &count, &capacity, option, value)) {
      result = CURL_FORMADD_MEMORY;
      goto done;
    }
    if (option == CURLFORM_END) {
      break;
    }
  }
  result = real_formadd(first, last, CURLFORM_ARRAY, forms, CURLFORM_END);
done:
  free(forms);
  return result;
}

#pragma GCC diagnostic pop
