#include "client/curl.h"

#include <memory>

#include "client/answer.h"
#include "client/curl_library.h"
#include "errors/zrerr.h"

namespace zr::vantle::shared {
namespace {

namespace lib = curllib;

// Appends to the answer; an answer that grows beyond kMaxAnswerBytes aborts the transfer.
size_t writeCallback(char* data, size_t size, size_t count, void* user) {
    if (!user) return 0;
    std::string& answer = *static_cast<std::string*>(user);
    if (size * count > kMaxAnswerBytes - answer.size()) return 0;
    answer.append(data, size * count);
    return size * count;
}

size_t readCallback(char* buffer, size_t size, size_t count, void* user) {
    if (!user) return CURL_READFUNC_ABORT;
    std::string& text = *static_cast<std::string*>(user);
    const size_t n = std::min(size * count, text.size());
    text.copy(buffer, n);
    text.erase(0, n);
    return n;
}

void checkOption(CURLcode code, const char* call) {
    if (code != CURLE_OK)
        throw TCURL_RAISE(kInternalSoftwareError).debug("CURLcode", static_cast<int>(code)).debug("function", call);
}

// Sets one option and records the call's text when it fails.
#define TCURL_SETOPT(option, value, text) checkOption(lib::easySetopt(handle, option, value), text)


// The header list and the error buffer live only as long as one request: the handle must not
// keep pointing at them afterwards, whichever way the request ends.
class RequestScope {
public:
    explicit RequestScope(CURL* handle) : _handle(handle) {}
    ~RequestScope() {
        lib::easySetopt(_handle, CURLOPT_HTTPHEADER, static_cast<curl_slist*>(nullptr));
        lib::easySetopt(_handle, CURLOPT_ERRORBUFFER, static_cast<char*>(nullptr));
    }
    RequestScope(const RequestScope&) = delete;
    RequestScope& operator=(const RequestScope&) = delete;

private:
    CURL* _handle;
};

}  // namespace

void tCURL::HeaderListDeleter::operator()(curl_slist* list) const { lib::slistFreeAll(list); }

tCURL::~tCURL() { lib::easyCleanup(static_cast<CURL*>(_connection)); }

void tCURL::initialize(const std::string& uri, const std::string& prefix, std::uint32_t timeoutInMS) {
    if (!_connection) _connection = lib::easyInit();
    _uri = uri;
    _prefix = prefix;
    _timeoutInMS = timeoutInMS;
    if (!_connection) throw TCURL_RAISE(kInternalSoftwareErrorFailedInitialize).debug("check failed", "_connection");
}

void tCURL::setMediaType(const std::string& mediaType) {
    _acceptType = mediaType;
    _contentType = _acceptType;
}

void tCURL::setCredentials(const std::string& username, const std::string& password) {
    _username = username;
    _password = password;
}

std::string tCURL::get(const std::string& path) { return request(false, path, putTextBuffer); }

std::string tCURL::put(const std::string& path, const std::string& body) {
    std::string upload = body;  // consumed by the read callback
    return request(true, path, upload);
}

void tCURL::setOptions(bool upload, const std::string& url, HeaderList& headers, char* errorBuffer,
                       std::string& uploadBuffer) {
    CURL* handle = static_cast<CURL*>(_connection);
    TCURL_SETOPT(CURLOPT_READFUNCTION, readCallback, "curl_easy_setopt(_connection, CURLOPT_READFUNCTION, _readCallback)");
    TCURL_SETOPT(CURLOPT_WRITEFUNCTION, writeCallback,
                 "curl_easy_setopt(_connection, CURLOPT_WRITEFUNCTION, _writeCallback)");
    TCURL_SETOPT(CURLOPT_WRITEDATA, &tempBufferForGet, "curl_easy_setopt(_connection, CURLOPT_WRITEDATA, &tempBufferForGet)");
    TCURL_SETOPT(CURLOPT_READDATA, &uploadBuffer, "curl_easy_setopt(_connection, CURLOPT_READDATA, &putTextBuffer)");
    TCURL_SETOPT(CURLOPT_UPLOAD, upload ? 1L : 0L, "curl_easy_setopt(_connection, CURLOPT_UPLOAD, upload ? 1L : 0L)");
    TCURL_SETOPT(CURLOPT_TIMEOUT_MS, static_cast<long>(_timeoutInMS),
                 "curl_easy_setopt(_connection, CURLOPT_TIMEOUT_MS, static_cast<long>(_timeoutInMS))");
    TCURL_SETOPT(CURLOPT_NOSIGNAL, 1L, "curl_easy_setopt(_connection, CURLOPT_NOSIGNAL, 1L)");
    TCURL_SETOPT(CURLOPT_URL, url.c_str(), "curl_easy_setopt(_connection, CURLOPT_URL, url.c_str())");
    // An answer that announces more than the transport takes is refused before its body is read.
    TCURL_SETOPT(CURLOPT_MAXFILESIZE_LARGE, static_cast<curl_off_t>(kMaxAnswerBytes),
                 "curl_easy_setopt(_connection, CURLOPT_MAXFILESIZE_LARGE, kMaxAnswerBytes)");
    if (!_username.empty())
        TCURL_SETOPT(CURLOPT_USERNAME, _username.c_str(), "curl_easy_setopt(_connection, CURLOPT_USERNAME, _username.c_str())");
    if (!_password.empty())
        TCURL_SETOPT(CURLOPT_PASSWORD, _password.c_str(), "curl_easy_setopt(_connection, CURLOPT_PASSWORD, _password.c_str())");
    const auto addHeader = [&headers](const std::string& line) {
        curl_slist* list = lib::slistAppend(headers.get(), line.c_str());
        if (!list) throw std::bad_alloc();
        (void)headers.release();  // the same list, or a new one when it was empty
        headers.reset(list);
    };
    if (!_acceptType.empty()) addHeader("Accept: " + _acceptType);
    if (!_contentType.empty()) addHeader("Content-Type: " + _contentType);
    // An upload goes out at once: many services never answer "Expect: 100-continue", and libcurl
    // would wait a second for it. A header without a value removes libcurl's own.
    if (upload) addHeader("Expect:");
    if (headers)
        TCURL_SETOPT(CURLOPT_HTTPHEADER, headers.get(), "curl_easy_setopt(_connection, CURLOPT_HTTPHEADER, headerList.get())");
    TCURL_SETOPT(CURLOPT_ERRORBUFFER, errorBuffer, "curl_easy_setopt(_connection, CURLOPT_ERRORBUFFER, errbuf)");
}

std::string tCURL::request(bool upload, const std::string& path, std::string& uploadBuffer) {
    tempBufferForGet.clear();
    if (_uri.empty()) throw TCURL_RAISE(kInvalidEndStationURI).debug("check failed", "!_uri.empty()");
    if (_prefix.empty()) throw TCURL_RAISE(kInvalidURIPrefix).debug("check failed", "!_prefix.empty()");

    CURL* handle = static_cast<CURL*>(_connection);
    HeaderList headers;
    char errorBuffer[CURL_ERROR_SIZE] = {};
    const RequestScope scope(handle);
    setOptions(upload, _uri + "/" + _prefix + "/" + path, headers, errorBuffer, uploadBuffer);

    const CURLcode performed = lib::easyPerform(handle);
    if (performed != CURLE_OK) {
        zrerr::Exception failure = TCURL_RAISE(kInternalSoftwareErrorUnknownNetworkError)
                                       .debug("function", "curl_easy_perform")
                                       .debug("CURLcode", static_cast<int>(performed))
                                       .debug("CURLOPT_ERRORBUFFER", errorBuffer);
        if (performed == CURLE_WRITE_ERROR || performed == CURLE_FILESIZE_EXCEEDED)
            failure.debug("maxAnswerBytes", kMaxAnswerBytes);
        throw failure;
    }
    long responseCode = 0;
    if (lib::easyGetinfo(handle, CURLINFO_RESPONSE_CODE, &responseCode) != CURLE_OK)
        throw TCURL_RAISE(kInternalSoftwareError)
            .debug("function", "curl_easy_getinfo(_connection, CURLINFO_RESPONSE_CODE, &responseCode)");
    classify(responseCode);
    return unwrap(tempBufferForGet);
}

}  // namespace zr::vantle::shared
