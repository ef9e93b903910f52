// Locks: critical sections.
#include "platform/platform.h"
#include "platform/windows/windows.h"

#include <new>

namespace platform {
namespace {

constexpr std::int32_t kOutOfMemory = -52000;

CRITICAL_SECTION* native(unsigned char* storage) { return std::launder(reinterpret_cast<CRITICAL_SECTION*>(storage)); }

}  // namespace

static_assert(sizeof(CRITICAL_SECTION) <= 64, "Mutex storage too small");

// The initializer can fail only for lack of memory (older systems allocate its event up front).
std::int32_t Mutex::init() noexcept {
    return InitializeCriticalSectionAndSpinCount(new (_storage) CRITICAL_SECTION, 0) ? 0 : kOutOfMemory;
}

void Mutex::destroy() noexcept { DeleteCriticalSection(native(_storage)); }
void Mutex::lock() noexcept { EnterCriticalSection(native(_storage)); }
void Mutex::unlock() noexcept { LeaveCriticalSection(native(_storage)); }

}  // namespace platform
