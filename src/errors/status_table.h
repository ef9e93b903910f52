// The table of every status code the library reports, with its message.
#pragma once

#include <cstdint>

namespace zrerr {

struct StatusRow {
    std::int32_t code;
    const char* constant;
    const char* message;  // at most 255 characters
};

// The rows in search order; the first row with a code wins.
const StatusRow* findStatus(std::int32_t code) noexcept;

}  // namespace zrerr
