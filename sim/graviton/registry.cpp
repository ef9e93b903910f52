#include "registry.h"

#include <cinttypes>
#include <cstdio>
#include <utility>

namespace grrtsim {

namespace {

constexpr std::int32_t kRegister = 2, kWithdraw = 0;

std::string logLine(RTCleanupProc procedure, void* argument, std::int32_t mode) {
    char line[96];
    std::snprintf(line, sizeof line, "mode=%" PRId32 " procedure=0x%" PRIxPTR " argument=0x%" PRIxPTR "\n", mode,
                  reinterpret_cast<std::uintptr_t>(procedure), reinterpret_cast<std::uintptr_t>(argument));
    return line;
}

}  // namespace

void Registry::apply(RTCleanupProc procedure, void* argument, std::int32_t mode) {
    std::string line = logLine(procedure, argument, mode);
    std::lock_guard<std::mutex> hold(lock_);
    log_ += line;
    // A null procedure is never registered: running it would crash the shutdown.
    if (mode == kRegister && procedure) registrations_.push_back({procedure, argument});
    if (mode == kWithdraw) withdraw(procedure, argument);
}

// Withdraws the oldest registration of the pair, if any.
void Registry::withdraw(RTCleanupProc procedure, void* argument) {
    for (auto it = registrations_.begin(); it != registrations_.end(); ++it)
        if (it->procedure == procedure && it->argument == argument) {
            registrations_.erase(it);
            return;
        }
}

std::uint32_t Registry::count() {
    std::lock_guard<std::mutex> hold(lock_);
    return static_cast<std::uint32_t>(registrations_.size());
}

std::string Registry::log() {
    std::lock_guard<std::mutex> hold(lock_);
    return log_;
}

std::vector<Registration> Registry::takeAll() {
    std::lock_guard<std::mutex> hold(lock_);
    return std::exchange(registrations_, {});
}

void Registry::clear() {
    std::lock_guard<std::mutex> hold(lock_);
    registrations_.clear();
    log_.clear();
}

Registry& registry() {
    static Registry instance;
    return instance;
}

}  // namespace grrtsim
