// Helpers of the runtime tests: loading a library the way libtiktal.so does, the HTTP library's
// entry points as a caller uses them, a one-request HTTP server, and the exported names of a file.
#pragma once

#define CURL_ALLOW_OLD_MULTI_SOCKET
#include "zrcurl/zrcurl.h"
#include "zrssl/zrsslinit.h"

#include <dlfcn.h>
#include <gtest/gtest.h>
#include <netinet/in.h>
#include <sys/socket.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <set>
#include <sstream>
#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

// The form interface and CURLOPT_HTTPPOST are deprecated in libcurl; the tests use them on purpose.
#pragma GCC diagnostic ignored "-Wdeprecated-declarations"

namespace runtime_test {

// Never closed, as the loader keeps its libraries.
inline void* load(const std::string& path) { return dlopen(path.c_str(), RTLD_NOW | RTLD_LOCAL); }

template <class Pointer>
Pointer find(void* library, const char* name) {
    return library ? reinterpret_cast<Pointer>(dlsym(library, name)) : nullptr;
}

// The entry points of one HTTP library that the tests call, and the variadic calls made the way a
// caller makes them: the values travel in the caller's va_list.
struct Http {
    explicit Http(const std::string& path) : lib(load(path)) {}
#define ENTRY(name) find<decltype(&name)>(lib, #name)
    void* lib;
    zrcurl_easy_init_fn easyInit = find<zrcurl_easy_init_fn>(lib, "curl_easy_init");
    zrcurl_easy_setopt_fn easySetopt = find<zrcurl_easy_setopt_fn>(lib, "zrcurl_easy_setopt");
    zrcurl_easy_perform_fn perform = find<zrcurl_easy_perform_fn>(lib, "curl_easy_perform");
    zrcurl_easy_getinfo_fn easyGetinfo = find<zrcurl_easy_getinfo_fn>(lib, "zrcurl_easy_getinfo");
    zrcurl_easy_cleanup_fn cleanup = find<zrcurl_easy_cleanup_fn>(lib, "curl_easy_cleanup");
    zrcurl_slist_append_fn slistAppend = find<zrcurl_slist_append_fn>(lib, "curl_slist_append");
    zrcurl_slist_free_all_fn slistFreeAll = find<zrcurl_slist_free_all_fn>(lib, "curl_slist_free_all");
    decltype(&curl_global_init_mem) globalInitMem = ENTRY(curl_global_init_mem);
    decltype(&curl_global_cleanup) globalCleanup = ENTRY(curl_global_cleanup);
    decltype(&curl_version) version = ENTRY(curl_version);
    decltype(&curl_easy_strerror) strerror = ENTRY(curl_easy_strerror);
    decltype(&zrcurl_formadd) formaddArgs = ENTRY(zrcurl_formadd);
    decltype(&curl_formfree) formfree = ENTRY(curl_formfree);
    decltype(&curl_multi_init) multiInit = ENTRY(curl_multi_init);
    decltype(&zrcurl_multi_setopt) multiSetoptArgs = ENTRY(zrcurl_multi_setopt);
    decltype(&curl_multi_add_handle) multiAdd = ENTRY(curl_multi_add_handle);
    decltype(&curl_multi_remove_handle) multiRemove = ENTRY(curl_multi_remove_handle);
    decltype(&curl_multi_cleanup) multiCleanup = ENTRY(curl_multi_cleanup);
    decltype(&curl_share_init) shareInit = ENTRY(curl_share_init);
    decltype(&zrcurl_share_setopt) shareSetoptArgs = ENTRY(zrcurl_share_setopt);
    decltype(&curl_share_cleanup) shareCleanup = ENTRY(curl_share_cleanup);
#undef ENTRY

// The named parameter before the values is an int: va_start on an enumeration, which C++
// promotes, would be undefined.
#define PASS_ARGS(call, last)  \
    va_list args;              \
    va_start(args, last);      \
    const auto result = call;  \
    va_end(args);              \
    return result
    CURLcode setopt(CURL* easy, int option, ...) {
        PASS_ARGS(easySetopt(easy, static_cast<CURLoption>(option), &args), option);
    }
    CURLcode getinfo(CURL* easy, int info, ...) {
        PASS_ARGS(easyGetinfo(easy, static_cast<CURLINFO>(info), &args), info);
    }
    CURLMcode multiSetopt(CURLM* multi, int option, ...) {
        PASS_ARGS(multiSetoptArgs(multi, static_cast<CURLMoption>(option), &args), option);
    }
    CURLSHcode shareSetopt(CURLSH* share, int option, ...) {
        PASS_ARGS(shareSetoptArgs(share, static_cast<CURLSHoption>(option), &args), option);
    }
    CURLFORMcode formadd(curl_httppost** first, curl_httppost** last, ...) {
        PASS_ARGS(formaddArgs(first, last, &args), last);
    }
#undef PASS_ARGS
};

inline size_t appendTo(char* data, size_t size, size_t count, void* text) {
    static_cast<std::string*>(text)->append(data, size * count);
    return size * count;
}

// Answers one HTTP/1.1 request on 127.0.0.1 (any free port) with a canned response and keeps the
// request that arrived.
class OneRequestServer {
public:
    explicit OneRequestServer(std::string response) : _response(std::move(response)) {
        _listener = socket(AF_INET, SOCK_STREAM, 0);
        sockaddr_in address{};
        address.sin_family = AF_INET;
        address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
        socklen_t size = sizeof address;
        auto* raw = reinterpret_cast<sockaddr*>(&address);
        if (bind(_listener, raw, size) != 0 || listen(_listener, 1) != 0 || getsockname(_listener, raw, &size) != 0)
            throw std::runtime_error(std::string("test server: ") + std::strerror(errno));
        _url = "http://127.0.0.1:" + std::to_string(ntohs(address.sin_port));
        _thread = std::thread([this] { serve(); });
    }
    ~OneRequestServer() {
        shutdown(_listener, SHUT_RDWR);  // ends a wait in accept when no request came
        if (_thread.joinable()) _thread.join();
        close(_listener);
    }
    std::string url(const std::string& path) const { return _url + path; }
    const std::string& request() {  // once the exchange is over
        if (_thread.joinable()) _thread.join();
        return _request;
    }

private:
    void serve() {
        const int connection = accept(_listener, nullptr, nullptr);
        if (connection < 0) return;
        char buffer[4096];
        ssize_t got = 1;
        while (!complete() && (got = recv(connection, buffer, sizeof buffer, 0)) > 0) _request.append(buffer, got);
        send(connection, _response.data(), _response.size(), MSG_NOSIGNAL);
        close(connection);
    }
    bool complete() const {  // the headers and a body of the announced length have arrived
        const size_t end = _request.find("\r\n\r\n");
        if (end == std::string::npos) return false;
        const size_t length = _request.find("Content-Length: ");
        const size_t body = length < end ? std::stoul(_request.substr(length + 16)) : 0;
        return _request.size() >= end + 4 + body;
    }
    std::string _response, _request, _url;
    int _listener;
    std::thread _thread;
};

inline bool contains(const std::string& text, const std::string& part) { return text.find(part) != std::string::npos; }

// The symbols a library defines for others, as the program `nm` lists them.
inline std::set<std::string> exported(const std::string& nm, const std::string& path) {
    std::set<std::string> names;
    const std::string command = nm + " -D --defined-only '" + path + "'";
    FILE* out = popen(command.c_str(), "r");
    char line[512];
    while (out && std::fgets(line, sizeof line, out)) {
        std::istringstream fields(line);
        std::string address, type, name;
        if (fields >> address >> type >> name) names.insert(name);
    }
    EXPECT_TRUE(out && pclose(out) == 0) << command;
    return names;
}

}  // namespace runtime_test
