// Cost of the export frame: a call through libtiktal.so against the same session operation
// called directly through a shared pointer. Each thread works on its own session.
#include <benchmark/benchmark.h>

#include <fcntl.h>
#include <unistd.h>

#include <memory>

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
}

void ExportGetAttributeViInt32(benchmark::State& state) {
    OpenSession session;
    ViInt32 value;
    for (auto _ : state)
        benchmark::DoNotOptimize(tiktal_GetAttributeViInt32(session.vi, "ptp1", TIKTAL_ATTR_1588_PRIORITY1, &value));
}

void DirectGetAttributeViInt32(benchmark::State& state) {
    const std::shared_ptr<tiktal::Session> session = std::make_shared<tiktal::SessionDebugPrintOnly>();
    ViInt32 value;
    for (auto _ : state) {
        std::shared_ptr<tiktal::Session> held = session;
        held->getAttributeViInt32("ptp1", TIKTAL_ATTR_1588_PRIORITY1, &value);
        benchmark::DoNotOptimize(value);
    }
}

BENCHMARK(ExportSelfTest)->Threads(1)->Threads(2);
BENCHMARK(DirectSelfTest)->Threads(1)->Threads(2);
BENCHMARK(ExportGetAttributeViInt32)->Threads(1)->Threads(2);
BENCHMARK(DirectGetAttributeViInt32)->Threads(1)->Threads(2);

}  // namespace

int main(int argc, char** argv) {
    // The tracing session writes five lines per attribute call; measure the calls, not a terminal.
    const int devNull = open("/dev/null", O_WRONLY);
    dup2(devNull, STDERR_FILENO);
    benchmark::Initialize(&argc, argv);
    benchmark::RunSpecifiedBenchmarks();
    benchmark::Shutdown();
    return 0;
}
