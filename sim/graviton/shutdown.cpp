// Shutting down as the environment's run time does: the clean-ups run on a thread of their own,
// without the lock, so that a clean-up may call RTSetCleanupProc itself.
#include "registry.h"

#include <thread>

int32_t grrt_sim_shutdown(void) {
    int32_t ran = 0;
    try {
        std::thread runner([&ran] {
            for (const grrtsim::Registration& due : grrtsim::registry().takeAll()) {
                due.procedure(due.argument);
                ++ran;
            }
        });
        runner.join();
    } catch (...) {  // no thread: the registrations were not taken
        return -1;
    }
    return ran;
}
