// The status record of one call of the routing service, and the check after the call.
#pragma once

#include <cstdint>
#include <type_traits>
#include <utility>

#include "RoCoLib.h"

namespace zrrocoapi {

// A fresh record for one call: code 0 and no text; its reallocate function owns the text.
class CallStatus {
public:
    CallStatus() noexcept;
    ~CallStatus();
    CallStatus(const CallStatus&) = delete;
    CallStatus& operator=(const CallStatus&) = delete;

    zrrocoapi_Status* get() noexcept { return &_record; }
    // Raises a negative code with the service's JSON details; success and warnings pass.
    void check() const;

    // The reallocate function the service calls: room for `capacity` bytes, the text kept;
    // 0 frees the text; above 0x7FFFFFFF fails.
    static std::int32_t reallocate(zrrocoapi_Status* status, std::uint32_t capacity) noexcept;

private:
    zrrocoapi_Status _record;
};

// Calls `function` with a fresh record as its last argument, then raises what the record holds.
template <class Function, class... Args>
auto call(Function&& function, Args&&... args) {
    CallStatus status;
    if constexpr (std::is_void_v<decltype(function(std::forward<Args>(args)..., status.get()))>) {
        function(std::forward<Args>(args)..., status.get());
        status.check();
    } else {
        auto result = function(std::forward<Args>(args)..., status.get());
        status.check();
        return result;
    }
}

}  // namespace zrrocoapi
