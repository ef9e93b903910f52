/* Walks through a time-service session: its time references, a few attributes of each type, the
 * current time, a write, saving the configuration, and one operation the service refuses.
 * Usage: time_service sync://HOST/DEVICE */
#include <stdio.h>
#include <stdlib.h>
#include <string.h>

#include <tiktal/tiktal.h>

static ViSession vi;

/* Prints a failing status with its message; returns whether the call succeeded. */
static int ok(const char* what, ViStatus status) {
    ViChar message[TIKTAL_ERROR_MESSAGE_SIZE];
    if (status == VI_SUCCESS) return 1;
    tiktal_error_message(vi, status, message);
    printf("  %-34s 0x%08X %s\n", what, (unsigned)status, message);
    return 0;
}

/* A text attribute, with the size query to find out how much room it needs. */
static void printText(const char* reference, ViAttr attribute, const char* label) {
    ViStatus size = tiktal_GetAttributeViString(vi, reference, attribute, 0, VI_NULL);
    char* text;
    if (size < 0) {
        ok(label, size);
        return;
    }
    text = malloc((size_t)size);
    if (text && ok(label, tiktal_GetAttributeViString(vi, reference, attribute, size, text)))
        printf("  %-34s %s\n", label, text);
    free(text);
}

static void printInt(const char* reference, ViAttr attribute, const char* label) {
    ViInt32 value = 0;
    if (ok(label, tiktal_GetAttributeViInt32(vi, reference, attribute, &value))) printf("  %-34s %d\n", label, (int)value);
}

/* The attributes of one time reference; the two families have attributes of their own. */
static void printReference(const char* reference) {
    ViChar type[64] = "";
    ViBoolean flag = VI_FALSE;
    ViReal64 delay = 0;
    if (!ok("type", tiktal_GetAttributeViString(vi, reference, TIKTAL_ATTR_TIME_REFERENCE_TYPE, sizeof type, type))) return;
    printf("%s (%s)\n", reference, type);
    if (ok("enabled", tiktal_GetAttributeViBoolean(vi, reference, TIKTAL_ATTR_TIME_REFERENCE_ENABLED, &flag)))
        printf("  %-34s %s\n", "enabled", flag ? "yes" : "no");
    if (strncmp(type, "IEEE 1588", 9) == 0) {
        printInt(reference, TIKTAL_ATTR_1588_PRIORITY1, "priority1");
        printInt(reference, TIKTAL_ATTR_1588_CLOCK_ACCURACY, "clock accuracy (1588 value)");
        printText(reference, TIKTAL_ATTR_1588_GM_CLOCK_ID, "grandmaster clock");
        if (strcmp(type, "IEEE 1588-2008") == 0 &&
            ok("mean path delay", tiktal_GetAttributeViReal64(vi, reference, TIKTAL_ATTR_1588_MEAN_PATH_DELAY, &delay)))
            printf("  %-34s %g ns\n", "mean path delay", delay);
    } else {
        printInt(reference, TIKTAL_ATTR_8021AS_PRIORITY1, "priority1");
        printInt(reference, TIKTAL_ATTR_8021AS_CLOCK_ACCURACY, "clock accuracy (code)");
        printText(reference, TIKTAL_ATTR_8021AS_GM_CLOCK_ID, "grandmaster clock");
        if (strcmp(type, "IEEE 802.1AS-2011") == 0 &&
            ok("AS capable", tiktal_GetAttributeViBoolean(vi, reference, TIKTAL_ATTR_8021AS_AS_CAPABLE, &flag)))
            printf("  %-34s %s\n", "AS capable", flag ? "yes" : "no");
    }
}

int main(int argc, char** argv) {
    ViChar names[1024];
    ViUInt32 seconds = 0, nanoseconds = 0;
    ViUInt16 fraction = 0;
    ViReal64 offset = 0;
    char* reference;

    if (argc < 2) {
        fprintf(stderr, "usage: %s sync://HOST/DEVICE\n", argv[0]);
        return 2;
    }
    if (!ok("tiktal_init", tiktal_init(argv[1], VI_FALSE, VI_FALSE, &vi))) return 1;
    printf("opened %s\n", argv[1]);

    if (ok("tiktal_GetTime", tiktal_GetTime(vi, &seconds, &nanoseconds, &fraction)))
        printf("time of the service: %u s %09u ns\n", (unsigned)seconds, (unsigned)nanoseconds);
    printText(VI_NULL, TIKTAL_ATTR_SELECTED_TIME_REFERENCE, "selected time reference");
    if (ok("offset", tiktal_GetAttributeViReal64(vi, VI_NULL, TIKTAL_ATTR_SELECTED_TIME_REFERENCE_OFFSET, &offset)))
        printf("  %-34s %g s\n", "offset of the selected one", offset);

    if (!ok("tiktal_GetTimeReferenceNames", tiktal_GetTimeReferenceNames(vi, sizeof names, names))) return 1;
    printf("time references: %s\n", names);
    for (reference = strtok(names, ","); reference; reference = strtok(NULL, ",")) printReference(reference);

    printf("writing 1588 priority1 = 100 on PTP1 and saving the configuration\n");
    if (ok("set priority1", tiktal_SetAttributeViInt32(vi, "PTP1", TIKTAL_ATTR_1588_PRIORITY1, 100)) &&
        ok("tiktal_PersistConfig", tiktal_PersistConfig(vi)))
        printInt("PTP1", TIKTAL_ATTR_1588_PRIORITY1, "1588 priority1 now");

    printf("a reset, which a time service refuses, and an 802.1AS attribute asked of a 1588 reference:\n");
    ok("tiktal_reset", tiktal_reset(vi));
    printInt("PTP1", TIKTAL_ATTR_8021AS_PRIORITY1, "802.1AS priority1 of PTP1");
    return ok("tiktal_close", tiktal_close(vi)) ? 0 : 1;
}
