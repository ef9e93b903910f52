// Many threads routing at once, on routing objects of their own and on one shared object: the
// library adds no lock, and afterwards the service holds exactly the routes the threads left.
// Also runs under ThreadSanitizer (ctest -L concurrency).
#include <thread>

#include "routing_support.h"

namespace {

using namespace routing_test;
using Calls = std::vector<std::string>;

constexpr int kThreads = 4;
constexpr int kRounds = 50;

TEST(RoutingConcurrently, EveryRouteIsAccountedFor) {
    const Service service;
    tiktal::Routing shared("Shared", tiktal::loadRoutingLibrary());
    std::vector<std::thread> threads;
    for (int t = 0; t < kThreads; ++t) {
        threads.emplace_back([t, &shared] {
            tiktal::Routing own("Dev" + std::to_string(t), tiktal::loadRoutingLibrary());
            const std::string source = "PFI" + std::to_string(t);
            const std::string first = "PXI_Trig" + std::to_string(2 * t), second = "PXI_Trig" + std::to_string(2 * t + 1);
            for (int round = 0; round < kRounds; ++round) {
                for (tiktal::Routing* routing : {&own, &shared}) {
                    routing->connectTrigTerminals(source.c_str(), first.c_str(), nullptr, round % 2, 0);
                    routing->connectTrigTerminals(source.c_str(), second.c_str(), nullptr, 0, 0);
                    routing->disconnectTrigTerminals(source.c_str(), first.c_str());
                }
            }
            own.connectClkTerminals("ClkIn", "PXI_Clk10");
            // The routes of a routing object's own device outlive it: the service holds them.
            EXPECT_EQ(own.alias(), "Dev" + std::to_string(t));
        });
    }
    for (std::thread& thread : threads) thread.join();

    Calls expectedShared;
    for (int t = 0; t < kThreads; ++t) {
        const std::string device = "Dev" + std::to_string(t);
        expectedShared.push_back("/Shared/PFI" + std::to_string(t) + "->/Shared/PXI_Trig" + std::to_string(2 * t + 1));
        EXPECT_EQ(service.routes(device.c_str()), Calls{}) << "ended with the object's immediate session";
    }
    std::sort(expectedShared.begin(), expectedShared.end());
    EXPECT_EQ(service.routes("Shared"), expectedShared);
}

}  // namespace
