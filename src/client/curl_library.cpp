#include "client/curl_library.h"

#include <atomic>
#include <cstdarg>
#include <mutex>
#include <string>

#include "platform/platform.h"
#include "zrcurl/zrcurl.h"
#include "zrcurl/zrcurl_entries.h"
#include "zrssl/zrsslinit.h"

namespace zr::vantle::shared::curllib {
namespace {

enum Entry {
#define ZRCURL_ENTRY(name) k_##name,
    ZRCURL_ENTRIES
#undef ZRCURL_ENTRY
    kEntryCount
};

constexpr const char* kEntryNames[] = {
#define ZRCURL_ENTRY(name) #name,
    ZRCURL_ENTRIES
#undef ZRCURL_ENTRY
};


struct Libraries {
    void* ssl = nullptr;
    void* sslHandle = nullptr;
    zrsslinit_uninit_fn sslUninit = nullptr;
    void* http = nullptr;
    void* entries[kEntryCount] = {};
};

std::mutex gLoadLock;
Libraries gLibraries;
std::atomic<bool> gLoaded{false};

bool tryLoad(Libraries& libs) {
    const std::string directory = platform::sharedDirectory();
    std::string error;
    libs.ssl = platform::loadLibrary(directory + "/zrssl/" + platform::libraryFileName("zrsslinit"), error);
    if (!libs.ssl) return false;
    const auto init = reinterpret_cast<zrsslinit_init_fn>(platform::findSymbol(libs.ssl, "ZRSSLINIT_Init", error));
    libs.sslUninit = reinterpret_cast<zrsslinit_uninit_fn>(platform::findSymbol(libs.ssl, "ZRSSLINIT_Uninit", error));
    if (!init || !libs.sslUninit) return false;
    libs.sslHandle = init();
    if (!libs.sslHandle) return false;
    libs.http = platform::loadLibrary(directory + "/zrcurl/" + platform::libraryFileName("curlimpl"), error);
    if (!libs.http) return false;
    for (int i = 0; i < kEntryCount; ++i)
        if (!(libs.entries[i] = platform::findSymbol(libs.http, kEntryNames[i], error))) return false;
    return true;
}

void undo(Libraries& libs) {
    platform::unloadLibrary(libs.http);
    if (libs.sslHandle) libs.sslUninit(libs.sslHandle);
    platform::unloadLibrary(libs.ssl);
    libs = Libraries();
}

bool load() {
    if (gLoaded.load(std::memory_order_acquire)) return true;
    const std::lock_guard<std::mutex> hold(gLoadLock);
    if (gLoaded.load(std::memory_order_relaxed)) return true;
    Libraries libs;
    if (!tryLoad(libs)) {
        undo(libs);
        return false;
    }
    gLibraries = libs;
    gLoaded.store(true, std::memory_order_release);
    return true;
}

// The entry point, or null while nothing is loaded.
template <class Function>
Function entry(Entry which) {
    return gLoaded.load(std::memory_order_acquire) ? reinterpret_cast<Function>(gLibraries.entries[which]) : nullptr;
}

}  // namespace

CURL* easyInit() { return load() ? entry<zrcurl_easy_init_fn>(k_curl_easy_init)() : nullptr; }

CURLcode easySetopt(CURL* handle, int option, ...) {
    const auto setopt = entry<zrcurl_easy_setopt_fn>(k_zrcurl_easy_setopt);
    if (!setopt) return CURLE_FAILED_INIT;
    va_list args;
    va_start(args, option);
    const CURLcode code = setopt(handle, static_cast<CURLoption>(option), &args);
    va_end(args);
    return code;
}

CURLcode easyPerform(CURL* handle) {
    const auto perform = entry<zrcurl_easy_perform_fn>(k_curl_easy_perform);
    return perform ? perform(handle) : CURLE_FAILED_INIT;
}

CURLcode easyGetinfo(CURL* handle, int info, ...) {
    const auto getinfo = entry<zrcurl_easy_getinfo_fn>(k_zrcurl_easy_getinfo);
    if (!getinfo) return CURLE_FAILED_INIT;
    va_list args;
    va_start(args, info);
    const CURLcode code = getinfo(handle, static_cast<CURLINFO>(info), &args);
    va_end(args);
    return code;
}

void easyCleanup(CURL* handle) {
    if (const auto cleanup = entry<zrcurl_easy_cleanup_fn>(k_curl_easy_cleanup)) cleanup(handle);
}

curl_slist* slistAppend(curl_slist* list, const char* text) {
    const auto append = entry<zrcurl_slist_append_fn>(k_curl_slist_append);
    return append ? append(list, text) : nullptr;
}

void slistFreeAll(curl_slist* list) {
    if (const auto freeAll = entry<zrcurl_slist_free_all_fn>(k_curl_slist_free_all)) freeAll(list);
}

}  // namespace zr::vantle::shared::curllib
