// A program that is itself the Graviton environment (graviton_host.cpp: it defines gGVRTVersion
// and RTSetCleanupProc): the main program comes before a loaded run-time library, and after the
// module that the environment set.
#include <dlfcn.h>
#include <gtest/gtest.h>
#include <tiktal/tiktal.h>

#include <atomic>
#include <cstdint>
#include <string>

#include "stderr_capture.h"

extern "C" std::atomic<int> gCleanupCalls;

TEST(GravitonMainProgram, ComesAfterTheSetModuleAndBeforeALoadedLibrary) {
    testsupport::QuietStderr quiet;
    void* grrt = dlopen((std::string(TIKTAL_GRAVITON_DIR) + "/libgrrt.so").c_str(), RTLD_NOW | RTLD_LOCAL);
    ASSERT_NE(grrt, nullptr) << dlerror();
    const auto registered = reinterpret_cast<std::uint32_t (*)()>(dlsym(grrt, "grrt_sim_registered"));
    ViSession vi = 0;
    ASSERT_EQ(tiktal_GVInit(const_cast<ViRsrc>("SyncTestInternal___"), VI_FALSE, VI_FALSE, &vi), VI_SUCCESS);
    EXPECT_EQ(gCleanupCalls.load(), 1);
    EXPECT_EQ(registered(), 0u);
    SetGVRTModule(grrt);
    ASSERT_EQ(tiktal_GVInit(const_cast<ViRsrc>("SyncTestInternal___"), VI_FALSE, VI_FALSE, &vi), VI_SUCCESS);
    EXPECT_EQ(gCleanupCalls.load(), 1);
    EXPECT_EQ(registered(), 1u);
    SetGVRTModule(nullptr);
    dlclose(grrt);
}
