// The HTTP transport of the time-service client: one libcurl easy handle that sends GET and PUT
// requests with JSON media types and unwraps the service's response envelope.
#pragma once

#include <cstdint>
#include <memory>
#include <string>

struct curl_slist;

namespace zr::vantle::shared {

// Statuses of the transport: errors from -411399 to -411350, warnings from 411350 to 411399.
inline constexpr std::int32_t kInternalSoftwareError = -411350;
inline constexpr std::int32_t kInternalSoftwareErrorFailedInitialize = -411351;
inline constexpr std::int32_t kInvalidEndStationURI = -411352;
inline constexpr std::int32_t kInvalidURIPrefix = -411353;
inline constexpr std::int32_t kNetworkClientBadRequestError = -411354;
inline constexpr std::int32_t kNetworkClientUnauthorizedError = -411355;
inline constexpr std::int32_t kNetworkClientNotFoundError = -411356;
inline constexpr std::int32_t kNetworkClientRequestTimeoutError = -411357;
inline constexpr std::int32_t kNetworkClientError = -411358;
inline constexpr std::int32_t kNetworkServerError = -411359;
inline constexpr std::int32_t kInvalidJSONResponseFromServer = -411360;
inline constexpr std::int32_t kInternalSoftwareErrorUnknownNetworkError = -411361;
inline constexpr std::int32_t kNetworkClientUnsupportedMediaType = -411370;
inline constexpr std::int32_t kNetworkClientInProgress = 411369;

// Raises one of the statuses above; the transport's site members go into "zrgvshared_debug".
#define TCURL_RAISE(constant) ::zrerr::raise((constant), #constant, ZRERR_FILE, __LINE__, "zrgvshared_debug")

class iCURL {
public:
    virtual ~iCURL() = default;
    virtual void initialize(const std::string& uri, const std::string& prefix, std::uint32_t timeoutInMS) = 0;
    virtual void setMediaType(const std::string& mediaType) = 0;
    virtual void setCredentials(const std::string& username, const std::string& password) = 0;
    // Both return the unwrapped answer: the text of its "result" member, or the whole body.
    virtual std::string put(const std::string& path, const std::string& body) = 0;
    virtual std::string get(const std::string& path) = 0;
};

class tCURL final : public iCURL {
public:
    tCURL() = default;
    ~tCURL() override;
    tCURL(const tCURL&) = delete;
    tCURL& operator=(const tCURL&) = delete;

    void initialize(const std::string& uri, const std::string& prefix, std::uint32_t timeoutInMS) override;
    void setMediaType(const std::string& mediaType) override;
    void setCredentials(const std::string& username, const std::string& password) override;
    std::string put(const std::string& path, const std::string& body) override;
    std::string get(const std::string& path) override;

private:
    struct HeaderListDeleter {
        void operator()(curl_slist* list) const;
    };
    using HeaderList = std::unique_ptr<curl_slist, HeaderListDeleter>;

    std::string request(bool upload, const std::string& path, std::string& uploadBuffer);
    void setHandleOptions();
    void setRequestOptions(bool upload, const std::string& path, std::string& uploadBuffer);

    void* _connection = nullptr;
    std::string tempBufferForGet;
    std::string putTextBuffer;  // upload source of GET requests: always empty
    std::string _uri;
    std::string _prefix;
    std::uint32_t _timeoutInMS = 0;
    std::string _acceptType = "vnd.zr.vantle.v0/json; charset=utf-8";
    std::string _contentType = "vnd.zr.vantle.v0/json; charset=utf-8";
    std::string _username;
    std::string _password;
    // What the handle keeps between requests: the options that change only with the settings
    // above (set again on the first request after a change), the header list and the error
    // buffer it points at, both as long-lived as the handle, and the last request's URL.
    bool _handleOptionsSet = false;
    HeaderList _headers;
    char _errorBuffer[256] = {};
    std::string _url;
};

}  // namespace zr::vantle::shared
