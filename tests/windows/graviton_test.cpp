// The Graviton variants of open and close against the Windows stand-ins of the run time: the
// run-time module found by the thread's TLS slot, the module set, then grrt.dll and grffrt.dll
// loaded; the cache of eight run times keyed by the image version in their PE headers; and the
// fatal ends, each in a child process (this program, started as "win_graviton_test fatal CASE").
#ifndef WIN32_LEAN_AND_MEAN
#define WIN32_LEAN_AND_MEAN
#endif
#include <windows.h>

#include <gtest/gtest.h>
#include <tiktal/tiktal.h>

#include <cstdint>
#include <memory>
#include <string>
#include <thread>
#include <vector>

namespace {

constexpr char kTrace[] = "SyncTestInternal___";

// One stand-in run time, loaded by path and unloaded at the end unless already unloaded.
class RunTime {
public:
    explicit RunTime(const std::string& file) : _module(LoadLibraryA(file.c_str())) {
        if (!_module) ADD_FAILURE() << "LoadLibraryA " << file << ": error " << GetLastError();
    }
    ~RunTime() { unload(); }
    RunTime(const RunTime&) = delete;
    RunTime& operator=(const RunTime&) = delete;

    HMODULE module() const { return _module; }
    void unload() {
        if (_module) FreeLibrary(_module);
        _module = nullptr;
    }
    std::uint32_t registered() const { return entry<std::uint32_t (*)()>("grrt_sim_registered")(); }
    std::int32_t shutdown() const { return entry<std::int32_t (*)()>("grrt_sim_shutdown")(); }

private:
    template <class Fn>
    Fn entry(const char* name) const {
        return reinterpret_cast<Fn>(reinterpret_cast<void*>(GetProcAddress(_module, name)));
    }
    HMODULE _module;
};

// The stand-ins of the build (image version 0.0), and the copies of this folder stamped with the
// image version N.(N % 2).
std::string standIn(const std::string& file) { return std::string(TIKTAL_GRAVITON_DIR) + "\\" + file; }
std::string stamped(int n) { return std::string(TIKTAL_STAMPED_DIR) + "\\grrt_v" + std::to_string(n) + ".dll"; }

ViSession openTraced() {
    ViSession vi = 0;
    EXPECT_EQ(tiktal_GVInit(const_cast<ViRsrc>(kTrace), VI_FALSE, VI_FALSE, &vi), VI_SUCCESS);
    return vi;
}

// Runs this program as "fatal CASE"; its exit code.
DWORD fatal(const std::string& which) {
    char program[MAX_PATH];
    GetModuleFileNameA(nullptr, program, MAX_PATH);
    std::string line = std::string("\"") + program + "\" fatal " + which;
    STARTUPINFOA startup{};
    startup.cb = sizeof startup;
    PROCESS_INFORMATION child{};
    if (!CreateProcessA(nullptr, line.data(), nullptr, nullptr, FALSE, 0, nullptr, nullptr, &startup, &child)) return ~0u;
    WaitForSingleObject(child.hProcess, 60000);
    DWORD code = ~0u;
    GetExitCodeProcess(child.hProcess, &code);
    CloseHandle(child.hThread);
    CloseHandle(child.hProcess);
    return code;
}

// The child's cases; each should end the process with exit code 1 before returning.
int fatalCase(const std::string& which) {
    if (which == "no-runtime") {
        tiktal_GVClose(0x7FFFFFFF);
    } else if (which == "no-function") {
        SetGVRTModule(GetModuleHandleA(nullptr));  // this program exports no RTSetCleanupProc
        openTraced();
    } else if (which == "ninth") {
        std::vector<std::unique_ptr<RunTime>> runTimes;
        for (int n = 1; n <= 9; ++n) {  // nine image versions: the ninth finds no entry
            runTimes.push_back(std::make_unique<RunTime>(stamped(n)));
            SetGVRTModule(runTimes.back()->module());
            openTraced();
        }
    }
    return 0;
}

TEST(Graviton, TheCleanupIsRegisteredOnOpenWithdrawnOnCloseAndRunAtShutdown) {
    RunTime runTime(standIn("grrt.dll"));  // found as a loaded run-time library
    const ViSession vi = openTraced();
    EXPECT_EQ(runTime.registered(), 1u);
    ViSession failed = 0;
    EXPECT_EQ(tiktal_GVInit(const_cast<ViRsrc>("NoSuchDevice"), VI_FALSE, VI_FALSE, &failed), tiktalerr_deviceNotFound);
    EXPECT_EQ(runTime.registered(), 1u) << "a failed open registers nothing";
    EXPECT_EQ(tiktal_GVClose(vi), VI_SUCCESS);
    EXPECT_EQ(runTime.registered(), 0u);

    const ViSession first = openTraced();
    ViSession second = 0;
    EXPECT_EQ(tiktal_GVInitAdvanced(const_cast<ViRsrc>(kTrace), 1, 2, VI_FALSE, &second), VI_SUCCESS);
    EXPECT_EQ(runTime.shutdown(), 2);
    EXPECT_EQ(tiktal_PersistConfig(first), tiktalerr_invalidObject);
    EXPECT_EQ(tiktal_PersistConfig(second), tiktalerr_invalidObject);
}

TEST(Graviton, TheRunTimeIsTheThreadsThenTheOneSetThenALoadedLibrary) {
    RunTime perThread(stamped(1)), set(stamped(2)), grrt(standIn("grrt.dll")), grffrt(standIn("grffrt.dll"));
    const DWORD index = TlsAlloc();  // as the environment hands its slot over
    ASSERT_NE(index, TLS_OUT_OF_INDEXES);
    TlsSetValue(index, perThread.module());
    SetGVRTTLSIndex(index);
    SetGVRTModule(set.module());
    const auto registeredIn = [&] {
        return std::vector<std::uint32_t>{perThread.registered(), set.registered(), grrt.registered(), grffrt.registered()};
    };
    openTraced();
    EXPECT_EQ(registeredIn(), (std::vector<std::uint32_t>{1, 0, 0, 0})) << "the thread's slot first";
    std::thread([&] { openTraced(); }).join();
    EXPECT_EQ(registeredIn(), (std::vector<std::uint32_t>{1, 1, 0, 0})) << "another thread's slot is empty";
    SetGVRTTLSIndex(TLS_OUT_OF_INDEXES);
    SetGVRTModule(nullptr);
    openTraced();
    EXPECT_EQ(registeredIn(), (std::vector<std::uint32_t>{1, 1, 1, 0})) << "then grrt.dll";
    grrt.unload();
    openTraced();
    EXPECT_EQ(grffrt.registered(), 1u) << "then grffrt.dll";
    TlsFree(index);
}

TEST(Graviton, EightImageVersionsKeepTheirEntriesAndCopiesOfOneVersionShareOne) {
    std::vector<std::unique_ptr<RunTime>> runTimes;
    for (int n = 1; n <= 8; ++n) {
        runTimes.push_back(std::make_unique<RunTime>(stamped(n)));
        SetGVRTModule(runTimes.back()->module());
        openTraced();
        EXPECT_EQ(runTimes.back()->registered(), 1u) << n;
    }
    // Once one of them is unloaded, its entry serves another version: that of the build's
    // numbered copies, which all share it.
    RunTime copy1(standIn("instances\\grrt_instance1.dll")), copy2(standIn("instances\\grrt_instance2.dll"));
    runTimes[0]->unload();
    for (const RunTime* copy : {&copy1, &copy2, &copy1}) {
        SetGVRTModule(copy->module());
        openTraced();
    }
    EXPECT_EQ(copy1.registered(), 2u);
    EXPECT_EQ(copy2.registered(), 1u);
    SetGVRTModule(runTimes[7]->module());
    openTraced();
    EXPECT_EQ(runTimes[7]->registered(), 2u) << "the others keep theirs";
    SetGVRTModule(nullptr);
    EXPECT_EQ(fatal("ninth"), 1u) << "nine versions loaded at once";
}

TEST(Graviton, WithoutARunTimeOnlyCloseOfNoSessionSucceeds) {
    EXPECT_EQ(tiktal_GVClose(0), VI_SUCCESS) << "nothing to withdraw, no run time needed";
    EXPECT_EQ(fatal("no-runtime"), 1u);
    EXPECT_EQ(fatal("no-function"), 1u);
}

}  // namespace

int main(int argc, char** argv) {
    if (argc == 3 && std::string(argv[1]) == "fatal") return fatalCase(argv[2]) == 0 ? 0 : 2;
    ::testing::InitGoogleTest(&argc, argv);
    return RUN_ALL_TESTS();
}
