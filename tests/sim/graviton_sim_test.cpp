// The Graviton run-time stand-ins, each copy loaded by path with dlopen and every call made
// through dlsym, as the driver reaches the run time of its process.
#include "graviton_rt.h"

#include <dlfcn.h>
#include <gtest/gtest.h>
#include <pthread.h>

#include <algorithm>
#include <cinttypes>
#include <cstdio>
#include <memory>
#include <mutex>
#include <set>
#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

namespace {

const std::string kFolder = GRAVITON_DIR;

// One loaded copy of the run time; dlclose when it goes.
class RunTime {
public:
    explicit RunTime(const std::string& path) : handle_(dlopen(path.c_str(), RTLD_NOW | RTLD_LOCAL)) {
        if (!handle_) ADD_FAILURE() << dlerror();
    }
    ~RunTime() { close(); }
    RunTime(const RunTime&) = delete;
    RunTime& operator=(const RunTime&) = delete;

    void close() {
        if (handle_) dlclose(handle_);
        handle_ = nullptr;
    }
    void* handle() const { return handle_; }

    std::int32_t set(RTCleanupProc procedure, void* argument, std::int32_t mode) const {
        return entry<decltype(&RTSetCleanupProc)>("RTSetCleanupProc")(procedure, argument, mode);
    }
    std::uint32_t registered() const { return entry<decltype(&grrt_sim_registered)>("grrt_sim_registered")(); }
    std::string log() const {
        std::unique_ptr<char, decltype(&grrt_sim_free)> text(entry<decltype(&grrt_sim_log)>("grrt_sim_log")(),
                                                             entry<decltype(&grrt_sim_free)>("grrt_sim_free"));
        return text ? text.get() : "(null)";
    }
    std::int32_t shutdown() const { return entry<decltype(&grrt_sim_shutdown)>("grrt_sim_shutdown")(); }
    std::uint32_t tlsIndex() const { return entry<decltype(&grrt_sim_tlsIndex)>("grrt_sim_tlsIndex")(); }
    void setThreadModule(void* module) const {
        entry<decltype(&grrt_sim_setThreadModule)>("grrt_sim_setThreadModule")(module);
    }
    void reset() const { entry<decltype(&grrt_sim_reset)>("grrt_sim_reset")(); }

    template <class F>
    F entry(const char* name) const {
        void* address = handle_ ? dlsym(handle_, name) : nullptr;
        if (!address) throw std::runtime_error(std::string("no entry ") + name);
        return reinterpret_cast<F>(address);
    }

private:
    void* handle_;
};

bool isLoaded(const std::string& name) {
    void* handle = dlopen(name.c_str(), RTLD_NOW | RTLD_NOLOAD);
    if (handle) dlclose(handle);
    return handle != nullptr;
}

std::string line(int mode, RTCleanupProc procedure, std::uintptr_t argument) {
    char text[96];
    std::snprintf(text, sizeof text, "mode=%d procedure=0x%" PRIxPTR " argument=0x%" PRIxPTR "\n", mode,
                  reinterpret_cast<std::uintptr_t>(procedure), argument);
    return text;
}

void* arg(std::uintptr_t value) { return reinterpret_cast<void*>(value); }

// What the clean-ups saw: the argument and the thread of each run.
std::mutex gRunsLock;
std::vector<std::pair<void*, std::thread::id>> gRuns;
const RunTime* gWithdrawingRunTime = nullptr;

std::int32_t recordRun(void* argument) {
    std::lock_guard<std::mutex> hold(gRunsLock);
    gRuns.emplace_back(argument, std::this_thread::get_id());
    return 0;
}

std::int32_t otherProcedure(void*) { return 0; }

// A clean-up that withdraws its own registration, as a run time's user may.
std::int32_t withdrawItself(void* argument) {
    recordRun(argument);
    return gWithdrawingRunTime->set(withdrawItself, argument, 0);
}

TEST(GravitonRunTime, RegistersWithdrawsAndLogsEveryCall) {
    RunTime rt(kFolder + "/libgrrt.so");
    ASSERT_NE(rt.handle(), nullptr);
    rt.reset();
    EXPECT_EQ(rt.registered(), 0u);
    EXPECT_EQ(rt.log(), "");

    EXPECT_EQ(rt.set(recordRun, arg(1), 2), 0);
    EXPECT_EQ(rt.set(recordRun, arg(2), 2), 0);
    EXPECT_EQ(rt.set(recordRun, arg(2), 2), 0);  // twice: two registrations
    EXPECT_EQ(rt.registered(), 3u);
    EXPECT_EQ(rt.set(recordRun, arg(1), 1), 0);       // other modes change nothing
    EXPECT_EQ(rt.set(recordRun, arg(1), -1), 0);
    EXPECT_EQ(rt.set(nullptr, arg(3), 2), 0);         // a null procedure is not registered
    EXPECT_EQ(rt.set(otherProcedure, arg(1), 0), 0);  // not that pair: nothing withdrawn
    EXPECT_EQ(rt.registered(), 3u);
    EXPECT_EQ(rt.set(recordRun, arg(2), 0), 0);
    EXPECT_EQ(rt.set(recordRun, arg(1), 0), 0);
    EXPECT_EQ(rt.set(recordRun, arg(1), 0), 0);  // already withdrawn
    EXPECT_EQ(rt.registered(), 1u);

    EXPECT_EQ(rt.log(), line(2, recordRun, 1) + line(2, recordRun, 2) + line(2, recordRun, 2) +
                            line(1, recordRun, 1) + line(-1, recordRun, 1) + "mode=2 procedure=0x0 argument=0x3\n" +
                            line(0, otherProcedure, 1) + line(0, recordRun, 2) + line(0, recordRun, 1) +
                            line(0, recordRun, 1));
    rt.reset();
    EXPECT_EQ(rt.registered(), 0u);
    EXPECT_EQ(rt.log(), "");
    EXPECT_EQ(rt.shutdown(), 0) << "a reset runs nothing later";
}

TEST(GravitonRunTime, ExportsTheRunTimeFunctionAndTheTestEntriesOnly) {
    const std::string command = std::string(GRAVITON_NM) + " -D --defined-only --format=posix " + kFolder +
                                "/instances/libgrrt_instance1.so";
    FILE* pipe = popen(command.c_str(), "r");
    ASSERT_NE(pipe, nullptr);
    std::set<std::string> exported;
    char name[512];
    char type;
    while (std::fscanf(pipe, "%511s %c %*[^\n]", name, &type) == 2)
        if (type == 'T' || type == 'W' || type == 'D' || type == 'B') exported.insert(name);
    EXPECT_EQ(pclose(pipe), 0);
    EXPECT_EQ(exported, (std::set<std::string>{"RTSetCleanupProc", "grrt_sim_registered", "grrt_sim_log",
                                               "grrt_sim_free", "grrt_sim_shutdown", "grrt_sim_tlsIndex",
                                               "grrt_sim_setThreadModule", "grrt_sim_reset"}));
}

TEST(GravitonRunTime, ShutdownRunsEachCleanupOnceOnItsOwnThread) {
    RunTime rt(kFolder + "/libgrrt.so");
    ASSERT_NE(rt.handle(), nullptr);
    rt.reset();
    gRuns.clear();
    gWithdrawingRunTime = &rt;
    int a = 0, b = 0, c = 0, d = 0;
    rt.set(recordRun, &a, 2);
    rt.set(recordRun, &b, 2);
    rt.set(withdrawItself, &c, 2);
    rt.set(recordRun, &d, 2);
    rt.set(recordRun, &b, 0);

    EXPECT_EQ(rt.shutdown(), 3);
    ASSERT_EQ(gRuns.size(), 3u);
    EXPECT_EQ(gRuns[0].first, &a);
    EXPECT_EQ(gRuns[1].first, &c);
    EXPECT_EQ(gRuns[2].first, &d);
    for (const auto& run : gRuns) EXPECT_NE(run.second, std::this_thread::get_id());
    EXPECT_EQ(rt.registered(), 0u);
    EXPECT_NE(rt.log().find(line(0, withdrawItself, reinterpret_cast<std::uintptr_t>(&c))), std::string::npos)
        << "the clean-up's own call reached the run time";

    gRuns.clear();
    EXPECT_EQ(rt.shutdown(), 0);
    EXPECT_TRUE(gRuns.empty());
    rt.set(recordRun, &a, 2);  // registering after a shutdown works again
    EXPECT_EQ(rt.shutdown(), 1);
    EXPECT_EQ(gRuns.size(), 1u);
}

TEST(GravitonRunTime, TwoRunTimesKeepSeparateStateAndAreFoundByBareName) {
    EXPECT_FALSE(isLoaded("libgrrt.so"));
    EXPECT_FALSE(isLoaded("libgrffrt.so"));
    RunTime grrt(kFolder + "/libgrrt.so"), grffrt(kFolder + "/libgrffrt.so");
    ASSERT_NE(grrt.handle(), nullptr);
    ASSERT_NE(grffrt.handle(), nullptr);
    EXPECT_NE(grrt.handle(), grffrt.handle());
    EXPECT_TRUE(isLoaded("libgrrt.so"));  // by its SONAME, as the driver looks for it
    EXPECT_TRUE(isLoaded("libgrffrt.so"));
    EXPECT_NE(grrt.entry<void*>("RTSetCleanupProc"), grffrt.entry<void*>("RTSetCleanupProc"));

    grrt.reset();
    grffrt.reset();
    grrt.set(recordRun, arg(7), 2);
    EXPECT_EQ(grrt.registered(), 1u);
    EXPECT_EQ(grffrt.registered(), 0u);
    EXPECT_EQ(grffrt.log(), "");
    gRuns.clear();
    EXPECT_EQ(grffrt.shutdown(), 0);
    EXPECT_EQ(grrt.shutdown(), 1);
    EXPECT_NE(grrt.tlsIndex(), grffrt.tlsIndex()) << "each run time has a thread key of its own";
}

TEST(GravitonRunTime, ThreadKeyCarriesEachThreadsModule) {
    RunTime rt(kFolder + "/libgrrt.so");
    ASSERT_NE(rt.handle(), nullptr);
    const std::uint32_t index = rt.tlsIndex();
    ASSERT_NE(index, 0xFFFFFFFFu);
    EXPECT_EQ(rt.tlsIndex(), index) << "created once";
    const pthread_key_t key = static_cast<pthread_key_t>(index);

    int mine = 0, theirs = 0;
    EXPECT_EQ(pthread_getspecific(key), nullptr);
    rt.setThreadModule(&mine);
    void* seenThere = &mine;
    void* unsetThere = &mine;
    std::thread([&] {
        unsetThere = pthread_getspecific(key);
        rt.setThreadModule(&theirs);
        seenThere = pthread_getspecific(key);
    }).join();
    EXPECT_EQ(unsetThere, nullptr);
    EXPECT_EQ(seenThere, &theirs);
    EXPECT_EQ(pthread_getspecific(key), &mine);
    rt.setThreadModule(nullptr);
    EXPECT_EQ(pthread_getspecific(key), nullptr);
}

TEST(GravitonRunTime, NineCopiesLoadAtOnceAndEachUnloadsAtItsLastClose) {
    std::vector<std::unique_ptr<RunTime>> copies;
    std::set<void*> handles;
    for (int n = 1; n <= 9; ++n) {
        copies.push_back(std::make_unique<RunTime>(kFolder + "/instances/libgrrt_instance" + std::to_string(n) + ".so"));
        ASSERT_NE(copies.back()->handle(), nullptr);
        handles.insert(copies.back()->handle());
        copies.back()->reset();
        for (int i = 0; i < n; ++i) copies.back()->set(recordRun, arg(i), 2);
    }
    EXPECT_EQ(handles.size(), 9u);
    for (int n = 1; n <= 9; ++n) EXPECT_EQ(copies[n - 1]->registered(), static_cast<std::uint32_t>(n)) << n;

    const std::string path = kFolder + "/instances/libgrrt_instance3.so";
    RunTime again(path);  // a second reference to the same copy
    EXPECT_EQ(again.handle(), copies[2]->handle());
    copies[2]->close();
    EXPECT_TRUE(isLoaded(path)) << "one reference left";
    EXPECT_EQ(again.registered(), 3u);
    again.close();
    EXPECT_FALSE(isLoaded(path)) << "the last dlclose unloads it";
    EXPECT_FALSE(isLoaded("libgrrt_instance3.so"));
    EXPECT_TRUE(isLoaded("libgrrt_instance4.so"));

    RunTime reloaded(path);
    EXPECT_EQ(reloaded.registered(), 0u) << "a fresh state after reloading";
    EXPECT_EQ(reloaded.log(), "");
    copies.clear();
    EXPECT_FALSE(isLoaded("libgrrt_instance9.so"));
}

TEST(GravitonRunTime, ConcurrentRegistrationsAndWithdrawals) {
    RunTime rt(kFolder + "/libgrrt.so");
    ASSERT_NE(rt.handle(), nullptr);
    rt.reset();
    constexpr int kThreads = 8, kRounds = 200;
    std::vector<std::thread> threads;
    for (int t = 0; t < kThreads; ++t)
        threads.emplace_back([&rt, t] {
            for (int round = 0; round < kRounds; ++round) {
                void* argument = arg(t * kRounds + round + 1);
                rt.set(recordRun, argument, 2);
                if (round % 2) rt.set(recordRun, argument, 0);
                if (round % 50 == 0) {
                    rt.registered();
                    rt.log();
                }
            }
        });
    for (std::thread& thread : threads) thread.join();

    EXPECT_EQ(rt.registered(), static_cast<std::uint32_t>(kThreads * kRounds / 2));
    const std::string log = rt.log();
    EXPECT_EQ(std::count(log.begin(), log.end(), '\n'), kThreads * kRounds * 3 / 2);
    gRuns.clear();
    EXPECT_EQ(rt.shutdown(), kThreads * kRounds / 2);
    std::set<void*> ran;
    for (const auto& run : gRuns) ran.insert(run.first);
    EXPECT_EQ(ran.size(), gRuns.size()) << "each clean-up ran once";
    EXPECT_EQ(ran.count(arg(1)), 1u);
    EXPECT_EQ(ran.count(arg(2)), 0u) << "withdrawn";
}

}  // namespace
