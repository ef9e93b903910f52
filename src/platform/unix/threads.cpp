// Locks: pthread mutexes.
#include "platform/platform.h"
#include "platform/unix/unix.h"

#include <pthread.h>

#include <cerrno>
#include <new>

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

}  // namespace platform
