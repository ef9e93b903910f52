// A lock for critical sections of a few instructions.
#pragma once

#include <atomic>
#include <thread>

namespace support {

// Taking it is one atomic exchange and leaving it one plain store, where a mutex needs an atomic
// read-modify-write for each; a thread that finds it taken gives up its processor until it is free.
// It cannot fail to be created.
class SpinLock {
public:
    void lock() noexcept {
        while (_taken.exchange(true, std::memory_order_acquire))
            while (_taken.load(std::memory_order_relaxed)) std::this_thread::yield();
    }
    void unlock() noexcept { _taken.store(false, std::memory_order_release); }

private:
    std::atomic<bool> _taken{false};
};

}  // namespace support
