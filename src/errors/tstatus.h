// The platform layer's fixed status record: a code and where it was set.
#pragma once

#include <cstdint>

namespace nZRAPALS100 {

struct tStatus {
    std::uint32_t size = sizeof(tStatus);
    std::int32_t code = 0;
    char component[10] = {};
    char file[102] = {};
    std::uint32_t line = 0;
    std::uint32_t extension[10] = {};

    bool isError() const noexcept { return code < 0; }
    // Takes `newCode` by the rule of every status: a first error is never replaced and a
    // warning gives way to an error. Component and file are cut to fit.
    void merge(std::int32_t newCode, const char* newComponent, const char* newFile, std::uint32_t newLine) noexcept;
    // The same rule for a whole record: where it was set comes along, and its extension words too
    // when both records are full size.
    void merge(const tStatus& other) noexcept;

private:
    // Whether `newCode` replaces the code held now.
    bool takes(std::int32_t newCode) const noexcept;
};

static_assert(sizeof(tStatus) == 164, "the status record is 164 bytes");

}  // namespace nZRAPALS100
