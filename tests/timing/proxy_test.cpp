// The device interface proxy against the device daemon running as a separate process: the packet
// bytes of every request, the chaining rule, system-call failures, waits, and a daemon that goes
// away while a request or a wait is in flight.
#include <gtest/gtest.h>
#include <signal.h>

#include <cerrno>
#include <future>
#include <string>

#include "InterfaceProxyTiktal.h"
#include "device_daemon.h"

namespace {

using nZRAPALS100::tStatus;
using Bytes = std::vector<std::uint8_t>;

// A proxy opened on the daemon's interface path.
struct Opened {
    explicit Opened(const DeviceDaemon& daemon) {
        tStatus status;
        proxy.open(daemon.path(), status);
        EXPECT_EQ(status.code, 0);
    }
    tiktalq300::tInterfaceProxy_tiktal proxy;
};

class Proxy : public ::testing::Test {
protected:
    void SetUp() override {
        ::signal(SIGPIPE, SIG_DFL);  // a request to a daemon that is gone must not raise it
        daemon = std::make_unique<DeviceDaemon>();
        opened = std::make_unique<Opened>(*daemon);
    }
    tiktalq300::tInterfaceProxy_tiktal& proxy() { return opened->proxy; }
    // The last packet the daemon received: its control code, output room and input bytes.
    DeviceDaemon::Packet last() {
        const auto packets = daemon->packets();
        return packets.empty() ? DeviceDaemon::Packet{} : packets.back();
    }

    std::unique_ptr<DeviceDaemon> daemon;
    std::unique_ptr<Opened> opened;
};

TEST(ProxyOpen, OnlyADeviceThatIsThereOpens) {
    tiktalq300::tInterfaceProxy_tiktal proxy;
    tStatus status;
    proxy.open("/nonexistent/tiktal0", status);
    EXPECT_EQ(status.code, -52006);
    EXPECT_FALSE(proxy.isOpen());
    EXPECT_STREQ(status.component, "tiktal_im");
    EXPECT_NE(std::string(status.file).find("interface_proxy"), std::string::npos) << status.file;
    EXPECT_GT(status.line, 0u);
    tStatus readStatus;
    EXPECT_EQ(proxy.readTerminalValue(58, readStatus), 0u);  // a closed proxy reaches nothing
    EXPECT_LT(readStatus.code, 0);
    tStatus longPath;
    proxy.open(std::string(200, 'x'), longPath);
    EXPECT_EQ(longPath.code, -52005);
}

TEST_F(Proxy, EveryRequestSendsItsPacketByteForByte) {
    tStatus status;
    proxy().writeTerminalValue(58, 0x11223344, status);
    EXPECT_EQ(last().code, 0x80012004u);
    EXPECT_EQ(last().outputSize, 4u);
    EXPECT_EQ(last().input, (Bytes{58, 0, 0, 0, 0x44, 0x33, 0x22, 0x11, 0, 0, 0, 0}));
    EXPECT_EQ(proxy().readTerminalValue(58, status), 0x11223344u);
    EXPECT_EQ(last().code, 0x80012008u);
    EXPECT_EQ(last().outputSize, 8u);
    EXPECT_EQ(last().input, (Bytes{58, 0, 0, 0, 0, 0, 0, 0}));
    proxy().resetDevice(status);
    EXPECT_EQ(last().code, 0x80022004u);
    EXPECT_EQ(last().input, (Bytes{0, 0, 0, 0}));
    EXPECT_EQ(proxy().readTerminalValue(58, status), 0u);  // the reset cleared it
    EXPECT_EQ(status.code, 0);

    const std::uint32_t infoCodes[] = {0x807F2004u, 0x807F2008u, 0x807F200Cu, 0x807F2010u, 0x807F2014u, 0x807F2018u};
    // The daemon's model data: revision, variant and device id, firmware, image date, terminals,
    // temperature.
    EXPECT_EQ(proxy().readInfo1(status), 3u);
    EXPECT_EQ(last().code, infoCodes[0]);
    EXPECT_EQ(proxy().readInfo2(status), 0x7405u);
    EXPECT_EQ(last().code, infoCodes[1]);
    EXPECT_EQ(proxy().readInfo3(status), 0x02030011u);
    EXPECT_EQ(proxy().readInfo4(status), 0x20231115u);
    EXPECT_EQ(proxy().readInfo5(status), 6u);
    EXPECT_EQ(proxy().readInfo6(status), 41250u);
    EXPECT_EQ(last().code, infoCodes[5]);
    EXPECT_EQ(last().input, (Bytes{0, 0, 0, 0}));

    std::uint32_t io = 0xA1B2C3D4;
    EXPECT_EQ(proxy().routingRequest1(1, 2, 3, 4, 5, 6, 7, 8, &io, status), 1u);  // the daemon answers a1
    EXPECT_EQ(io, 0xA1B2C3D4u);                                                  // and the value as it was
    EXPECT_EQ(last().code, 0x80802004u);
    EXPECT_EQ(last().outputSize, 12u);
    const Bytes request1 = {1, 0, 0, 0, 2, 0, 0, 0, 3, 0, 0, 0, 0, 0, 0, 0, 4, 0, 0, 0, 0, 0, 0, 0, 5, 0, 0, 0,
                            0, 0, 0, 0, 6, 0, 0, 0, 7, 0, 0, 0, 8, 0, 0, 0, 0, 0, 0, 0, 0xD4, 0xC3, 0xB2, 0xA1, 0, 0, 0, 0};
    EXPECT_EQ(last().input, request1);
    io = 9;
    proxy().routingRequest3(0x0102, 0x0304, &io, status);
    EXPECT_EQ(io, 9u);
    EXPECT_EQ(last().code, 0x8080200Cu);
    EXPECT_EQ(last().input, (Bytes{2, 1, 0, 0, 0, 0, 0, 0, 4, 3, 0, 0, 0, 0, 0, 0, 9, 0, 0, 0, 0, 0, 0, 0}));
    proxy().routingRequest8(0x05, 0x06, status);
    EXPECT_EQ(last().code, 0x80802020u);
    EXPECT_EQ(last().input, (Bytes{5, 0, 0, 0, 0, 0, 0, 0, 6, 0, 0, 0, 0, 0, 0, 0}));
    EXPECT_EQ(proxy().routingRequest10(1, 2, 3, 4, status), 1u);
    EXPECT_EQ(last().code, 0x8080202Cu);
    EXPECT_EQ(last().outputSize, 8u);
    const Bytes request10 = last().input;
    ASSERT_EQ(request10.size(), 24u);  // the pad at its end is left unset
    EXPECT_EQ(Bytes(request10.begin(), request10.begin() + 20), (Bytes{1, 0, 0, 0, 2, 0, 0, 0, 3, 0, 0, 0, 4, 0, 0, 0, 0, 0, 0, 0}));
    proxy().routingRequest9(7, 8, status);
    EXPECT_EQ(last().input, (Bytes{7, 0, 0, 0, 8, 0, 0, 0, 0, 0, 0, 0}));
    for (auto request : {&tiktalq300::tInterfaceProxy_tiktal::routingRequest2, &tiktalq300::tInterfaceProxy_tiktal::routingRequest4,
                         &tiktalq300::tInterfaceProxy_tiktal::routingRequest5, &tiktalq300::tInterfaceProxy_tiktal::routingRequest6}) {
        (proxy().*request)(0x0A, status);
        EXPECT_EQ(last().input, (Bytes{0x0A, 0, 0, 0, 0, 0, 0, 0}));
    }
    std::uint32_t served = 0;
    proxy().routingRequest0(&served, status);
    EXPECT_EQ(served, 10u);  // every routing request so far, this one included
    EXPECT_EQ(status.code, 0);

    // Null pointers for values the request reads or writes: a status, nothing sent.
    const std::size_t sent = daemon->packets().size();
    tStatus nullStatus;
    proxy().routingRequest0(nullptr, nullStatus);
    EXPECT_EQ(nullStatus.code, -52005);
    EXPECT_EQ(daemon->packets().size(), sent);
}

TEST_F(Proxy, TheChainingRuleDecidesWhatGoesOutAndWhatComesBack) {
    tStatus failed;
    failed.merge(-7, "c", "f", 1);
    const std::size_t sent = daemon->packets().size();
    EXPECT_EQ(proxy().readTerminalValue(58, failed), 0u);
    proxy().writeTerminalValue(58, 1, failed);
    EXPECT_EQ(daemon->packets().size(), sent);  // an error already there sends nothing
    EXPECT_EQ(failed.code, -7);

    tStatus warned;
    warned.merge(0x1234, "c", "f", 1);
    proxy().writeTerminalValue(65, 5, warned);
    EXPECT_EQ(last().input, (Bytes{65, 0, 0, 0, 5, 0, 0, 0, 0x34, 0x12, 0, 0}));  // the warning goes out
    EXPECT_EQ(warned.code, 0x1234);
    daemon->failNext(0x80012008u, -50150);
    EXPECT_EQ(proxy().readTerminalValue(65, warned), 0u);  // what the failing driver answered
    EXPECT_EQ(warned.code, -50150);  // the driver's error replaces the warning
    EXPECT_STREQ(warned.component, "tiktal_im");
    EXPECT_NE(std::string(warned.file).find("InterfaceProxyTiktal"), std::string::npos) << warned.file;

    // readInfo2 returns the low half of the driver's value.
    tStatus status;
    const std::uint32_t info2 = 0x5A3C7405;  // the daemon's model data
    EXPECT_EQ(proxy().readInfo2(status), static_cast<std::uint16_t>(info2 & 0xFFFF));
    EXPECT_NE(info2 >> 16, 0u) << "the daemon's value shows only its low half";
}

TEST_F(Proxy, AFailedSystemCallReachesTheCallerWithWhereItFailed) {
    daemon->failSystemCall(0x80012008u, EBUSY);
    tStatus status;
    EXPECT_EQ(proxy().readTerminalValue(58, status), 0u);
    EXPECT_EQ(status.code, -52031);
    EXPECT_STREQ(status.component, "tiktal_im");
    EXPECT_NE(std::string(status.file).find("interface_proxy"), std::string::npos) << status.file;
    EXPECT_GT(status.line, 0u);
    tStatus unsupported;
    EXPECT_EQ(proxy().read(nullptr, 4, unsupported), 0u);
    EXPECT_EQ(unsupported.code, -52002);
}

TEST_F(Proxy, WaitsAreArmedSignalledAndCancelled) {
    tiktal::nZRAPAL000::tWaitContext signalled, cancelled, none;
    tStatus status;
    const std::uint32_t first = proxy().beginWait(0x0102, 0x03040506, 7, signalled, status);
    ASSERT_NE(first, 0u);
    EXPECT_EQ(status.code, 0);
    EXPECT_EQ(last().code, 0x0022FC00u);
    const Bytes wait = last().input;
    ASSERT_EQ(wait.size(), 24u);
    EXPECT_EQ(Bytes(wait.begin() + 16, wait.end()), (Bytes{6, 5, 4, 3, 2, 1, 7, 0}));
    const std::uint32_t second = proxy().beginWait(1, 2, 3, cancelled, status);
    ASSERT_NE(second, 0u);
    EXPECT_NE(first, second);
    EXPECT_EQ(daemon->armedWaits().size(), 2u);

    daemon->signalWait(first);
    signalled.waiter.join();  // the condition ended the wait
    EXPECT_EQ(signalled.status.code, 0);
    proxy().endWait(cancelled);
    EXPECT_EQ(cancelled.waitId, 0u);
    EXPECT_EQ(last().code, 0x0022FC04u);
    EXPECT_EQ(last().input, (Bytes{static_cast<std::uint8_t>(second), static_cast<std::uint8_t>(second >> 8),
                                   static_cast<std::uint8_t>(second >> 16), static_cast<std::uint8_t>(second >> 24), 0, 0, 0, 0}));
    EXPECT_TRUE(daemon->armedWaits().empty());

    const std::size_t sent = daemon->packets().size();
    proxy().endWait(none);  // identifier 0: nothing to cancel
    EXPECT_EQ(daemon->packets().size(), sent);
}

TEST_F(Proxy, ADaemonThatGoesAwayFailsTheRequestAndEndsTheWait) {
    tiktal::nZRAPAL000::tWaitContext waiting;
    tStatus waitStatus;
    ASSERT_NE(proxy().beginWait(1, 2, 3, waiting, waitStatus), 0u);

    daemon->delayNext(0x80012008u, 60000);
    auto inFlight = std::async(std::launch::async, [&] {
        tStatus status;
        proxy().readTerminalValue(58, status);
        return status.code;
    });
    while (daemon->packets().empty() || daemon->packets().back().code != 0x80012008u) std::this_thread::yield();
    daemon->kill();
    EXPECT_EQ(inFlight.get(), -52003);  // the connection was reset
    waiting.waiter.join();
    EXPECT_LT(waiting.status.code, 0);
    proxy().endWait(waiting);  // returns: nothing left to wait for
    EXPECT_EQ(waiting.waitId, 0u);
    tStatus after;
    proxy().readTerminalValue(58, after);
    EXPECT_LT(after.code, 0);
}

TEST_F(Proxy, AConnectionClosedMidRequestIsAnErrorAndStaysClosed) {
    daemon->closeOnNext(0x80022004u);
    tStatus status;
    proxy().resetDevice(status);
    EXPECT_EQ(status.code, -52003);
    EXPECT_FALSE(proxy().isOpen());
    tStatus next;
    proxy().readInfo1(next);
    EXPECT_EQ(next.code, -52003);
}

}  // namespace
