// Several threads issuing requests on one proxy and on proxies of their own at once: every answer
// belongs to its own request. Also runs under ThreadSanitizer (ctest -L concurrency).
#include <gtest/gtest.h>

#include <thread>

#include "InterfaceProxyTiktal.h"
#include "device_daemon.h"

namespace {

using nZRAPALS100::tStatus;

TEST(ProxyConcurrently, EveryAnswerMatchesItsRequest) {
    DeviceDaemon daemon;
    tiktalq300::tInterfaceProxy_tiktal shared;
    tStatus opened;
    shared.open(daemon.path(), opened);
    ASSERT_EQ(opened.code, 0);
    const std::uint32_t terminals[] = {58, 65, 72, 79, 86, 93};  // one per thread: only it writes there
    std::vector<std::thread> threads;
    for (std::size_t t = 0; t < std::size(terminals); ++t) {
        threads.emplace_back([&, t] {
            tiktalq300::tInterfaceProxy_tiktal own;
            tStatus status;
            own.open(daemon.path(), status);
            for (std::uint32_t round = 1; round <= 200; ++round) {
                auto& proxy = round % 2 ? own : shared;
                const std::uint32_t value = static_cast<std::uint32_t>(t) << 16 | round;
                proxy.writeTerminalValue(terminals[t], value, status);
                EXPECT_EQ(proxy.readTerminalValue(terminals[t], status), value);
            }
            EXPECT_EQ(status.code, 0);
        });
    }
    for (std::thread& thread : threads) thread.join();
    const auto values = daemon.terminalValues();
    for (std::size_t t = 0; t < std::size(terminals); ++t)
        EXPECT_EQ(values.at(terminals[t]), static_cast<std::uint32_t>(t) << 16 | 200u);
}

}  // namespace
