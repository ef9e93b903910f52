// The status record of one call of the routing service, and the check after the call.
#pragma once

#include <utility>

#include "RoCoLib.h"
#include "errors/call_record.h"

namespace zrrocoapi {

struct RoutingService {
    static constexpr const char* kComponent = "zrrocoapi";
    static constexpr const char* kName = "The routing service";
};

// A fresh record for one call: code 0 and no text; its reallocate function owns the text.
using CallStatus = zrerr::CallRecord<zrrocoapi_Status, RoutingService>;

// Calls `function` with a fresh record as its last argument, then raises what the record holds.
template <class Function, class... Args>
auto call(Function&& function, Args&&... args) {
    return CallStatus::call(std::forward<Function>(function), std::forward<Args>(args)...);
}

}  // namespace zrrocoapi
