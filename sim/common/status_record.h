// The writer of a caller's JSON status record, shared by the stand-ins of the libraries that
// report through one (routing service, PXI chassis query library). Records have the fields code,
// capacity, reallocate and json.
#pragma once

#include <cstdint>
#include <cstring>
#include <string>

namespace simcommon {

// Sets the code of a record (null: nothing) and writes `json` into its text when the caller's
// reallocate gives room; a reallocate that is missing or fails leaves the text as it was.
template <class Record>
void writeStatus(Record* st, std::int32_t code, const std::string& json) noexcept {
    constexpr std::uint32_t kMaxCapacity = 0x7FFFFFFFu;
    if (!st) return;
    st->code = code;
    if (json.size() >= kMaxCapacity) return;
    const auto needed = static_cast<std::uint32_t>(json.size() + 1);
    if (st->capacity < needed && !(st->reallocate && st->reallocate(st, needed))) return;
    if (!st->json || st->capacity < needed) return;
    std::memcpy(st->json, json.c_str(), needed);
}

}  // namespace simcommon
