// The shared-directory libraries, used the way libtiktal.so uses them: opened by path with
// dlopen(RTLD_NOW | RTLD_LOCAL), every entry point looked up by name, every call made through the
// pointers found. Built twice, into a program without libcurl and into one that links it
// (RUNTIME_TEST_LINKS_LIBCURL).
#include "runtime_support.h"
#include "zrcurl/zrcurl_entries.h"

#include <atomic>
#include <cstdlib>
#include <filesystem>
#include <type_traits>

using namespace runtime_test;

namespace {

const std::string kShared = RUNTIME_SHARED_DIR;
const std::string kBroken = RUNTIME_BROKEN_DIR;
const std::string kHttpLibrary = kShared + "/zrcurl/libcurlimpl.so";
const std::string kSslLibrary = kShared + "/zrssl/libzrsslinit.so";
const std::vector<std::string> kNone;

// The loader's pointer types are exactly libcurl's types and the library's own.
static_assert(std::is_same<zrcurl_easy_init_fn, decltype(&curl_easy_init)>::value, "");
static_assert(std::is_same<zrcurl_easy_setopt_fn, decltype(&zrcurl_easy_setopt)>::value, "");
static_assert(std::is_same<zrcurl_easy_perform_fn, decltype(&curl_easy_perform)>::value, "");
static_assert(std::is_same<zrcurl_easy_getinfo_fn, decltype(&zrcurl_easy_getinfo)>::value, "");
static_assert(std::is_same<zrcurl_easy_cleanup_fn, decltype(&curl_easy_cleanup)>::value, "");
static_assert(std::is_same<zrcurl_slist_append_fn, decltype(&curl_slist_append)>::value, "");
static_assert(std::is_same<zrcurl_slist_free_all_fn, decltype(&curl_slist_free_all)>::value, "");

// The names in the order the driver library documents for its loader.
const std::vector<std::string> kNames = {
    "curl_easy_pause", "curl_easy_strerror", "curl_easy_escape", "curl_easy_unescape", "zrcurl_formadd",
    "curl_formfree", "curl_free", "curl_getdate", "curl_global_init_mem", "curl_slist_append",
    "curl_slist_free_all", "curl_version", "curl_version_info", "curl_easy_init", "zrcurl_easy_setopt",
    "curl_easy_perform", "curl_easy_cleanup", "zrcurl_easy_getinfo", "curl_easy_duphandle", "curl_easy_reset",
    "curl_easy_recv", "curl_easy_send", "curl_global_init", "curl_global_cleanup", "curl_multi_init",
    "curl_multi_add_handle", "curl_multi_remove_handle", "curl_multi_fdset", "curl_multi_wait",
    "curl_multi_perform", "curl_multi_cleanup", "curl_multi_info_read", "curl_multi_strerror",
    "curl_multi_socket", "curl_multi_socket_action", "curl_multi_socket_all", "curl_multi_timeout",
    "zrcurl_multi_setopt", "curl_multi_assign", "curl_share_init", "zrcurl_share_setopt", "curl_share_cleanup",
    "curl_share_strerror"};

// The other way to use the list: included while ZRCURL_ENTRY is defined, it expands in place.
const char* const kIncludedInPlace[] = {
#define ZRCURL_ENTRY(name) #name,
#include "zrcurl/zrcurl_entries.h"
#undef ZRCURL_ENTRY
};

// The names that dlsym does not find in `library`.
std::vector<std::string> unresolved(void* library) {
    std::vector<std::string> missing;
    for (const std::string& name : kNames)
        if (!find<void*>(library, name.c_str())) missing.push_back(name);
    return missing;
}

// An easy handle for `url` that collects the response body in `body`.
CURL* easyFor(Http& http, const std::string& url, std::string* body) {
    CURL* easy = http.easyInit();
    if (easy && (http.setopt(easy, CURLOPT_URL, url.c_str()) || http.setopt(easy, CURLOPT_NOPROXY, "*") ||
                 http.setopt(easy, CURLOPT_WRITEFUNCTION, appendTo) || http.setopt(easy, CURLOPT_WRITEDATA, body)))
        ADD_FAILURE() << "setting up the easy handle failed";
    return easy;
}

// Counts the allocations libcurl makes through the functions given to curl_global_init_mem.
std::atomic<int> gAllocations{0};
void* countMalloc(size_t size) { return ++gAllocations, std::malloc(size); }
void countFree(void* memory) { std::free(memory); }
void* countRealloc(void* memory, size_t size) { return ++gAllocations, std::realloc(memory, size); }
char* countStrdup(const char* text) { return ++gAllocations, strdup(text); }
void* countCalloc(size_t count, size_t size) { return ++gAllocations, std::calloc(count, size); }

// Whether libcurl's global state was stopped: curl_global_init_mem ignores its allocator while the
// state runs, so only then do allocations go through the counting functions.
bool libcurlWasStopped(Http& http) {
    gAllocations = 0;
    if (http.globalInitMem(CURL_GLOBAL_ALL, countMalloc, countFree, countRealloc, countStrdup, countCalloc))
        return false;
    http.cleanup(http.easyInit());
    http.globalCleanup();
    return gAllocations > 0;
}

// Runs in a fresh process, where nothing has started libcurl; the result names the step that failed.
int nestInitAndUninit() {
    void* ssl = load(kSslLibrary);
    const auto init = find<zrsslinit_init_fn>(ssl, "ZRSSLINIT_Init");
    const auto uninit = find<zrsslinit_uninit_fn>(ssl, "ZRSSLINIT_Uninit");
    Http http(kHttpLibrary);
    if (!init || !uninit || !http.globalInitMem || !libcurlWasStopped(http)) return 1;
    void* outer = init();
    void* inner = init();
    if (!outer || !inner || outer == inner || libcurlWasStopped(http)) return 2;
    uninit(inner);
    if (libcurlWasStopped(http)) return 3;  // the outer handle still holds the state
    uninit(outer);
    if (!libcurlWasStopped(http)) return 4;  // the last handle ended it
    uninit(nullptr);
    void* again = init();
    if (!again) return 5;
    uninit(again);
    return 0;
}

}  // namespace

TEST(Table, ListsTheEntryPointsInTheLoadersOrder) {
#define ZRCURL_ENTRY(name) #name,
    const std::vector<std::string> table = {ZRCURL_ENTRIES};
#undef ZRCURL_ENTRY
    EXPECT_EQ(table, kNames);
    EXPECT_EQ(table.size(), size_t{ZRCURL_ENTRY_COUNT});
    EXPECT_EQ(std::vector<std::string>(std::begin(kIncludedInPlace), std::end(kIncludedInPlace)), kNames);
}

TEST(Exports, EachLibraryExportsExactlyItsEntryPoints) {
    std::set<std::string> all(kNames.begin(), kNames.end());
    EXPECT_EQ(exported(RUNTIME_NM, kHttpLibrary), all);
    all.erase("zrcurl_share_setopt");
    EXPECT_EQ(exported(RUNTIME_NM, kBroken + "/missing-name/zrcurl/libcurlimpl.so"), all);
    EXPECT_EQ(exported(RUNTIME_NM, kSslLibrary), (std::set<std::string>{"ZRSSLINIT_Init", "ZRSSLINIT_Uninit"}));
    EXPECT_EQ(exported(RUNTIME_NM, kBroken + "/no-uninit/zrssl/libzrsslinit.so"), std::set<std::string>{"ZRSSLINIT_Init"});
}

TEST(Ssl, InitAndUninitPairsNest) {
    GTEST_FLAG_SET(death_test_style, "threadsafe");  // a new process, not a copy of this one
    EXPECT_EXIT(std::_Exit(nestInitAndUninit()), testing::ExitedWithCode(0), "");
}

TEST(Http, ResolvesEveryNameAndForwardsToLibcurl) {
    ASSERT_NE(load(kSslLibrary), nullptr) << dlerror();  // first, as the loader does; it needs libcurl
    Http http(kHttpLibrary);
    ASSERT_NE(http.lib, nullptr) << dlerror();
    EXPECT_EQ(unresolved(http.lib), kNone);
    void* libcurl = dlopen("libcurl.so.4", RTLD_NOW | RTLD_NOLOAD);
    ASSERT_NE(libcurl, nullptr);
    for (const std::string& name : kNames) {  // libcurl's names are the library's own forwarders
        if (name.rfind("curl_", 0) != 0) continue;
        EXPECT_NE(dlsym(http.lib, name.c_str()), dlsym(libcurl, name.c_str())) << name;
    }
    // A forwarder that reached itself instead of libcurl would never return.
    const auto libcurlVersion = find<decltype(&curl_version)>(libcurl, "curl_version");
    EXPECT_STREQ(http.version(), libcurlVersion());
    EXPECT_STREQ(http.strerror(CURLE_OK), "No error");
#ifdef RUNTIME_TEST_LINKS_LIBCURL
    // The program's own libcurl is the one used.
    EXPECT_EQ(reinterpret_cast<void*>(libcurlVersion), reinterpret_cast<void*>(&curl_version));
#endif
}

TEST(Http, PerformsARequest) {
    Http http(kHttpLibrary);
    OneRequestServer server("HTTP/1.1 201 Created\r\nContent-Length: 5\r\nConnection: close\r\n\r\nmade!");
    std::string body;
    CURL* easy = easyFor(http, server.url("/time/now"), &body);
    ASSERT_NE(easy, nullptr);
    curl_slist* headers = http.slistAppend(nullptr, "X-Tiktal-Test: header arrived");
    ASSERT_NE(headers, nullptr);
    EXPECT_EQ(http.setopt(easy, CURLOPT_HTTPHEADER, headers), CURLE_OK);
    EXPECT_EQ(http.setopt(easy, CURLOPT_POSTFIELDS, "hello world"), CURLE_OK);
    EXPECT_EQ(http.setopt(easy, CURLOPT_POSTFIELDSIZE, 5L), CURLE_OK);
    ASSERT_EQ(http.perform(easy), CURLE_OK);
    long code = 0;
    curl_off_t received = 0;
    EXPECT_EQ(http.getinfo(easy, CURLINFO_RESPONSE_CODE, &code), CURLE_OK);
    EXPECT_EQ(code, 201);
    EXPECT_EQ(http.getinfo(easy, CURLINFO_SIZE_DOWNLOAD_T, &received), CURLE_OK);
    EXPECT_EQ(received, 5);
    EXPECT_EQ(body, "made!");
    const std::string& request = server.request();
    EXPECT_EQ(request.rfind("POST /time/now HTTP/1.1\r\n", 0), 0u) << request;
    EXPECT_TRUE(contains(request, "\r\nX-Tiktal-Test: header arrived\r\n")) << request;
    EXPECT_TRUE(contains(request, "\r\nContent-Length: 5\r\n")) << request;
    EXPECT_EQ(request.substr(request.size() - 9), "\r\n\r\nhello") << request;
    http.slistFreeAll(headers);
    http.cleanup(easy);
}

TEST(Http, OptionValuesOfEveryTypeArrive) {
    Http http(kHttpLibrary);
    OneRequestServer server("HTTP/1.1 200 OK\r\nContent-Length: 10\r\nConnection: close\r\n\r\n0123456789");
    std::string body;
    CURL* easy = easyFor(http, server.url("/"), &body);  // pointers and a function pointer
    ASSERT_NE(easy, nullptr);
    EXPECT_EQ(http.setopt(easy, CURLOPT_TIMEOUT_MS, 60000L), CURLE_OK);  // long
    EXPECT_EQ(http.setopt(easy, CURLOPT_POSTFIELDSIZE, -2L), CURLE_BAD_FUNCTION_ARGUMENT);
    EXPECT_EQ(http.setopt(easy, CURLOPTTYPE_LONG + 9999, 1L), CURLE_UNKNOWN_OPTION);
    EXPECT_EQ(http.setopt(easy, CURLOPT_POSTFIELDS, "abcdefgh"), CURLE_OK);
    EXPECT_EQ(http.setopt(easy, CURLOPT_POSTFIELDSIZE_LARGE, curl_off_t{3}), CURLE_OK);  // curl_off_t
    EXPECT_EQ(http.setopt(easy, CURLOPT_MAXFILESIZE_LARGE, curl_off_t{9}), CURLE_OK);
    EXPECT_EQ(http.perform(easy), CURLE_FILESIZE_EXCEEDED);  // 10 bytes announced, 9 allowed
    EXPECT_EQ(body, "");
    const std::string& request = server.request();
    EXPECT_TRUE(contains(request, "\r\nContent-Length: 3\r\n")) << request;
    EXPECT_EQ(request.substr(request.size() - 7), "\r\n\r\nabc") << request;
    http.cleanup(easy);
}

TEST(Http, FormAddBuildsAForm) {
    Http http(kHttpLibrary);
    OneRequestServer server("HTTP/1.1 200 OK\r\nContent-Length: 0\r\nConnection: close\r\n\r\n");
    curl_httppost* first = nullptr;
    curl_httppost* last = nullptr;
    EXPECT_EQ(http.formadd(&first, &last, CURLFORM_COPYNAME, "alpha", CURLFORM_COPYCONTENTS, "first value",
                           CURLFORM_CONTENTTYPE, "text/plain", CURLFORM_END), CURL_FORMADD_OK);
    EXPECT_EQ(http.formadd(&first, &last, CURLFORM_PTRNAME, "betaXX", CURLFORM_NAMELENGTH, 4L, CURLFORM_PTRCONTENTS,
                           "second", CURLFORM_CONTENTSLENGTH, 3L, CURLFORM_END), CURL_FORMADD_OK);
    const curl_forms items[] = {{CURLFORM_COPYNAME, "gamma"}, {CURLFORM_COPYCONTENTS, "third"}, {CURLFORM_END, nullptr}};
    EXPECT_EQ(http.formadd(&first, &last, CURLFORM_ARRAY, items, CURLFORM_END), CURL_FORMADD_OK);
    EXPECT_EQ(http.formadd(&first, &last, CURLFORM_COPYNAME, "delta", CURLFORM_PTRCONTENTS, "fourth-and-more",
                           CURLFORM_CONTENTLEN, curl_off_t{6}, CURLFORM_END), CURL_FORMADD_OK);
    EXPECT_EQ(http.formadd(&first, &last, CURLFORM_COPYCONTENTS, "no name", CURLFORM_END), CURL_FORMADD_INCOMPLETE);
    EXPECT_EQ(http.formadd(&first, &last, CURLFORM_OBSOLETE, "x", CURLFORM_END), CURL_FORMADD_UNKNOWN_OPTION);
    EXPECT_EQ(http.formadd(&first, &last, CURLFORM_ARRAY, nullptr, CURLFORM_END), CURL_FORMADD_NULL);
    ASSERT_NE(first, nullptr);
    std::string body;
    CURL* easy = easyFor(http, server.url("/form"), &body);
    ASSERT_NE(easy, nullptr);
    EXPECT_EQ(http.setopt(easy, CURLOPT_HTTPPOST, first), CURLE_OK);
    EXPECT_EQ(http.perform(easy), CURLE_OK);
    const std::string& request = server.request();
    EXPECT_TRUE(contains(request, "name=\"alpha\"\r\nContent-Type: text/plain\r\n\r\nfirst value\r\n")) << request;
    EXPECT_TRUE(contains(request, "name=\"beta\"\r\n\r\nsec\r\n")) << request;
    EXPECT_TRUE(contains(request, "name=\"gamma\"\r\n\r\nthird\r\n")) << request;
    EXPECT_TRUE(contains(request, "name=\"delta\"\r\n\r\nfourth\r\n")) << request;
    EXPECT_FALSE(contains(request, "no name")) << request;
    http.cleanup(easy);
    http.formfree(first);
}

TEST(Http, MultiAndShareOptionsArrive) {
    Http http(kHttpLibrary);
    CURL* easy = http.easyInit();
    CURLM* multi = http.multiInit();
    CURLSH* share = http.shareInit();
    ASSERT_TRUE(easy && multi && share);
    int timerCalls = 0;
    const auto timer = +[](CURLM*, long, void* calls) { return ++*static_cast<int*>(calls), 0; };
    EXPECT_EQ(http.multiSetopt(multi, CURLMOPT_TIMERFUNCTION, timer), CURLM_OK);
    EXPECT_EQ(http.multiSetopt(multi, CURLMOPT_TIMERDATA, &timerCalls), CURLM_OK);
    EXPECT_EQ(http.multiSetopt(multi, CURLMOPT_MAXCONNECTS, 4L), CURLM_OK);
    EXPECT_EQ(http.multiSetopt(multi, CURLOPTTYPE_LONG + 999, 1L), CURLM_UNKNOWN_OPTION);
    EXPECT_EQ(http.multiAdd(multi, easy), CURLM_OK);
    EXPECT_GT(timerCalls, 0);  // the multi handle called the timer function with its data
    EXPECT_EQ(http.multiRemove(multi, easy), CURLM_OK);

    int locks = 0;
    const auto lock = +[](CURL*, curl_lock_data, curl_lock_access, void* count) { ++*static_cast<int*>(count); };
    const auto unlock = +[](CURL*, curl_lock_data, void*) {};
    EXPECT_EQ(http.shareSetopt(share, CURLSHOPT_SHARE, CURL_LOCK_DATA_DNS), CURLSHE_OK);
    EXPECT_EQ(http.shareSetopt(share, CURLSHOPT_SHARE, 1000), CURLSHE_BAD_OPTION);
    EXPECT_EQ(http.shareSetopt(share, CURLSHOPT_LOCKFUNC, lock), CURLSHE_OK);
    EXPECT_EQ(http.shareSetopt(share, CURLSHOPT_UNLOCKFUNC, unlock), CURLSHE_OK);
    EXPECT_EQ(http.shareSetopt(share, CURLSHOPT_USERDATA, &locks), CURLSHE_OK);
    EXPECT_EQ(http.shareSetopt(share, CURLSHOPT_NONE, 1), CURLSHE_BAD_OPTION);
    EXPECT_EQ(http.setopt(easy, CURLOPT_SHARE, share), CURLE_OK);
    EXPECT_GT(locks, 0);  // attaching the share locked it through the lock function, with its data
    EXPECT_EQ(http.setopt(easy, CURLOPT_SHARE, static_cast<CURLSH*>(nullptr)), CURLE_OK);
    http.cleanup(easy);
    EXPECT_EQ(http.multiCleanup(multi), CURLM_OK);
    EXPECT_EQ(http.shareCleanup(share), CURLSHE_OK);
}

TEST(Http, WithoutLibcurlEveryCallFails) {
    Http http(RUNTIME_IMPL_WITHOUT_LIBCURL);
    ASSERT_NE(http.lib, nullptr) << dlerror();
    EXPECT_EQ(unresolved(http.lib), kNone);
    EXPECT_EQ(http.easyInit(), nullptr);
    EXPECT_EQ(http.setopt(nullptr, CURLOPT_URL, "http://127.0.0.1/"), CURLE_FAILED_INIT);
    EXPECT_EQ(http.perform(nullptr), CURLE_FAILED_INIT);
    long code = 0;
    EXPECT_EQ(http.getinfo(nullptr, CURLINFO_RESPONSE_CODE, &code), CURLE_FAILED_INIT);
    EXPECT_EQ(http.slistAppend(nullptr, "X: y"), nullptr);
    http.slistFreeAll(nullptr);
    http.cleanup(nullptr);
    EXPECT_EQ(http.version(), nullptr);
    EXPECT_STREQ(http.strerror(CURLE_OK), "libcurl is not available");
    EXPECT_EQ(http.multiSetopt(nullptr, CURLMOPT_MAXCONNECTS, 1L), CURLM_INTERNAL_ERROR);
    EXPECT_EQ(http.shareSetopt(nullptr, CURLSHOPT_SHARE, CURL_LOCK_DATA_DNS), CURLSHE_NOT_BUILT_IN);
    curl_httppost* first = nullptr;
    curl_httppost* last = nullptr;
    EXPECT_EQ(http.formadd(&first, &last, CURLFORM_COPYNAME, "a", CURLFORM_END), CURL_FORMADD_DISABLED);
}

// Each broken shared directory lacks exactly its one piece.
TEST(Broken, EachCaseLacksExactlyItsPiece) {
    EXPECT_FALSE(std::filesystem::exists(kBroken + "/no-ssl/zrssl"));
    EXPECT_FALSE(std::filesystem::exists(kBroken + "/no-curl/zrcurl"));
    for (const char* good : {"no-ssl", "init-null", "no-uninit"})
        EXPECT_EQ(unresolved(load(kBroken + "/" + good + "/zrcurl/libcurlimpl.so")), kNone) << good;
    EXPECT_EQ(unresolved(load(kBroken + "/missing-name/zrcurl/libcurlimpl.so")),
              std::vector<std::string>{"zrcurl_share_setopt"});
    for (const std::string ssl : {"missing-name", "init-null", "no-uninit", "no-curl"}) {
        void* library = load(kBroken + "/" + ssl + "/zrssl/libzrsslinit.so");
        EXPECT_NE(find<void*>(library, "ZRSSLINIT_Init"), nullptr) << ssl;
        EXPECT_EQ(find<void*>(library, "ZRSSLINIT_Uninit") == nullptr, ssl == "no-uninit") << ssl;
    }
    const auto init = find<zrsslinit_init_fn>(load(kBroken + "/init-null/zrssl/libzrsslinit.so"), "ZRSSLINIT_Init");
    ASSERT_NE(init, nullptr);
    EXPECT_EQ(init(), nullptr);
}
