// The state of one run time: the clean-up registrations in force and the log of
// RTSetCleanupProc calls, under one lock that is never held while a clean-up runs.
#pragma once

#include "graviton_rt.h"

#include <cstdint>
#include <mutex>
#include <string>
#include <vector>

namespace grrtsim {

struct Registration {
    RTCleanupProc procedure;
    void* argument;
};

class Registry {
public:
    // Logs the call, then registers or withdraws as the mode says.
    void apply(RTCleanupProc procedure, void* argument, std::int32_t mode);
    std::uint32_t count();
    std::string log();
    // Withdraws every registration and hands them over, oldest first.
    std::vector<Registration> takeAll();
    void clear();

private:
    void withdraw(RTCleanupProc procedure, void* argument);

    std::mutex lock_;
    std::vector<Registration> registrations_;
    std::string log_;
};

Registry& registry();

}  // namespace grrtsim
