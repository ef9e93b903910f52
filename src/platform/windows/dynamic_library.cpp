// Shared libraries loaded at run time, and the shared installation directory from the registry.
#include "platform/platform.h"
#include "platform/windows/windows.h"

#include <algorithm>

namespace platform {

// A library given by its path finds the libraries it imports in its own folder first (a run-time
// library of the shared directory has its libcurl beside it); a bare name is looked for in the
// system's order.
void* loadLibrary(const std::string& path, std::string& error) {
    std::string native = path;
    std::replace(native.begin(), native.end(), '/', '\\');
    const DWORD search = native.find('\\') == std::string::npos ? 0 : LOAD_WITH_ALTERED_SEARCH_PATH;
    HMODULE library = LoadLibraryExA(native.c_str(), nullptr, search);
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
// missing, so that loading from it fails and says so. RRF_RT_REG_SZ takes a REG_EXPAND_SZ value
// too, expanded (asking for REG_EXPAND_SZ itself is refused unless unexpanded).
std::string sharedDirectory() {
    char value[MAX_PATH];
    DWORD size = sizeof value;
    if (RegGetValueA(HKEY_LOCAL_MACHINE, "Software\\Korvane\\Common\\Installer", "ZRSHAREDDIR", RRF_RT_REG_SZ,
                     nullptr, value, &size) != ERROR_SUCCESS)
        return "";
    return value;
}

}  // namespace platform
