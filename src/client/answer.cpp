#include "client/answer.h"

#include <cstdint>
#include <optional>

#include "client/curl.h"
#include "client/envelope.h"
#include "errors/zrerr.h"

namespace zr::vantle::shared {
namespace {

// The status an "errorCode" stands for. Codes written as unsigned 32-bit numbers
// (3220848643 for 0xBFFA4003) wrap as a C conversion would; a code that does not come out as an
// error (a warning, 0, a fraction, out of range) stands for nothing.
std::optional<std::int32_t> errorStatus(std::optional<double> code) {
    if (!code || *code < -2147483648.0 || *code > 4294967295.0) return std::nullopt;
    const auto status = static_cast<std::int32_t>(static_cast<std::uint32_t>(static_cast<std::int64_t>(*code)));
    if (status >= 0) return std::nullopt;
    return status;
}

}  // namespace

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

std::string unwrap(const std::string& body) {
    envelope::Envelope members;
    const envelope::ScanError scan = envelope::check(body, members);
    if (scan != envelope::kOk) throw TCURL_RAISE(kInvalidJSONResponseFromServer).debug("jsonz_ErrorCode", static_cast<int>(scan));

    bool success = true;
    std::optional<double> errorCode;
    std::string_view errorCodeText, errorText, errorInfo;
    if (members.error) {
        const std::string_view errorValue = *members.error;
        const auto member = [&](const char* name) { return envelope::findMember(errorValue, name); };
        const auto successAt = member("success");
        success = successAt && envelope::readBool(errorValue, *successAt);
        if (const auto at = member("errorCode")) {
            errorCode = envelope::readWholeNumber(errorValue, *at);
            errorCodeText = envelope::valueText(errorValue, *at).value_or("");
        }
        if (const auto at = member("errorText")) errorText = envelope::readString(errorValue, *at);
        if (const auto at = member("errorInfo")) errorInfo = envelope::readString(errorValue, *at);
    }
    if (!success) {
        // A failure must never read as success or as a warning: without an error code of its own
        // it is reported as the server's error.
        const std::optional<std::int32_t> status = errorStatus(errorCode);
        throw zrerr::raise(status ? *status : kNetworkServerError, status ? "errorCode" : "kNetworkServerError",
                           ZRERR_FILE, __LINE__, "zrgvshared_debug")
            .debug("errorCode", std::string(errorCodeText))
            .debug("errorText", std::string(errorText))
            .debug("errorInfo", std::string(errorInfo));
    }
    if (members.result) return std::string(*members.result);
    return body;
}

}  // namespace zr::vantle::shared
