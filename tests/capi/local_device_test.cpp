// Local devices through the C interface, on a simulated machine with its stand-ins running.
#include <gtest/gtest.h>
#include <tiktal/tiktal.h>

#include <cmath>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <functional>
#include <limits>
#include <memory>
#include <string>

#include "local_machine.h"
#include "stderr_capture.h"

namespace {

constexpr std::uint32_t kReadTerminalValue = 0x80012008;
constexpr std::uint32_t kResetDevice = 0x80022004;

class LocalDevices : public ::testing::Test, protected localmachine::LocalMachine {
protected:
    ~LocalDevices() override {
        for (ViSession vi : _open) tiktal_close(vi);
    }

    // Opens `name`; 0 when that fails, with the status in `status`.
    ViSession open(const char* name, ViBoolean reset = VI_FALSE) {
        ViSession vi = 0;
        status = tiktal_init(const_cast<ViRsrc>(name), VI_FALSE, reset, &vi);
        if (status == VI_SUCCESS) _open.push_back(vi);
        return status == VI_SUCCESS ? vi : 0;
    }
    ViInt32 int32(ViSession vi, ViAttr attribute) {
        ViInt32 value = -1;
        status = tiktal_GetAttributeViInt32(vi, "", attribute, &value);
        return value;
    }
    // How many device lists were built so far: each build asks the chassis query about every
    // module it finds, one query session each.
    int chassisSessions() {
        const auto log = chassis.entry<std::uint32_t (*)(char*, std::uint32_t)>("zrqpxi_sim_log");
        std::string text(log(nullptr, 0), '\0');
        log(text.data(), static_cast<std::uint32_t>(text.size()));
        int sessions = 0;
        for (std::size_t at = 0; (at = text.find("openPXISession(", at)) != std::string::npos; ++at) ++sessions;
        return sessions;
    }
    std::string routingText(const char* entry, const char* argument = nullptr) {
        using Text = char* (*)(const char*);
        using Free = void (*)(char*);
        char* text = argument || std::string(entry) == "zrrocoapi_sim_routes"
                         ? routing.entry<Text>(entry)(argument)
                         : routing.entry<char* (*)()>(entry)();
        const std::string copy = text ? text : "";
        routing.entry<Free>("zrrocoapi_destroyString")(text);
        return copy;
    }

    std::vector<ViSession> _open;
    ViStatus status = VI_SUCCESS;
};

TEST_F(LocalDevices, ModulesOpenByAliasInAnyCaseAndByTheirPciAddress) {
    const ViSession byAlias = open("pxi1slot2");
    ASSERT_EQ(status, VI_SUCCESS);
    EXPECT_EQ(int32(byAlias, 1150001), 6699) << "serial number 1a2b";
    EXPECT_EQ(int32(byAlias, 1150002), 0x7405);
    // Chassis 1's slots are devices of bus 2.
    for (const char* name : {"PXI0::2-2.0::INSTR", "pxi0::2-2::instr", "PCI0::2-2.0", "PXI2::2::INSTR", "PXI2::2::0::INSTR"}) {
        const ViSession vi = open(name);
        ASSERT_EQ(status, VI_SUCCESS) << name;
        EXPECT_EQ(int32(vi, 1150002), 0x7405) << name;
    }
    EXPECT_EQ(int32(open("PXI0::2-4.0::INSTR"), 1150002), 0x7406);
    // A serial number that is not hexadecimal reads as 0.
    machine("add " + _root + " 1 9 --serial 12xy");
    DeviceDaemon slot9(_root + "/dev/tiktal3");
    EXPECT_EQ(int32(open("PXI1Slot9"), 1150001), 0);
    // Names that are no address of a module here, or no address at all.
    for (const char* name : {"PXI1::2-2.0::INSTR", "PXI0::2-2.1::INSTR", "PXI0::256-2.0::INSTR", "PXI0::2-32.0::INSTR",
                             "PXI0::2-2.8::INSTR", "PXI0::MEMACC", "PXI0::1::BACKPLANE", "PXI0::CHASSIS1::SLOT2",
                             "PXI0::CHASSIS1::SLOT2::FUNC0::INSTR", "PXI0::99999999999-2.0::INSTR", "PXI1Slot2 ", ""}) {
        EXPECT_EQ(open(name), 0u) << name;
        EXPECT_EQ(status, tiktalerr_deviceNotFound) << name;
    }
}

TEST_F(LocalDevices, TerminalValuesGoToTheDriverInThousandths) {
    const ViSession vi = open("PXI1Slot2");
    ASSERT_EQ(status, VI_SUCCESS);
    EXPECT_EQ(tiktal_SetAttributeViReal64(vi, "", 1150100, 2.5), VI_SUCCESS);
    EXPECT_EQ(tiktal_SetAttributeViReal64(vi, "ignored", 1150105, 4294967.295), VI_SUCCESS);
    EXPECT_EQ(slot2->terminalValues(), (std::map<std::uint32_t, std::uint32_t>{{58, 2500}, {93, 4294967295u}}));
    ViReal64 value = 0;
    EXPECT_EQ(tiktal_GetAttributeViReal64(vi, "", 1150100, &value), VI_SUCCESS);
    EXPECT_EQ(value, 2.5);
    EXPECT_EQ(tiktal_GetAttributeViReal64(vi, "", 1150105, &value), VI_SUCCESS);
    EXPECT_EQ(value, 4294967.295) << "the count is unsigned";

    // Values without a count are refused and nothing is sent; so are other attributes.
    slot2->clearPackets();
    for (const double bad : {-0.001, std::nan(""), std::numeric_limits<double>::infinity(), 4294967.296})
        EXPECT_EQ(tiktal_SetAttributeViReal64(vi, "", 1150101, bad), tiktalerr_invParameter) << bad;
    EXPECT_EQ(tiktal_SetAttributeViReal64(vi, "", 1150106, 1.0), tiktalerr_nsupAttr);
    EXPECT_EQ(tiktal_GetAttributeViReal64(vi, "", 1150106, &value), tiktalerr_nsupAttr);
    EXPECT_EQ(tiktal_GetAttributeViReal64(vi, "", 1150099, &value), tiktalerr_nsupAttr);
    EXPECT_EQ(tiktal_GetAttributeViInt32(vi, "", 1150003, nullptr), tiktalerr_invParameter) << "null comes first";
    EXPECT_EQ(tiktal_GetAttributeViReal64(vi, "", 1150100, nullptr), tiktalerr_invParameter);
    EXPECT_TRUE(slot2->packets().empty());

    // A failed request reaches the caller with the driver's status.
    slot2->failNext(kReadTerminalValue, -52008);
    EXPECT_EQ(tiktal_GetAttributeViReal64(vi, "", 1150100, &value), -52008);
}

TEST_F(LocalDevices, RoutesAreMadeAndRemovedByTheRoutingService) {
    const ViSession vi = open("PXI1Slot4");
    ASSERT_EQ(status, VI_SUCCESS);
    EXPECT_EQ(tiktal_ConnectTrigTerminals(vi, "PFI0", "PXI_Trig3", "", 0, 0), VI_SUCCESS);
    EXPECT_NE(routingText("zrrocoapi_sim_routes", "PXI1Slot4").find("/PXI1Slot4/PXI_Trig3"), std::string::npos);
    EXPECT_EQ(tiktal_DisconnectTrigTerminals(vi, "PFI0", "AllConnected"), VI_SUCCESS);
    EXPECT_EQ(routingText("zrrocoapi_sim_routes", "PXI1Slot4"), "[]");
    EXPECT_EQ(tiktal_ConnectClkTerminals(vi, "ClkIn", "PXI_Clk10"), VI_SUCCESS);
    EXPECT_NE(routingText("zrrocoapi_sim_routes", "PXI1Slot4").find("/PXI1Slot4/PXI_Clk10_In"), std::string::npos);
    tiktal_close(vi);
    _open.clear();
    EXPECT_EQ(routingText("zrrocoapi_sim_routes", "PXI1Slot4"), "[]") << "closing ends the routing session";
}

TEST_F(LocalDevices, ResetGoesThroughTheRoutingServiceAndTheDriver) {
    routing.entry<void (*)()>("zrrocoapi_sim_reset")();
    const ViSession vi = open("PXI1Slot2", VI_TRUE);
    ASSERT_EQ(status, VI_SUCCESS);
    const auto calls = [&] {
        std::string names;
        const std::string log = routingText("zrrocoapi_sim_log");
        for (const char* call : {"initiateDeviceReset", "completeDeviceReset", "destroySession"})
            for (std::size_t at = 0; (at = log.find(std::string("\"") + call + "\"", at)) != std::string::npos; ++at)
                names += std::string(call) + " ";
        return names;
    };
    EXPECT_EQ(calls(), "initiateDeviceReset completeDeviceReset destroySession ");
    EXPECT_EQ(slot2->packets().back().code, kResetDevice);

    // A failed device reset is not completed, and its routing session still ends.
    routing.entry<void (*)()>("zrrocoapi_sim_reset")();
    slot2->failNext(kResetDevice, -52008);
    EXPECT_EQ(tiktal_reset(vi), -52008);
    EXPECT_EQ(calls(), "initiateDeviceReset destroySession ");
}

TEST_F(LocalDevices, TheListIsRebuiltOnlyWhenALookupMissesIt) {
    ASSERT_NE(open("PXI1Slot2"), 0u);
    const int oneBuild = chassisSessions();
    ASSERT_GT(oneBuild, 0);

    // A present module of another kind: no rebuild.
    EXPECT_EQ(open("PXI3Slot5"), 0u);
    EXPECT_EQ(status, tiktalerr_deviceNotFound);
    EXPECT_EQ(chassisSessions(), oneBuild);
    // A name no device has: exactly one rebuild.
    EXPECT_EQ(open("NoSuchDevice"), 0u);
    EXPECT_EQ(status, tiktalerr_deviceNotFound);
    const int twoBuilds = chassisSessions();
    EXPECT_GT(twoBuilds, oneBuild);
    const int perBuild = twoBuilds - oneBuild;

    // A module added since is found after one rebuild, which locates the four modules and gives
    // the new one its alias.
    machine("add " + _root + " 1 7");
    EXPECT_EQ(open("PXI1Slot7"), 0u) << "its driver is not running";
    EXPECT_NE(status, VI_SUCCESS);
    EXPECT_EQ(chassisSessions(), twoBuilds + 4 + 1);

    // A module removed stays in the cached list until a lookup misses it.
    machine("remove " + _root + " tiktal1");
    EXPECT_NE(open("PXI1Slot4"), 0u) << "its driver still runs";
    EXPECT_EQ(open("NoSuchDevice"), 0u);
    EXPECT_EQ(open("PXI0::2-4.0::INSTR"), 0u);
    EXPECT_EQ(status, tiktalerr_deviceNotFound);
}

TEST_F(LocalDevices, AnAbsentModuleCostsOneRebuildAndASimulatedDeviceTraces) {
    slot4.reset();
    machine("remove " + _root + " tiktal1");
    ASSERT_NE(open("PXI1Slot2"), 0u);
    // The list of the next call has slot 4 absent, and so does the one it rebuilds.
    const int before = chassisSessions();
    EXPECT_EQ(open("PXI1Slot4"), 0u);
    EXPECT_EQ(status, tiktalerr_deviceNotFound);
    EXPECT_GT(chassisSessions(), before);

    std::ofstream(dataDirectory() + "/board1.fake")
        << R"({"serialNumber":"5eed","pciDeviceID":29701,"pciSubsystemID":1,"pciBusNumber":200,"pciDeviceNumber":0,)"
           R"("pciFunctionNumber":0,"pcieLinkWidth":1,"pcieMaxLinkWidth":1,"pciRevision":1,"pcieTransferRate":1,)"
           R"("pcieMaxTransferRate":1})";
    testsupport::StderrCapture trace;
    const ViSession simulated = open("Sync1");
    ASSERT_EQ(status, VI_SUCCESS) << "the simulated device's numbered alias";
    ViReal64 value = 0;
    EXPECT_EQ(tiktal_SetAttributeViReal64(simulated, "", 1150100, 2.5), VI_SUCCESS);
    EXPECT_EQ(tiktal_GetAttributeViReal64(simulated, "", 1150106, &value), VI_SUCCESS);
    EXPECT_NE(open("PXI0::200-0.0::INSTR"), 0u) << "by its address too";
    std::string lines;
    for (const std::string& write : trace.finish()) lines += write;
    EXPECT_NE(lines.find("tiktal::SessionDebugPrintOnly::setAttributeViReal64"), std::string::npos) << lines;
}

TEST_F(LocalDevices, OneDevicesMistakesAffectOnlyThatDevice) {
    // Hand-edited entries without a text alias, whose tokens sort before the modules' ones.
    std::ofstream(dataDirectory() + "/tiktal.config")
        << R"({"version":1,"devices":{"A1":{},"A2":{"alias":5},"A3":{"alias":null}}})";
    // Slot 4 reports a link wider than 31 bits; a simulated device sits at slot 2's PCI address.
    std::ofstream(_root + "/sys/devices/pci0000:01/0000:01:00.0/0000:02:04.0/current_link_width") << "2147483648\n";
    machine("fake " + _root + R"( shadow --json '{"pciBusNumber":2,"pciDeviceNumber":2,"pcieMaxLinkWidth":4294967295}')");
    testsupport::StderrCapture trace;
    EXPECT_EQ(int32(open("PXI1Slot2"), 1150002), 0x7405);
    EXPECT_EQ(int32(open("PXI0::2-2.0::INSTR"), 1150002), 0x7405) << "the module, not the simulated device";
    EXPECT_EQ(int32(open("PXI1Slot4"), 1150002), 0x7406);
    EXPECT_NE(open("PXI1Slot2_1"), 0u) << "the simulated device opens by its alias";
    std::string lines;
    for (const std::string& write : trace.finish()) lines += write;
    EXPECT_NE(lines.find("Simulated device " + dataDirectory() + "/shadow.fake is left out of the lookup by PCI address"),
              std::string::npos) << lines;

    std::ifstream in(dataDirectory() + "/tiktal.config");
    const std::string file((std::istreambuf_iterator<char>(in)), std::istreambuf_iterator<char>());
    EXPECT_NE(file.find("\"alias\":\t5,"), std::string::npos) << file;
    EXPECT_NE(file.find("\"alias\":\tnull,"), std::string::npos) << file;
    EXPECT_NE(file.find("\"A1\":\t{\n\t\t\t\"serial_number\""), std::string::npos) << "still without an alias";
}

// Each build of the device list that fails says so once on standard error, with the file and what
// is wrong with it; text that is not UTF-8, and strings that an escaped NUL would cut short, never
// make it into the list or the configuration file.
TEST_F(LocalDevices, AListThatCannotBeBuiltSaysWhichFileAndWhatOnce) {
    const std::string config = dataDirectory() + "/tiktal.config";
    const std::string serial = _root + "/sys/class/tiktal/tiktal0/serial_number";
    const std::string link = _root + "/sys/class/tiktal/tiktal1/device";
    const std::string target = std::filesystem::read_symlink(link);
    const auto write = [](const std::string& path, const std::string& text) { std::ofstream(path) << text; };
    const auto relink = [&](const std::string& to) {
        std::filesystem::remove(link);
        std::filesystem::create_symlink(to, link);
    };
    struct Case {
        std::function<void()> make, mend;
        ViStatus status;
        std::string file, what;
    };
    const std::vector<Case> cases{
        {[&] { write(serial, "\xff\xfe\n"); }, [&] { write(serial, "1a2b\n"); }, tiktalerr_invParameter, serial,
         "not valid UTF-8"},
        {[&] { write(serial, std::string(5000, '1')); }, [&] { write(serial, "1a2b\n"); }, tiktalerr_bufferTooSmall,
         serial, "Failed to read file"},
        {[&] { write(config, R"({"version":1,"devices":{"A":{"alias":"Dev\u0000One"}}})"); }, [&] { write(config, ""); },
         tiktalerr_invParameter, config, R"(\\u0000)"},
        {[&] { machine("fake " + _root + R"( board --json '{"serialNumber":"12\u000034"}')"); },
         [&] { machine("remove-fake " + _root + " board"); }, tiktalerr_invParameter, dataDirectory() + "/board.fake",
         R"(\\u0000)"},
        {[&] { relink("device"); }, [&] { relink(target); }, tiktalerr_internalSoftware, link,
         "Failed to list the timing modules"}};
    for (const Case& hostile : cases) {
        hostile.make();
        testsupport::StderrCapture trace;
        EXPECT_EQ(open("PXI1Slot2"), 0u) << hostile.file;
        EXPECT_EQ(status, hostile.status) << hostile.file;
        std::string lines;
        for (const std::string& line : trace.finish()) lines += line;
        EXPECT_EQ(lines.rfind("Fatal configuration error! {", 0), 0u) << lines;
        EXPECT_EQ(lines.find("Fatal", 1), std::string::npos) << "once: " << lines;
        EXPECT_NE(lines.find(hostile.file), std::string::npos) << lines;
        EXPECT_NE(lines.find(hostile.what), std::string::npos) << lines;
        hostile.mend();
    }
    char message[TIKTAL_ERROR_MESSAGE_SIZE];
    EXPECT_EQ(tiktal_error_message(VI_NULL, tiktalerr_bufferTooSmall, message), VI_SUCCESS) << message;

    // A stray file in the class folder is no module.
    write(_root + "/sys/class/tiktal/README", "not a module");
    EXPECT_NE(open("PXI1Slot2"), 0u);
    EXPECT_EQ(int32(open("pxi1slot2"), 1150001), 6699);
}

TEST_F(LocalDevices, AModuleWhoseDriverIsNotRunningFailsAtOnce) {
    slot4->kill();  // its socket stays behind, with no one listening
    EXPECT_EQ(open("PXI1Slot4"), 0u);
    EXPECT_NE(status, VI_SUCCESS);
    EXPECT_LT(status, 0);
    slot4.reset();
    EXPECT_EQ(open("PXI1Slot4"), 0u) << "and without a socket";
    EXPECT_LT(status, 0);
}

}  // namespace
