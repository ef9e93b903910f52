// Shared libraries loaded at run time, and the shared installation directory.
#include "platform/platform.h"
#include "platform/unix/unix.h"

#include <dlfcn.h>

#include <cstdlib>

namespace platform {

namespace {

std::string dlerrorText() {
    const char* text = dlerror();
    return text ? text : "unknown dynamic loader error";
}

}  // namespace

void* loadLibrary(const std::string& path, std::string& error) {
    void* library = dlopen(path.c_str(), RTLD_NOW | RTLD_LOCAL);
    if (!library) error = dlerrorText();
    return library;
}

void* findSymbol(void* library, const char* name, std::string& error) {
    dlerror();
    void* symbol = dlsym(library, name);
    if (!symbol) error = dlerrorText();
    return symbol;
}

void unloadLibrary(void* library) noexcept {
    if (library) dlclose(library);
}

void* findDefinitionBeyond(const char* name) noexcept {
    if (void* next = dlsym(RTLD_NEXT, name)) return next;
    void* first = dlsym(RTLD_DEFAULT, name);
    Dl_info own{}, found{};
    // The first definition may be the driver library's own: that is no definition beyond it.
    if (!first || !dladdr(reinterpret_cast<void*>(&findDefinitionBeyond), &own) || !dladdr(first, &found) ||
        own.dli_fbase == found.dli_fbase)
        return nullptr;
    return first;
}

std::string libraryFileName(const std::string& stem) { return "lib" + stem + ".so"; }

std::string sharedDirectory() {
    const char* configured = std::getenv("ZRSHAREDDIR");
    return configured && *configured ? configured : TIKTAL_DEFAULT_SHARED_DIR;
}

}  // namespace platform
