// The test entries over the registrations and the log.
#include "registry.h"

#include <cstdlib>
#include <cstring>

uint32_t grrt_sim_registered(void) { return grrtsim::registry().count(); }

char* grrt_sim_log(void) {
    try {
        const std::string log = grrtsim::registry().log();
        char* text = static_cast<char*>(std::malloc(log.size() + 1));
        if (text) std::memcpy(text, log.c_str(), log.size() + 1);
        return text;
    } catch (...) {
        return nullptr;
    }
}

void grrt_sim_free(char* text) { std::free(text); }

void grrt_sim_reset(void) { grrtsim::registry().clear(); }
