/* Reads the time of a time service and lists its time references.
 * Usage: time_references sync://HOST/DEVICE */
#include <stdio.h>
#include <stdlib.h>
#include <string.h>

#include <tiktal/tiktal.h>

/* Prints a failing status with its message and returns it. */
static ViStatus check(ViSession vi, const char* call, ViStatus status) {
    if (status < 0) {
        ViChar message[TIKTAL_ERROR_MESSAGE_SIZE];
        tiktal_error_message(vi, status, message);
        fprintf(stderr, "%s failed: 0x%08X %s\n", call, (unsigned)status, message);
    }
    return status;
}

int main(int argc, char** argv) {
    ViSession vi = 0;
    ViUInt32 seconds = 0, nanoseconds = 0;
    ViUInt16 fraction = 0;
    ViStatus size;
    char *names, *name;

    if (argc != 2) {
        fprintf(stderr, "usage: %s sync://HOST/DEVICE\n", argv[0]);
        return 2;
    }
    if (check(0, "tiktal_init", tiktal_init(argv[1], VI_FALSE, VI_FALSE, &vi)) < 0) return 1;

    if (check(vi, "tiktal_GetTime", tiktal_GetTime(vi, &seconds, &nanoseconds, &fraction)) == VI_SUCCESS)
        printf("time: %u.%09u s since the service's epoch\n", (unsigned)seconds, (unsigned)nanoseconds);

    /* The names list: ask for its size, then read it. */
    size = tiktal_GetTimeReferenceNames(vi, 0, VI_NULL);
    names = size > 0 ? malloc((size_t)size) : NULL;
    if (!names || check(vi, "tiktal_GetTimeReferenceNames", tiktal_GetTimeReferenceNames(vi, size, names)) < 0) {
        free(names);
        tiktal_close(vi);
        return 1;
    }
    for (name = strtok(names, ","); name; name = strtok(NULL, ",")) {
        ViChar type[64] = "";
        ViBoolean enabled = VI_FALSE;
        check(vi, "type", tiktal_GetAttributeViString(vi, name, TIKTAL_ATTR_TIME_REFERENCE_TYPE, sizeof type, type));
        check(vi, "enabled", tiktal_GetAttributeViBoolean(vi, name, TIKTAL_ATTR_TIME_REFERENCE_ENABLED, &enabled));
        printf("%-12s %-24s %s\n", name, type, enabled ? "enabled" : "disabled");
    }
    free(names);
    return check(vi, "tiktal_close", tiktal_close(vi)) < 0 ? 1 : 0;
}
