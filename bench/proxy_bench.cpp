// readTerminalValue through the device interface proxy, against a bare send and receive of the
// same request message on a socket to the same device daemon.
#include <benchmark/benchmark.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <cstring>
#include <memory>

#include "InterfaceProxyTiktal.h"
#include "device_daemon.h"

namespace {

std::unique_ptr<DeviceDaemon> gDaemon;

void ProxyReadTerminalValue(benchmark::State& state) {
    tiktalq300::tInterfaceProxy_tiktal proxy;
    nZRAPALS100::tStatus status;
    proxy.open(gDaemon->path(), status);
    for (auto _ : state) benchmark::DoNotOptimize(proxy.readTerminalValue(58, status));
    if (status.code != 0) state.SkipWithError("the proxy failed");
}

void BareSocketReadTerminalValue(benchmark::State& state) {
    const int socket = ::socket(AF_UNIX, SOCK_SEQPACKET, 0);
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    std::strncpy(address.sun_path, gDaemon->path().c_str(), sizeof address.sun_path - 1);
    if (::connect(socket, reinterpret_cast<sockaddr*>(&address), sizeof address) != 0) {
        state.SkipWithError("cannot connect");
        return;
    }
    // Code 0x80012008, output room 8, terminal 58, status 0.
    const std::uint8_t request[] = {0x08, 0x20, 0x01, 0x80, 8, 0, 0, 0, 58, 0, 0, 0, 0, 0, 0, 0};
    std::uint8_t answer[16];
    for (auto _ : state) {
        ::send(socket, request, sizeof request, MSG_NOSIGNAL);
        benchmark::DoNotOptimize(::recv(socket, answer, sizeof answer, 0));
    }
    ::close(socket);
}

BENCHMARK(ProxyReadTerminalValue)->UseRealTime();
BENCHMARK(BareSocketReadTerminalValue)->UseRealTime();

}  // namespace

int main(int argc, char** argv) {
    gDaemon = std::make_unique<DeviceDaemon>();
    benchmark::Initialize(&argc, argv);
    benchmark::RunSpecifiedBenchmarks();
    benchmark::Shutdown();
    gDaemon.reset();
    return 0;
}
