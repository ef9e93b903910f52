// The time service's protocol under /tiktalwebs: what the service answers to one request, computed
// from the state, before any test directive changes it.
#pragma once

#include "state.h"

#include <string>

namespace timeservice {

// The media type of every answer under /tiktalwebs.
inline constexpr const char* kMediaType = "vnd.zr.tiktal.v1/json; charset=utf-8";
inline const std::string kServicePrefix = "/tiktalwebs";

// A request under /tiktalwebs, with the path and query as sent (still percent-encoded).
struct ServiceRequest {
    std::string method;
    std::string path;
    std::string query;
    std::string body;
};

// The service's answer: the HTTP status and the JSON body (the error envelope for a failure).
struct Answer {
    int status = 200;
    Json body;
};

// Answers one request. A PUT of a member changes `state`; PUT D/persist writes `state` to the
// file `statePath`.
Answer answer(cJSON* state, const std::string& statePath, const ServiceRequest& request);

}  // namespace timeservice
