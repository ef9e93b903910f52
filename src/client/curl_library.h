// The HTTP library, loaded at run time from the shared directory together with the SSL
// initialisation library that must be started first. Loading happens on the first easyInit,
// under one process-wide lock, all or nothing; a failed load is tried again by the next call.
#pragma once

#include <curl/curl.h>

namespace zr::vantle::shared::curllib {

// A new easy handle; null when the libraries cannot be loaded.
CURL* easyInit();
// While nothing is loaded these return CURLE_FAILED_INIT, and the others do nothing. The option
// is an int: va_start after an enum parameter is undefined.
CURLcode easySetopt(CURL* handle, int option, ...);
CURLcode easyPerform(CURL* handle);
CURLcode easyGetinfo(CURL* handle, int info, ...);
void easyCleanup(CURL* handle);
curl_slist* slistAppend(curl_slist* list, const char* text);
void slistFreeAll(curl_slist* list);

}  // namespace zr::vantle::shared::curllib
