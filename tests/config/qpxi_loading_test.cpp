// Loading the PXI chassis query library when it is missing or incomplete. Each case runs in a
// process of its own, whose LD_LIBRARY_PATH CTest points at the folder of that case. Loading never
// raises: the failure is recorded in the caller's status and the library's own.
#include <dlfcn.h>
#include <gtest/gtest.h>

#include <string>

#include "config/qpxi_library.h"

namespace {

TEST(LoadingQpxiLibrary, AMissingLibraryIsRecordedWithTheLoadersTextAndLeavesEveryFunctionNull) {
    zrerr::Exception status;
    const zrqpxi::DynamicQPXILibrary library(status);
    EXPECT_EQ(status.code(), -52005);
    const std::string details = status.what();
    EXPECT_NE(details.find(R"("error_constant":"zrapalerr_invalidParameter")"), std::string::npos) << details;
    EXPECT_NE(details.find(R"("zrdynlib_debug":{"debug":"failed to zrdynlib_load library","path":"libzrqpxi.so")"),
              std::string::npos) << details;
    EXPECT_NE(details.find(R"("internal_error":{"api":"dlerror","string":"libzrqpxi.so: cannot open shared object file)"),
              std::string::npos) << details;
    EXPECT_EQ(library.status().code(), -52005);
    EXPECT_STREQ(library.status().what(), status.what());
    for (std::size_t i = 0; i < zrqpxi::kFunctionCount; ++i) EXPECT_EQ(library.function(i), nullptr) << i;
}

TEST(LoadingQpxiLibrary, AMissingSymbolStopsTheLookupThere) {
    zrerr::Exception status;
    const zrqpxi::DynamicQPXILibrary library(status);
    EXPECT_EQ(status.code(), -52005);
    const std::string details = status.what();
    EXPECT_NE(details.find(R"("debug":"failed to get symbol","zrdynlib_symbol":"zrqpxi_ItemIterator_nextItem")"),
              std::string::npos) << details;
    EXPECT_STREQ(library.status().what(), status.what());
    // Slots 1 to 10 are loaded; slot 11 is missing, and slots 12 to 17, which the broken copy
    // has, are not looked up.
    for (std::size_t i = 0; i < 10; ++i) EXPECT_NE(library.function(i), nullptr) << i;
    void* broken = dlopen("libzrqpxi.so", RTLD_NOW | RTLD_NOLOAD);
    ASSERT_NE(broken, nullptr);
    for (std::size_t i = 10; i < zrqpxi::kFunctionCount; ++i) {
        EXPECT_EQ(library.function(i), nullptr) << i;
        EXPECT_EQ(dlsym(broken, zrqpxi::kFunctionNames[i]) == nullptr, i == 10) << zrqpxi::kFunctionNames[i];
    }
    dlclose(broken);
}

}  // namespace
