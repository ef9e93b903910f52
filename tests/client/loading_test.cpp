// Loading of the SSL and HTTP libraries from the shared directory: all or nothing, and a failed
// load is tried again. One process, so the steps run in order and the last one succeeds.
#include <gtest/gtest.h>

#include <stdlib.h>

#include <fstream>
#include <string>

#include "client/curl.h"
#include "errors/zrerr.h"

namespace {

using namespace zr::vantle::shared;

// The run-time libraries mapped into this process now.
std::string loadedRuntimeLibraries() {
    std::ifstream maps("/proc/self/maps");
    std::string line, found;
    while (std::getline(maps, line))
        for (const char* name : {"libzrsslinit.so", "libcurlimpl.so"})
            if (line.find(name) != std::string::npos && found.find(name) == std::string::npos) found += name + std::string(" ");
    return found;
}

std::int32_t initializeWith(const std::string& sharedDirectory) {
    setenv("ZRSHAREDDIR", sharedDirectory.c_str(), 1);
    tCURL curl;
    try {
        curl.initialize("http://127.0.0.2:9", "tiktalwebs", 1000);
        return 0;
    } catch (const zrerr::Exception& e) {
        EXPECT_NE(std::string(e.what()).find("\"check failed\":\"_connection\""), std::string::npos) << e.what();
        return e.code();
    }
}

TEST(Loading, EveryBrokenLayoutFailsAndLeavesNothingLoadedThenTheRealOneLoads) {
    // Without the libraries a handle-less transport fails its requests cleanly.
    setenv("ZRSHAREDDIR", "/nonexistent/shared", 1);
    tCURL unloaded;
    EXPECT_THROW(unloaded.initialize("http://127.0.0.2:9", "tiktalwebs", 1000), zrerr::Exception);
    try {
        unloaded.get("devices");
        ADD_FAILURE();
    } catch (const zrerr::Exception& e) {
        EXPECT_EQ(e.code(), kInternalSoftwareError);  // the first option call finds nothing loaded
    }

    const std::string broken = TIKTAL_SHARED_DIR_BROKEN;
    for (const std::string& layout : {std::string("/nonexistent/shared"), broken + "/no-ssl", broken + "/no-uninit",
                                      broken + "/init-null", broken + "/no-curl", broken + "/missing-name"}) {
        EXPECT_EQ(initializeWith(layout), kInternalSoftwareErrorFailedInitialize) << layout;
        EXPECT_EQ(loadedRuntimeLibraries(), "") << layout;
    }
    EXPECT_EQ(initializeWith(TIKTAL_SHARED_DIR_BUILD), 0);
    EXPECT_NE(loadedRuntimeLibraries().find("libcurlimpl.so"), std::string::npos);
    EXPECT_NE(loadedRuntimeLibraries().find("libzrsslinit.so"), std::string::npos);
    // Once loaded, the libraries stay: the directory is not consulted again.
    EXPECT_EQ(initializeWith("/nonexistent/shared"), 0);
}

}  // namespace
