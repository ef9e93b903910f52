// The library exports cJSON's functions under their own names, so that applications linked with
// it can use them. Each exported function forwards to cJSON's own definition.
#pragma once

namespace tiktal {

// cJSON's own definition of the function `name`.
void* cjsonEntry(const char* name) noexcept;

}  // namespace tiktal
