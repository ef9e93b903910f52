/* The IVI size query for text outputs, and error handling with tiktal_error_message.
 * Usage: size_query [RESOURCE]   (default: the call-tracing session "SyncTestInternal___") */
#include <stdio.h>
#include <stdlib.h>

#include <tiktal/tiktal.h>

static void report(ViSession vi, const char* what, ViStatus status) {
    ViChar message[TIKTAL_ERROR_MESSAGE_SIZE]; /* the message buffer must hold 256 bytes */
    tiktal_error_message(vi, status, message);
    printf("%-44s status %d (0x%08X)%s%s\n", what, (int)status, (unsigned)status, status < 0 ? ": " : "",
           status < 0 ? message : "");
}

int main(int argc, char** argv) {
    const char* resource = argc > 1 ? argv[1] : "SyncTestInternal___";
    ViSession vi = 0;
    ViStatus status, size;
    char small[1];
    char* buffer;

    status = tiktal_init(resource, VI_FALSE, VI_FALSE, &vi);
    report(vi, "tiktal_init", status);
    if (status < 0) return 1;

    /* 1. Ask how many bytes the text needs: bufferSize 0 and no buffer. A positive status is
     *    the size, terminating NUL included. */
    size = tiktal_GetTimeReferenceNames(vi, 0, VI_NULL);
    report(vi, "size query", size);
    if (size < 0) return 1;

    /* 2. A buffer that is too small is refused; nothing is cut short silently. */
    if (size > 1) report(vi, "reading into a 1-byte buffer", tiktal_GetTimeReferenceNames(vi, (ViInt32)sizeof small, small));

    /* 3. A buffer of the size asked for. */
    buffer = malloc((size_t)size);
    if (!buffer) return 1;
    status = tiktal_GetTimeReferenceNames(vi, size, buffer);
    report(vi, "reading into a buffer of that size", status);
    if (status == VI_SUCCESS) printf("time references: \"%s\"\n", buffer);
    free(buffer);

    /* 4. Failing calls: an operation the session does not offer, and a closed handle. */
    report(vi, "tiktal_StartPTP", tiktal_StartPTP(vi, 0, 0, 0, 0));
    tiktal_close(vi);
    report(vi, "tiktal_self_test after tiktal_close", tiktal_self_test(vi, NULL, NULL));
    return 0;
}
