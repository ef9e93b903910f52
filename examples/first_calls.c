/* Opens a resource, makes a few calls, prints each status with its message, and closes.
 * Usage: first_calls [RESOURCE]   (default: the call-tracing session "SyncTestInternal___") */
#include <stdio.h>

#include <tiktal/tiktal.h>

static void report(const char* call, ViStatus status) {
    ViChar message[TIKTAL_ERROR_MESSAGE_SIZE];
    tiktal_error_message(VI_NULL, status, message);
    printf("%-40s -> 0x%08X  %s\n", call, (unsigned)status, status == VI_SUCCESS ? "(success)" : message);
    fflush(stdout);
}

int main(int argc, char** argv) {
    const char* resource = argc > 1 ? argv[1] : "SyncTestInternal___";
    ViSession vi = 0;
    ViInt16 result = -1;
    ViChar text[TIKTAL_ERROR_MESSAGE_SIZE] = "";
    ViInt32 priority = 0;
    ViUInt32 seconds = 0, nanoseconds = 0;
    ViUInt16 fraction = 0;
    ViStatus status;

    setvbuf(stdout, NULL, _IOLBF, 0);
    status = tiktal_init(resource, VI_FALSE, VI_FALSE, &vi);
    report("tiktal_init", status);
    if (status < 0) return 1;
    printf("   session handle 0x%08X\n", (unsigned)vi);

    report("tiktal_self_test", tiktal_self_test(vi, &result, text));
    printf("   self test %d: %s\n", result, text);
    report("tiktal_ConnectTrigTerminals", tiktal_ConnectTrigTerminals(vi, "PXI_Trig0", "PFI0", "", 0, 1));
    report("tiktal_GetAttributeViInt32", tiktal_GetAttributeViInt32(vi, "ptp1", TIKTAL_ATTR_1588_PRIORITY1, &priority));
    status = tiktal_GetTimeReferenceNames(vi, 0, VI_NULL);
    printf("%-40s -> %d (size query: bytes needed)\n", "tiktal_GetTimeReferenceNames", (int)status);
    report("tiktal_GetTime", tiktal_GetTime(vi, &seconds, &nanoseconds, &fraction));
    report("tiktal_StartPTP (not supported)", tiktal_StartPTP(vi, 0, 0, 0, 0));
    report("tiktal_close", tiktal_close(vi));
    report("tiktal_reset after close", tiktal_reset(vi));
    return 0;
}
