// Opening and closing a timing module by its alias through the C interface, with the device list
// of 10 and of 1,000 modules already cached; and reading a terminal value through the C interface
// against the bare device request on the device interface proxy. The driver stand-in serves the
// module opened; the routing and chassis-query stand-ins are found through the RUNPATH.
#include <benchmark/benchmark.h>
#include <tiktal/tiktal.h>

#include <exception>
#include <map>
#include <memory>
#include <string>

#include "InterfaceProxyTiktal.h"
#include "device_daemon.h"
#include "simulated_machines.h"

namespace {

constexpr int kSizes[] = {10, 1000};
benchsupport::Machines machines(kSizes);
// The driver stand-in of the last module of each machine, started on first use.
std::map<int, std::unique_ptr<DeviceDaemon>> daemons;

// Opens the last module of the machine of `modules` modules; 0 and the benchmark skipped when
// that fails. The first open builds (or rebuilds) the cached list: the 1,000-module machine's
// names are not all in the 10-module list, so it runs second.
ViSession openLast(benchmark::State& state, int modules) {
    try {
        const std::string root = machines.use(modules);
        if (!daemons[modules]) daemons[modules] = std::make_unique<DeviceDaemon>(root + "/dev/tiktal" + std::to_string(modules - 1));
    } catch (const std::exception& failure) {
        state.SkipWithError(failure.what());
        return 0;
    }
    ViSession vi = 0;
    std::string alias = benchsupport::lastAlias(modules);
    if (tiktal_init(alias.data(), VI_FALSE, VI_FALSE, &vi) != VI_SUCCESS) state.SkipWithError(("cannot open " + alias).c_str());
    return vi;
}

void InitCloseByAlias(benchmark::State& state) {
    const int modules = static_cast<int>(state.range(0));
    tiktal_close(openLast(state, modules));
    std::string alias = benchsupport::lastAlias(modules);
    for (auto _ : state) {
        ViSession vi = 0;
        if (tiktal_init(alias.data(), VI_FALSE, VI_FALSE, &vi) != VI_SUCCESS) state.SkipWithError("init failed");
        tiktal_close(vi);
    }
}

void ReadTerminalValueThroughTheSession(benchmark::State& state) {
    const ViSession vi = openLast(state, 1000);
    ViReal64 value = 0;
    for (auto _ : state) benchmark::DoNotOptimize(tiktal_GetAttributeViReal64(vi, "", 1150100, &value));
    tiktal_close(vi);
}

void ReadTerminalValueThroughTheProxy(benchmark::State& state) {
    tiktalq300::tInterfaceProxy_tiktal proxy;
    nZRAPALS100::tStatus status;
    proxy.open(daemons.at(1000)->path(), status);
    for (auto _ : state) benchmark::DoNotOptimize(proxy.readTerminalValue(58, status));
    if (status.code != 0) state.SkipWithError("the proxy failed");
}

BENCHMARK(InitCloseByAlias)->Arg(10)->Arg(1000)->Unit(benchmark::kMicrosecond);
BENCHMARK(ReadTerminalValueThroughTheSession)->Unit(benchmark::kMicrosecond);
BENCHMARK(ReadTerminalValueThroughTheProxy)->Unit(benchmark::kMicrosecond);

}  // namespace

BENCHMARK_MAIN();
