// The timing module's routing operations against the routing service stand-in, loaded from its
// own shared library by bare name as the timing-module session loads it.
#include <algorithm>

#include "routing_support.h"

namespace {

using namespace routing_test;
using Calls = std::vector<std::string>;

class Routing : public ::testing::Test {
protected:
    void SetUp() override {
        routing = std::make_unique<tiktal::Routing>("Dev1", tiktal::loadRoutingLibrary());
        service = std::make_unique<Service>();
        start = service->calls().size();
    }
    void TearDown() override {
        routing.reset();
        service->reset();
    }
    // The calls that reached the service since the test began.
    Calls sent() const { return service->callNames(start); }

    std::unique_ptr<tiktal::Routing> routing;
    std::unique_ptr<Service> service;
    std::size_t start = 0;
};

const Calls kConnectTrigger = {"RouteAttributes_new", "RouteAttributes_setLifetime", "RouteAttributes_getConstraints",
                               "RouteConstraints_setBoolConstraint", "calculateRoute", "RouteAttributes_destroy"};
const Calls kConnectClock = {"RouteAttributes_new", "RouteAttributes_setLifetime", "calculateRoute",
                             "RouteAttributes_destroy"};

TEST_F(Routing, LocalChecksComeInTheirOrderAndSendNothing) {
    const auto trig = [&](const char* source, const char* destination, const char* syncClock = nullptr) {
        return reported([&] { routing->connectTrigTerminals(source, destination, syncClock, 0, 0); }).first;
    };
    // Equal qualified names first, then the filter, then the synchronization clock.
    EXPECT_EQ(trig("PFI0", "/Dev1/PFI0"), tiktalerr_invParameter);
    EXPECT_EQ(trig("DDS", "DDS", "SyncClkFullSpeed"), tiktalerr_invParameter);
    EXPECT_EQ(trig("PXIe_Clk100", "PXI_Trig0", "SyncClkFullSpeed"), tiktalerr_featureNotSupported);
    EXPECT_EQ(trig("PFI0", "PXIE_DSTARA3"), tiktalerr_featureNotSupported);
    EXPECT_EQ(trig("PFI_LVDS0", "ClkOut"), tiktalerr_featureNotSupported);
    EXPECT_EQ(trig("/Dev1/PFI_LVDS0", "/Dev1/ClkOut"), tiktalerr_featureNotSupported);  // the filter strips
    EXPECT_EQ(trig("PFI0", "PXI_Trig0", "SyncClkFullSpeed"), tiktalerr_syncClkInvalid);
    EXPECT_EQ(trig(nullptr, "PXI_Trig0"), tiktalerr_invParameter);
    EXPECT_EQ(trig("PFI0", nullptr), tiktalerr_invParameter);
    const auto clk = [&](const char* source, const char* destination) {
        return reported([&] { routing->connectClkTerminals(source, destination); }).first;
    };
    EXPECT_EQ(clk("PXI_Clk10_In", "pxi_clk10"), tiktalerr_invParameter);  // both become PXI_Clk10_In
    EXPECT_EQ(clk("PXIe_Clk100", "ClkOut"), tiktalerr_featureNotSupported);
    EXPECT_EQ(clk(nullptr, "ClkOut"), tiktalerr_invParameter);
    EXPECT_EQ(reported([&] { routing->disconnectTrigTerminals(nullptr, "PXI_Trig0"); }).first, tiktalerr_invParameter);
    EXPECT_EQ(reported([&] { routing->disconnectClkTerminals("ClkIn", nullptr); }).first, tiktalerr_invParameter);
    EXPECT_EQ(sent(), Calls{});

    // Synchronization clocks that pass, and an update edge that changes nothing.
    for (const char* syncClock : {static_cast<const char*>(nullptr), "", "SyncClkAsync", "SYNCCLKASYNC"}) {
        EXPECT_EQ(trig("PFI0", "PXI_Trig0", syncClock), VI_SUCCESS) << (syncClock ? syncClock : "null");
        EXPECT_EQ(service->routes("Dev1"), Calls{"/Dev1/PFI0->/Dev1/PXI_Trig0"});
        routing->disconnectTrigTerminals("PFI0", "PXI_Trig0");
    }
    routing->connectTrigTerminals("PFI1", "PXI_Trig1", nullptr, 1, 12345);
    EXPECT_EQ(service->routes("Dev1"), Calls{"!/Dev1/PFI1->/Dev1/PXI_Trig1"});
}

TEST_F(Routing, ConnectSendsItsCallsInOrderAndAlwaysDestroysTheAttributes) {
    routing->connectTrigTerminals("PFI0", "PXI_Trig0", "", 0, 0);
    EXPECT_EQ(sent(), kConnectTrigger);
    const Calls all = service->calls();
    EXPECT_NE(all[start + 1].find("\"lifetime\":1"), std::string::npos) << all[start + 1];
    EXPECT_NE(all[start + 3].find("\"inversionNeeded\""), std::string::npos) << all[start + 3];
    EXPECT_NE(all[start + 3].find("\"value\":0"), std::string::npos) << all[start + 3];
    EXPECT_NE(all[start + 4].find("\"/Dev1/PFI0\""), std::string::npos) << all[start + 4];

    // The service refuses: the attributes still go, and the caller gets the normalized status.
    start = service->calls().size();
    const auto [status, message] = reported([&] { routing->connectTrigTerminals("NoSuchTerminal", "PXI_Trig1", nullptr, 0, 0); });
    EXPECT_EQ(status, static_cast<ViStatus>(0xBFFA4032));  // -89120, an invalid source
    EXPECT_FALSE(message.empty());
    EXPECT_EQ(sent(), kConnectTrigger);
    start = service->calls().size();
    EXPECT_EQ(reported([&] { routing->connectClkTerminals("PFI1", "PXI_Trig0"); }).first,
              static_cast<ViStatus>(0xBFFF0042));  // -89123: PXI_Trig0 is driven already
    EXPECT_EQ(sent(), kConnectClock);
    EXPECT_EQ(service->routes("Dev1"), Calls{"/Dev1/PFI0->/Dev1/PXI_Trig0"});
}

TEST_F(Routing, ClockRoutesMapPxiClk10ToItsInput) {
    routing->connectClkTerminals("ClkIn", "pxi_clk10");
    routing->connectClkTerminals("PXI_Clk10", "ClkOut");
    EXPECT_EQ(service->routes("Dev1"), (Calls{"/Dev1/ClkIn->/Dev1/PXI_Clk10_In", "/Dev1/PXI_Clk10->/Dev1/ClkOut"}));
    routing->disconnectClkTerminals("ClkIn", "PXI_CLK10");
    EXPECT_EQ(service->routes("Dev1"), Calls{"/Dev1/PXI_Clk10->/Dev1/ClkOut"});
    // The trigger operations know no such mapping: this names a route that does not exist.
    routing->connectClkTerminals("ClkIn", "PXI_Clk10");
    EXPECT_LT(reported([&] { routing->disconnectTrigTerminals("ClkIn", "PXI_Clk10"); }).first, 0);
    EXPECT_EQ(service->routes("Dev1"), (Calls{"/Dev1/ClkIn->/Dev1/PXI_Clk10_In", "/Dev1/PXI_Clk10->/Dev1/ClkOut"}));
}

TEST_F(Routing, AllConnectedRemovesRoutesInBulk) {
    const auto connectAll = [&] {
        routing->connectTrigTerminals("PFI0", "PXI_Trig0", nullptr, 0, 0);
        routing->connectTrigTerminals("PFI0", "PXI_Trig1", nullptr, 0, 0);
        routing->connectTrigTerminals("PFI1", "PXI_Trig2", nullptr, 0, 0);
        routing->connectTrigTerminals("/Dev2/PFI0", "/Dev2/PXI_Trig0", nullptr, 0, 0);
    };
    connectAll();
    routing->disconnectTrigTerminals("PFI0", "allconnected");
    EXPECT_EQ(service->routes("Dev1"), Calls{"/Dev1/PFI1->/Dev1/PXI_Trig2"});
    routing->disconnectTrigTerminals("ALLCONNECTED", "PXI_Trig2");
    EXPECT_EQ(service->routes("Dev1"), Calls{});
    routing->connectTrigTerminals("PFI0", "PXI_Trig0", nullptr, 0, 0);
    routing->connectTrigTerminals("PFI1", "PXI_Trig1", nullptr, 0, 0);
    start = service->calls().size();
    routing->disconnectClkTerminals("AllConnected", "AllConnected");
    EXPECT_EQ(sent(), Calls{"destroyImmediateRoutesOnDevice"});
    EXPECT_NE(service->calls().back().find("\"Dev1\""), std::string::npos) << service->calls().back();
    EXPECT_EQ(service->routes("Dev1"), Calls{});
    EXPECT_EQ(service->routes("Dev2"), Calls{"/Dev2/PFI0->/Dev2/PXI_Trig0"});  // another device's
    // Disconnecting what was never connected reports what the service reports.
    EXPECT_LT(reported([&] { routing->disconnectTrigTerminals("PFI3", "PXI_Trig3"); }).first, 0);
}

TEST_F(Routing, NamesOfAnyLengthReachTheServiceWhole) {
    const std::string longName(1 << 20, 'A');
    const auto [status, message] = reported([&] { routing->connectTrigTerminals(longName.c_str(), "PXI_Trig0", nullptr, 0, 0); });
    EXPECT_EQ(status, static_cast<ViStatus>(0xBFFA4032));
    const Calls all = service->calls();
    EXPECT_NE(all[start + 4].find("/Dev1/" + longName), std::string::npos);
}

TEST_F(Routing, AResetTellsTheServiceAroundTheHardwareResetAndEndsItsSession) {
    routing->connectTrigTerminals("PFI0", "PXI_Trig0", nullptr, 0, 0);
    start = service->calls().size();
    bool resetRan = false;
    tiktal::roco::resetDevice(routing->lib(), "Dev1", [&] { resetRan = true; });
    EXPECT_TRUE(resetRan);
    EXPECT_EQ(sent(), (Calls{"createSession", "initiateDeviceReset", "completeDeviceReset", "destroySession"}));
    EXPECT_EQ(service->routes("Dev1"), Calls{});

    // The hardware reset fails: the service is not told that the reset ended, but the session ends.
    start = service->calls().size();
    EXPECT_THROW(tiktal::roco::resetDevice(routing->lib(), "Dev1", [] { throw std::runtime_error("device"); }),
                 std::runtime_error);
    EXPECT_EQ(sent(), (Calls{"createSession", "initiateDeviceReset", "destroySession"}));
    // The device is still resetting: a new reset says so, and never reaches the hardware.
    start = service->calls().size();
    EXPECT_LT(reported([&] { tiktal::roco::resetDevice(routing->lib(), "Dev1", [&] { FAIL(); }); }).first, 0);
    EXPECT_EQ(sent(), (Calls{"createSession", "initiateDeviceReset", "destroySession"}));
}

}  // namespace
