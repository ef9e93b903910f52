// Shared libraries loaded at run time, and the shared installation directory from the registry.
#include "platform/platform.h"
#include "platform/windows/windows.h"

namespace platform {

void* loadLibrary(const std::string& path, std::string& error) {
    HMODULE library = LoadLibraryA(path.c_str());
    if (!library) error = lastErrorText();
    return reinterpret_cast<void*>(library);
}

void* findSymbol(void* library, const char* name, std::string& error) {
    FARPROC symbol = GetProcAddress(static_cast<HMODULE>(library), name);
    if (!symbol) error = lastErrorText();
    return reinterpret_cast<void*>(symbol);
}

void unloadLibrary(void* library) noexcept {
    if (library) FreeLibrary(static_cast<HMODULE>(library));
}

// cJSON is linked into the DLL, which exports its functions itself: there is nothing to forward to.
void* findDefinitionBeyond(const char*) noexcept { return nullptr; }

std::string libraryFileName(const std::string& stem) { return stem + ".dll"; }

// The installer's value "ZRSHAREDDIR" under HKLM\Software\Korvane\Common\Installer; "" when it is
// missing, so that loading from it fails and says so.
std::string sharedDirectory() {
    char value[MAX_PATH];
    DWORD size = sizeof value;
    if (RegGetValueA(HKEY_LOCAL_MACHINE, "Software\\Korvane\\Common\\Installer", "ZRSHAREDDIR",
                     RRF_RT_REG_SZ | RRF_RT_REG_EXPAND_SZ, nullptr, value, &size) != ERROR_SUCCESS)
        return "";
    return value;
}

}  // namespace platform
