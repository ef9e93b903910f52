#include "client/curl.h"

#include <memory>

#include "client/curl_library.h"
#include "client/envelope.h"
#include "errors/zrerr.h"

namespace zr::vantle::shared {
namespace {

namespace lib = curllib;

#define TCURL_RAISE(constant) ::zrerr::raise((constant), #constant, ZRERR_FILE, __LINE__, "zrgvshared_debug")

size_t writeCallback(char* data, size_t size, size_t count, void* user) {
    if (!user) return 0;
    static_cast<std::string*>(user)->append(data, size * count);
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

void classify(long responseCode) {
    const auto fail = [responseCode](zrerr::Exception e) { return e.debug("responseCode", responseCode); };
    switch (responseCode) {
    case 202: throw fail(TCURL_RAISE(kNetworkClientInProgress));
    case 400: throw fail(TCURL_RAISE(kNetworkClientBadRequestError));
    case 401: throw fail(TCURL_RAISE(kNetworkClientUnauthorizedError));
    case 404: throw fail(TCURL_RAISE(kNetworkClientNotFoundError));
    case 408: throw fail(TCURL_RAISE(kNetworkClientRequestTimeoutError));
    case 415: throw fail(TCURL_RAISE(kNetworkClientUnsupportedMediaType));
    }
    if (responseCode >= 400 && responseCode <= 498) throw fail(TCURL_RAISE(kNetworkClientError));
    if (responseCode >= 500 && responseCode <= 598) throw fail(TCURL_RAISE(kNetworkServerError));
}

// The answer's "result" text (or the whole body); a failure when its "error" says so.
std::string unwrap(const std::string& body) {
    const envelope::ScanError scan = envelope::check(body);
    if (scan != envelope::kOk) throw TCURL_RAISE(kInvalidJSONResponseFromServer).debug("jsonz_ErrorCode", static_cast<int>(scan));

    bool success = true;
    std::int32_t errorCode = 0;
    std::string_view errorText, errorInfo;
    if (const auto error = envelope::findMember(body, "error")) {
        const std::string_view errorValue = envelope::valueText(body, *error).value_or("");
        const auto member = [&](const char* name) { return envelope::findMember(errorValue, name); };
        const auto successAt = member("success");
        success = successAt && envelope::readBool(errorValue, *successAt);
        if (const auto at = member("errorCode")) errorCode = envelope::readNumber(errorValue, *at);
        if (const auto at = member("errorText")) errorText = envelope::readString(errorValue, *at);
        if (const auto at = member("errorInfo")) errorInfo = envelope::readString(errorValue, *at);
    }
    if (!success) {
        // A failure without a code of its own must not read as success: report it as the
        // server's error.
        const std::int32_t status = errorCode != 0 ? errorCode : kNetworkServerError;
        throw zrerr::raise(status, errorCode != 0 ? "errorCode" : "kNetworkServerError", ZRERR_FILE, __LINE__,
                           "zrgvshared_debug")
            .debug("errorText", std::string(errorText).c_str())
            .debug("errorInfo", std::string(errorInfo).c_str());
    }
    if (const auto result = envelope::findMember(body, "result"))
        if (const auto text = envelope::valueText(body, *result)) return std::string(*text);
    return body;
}

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
    if (!_username.empty())
        TCURL_SETOPT(CURLOPT_USERNAME, _username.c_str(), "curl_easy_setopt(_connection, CURLOPT_USERNAME, _username.c_str())");
    if (!_password.empty())
        TCURL_SETOPT(CURLOPT_PASSWORD, _password.c_str(), "curl_easy_setopt(_connection, CURLOPT_PASSWORD, _password.c_str())");
    const auto addHeader = [&headers](const std::string& name, const std::string& value) {
        if (value.empty()) return;
        curl_slist* list = lib::slistAppend(headers.get(), (name + value).c_str());
        if (!list) throw std::bad_alloc();
        (void)headers.release();  // the same list, or a new one when it was empty
        headers.reset(list);
    };
    addHeader("Accept: ", _acceptType);
    addHeader("Content-Type: ", _contentType);
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
    if (performed != CURLE_OK)
        throw TCURL_RAISE(kInternalSoftwareErrorUnknownNetworkError)
            .debug("function", "curl_easy_perform")
            .debug("CURLcode", static_cast<int>(performed))
            .debug("CURLOPT_ERRORBUFFER", errorBuffer);
    long responseCode = 0;
    if (lib::easyGetinfo(handle, CURLINFO_RESPONSE_CODE, &responseCode) != CURLE_OK)
        throw TCURL_RAISE(kInternalSoftwareError)
            .debug("function", "curl_easy_getinfo(_connection, CURLINFO_RESPONSE_CODE, &responseCode)");
    classify(responseCode);
    return unwrap(tempBufferForGet);
}

}  // namespace zr::vantle::shared
