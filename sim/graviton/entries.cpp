// The run time's one function the driver calls.
#include "registry.h"

int32_t RTSetCleanupProc(RTCleanupProc procedure, void* argument, int32_t mode) {
    try {
        grrtsim::registry().apply(procedure, argument, mode);
    } catch (...) {  // out of memory: the call is lost, as nothing may escape into C
    }
    return 0;
}
