// Building the list of local devices on simulated machines of 10, 100 and 1,000 timing modules in
// PXI chassis: from no configuration file (enumeration, merge, save), and again with the file
// already holding the result, which is then not written; and 1,000 and 10,000 new simulated devices
// that get numbered aliases. The machines are laid out by the
// project's command in a temporary folder, removed at the end.
#include <benchmark/benchmark.h>
#include <stdlib.h>
#include <sys/stat.h>

#include <cjson/cJSON.h>

#include <chrono>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <exception>
#include <filesystem>
#include <fstream>
#include <stdexcept>
#include <string>
#include <thread>
#include <utility>

#include "config/device_list.h"
#include "config/lockable_file.h"
#include "simulated_machines.h"

namespace {

namespace fs = std::filesystem;

constexpr int kSizes[] = {10, 100, 1000};
benchsupport::Machines machines(kSizes);

bool hasPxiAlias(const zrjsonconfig::DeviceEntry& device) {
    const cJSON* alias = cJSON_GetObjectItem(device.configured(), "alias");
    return cJSON_IsString(alias) && std::strncmp(alias->valuestring, "PXI", 3) == 0;
}

// Every module is in the list with the alias of its chassis and slot, so the chassis query library
// was loaded and asked for each of them.
void checkList(benchmark::State& state, const zrjsonconfig::ConfigurationData& list) {
    std::size_t located = 0;
    for (const auto& entry : list.entries()) located += hasPxiAlias(*entry.second);
    if (list.entries().size() != static_cast<std::size_t>(state.range(0)) || located != list.entries().size())
        state.SkipWithError("the list does not hold every module with its PXI alias");
}

// The file is written by replacing it, so a write gives it another inode.
std::pair<ino_t, std::int64_t> identityOf(const std::string& path) {
    struct stat status {};
    if (::stat(path.c_str(), &status) != 0) return {};
    return {status.st_ino, std::int64_t{status.st_mtim.tv_sec} * 1000000000 + status.st_mtim.tv_nsec};
}

// Runs `body`; a failure ends the benchmark with its text instead of the program.
template <class Body>
void guarded(benchmark::State& state, Body&& body) {
    try {
        machines.use(static_cast<int>(state.range(0)));
        body();
    } catch (const std::exception& failure) {
        state.SkipWithError(failure.what());
    }
    state.SetComplexityN(state.range(0));
}

void DeviceListFromScratch(benchmark::State& state) {
    guarded(state, [&] {
        const std::string file = zrjsonconfig::configFilePath();
        zrjsonconfig::ConfigurationData list;
        for (auto _ : state) {
            state.PauseTiming();
            fs::remove(file);
            state.ResumeTiming();
            list = tiktalsae::loadDeviceList();
        }
        checkList(state, list);
    });
}

void DeviceListUnchanged(benchmark::State& state) {
    guarded(state, [&] {
        const std::string file = zrjsonconfig::configFilePath();
        fs::remove(file);
        tiktalsae::loadDeviceList();
        const auto written = identityOf(file);
        zrjsonconfig::ConfigurationData list;
        for (auto _ : state) list = tiktalsae::loadDeviceList();
        checkList(state, list);
        if (identityOf(file) != written) state.SkipWithError("the unchanged list was written again");
    });
}

// New simulated devices at a PCI address in no chassis, which get numbered aliases (Sync1, Sync2,
// ...) one after the other; no module, and no configuration file before each build.
void NumberedAliasesFromScratch(benchmark::State& state) {
    const int devices = static_cast<int>(state.range(0));
    const std::string root = machines.base() + "/numbered-" + std::to_string(devices);
    const std::string data = root + "/var/lib/Korvane/tiktal";
    fs::create_directories(data);
    for (int n = 0; n < devices; ++n)
        std::ofstream(data + "/d" + std::to_string(n) + ".fake")
            << R"({"serialNumber":"5eed","pciDeviceID":29701,"pciSubsystemID":1,"pciRevision":2,"pciBusNumber":255,)"
               R"("pciDeviceNumber":0,"pciFunctionNumber":0,"pcieLinkWidth":4,"pcieMaxLinkWidth":4,)"
               R"("pcieTransferRate":2,"pcieMaxTransferRate":2})";
    ::setenv("TIKTAL_SYSROOT", root.c_str(), 1);
    zrjsonconfig::ConfigurationData list;
    try {
        for (auto _ : state) {
            state.PauseTiming();
            fs::remove(data + "/tiktal.config");
            state.ResumeTiming();
            list = tiktalsae::loadDeviceList();
        }
    } catch (const std::exception& failure) {
        state.SkipWithError(failure.what());
    }
    if (!list.aliasesInUse().contains("Sync" + std::to_string(devices))) state.SkipWithError("not numbered 1 to N");
    state.SetComplexityN(devices);
}

void sizes(benchmark::internal::Benchmark* bench) {
    for (const int modules : kSizes) bench->Arg(modules);
    bench->Unit(benchmark::kMillisecond)->UseRealTime()->Complexity();
}

BENCHMARK(DeviceListFromScratch)->Apply(sizes);
BENCHMARK(DeviceListUnchanged)->Apply(sizes);
BENCHMARK(NumberedAliasesFromScratch)->Arg(1000)->Arg(10000)->Unit(benchmark::kMillisecond)->UseRealTime()->Complexity();

}  // namespace

BENCHMARK_MAIN();
