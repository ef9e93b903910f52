// The operating-system facilities the library uses. Each system has one backend file; nothing
// outside this folder includes a system header for them.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>

namespace platform {

// A lock that must be initialized before use; initialization can fail for lack of memory.
class Mutex {
public:
    Mutex() noexcept = default;
    Mutex(const Mutex&) = delete;
    Mutex& operator=(const Mutex&) = delete;

    // 0 on success, else the platform status (-52000 when the system has no memory for it).
    std::int32_t init() noexcept;
    void destroy() noexcept;
    void lock() noexcept;
    void unlock() noexcept;

private:
    alignas(16) unsigned char _storage[64];
};

class LockGuard {
public:
    explicit LockGuard(Mutex& mutex) noexcept : _mutex(mutex) { _mutex.lock(); }
    ~LockGuard() { _mutex.unlock(); }
    LockGuard(const LockGuard&) = delete;
    LockGuard& operator=(const LockGuard&) = delete;

private:
    Mutex& _mutex;
};

// Hands one whole line to the debug output; lines of concurrent writers never mix.
void writeDebugOutput(const char* line, std::size_t length) noexcept;

// Shared libraries loaded at run time. Failures return null and describe themselves in `error`.
void* loadLibrary(const std::string& path, std::string& error);
void* findSymbol(void* library, const char* name, std::string& error);
void unloadLibrary(void* library) noexcept;
// The definition of the function `name` in another object than the driver library itself: the
// first after it in the lookup order, else the first before it. Null when there is none.
void* findDefinitionBeyond(const char* name) noexcept;
// The file name of the library `stem` on this system ("libstem.so").
std::string libraryFileName(const std::string& stem);

// The shared installation directory that holds the run-time libraries: $ZRSHAREDDIR when set,
// else the directory chosen when the library was configured.
std::string sharedDirectory();

}  // namespace platform
