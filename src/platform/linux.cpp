// Linux backend of the platform layer.
#include "platform/platform.h"

#include <cerrno>
#include <cstdlib>
#include <dlfcn.h>
#include <new>
#include <pthread.h>
#include <unistd.h>

namespace platform {
namespace {

constexpr std::int32_t kOutOfMemory = -52000;
// Any other failure to create a lock: the platform layer's internal error.
constexpr std::int32_t kInternalError = -52003;

pthread_mutex_t* native(unsigned char* storage) { return std::launder(reinterpret_cast<pthread_mutex_t*>(storage)); }

}  // namespace

static_assert(sizeof(pthread_mutex_t) <= 64, "Mutex storage too small");

std::int32_t Mutex::init() noexcept {
    const int error = pthread_mutex_init(new (_storage) pthread_mutex_t, nullptr);
    if (error == 0) return 0;
    return error == ENOMEM ? kOutOfMemory : kInternalError;
}

void Mutex::destroy() noexcept { pthread_mutex_destroy(native(_storage)); }
void Mutex::lock() noexcept { pthread_mutex_lock(native(_storage)); }
void Mutex::unlock() noexcept { pthread_mutex_unlock(native(_storage)); }

// One write(2) per line: the kernel does not split a pipe write of up to PIPE_BUF bytes, and
// trace lines are shorter than that.
void writeDebugOutput(const char* line, std::size_t length) noexcept {
    while (length > 0) {
        const ssize_t written = ::write(STDERR_FILENO, line, length);
        if (written < 0 && errno == EINTR) continue;
        if (written <= 0) return;
        line += written;
        length -= static_cast<std::size_t>(written);
    }
}

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
