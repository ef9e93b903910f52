// The test entries: open handles and containers, the log of calls, invalidation and reset.
// Their own calls are not logged.
#include "state.h"
#include "zrqpxi_sim.h"

#include <cstring>
#include <string>

using namespace qpxisim;

uint32_t zrqpxi_sim_openItems(void) {
    std::lock_guard<std::mutex> lock(stateLock());
    return state().openItems();
}

uint32_t zrqpxi_sim_openContainers(void) {
    std::lock_guard<std::mutex> lock(stateLock());
    return state().openContainers();
}

uint32_t zrqpxi_sim_log(char* buffer, uint32_t size) {
    std::lock_guard<std::mutex> lock(stateLock());
    std::size_t needed = 1;
    for (const std::string& line : state().log) needed += line.size() + 1;
    if (buffer && size > 0) {
        std::size_t at = 0;
        for (const std::string& line : state().log)
            for (const char c : line + "\n")
                if (at + 1 < size) buffer[at++] = c;
        buffer[at] = '\0';
    }
    return needed > 0xFFFFFFFFu ? 0xFFFFFFFFu : static_cast<uint32_t>(needed);
}

void zrqpxi_sim_invalidate(void) {
    std::lock_guard<std::mutex> lock(stateLock());
    state().invalidateAll();
}

void zrqpxi_sim_reset(void) {
    std::lock_guard<std::mutex> lock(stateLock());
    state().clear();
}
