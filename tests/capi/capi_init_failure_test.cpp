// The library's process-wide initialization failed: run with LD_PRELOAD of the shim in
// tests/support, whose pthread_mutex_init fails with ENOMEM for callers inside libtiktal.so.
// Sessions can then be neither opened nor used, while what needs no session still works.
#include "capi_support.h"

namespace {

using namespace capi;

TEST(GlobalInitFailure, SessionFunctionsReportInternalSoftwareError) {
    ViSession vi = 0xDEADBEEF;
    EXPECT_EQ(tiktal_init(kTraceResource, VI_FALSE, VI_FALSE, &vi), tiktalerr_internalSoftware);
    EXPECT_EQ(vi, 0u);
    EXPECT_EQ(tiktal_initAdvanced(kTraceResource, 0, 0, VI_TRUE, &vi), tiktalerr_internalSoftware);
    EXPECT_EQ(tiktal_GVInit(kTraceResource, VI_FALSE, VI_FALSE, &vi), tiktalerr_internalSoftware);
    EXPECT_EQ(tiktal_GVInitAdvanced(kTraceResource, 0, 0, VI_FALSE, &vi), tiktalerr_internalSoftware);
    EXPECT_EQ(vi, 0u);
    for (ViSession handle : {0x7FFFFFFFu, 0u}) {
        EXPECT_EQ(tiktal_close(handle), tiktalerr_internalSoftware);
        EXPECT_EQ(tiktal_GVClose(handle), tiktalerr_internalSoftware);
        for (const Export& e : forwardingExports())
            EXPECT_EQ(e.callWithZeros(handle), tiktalerr_internalSoftware) << e.name;
    }
}

TEST(GlobalInitFailure, StubsZeroExportsAndMessagesAreUnaffected) {
    ASSERT_EQ(exportsOfKind("stub").size(), 48u);
    for (const Export& e : exportsOfKind("stub")) EXPECT_EQ(e.callWithZeros(0x7FFFFFFF), tiktalerr_featureNotSupported);
    for (const Export& e : exportsOfKind("zero")) EXPECT_EQ(e.callWithZeros(0x7FFFFFFF), VI_SUCCESS);
    char message[TIKTAL_ERROR_MESSAGE_SIZE];
    EXPECT_EQ(tiktal_error_message(VI_NULL, tiktalerr_internalSoftware, message), VI_SUCCESS);
    EXPECT_STREQ(message, "An internal software error occurred.");
    EXPECT_EQ(tiktal_error_message(VI_NULL, 0, message), tiktalerr_warn_unknownStatus);
    EXPECT_STREQ(message, "Unknown status value 0x00000000");
}

}  // namespace
