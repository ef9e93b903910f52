// Modules of the graphical environment's run time: loaded modules, their exports and the image
// version of their executable headers.
#include "platform/platform.h"
#include "platform/windows/windows.h"

namespace platform {

void* threadModule(std::uint32_t index) noexcept {
    if (index == TLS_OUT_OF_INDEXES) return nullptr;
    return TlsGetValue(index);
}

void* mainProgramDefining(std::initializer_list<const char*> names) noexcept {
    HMODULE program = GetModuleHandleA(nullptr);
    for (const char* name : names)
        if (GetProcAddress(program, name)) return program;
    return nullptr;
}

void* loadedLibrary(const char* name) noexcept {
    HMODULE module = nullptr;
    return GetModuleHandleExA(GET_MODULE_HANDLE_EX_FLAG_UNCHANGED_REFCOUNT, name, &module) ? module : nullptr;
}

// A module's export table holds only what the module itself exports (a forwarded name resolves
// into the module it names).
void* moduleSymbol(void* module, const char* name) noexcept {
    return module ? reinterpret_cast<void*>(GetProcAddress(static_cast<HMODULE>(module), name)) : nullptr;
}

// The image version of the module's executable header (major in the high half, minor in the low).
// A module stamped 0.0 gets 1: 0 marks a free cache entry.
std::uint32_t moduleStamp(void* module) noexcept {
    const auto* base = static_cast<const unsigned char*>(module);
    const auto* dos = reinterpret_cast<const IMAGE_DOS_HEADER*>(base);
    if (!base || dos->e_magic != IMAGE_DOS_SIGNATURE) return 1;
    const auto* headers = reinterpret_cast<const IMAGE_NT_HEADERS*>(base + dos->e_lfanew);
    if (headers->Signature != IMAGE_NT_SIGNATURE) return 1;
    const std::uint32_t stamp = (static_cast<std::uint32_t>(headers->OptionalHeader.MajorImageVersion) << 16) |
                                headers->OptionalHeader.MinorImageVersion;
    return stamp != 0 ? stamp : 1;
}

// A module that is no longer loaded has no file name.
bool isModuleLoaded(void* module) noexcept {
    char name[MAX_PATH];
    return GetModuleFileNameA(static_cast<HMODULE>(module), name, sizeof name) != 0;
}

}  // namespace platform
