// The two checks of a time-service answer: its HTTP status code, and the JSON envelope around its
// body ("result", "error"). Both raise the transport's statuses (client/curl.h).
#pragma once

#include <cstddef>
#include <string>

namespace zr::vantle::shared {

// The largest answer body the transport takes; a larger one fails as soon as it passes this size.
// The service's answers are a few kilobytes; even a hundred thousand time-reference names fit.
inline constexpr std::size_t kMaxAnswerBytes = 4 * 1024 * 1024;

// Fails for the HTTP status codes of a failed request (the 202 warning included).
void classify(long responseCode);

// The answer's "result" text (or the whole body); a failure when its "error" says so. The status
// of a failure is always an error: an "errorCode" that is not one gives kNetworkServerError.
std::string unwrap(const std::string& body);

}  // namespace zr::vantle::shared
