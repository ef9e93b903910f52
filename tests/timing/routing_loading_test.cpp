// Loading the routing service when it is missing or incomplete. Each case runs in a process of
// its own, whose LD_LIBRARY_PATH CTest points at the folder of that case.
#include <gtest/gtest.h>

#include <string>

#include "errors/zrerr.h"
#include "timing/routing.h"

namespace {

std::string failureOfLoading() {
    try {
        tiktal::loadRoutingLibrary();
    } catch (const zrerr::Exception& e) {
        EXPECT_EQ(e.code(), -52005);
        return e.what();
    }
    ADD_FAILURE() << "the routing service loaded";
    return {};
}

TEST(LoadingRoutingService, AMissingLibraryFailsWithTheLoadersText) {
    const std::string details = failureOfLoading();
    EXPECT_NE(details.find(R"("error_constant":"zrapalerr_invalidParameter")"), std::string::npos) << details;
    EXPECT_NE(details.find(R"("zrdynlib_debug":{"debug":"failed to zrdynlib_load library","path":"libzrrocoapi.so")"),
              std::string::npos) << details;
    EXPECT_NE(details.find(R"("internal_error":{"api":"dlerror","string":"libzrrocoapi.so: cannot open shared object file)"),
              std::string::npos) << details;
}

TEST(LoadingRoutingService, MissingSymbolsFailNamingTheFirstInTableOrder) {
    const std::string details = failureOfLoading();
    EXPECT_NE(details.find(R"("debug":"failed to get symbol","zrdynlib_symbol":"zrrocoapi_showRoute")"),
              std::string::npos) << details;
    EXPECT_EQ(details.find("zrrocoapi_completeDeviceReset"), std::string::npos) << details;
}

}  // namespace
