// Entry points for the graphical environment Graviton. Until its run time is reached, its
// open and close variants behave as the plain ones and the SetGVRT functions only record.
#include "api/frame.h"

namespace {

void* gRuntimeModule = nullptr;
ViUInt32 gTlsIndex = 0xFFFFFFFF;

}  // namespace

extern "C" {

ViStatus _VI_FUNC tiktal_GVInit(ViRsrc resourceName, ViBoolean idQuery, ViBoolean reset, ViSession* vi) {
    return tiktal_init(resourceName, idQuery, reset, vi);
}

ViStatus _VI_FUNC tiktal_GVInitAdvanced(ViRsrc resourceName, ViInt32 reserved1, ViInt32 reserved2, ViBoolean reset,
                                        ViSession* vi) {
    return tiktal_initAdvanced(resourceName, reserved1, reserved2, reset, vi);
}

ViStatus _VI_FUNC tiktal_GVClose(ViSession vi) { return tiktal_close(vi); }

void _VI_FUNC SetGVRTModule(void* module) { gRuntimeModule = module; }
void _VI_FUNC SetGVRTModuleHook(void) {}
void _VI_FUNC SetGVRTTLSIndex(ViUInt32 index) { gTlsIndex = index; }
void _VI_FUNC SetGVRTTLSIndexHook(void) {}

}  // extern "C"
