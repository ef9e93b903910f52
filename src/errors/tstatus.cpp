#include "errors/tstatus.h"

#include <cstring>

namespace nZRAPALS100 {

bool tStatus::takes(std::int32_t newCode) const noexcept {
    return (code == 0 && newCode != 0) || (code > 0 && newCode < 0);
}

void tStatus::merge(std::int32_t newCode, const char* newComponent, const char* newFile, std::uint32_t newLine) noexcept {
    if (!takes(newCode)) return;
    code = newCode;
    if (size < sizeof(tStatus)) return;
    std::strncpy(component, newComponent, 9);
    component[9] = '\0';
    const std::size_t length = std::strlen(newFile);
    if (length <= 100) {
        std::memcpy(file, newFile, length + 1);
    } else {  // first 49, "..", last 49
        std::memcpy(file, newFile, 49);
        std::memcpy(file + 49, "..", 2);
        std::memcpy(file + 51, newFile + length - 49, 50);
    }
    line = newLine;
}

void tStatus::merge(const tStatus& other) noexcept {
    if (!takes(other.code)) return;
    if (other.size < sizeof(tStatus)) {
        code = other.code;
        return;
    }
    merge(other.code, other.component, other.file, other.line);
    if (size >= sizeof(tStatus)) std::memcpy(extension, other.extension, sizeof extension);
}

}  // namespace nZRAPALS100
