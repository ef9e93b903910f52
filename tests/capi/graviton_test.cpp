// The Graviton variants of open and close against the stand-in run times (sim/graviton): the
// clean-up registered, withdrawn and run at shutdown; the run-time module found in each of its
// four ways and in their order; the cache of eight run times, its reclaim of unloaded ones, and
// the two fatal ends of the process.
#include <dlfcn.h>
#include <gtest/gtest.h>
#include <tiktal/tiktal.h>

#include <cstdint>
#include <string>
#include <thread>
#include <vector>

#include "graviton_rt.h"
#include "stderr_capture.h"

namespace {

constexpr char kTrace[] = "SyncTestInternal___";

// One stand-in run time, loaded by path and unloaded at the end unless already unloaded.
class RunTime {
public:
    explicit RunTime(const std::string& file) : _handle(dlopen((std::string(TIKTAL_GRAVITON_DIR) + "/" + file).c_str(), RTLD_NOW | RTLD_LOCAL)) {
        if (!_handle) ADD_FAILURE() << dlerror();
    }
    ~RunTime() { unload(); }
    RunTime(const RunTime&) = delete;
    RunTime& operator=(const RunTime&) = delete;

    void* handle() const { return _handle; }
    void unload() {
        if (_handle) dlclose(_handle);
        _handle = nullptr;
    }
    std::uint32_t registered() const { return entry<std::uint32_t (*)()>("grrt_sim_registered")(); }
    std::int32_t shutdown() const { return entry<std::int32_t (*)()>("grrt_sim_shutdown")(); }
    std::uint32_t tlsIndex() const { return entry<std::uint32_t (*)()>("grrt_sim_tlsIndex")(); }
    void setThreadModule(void* module) const { entry<void (*)(void*)>("grrt_sim_setThreadModule")(module); }

private:
    template <class Fn>
    Fn entry(const char* name) const {
        return reinterpret_cast<Fn>(dlsym(_handle, name));
    }
    void* _handle;
};

std::string instance(int n) { return "instances/libgrrt_instance" + std::to_string(n) + ".so"; }

ViSession openTraced() {
    ViSession vi = 0;
    EXPECT_EQ(tiktal_GVInit(const_cast<ViRsrc>(kTrace), VI_FALSE, VI_FALSE, &vi), VI_SUCCESS);
    return vi;
}

// The process's own trace lines go nowhere.
class Graviton : public ::testing::Test {
    testsupport::QuietStderr _quiet;
};

TEST_F(Graviton, TheCleanupIsRegisteredOnOpenWithdrawnOnCloseAndRunAtShutdown) {
    RunTime runTime("libgrrt.so");  // found as a loaded run-time library
    const ViSession vi = openTraced();
    EXPECT_EQ(runTime.registered(), 1u);
    ViSession failed = 0;
    EXPECT_NE(tiktal_GVInit(const_cast<ViRsrc>("NoSuchDevice"), VI_FALSE, VI_FALSE, &failed), VI_SUCCESS);
    EXPECT_NE(tiktal_GVInitAdvanced(const_cast<ViRsrc>("NoSuchDevice"), 0, 0, VI_FALSE, &failed), VI_SUCCESS);
    EXPECT_EQ(runTime.registered(), 1u) << "a failed open registers nothing";
    EXPECT_EQ(tiktal_GVClose(vi), VI_SUCCESS);
    EXPECT_EQ(runTime.registered(), 0u);
    EXPECT_EQ(tiktal_PersistConfig(vi), tiktalerr_invalidObject);

    // The run time shutting down closes the sessions still open.
    const ViSession first = openTraced();
    ViSession second = 0;
    EXPECT_EQ(tiktal_GVInitAdvanced(const_cast<ViRsrc>(kTrace), 1, 2, VI_FALSE, &second), VI_SUCCESS);
    EXPECT_EQ(runTime.registered(), 2u);
    EXPECT_EQ(runTime.shutdown(), 2);
    EXPECT_EQ(tiktal_PersistConfig(first), tiktalerr_invalidObject);
    EXPECT_EQ(tiktal_PersistConfig(second), tiktalerr_invalidObject);
    EXPECT_EQ(runTime.registered(), 0u);
}

TEST_F(Graviton, WithoutARunTimeOnlyCloseOfNoSessionSucceeds) {
    EXPECT_EQ(tiktal_GVClose(0), VI_SUCCESS) << "nothing to withdraw, no run time needed";
    EXPECT_EXIT(tiktal_GVClose(0x7FFFFFFF), ::testing::ExitedWithCode(1),
                "Fatal Error: gravitonv\\.lib was not called from a Graviton process\\.\n");
    EXPECT_EXIT(openTraced(), ::testing::ExitedWithCode(1), "was not called from a Graviton process");
}

TEST_F(Graviton, TheRunTimeIsTheThreadsThenTheOneSetThenALoadedLibrary) {
    RunTime perThread(instance(1)), set(instance(2)), grrt("libgrrt.so"), grffrt("libgrffrt.so");
    SetGVRTTLSIndex(perThread.tlsIndex());
    perThread.setThreadModule(perThread.handle());
    SetGVRTModule(set.handle());
    const auto registeredIn = [&] {
        return std::vector<std::uint32_t>{perThread.registered(), set.registered(), grrt.registered(), grffrt.registered()};
    };
    tiktal_GVClose(openTraced());  // registered and withdrawn: no counts left
    openTraced();
    EXPECT_EQ(registeredIn(), (std::vector<std::uint32_t>{1, 0, 0, 0})) << "the thread's slot first";
    std::thread([&] { openTraced(); }).join();
    EXPECT_EQ(registeredIn(), (std::vector<std::uint32_t>{1, 1, 0, 0})) << "another thread's slot is empty";
    SetGVRTTLSIndex(0xFFFFFFFF);
    SetGVRTModule(nullptr);
    openTraced();
    EXPECT_EQ(registeredIn(), (std::vector<std::uint32_t>{1, 1, 1, 0})) << "then libgrrt.so";
    grrt.unload();
    openTraced();
    EXPECT_EQ(grffrt.registered(), 1u) << "then libgrffrt.so";
}

TEST_F(Graviton, EightRunTimesKeepTheirEntriesAndAnUnloadedOneMakesRoom) {
    std::vector<std::unique_ptr<RunTime>> runTimes;
    for (int n = 1; n <= 8; ++n) {
        runTimes.push_back(std::make_unique<RunTime>(instance(n)));
        SetGVRTModule(runTimes.back()->handle());
        openTraced();
    }
    for (int n = 0; n < 8; ++n) {  // each again, from its cache entry
        SetGVRTModule(runTimes[n]->handle());
        openTraced();
        EXPECT_EQ(runTimes[n]->registered(), 2u) << n + 1;
    }

    // A ninth: no room while the eight are loaded.
    RunTime ninth(instance(9));
    SetGVRTModule(ninth.handle());
    EXPECT_EXIT(openTraced(), ::testing::ExitedWithCode(1),
                "Fatal Error: gravitonv\\.lib was unable to locate a suitable location to resolve \"RTSetCleanupProc\"\\. "
                "This may happen when too many instances of Graviton have been loaded into the same process\\.\n");

    // Once one of them is unloaded, its entry goes to the ninth.
    runTimes[0]->unload();
    ASSERT_EQ(dlopen((std::string(TIKTAL_GRAVITON_DIR) + "/" + instance(1)).c_str(), RTLD_NOW | RTLD_NOLOAD), nullptr);
    openTraced();
    EXPECT_EQ(ninth.registered(), 1u);
    SetGVRTModule(runTimes[7]->handle());
    openTraced();
    EXPECT_EQ(runTimes[7]->registered(), 3u) << "the others keep theirs";
    SetGVRTModule(nullptr);
}

TEST_F(Graviton, ARunTimeWithoutTheFunctionHasNoPlace) {
    void* program = dlopen(nullptr, RTLD_NOW);
    SetGVRTModule(program);  // this program defines no RTSetCleanupProc
    EXPECT_EXIT(openTraced(), ::testing::ExitedWithCode(1), "unable to locate a suitable location to resolve \"RTSetCleanupProc\"");
    SetGVRTModule(nullptr);
}

// Runs alone under ThreadSanitizer: ctest -L concurrency.
TEST(GravitonConcurrently, ThreadsOfFourRunTimesResolveAtOnce) {
    testsupport::QuietStderr quiet;
    std::vector<std::unique_ptr<RunTime>> runTimes;
    for (int n = 1; n <= 4; ++n) runTimes.push_back(std::make_unique<RunTime>(instance(n)));
    SetGVRTTLSIndex(runTimes[0]->tlsIndex());
    std::vector<std::thread> threads;
    for (int t = 0; t < 8; ++t)
        threads.emplace_back([&, t] {
            runTimes[0]->setThreadModule(runTimes[t % 4]->handle());
            for (int round = 0; round < 50; ++round) EXPECT_EQ(tiktal_GVClose(openTraced()), VI_SUCCESS);
            openTraced();
        });
    for (std::thread& thread : threads) thread.join();
    for (const auto& runTime : runTimes) EXPECT_EQ(runTime->registered(), 2u);
    SetGVRTTLSIndex(0xFFFFFFFF);
}

}  // namespace
