// Makes calls on a call-tracing session, for trace_debugger_test.cpp to read under a debugger.
// Exits 0 when every call succeeds.
#include <tiktal/tiktal.h>

#include <cstdint>
#include <string>

int main() {
    ViSession vi = 0;
    const std::string longText(5000, 'A');
    ViStatus worst = tiktal_init("SyncTestInternal___", VI_FALSE, VI_TRUE, &vi);
    for (const ViStatus status : {
             tiktal_ConnectTrigTerminals(vi, "PXI_Trig0", "PFI0", nullptr, -1, 2),
             tiktal_AdjustTime_beta(vi, UINT64_MAX, 0),
             tiktal_CreateFutureTimeEvent(vi, "PFI1", INT32_MIN, UINT32_MAX, 0, 65535),
             tiktal_SetAttributeViReal64(vi, "", TIKTAL_ATTR_TERMINAL_58_VALUE, -0.25),
             tiktal_SetAttributeViBoolean(vi, "GPS", TIKTAL_ATTR_TIME_REFERENCE_ENABLED, VI_TRUE),
             tiktal_ClearClock(vi, longText.c_str()),
             tiktal_close(vi),
         })
        if (status != VI_SUCCESS) worst = status;
    return worst == VI_SUCCESS ? 0 : 1;
}
