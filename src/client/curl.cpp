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

static_assert(CURL_ERROR_SIZE == 256, "the error buffer of tCURL holds CURL_ERROR_SIZE bytes");

}  // namespace

void tCURL::HeaderListDeleter::operator()(curl_slist* list) const { lib::slistFreeAll(list); }

tCURL::~tCURL() { lib::easyCleanup(static_cast<CURL*>(_connection)); }

void tCURL::initialize(const std::string& uri, const std::string& prefix, std::uint32_t timeoutInMS) {
    if (!_connection) _connection = lib::easyInit();
    _uri = uri;
    _prefix = prefix;
    _timeoutInMS = timeoutInMS;
    _handleOptionsSet = false;
    if (!_connection) throw TCURL_RAISE(kInternalSoftwareErrorFailedInitialize).debug("check failed", "_connection");
}

void tCURL::setMediaType(const std::string& mediaType) {
    _acceptType = mediaType;
    _contentType = _acceptType;
    _handleOptionsSet = false;
}

void tCURL::setCredentials(const std::string& username, const std::string& password) {
    _username = username;
    _password = password;
    _handleOptionsSet = false;
}

std::string tCURL::get(const std::string& path) { return request(false, path, putTextBuffer); }

std::string tCURL::put(const std::string& path, const std::string& body) {
    std::string upload = body;  // consumed by the read callback
    return request(true, path, upload);
}

// The options that stay the same from one request to the next.
void tCURL::setHandleOptions() {
    CURL* handle = static_cast<CURL*>(_connection);
    TCURL_SETOPT(CURLOPT_READFUNCTION, readCallback, "curl_easy_setopt(_connection, CURLOPT_READFUNCTION, _readCallback)");
    TCURL_SETOPT(CURLOPT_WRITEFUNCTION, writeCallback,
                 "curl_easy_setopt(_connection, CURLOPT_WRITEFUNCTION, _writeCallback)");
    TCURL_SETOPT(CURLOPT_WRITEDATA, &tempBufferForGet, "curl_easy_setopt(_connection, CURLOPT_WRITEDATA, &tempBufferForGet)");
    TCURL_SETOPT(CURLOPT_TIMEOUT_MS, static_cast<long>(_timeoutInMS),
                 "curl_easy_setopt(_connection, CURLOPT_TIMEOUT_MS, static_cast<long>(_timeoutInMS))");
    TCURL_SETOPT(CURLOPT_NOSIGNAL, 1L, "curl_easy_setopt(_connection, CURLOPT_NOSIGNAL, 1L)");
    // An answer that announces more than the transport takes is refused before its body is read.
    TCURL_SETOPT(CURLOPT_MAXFILESIZE_LARGE, static_cast<curl_off_t>(kMaxAnswerBytes),
                 "curl_easy_setopt(_connection, CURLOPT_MAXFILESIZE_LARGE, kMaxAnswerBytes)");
    const char* username = _username.empty() ? nullptr : _username.c_str();  // null: none
    const char* password = _password.empty() ? nullptr : _password.c_str();
    TCURL_SETOPT(CURLOPT_USERNAME, username, "curl_easy_setopt(_connection, CURLOPT_USERNAME, _username.c_str())");
    TCURL_SETOPT(CURLOPT_PASSWORD, password, "curl_easy_setopt(_connection, CURLOPT_PASSWORD, _password.c_str())");

    // The handle lets go of the old list before it is freed.
    TCURL_SETOPT(CURLOPT_HTTPHEADER, static_cast<curl_slist*>(nullptr),
                 "curl_easy_setopt(_connection, CURLOPT_HTTPHEADER, nullptr)");
    _headers.reset();
    const auto addHeader = [this](const std::string& line) {
        curl_slist* list = lib::slistAppend(_headers.get(), line.c_str());
        if (!list) throw std::bad_alloc();
        (void)_headers.release();  // the same list, or a new one when it was empty
        _headers.reset(list);
    };
    if (!_acceptType.empty()) addHeader("Accept: " + _acceptType);
    if (!_contentType.empty()) addHeader("Content-Type: " + _contentType);
    // An upload goes out at once: many services never answer "Expect: 100-continue", and libcurl
    // would wait a second for it. A header without a value only removes libcurl's own, so a GET,
    // which has none, sends nothing for it.
    addHeader("Expect:");
    TCURL_SETOPT(CURLOPT_HTTPHEADER, _headers.get(), "curl_easy_setopt(_connection, CURLOPT_HTTPHEADER, headerList.get())");
    TCURL_SETOPT(CURLOPT_ERRORBUFFER, _errorBuffer, "curl_easy_setopt(_connection, CURLOPT_ERRORBUFFER, errbuf)");
    _handleOptionsSet = true;
}

void tCURL::setRequestOptions(bool upload, const std::string& path, std::string& uploadBuffer) {
    CURL* handle = static_cast<CURL*>(_connection);
    if (!_handleOptionsSet) setHandleOptions();
    TCURL_SETOPT(CURLOPT_READDATA, &uploadBuffer, "curl_easy_setopt(_connection, CURLOPT_READDATA, &putTextBuffer)");
    TCURL_SETOPT(CURLOPT_UPLOAD, upload ? 1L : 0L, "curl_easy_setopt(_connection, CURLOPT_UPLOAD, upload ? 1L : 0L)");
    _url.assign(_uri).append("/").append(_prefix).append("/").append(path);
    TCURL_SETOPT(CURLOPT_URL, _url.c_str(), "curl_easy_setopt(_connection, CURLOPT_URL, url.c_str())");
}

std::string tCURL::request(bool upload, const std::string& path, std::string& uploadBuffer) {
    tempBufferForGet.clear();
    if (_uri.empty()) throw TCURL_RAISE(kInvalidEndStationURI).debug("check failed", "!_uri.empty()");
    if (_prefix.empty()) throw TCURL_RAISE(kInvalidURIPrefix).debug("check failed", "!_prefix.empty()");

    CURL* handle = static_cast<CURL*>(_connection);
    setRequestOptions(upload, path, uploadBuffer);
    _errorBuffer[0] = '\0';

    const CURLcode performed = lib::easyPerform(handle);
    if (performed != CURLE_OK) {
        zrerr::Exception failure = TCURL_RAISE(kInternalSoftwareErrorUnknownNetworkError)
                                       .debug("function", "curl_easy_perform")
                                       .debug("CURLcode", static_cast<int>(performed))
                                       .debug("CURLOPT_ERRORBUFFER", _errorBuffer);
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
