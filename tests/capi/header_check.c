/* The public header on its own: compiles as strict C99 and as C++ (header_check.cpp), declares
 * every export of src/tables/exports.tsv with a prototype that links against libtiktal.so, and
 * in a fresh process issues the first handles 0x7FFFFFFF and 0x80000000. */
#include <stdio.h>

#include <tiktal/tiktal.h>

typedef void (*AnyFunction)(void);

#define TIKTAL_EXPORT_ADDRESS(name) (AnyFunction)&name,
#define TIKTAL_EXPORT_manual(name, op) TIKTAL_EXPORT_ADDRESS(name)
#define TIKTAL_EXPORT_forward(name, op) TIKTAL_EXPORT_ADDRESS(name)
#define TIKTAL_EXPORT_text(name, op) TIKTAL_EXPORT_ADDRESS(name)
#define TIKTAL_EXPORT_stub(name, op) TIKTAL_EXPORT_ADDRESS(name)
#define TIKTAL_EXPORT_zero(name, op) TIKTAL_EXPORT_ADDRESS(name)

static AnyFunction const kExports[] = {
#include "export_calls.inc"
};

static int failures = 0;

static void check(int ok, const char* what) {
    if (!ok) {
        printf("FAILED: %s\n", what);
        ++failures;
    }
}

int main(void) {
    const size_t count = sizeof kExports / sizeof kExports[0];
    size_t i;
    ViSession first = 0, second = 0;

    check(count == 92, "the table lists 92 exports");
    for (i = 0; i < count; ++i) check(kExports[i] != NULL, "every export has an address");

    check(tiktal_init("SyncTestInternal___", VI_FALSE, VI_FALSE, &first) == VI_SUCCESS, "first tiktal_init");
    check(first == 0x7FFFFFFFu, "the first handle of a process is 0x7FFFFFFF");
    check(tiktal_init("SyncTestInternal___", VI_FALSE, VI_FALSE, &second) == VI_SUCCESS, "second tiktal_init");
    check(second == 0x80000000u, "the second handle is 0x80000000");
    check(tiktal_close(first) == VI_SUCCESS && tiktal_close(second) == VI_SUCCESS, "tiktal_close");
    if (failures == 0) printf("header and first handles: ok (%u exports)\n", (unsigned)count);
    return failures == 0 ? 0 : 1;
}
