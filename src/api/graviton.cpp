// Entry points for the graphical environment Graviton: its open and close variants register and
// withdraw, with the environment's run time, a clean-up that closes the session when the run time
// shuts down first.
#include <cstdint>

#include "api/frame.h"
#include "graviton/runtime_import.h"

namespace {

using tiktal::graviton::RuntimeImport;

// int32_t RTSetCleanupProc(procedure, argument, mode): mode 2 registers, mode 0 withdraws.
using CleanupProc = std::int32_t (*)(void* argument);
using SetCleanupProc = std::int32_t (*)(CleanupProc procedure, void* argument, std::int32_t mode);
constexpr std::int32_t kRegister = 2;
constexpr std::int32_t kWithdraw = 0;

RuntimeImport gSetCleanupProc("RTSetCleanupProc");

std::int32_t closeSession(void* argument) {
    return tiktal_close(static_cast<ViSession>(reinterpret_cast<std::uintptr_t>(argument)));
}

void setCleanup(ViSession vi, std::int32_t mode) {
    const auto setCleanupProc = reinterpret_cast<SetCleanupProc>(gSetCleanupProc.resolve());
    setCleanupProc(closeSession, reinterpret_cast<void*>(static_cast<std::uintptr_t>(vi)), mode);
}

// A session opened by `status` gets its clean-up.
ViStatus registered(ViStatus status, const ViSession* vi) {
    if (status >= 0 && vi) setCleanup(*vi, kRegister);
    return status;
}

}  // namespace

extern "C" {

ViStatus _VI_FUNC tiktal_GVInit(ViRsrc resourceName, ViBoolean idQuery, ViBoolean reset, ViSession* vi) {
    return registered(tiktal_init(resourceName, idQuery, reset, vi), vi);
}

ViStatus _VI_FUNC tiktal_GVInitAdvanced(ViRsrc resourceName, ViInt32, ViInt32, ViBoolean reset, ViSession* vi) {
    return registered(tiktal_init(resourceName, VI_FALSE, reset, vi), vi);
}

ViStatus _VI_FUNC tiktal_GVClose(ViSession vi) {
    if (vi != 0) setCleanup(vi, kWithdraw);
    return tiktal_close(vi);
}

void _VI_FUNC SetGVRTModule(void* module) { tiktal::graviton::setRuntimeModule(module); }
void _VI_FUNC SetGVRTModuleHook(void) {}
void _VI_FUNC SetGVRTTLSIndex(ViUInt32 index) { tiktal::graviton::setThreadIndex(index); }
void _VI_FUNC SetGVRTTLSIndexHook(void) {}

}  // extern "C"
