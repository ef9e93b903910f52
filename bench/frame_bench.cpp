// Cost of the export frame: a call through libtiktal.so against the same session operation
// called directly through a shared pointer, with 1, 2 and 4 threads, each on its own session.
// Times are wall-clock time per call of all threads together, and items_per_second is the total
// throughput: divide it by the figure of threads:1 for how the calls scale with threads.
#include <benchmark/benchmark.h>

#include <fcntl.h>
#include <unistd.h>

#include <memory>
#include <thread>

#include "sessions/session.h"

namespace {

// An open tracing session for the running thread, closed when the benchmark ends.
struct OpenSession {
    OpenSession() { tiktal_init("SyncTestInternal___", VI_FALSE, VI_FALSE, &vi); }
    ~OpenSession() { tiktal_close(vi); }
    ViSession vi = 0;
};

void ExportSelfTest(benchmark::State& state) {
    OpenSession session;
    ViInt16 result;
    ViChar message[256];
    for (auto _ : state) benchmark::DoNotOptimize(tiktal_self_test(session.vi, &result, message));
    state.SetItemsProcessed(state.iterations());
}

void DirectSelfTest(benchmark::State& state) {
    const std::shared_ptr<tiktal::Session> session = std::make_shared<tiktal::SessionDebugPrintOnly>();
    ViInt16 result;
    ViChar message[256];
    for (auto _ : state) {
        std::shared_ptr<tiktal::Session> held = session;  // what the frame holds during a call
        held->selfTest(&result, message);
        benchmark::DoNotOptimize(message);
    }
    state.SetItemsProcessed(state.iterations());
}

void ExportGetAttributeViInt32(benchmark::State& state) {
    OpenSession session;
    ViInt32 value;
    for (auto _ : state)
        benchmark::DoNotOptimize(tiktal_GetAttributeViInt32(session.vi, "ptp1", TIKTAL_ATTR_1588_PRIORITY1, &value));
    state.SetItemsProcessed(state.iterations());
}

void DirectGetAttributeViInt32(benchmark::State& state) {
    const std::shared_ptr<tiktal::Session> session = std::make_shared<tiktal::SessionDebugPrintOnly>();
    ViInt32 value;
    for (auto _ : state) {
        std::shared_ptr<tiktal::Session> held = session;
        held->getAttributeViInt32("ptp1", TIKTAL_ATTR_1588_PRIORITY1, &value);
        benchmark::DoNotOptimize(value);
    }
    state.SetItemsProcessed(state.iterations());
}

// The throughput of all threads together, against the wall clock.
void calls(benchmark::internal::Benchmark* benchmark) {
    benchmark->Threads(1)->Threads(2)->Threads(4)->UseRealTime();
}

BENCHMARK(ExportSelfTest)->Apply(calls);
BENCHMARK(DirectSelfTest)->Apply(calls);
BENCHMARK(ExportGetAttributeViInt32)->Apply(calls);
BENCHMARK(DirectGetAttributeViInt32)->Apply(calls);

}  // namespace

int main(int argc, char** argv) {
    // The tracing session writes five lines per attribute call; measure the calls, not a terminal.
    const int devNull = open("/dev/null", O_WRONLY);
    dup2(devNull, STDERR_FILENO);
    // Shared pointers count with plain instructions until a process starts its second thread, and
    // with atomic ones from then on. Start one, so that the threads:1 rows count as the library
    // does in a multi-threaded application, like those of more threads.
    std::thread([] {}).join();
    benchmark::Initialize(&argc, argv);
    benchmark::RunSpecifiedBenchmarks();
    benchmark::Shutdown();
    return 0;
}
