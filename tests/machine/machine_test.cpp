// The simulated-machine command as tests and users run it, seen through the library's enumeration:
// modules laid out in chassis slots, one appearing and one disappearing, daemons on their paths.
#include <gtest/gtest.h>

#include <cstdlib>
#include <filesystem>
#include <string>
#include <vector>

#include "InterfaceProxyTiktal.h"
#include "config/alias_factory.h"
#include "config/device_iterator.h"
#include "config/qpxi_library.h"

namespace {

namespace fs = std::filesystem;

int machine(const std::string& arguments) {
    const std::string command = std::string("TIKTAL_DEVD=") + TIKTAL_DEVD + " " + TIKTAL_MACHINE + " " + arguments;
    return std::system(command.c_str());
}

std::vector<std::string> tokens() {
    zrjsonconfig::APALDeviceIterator devices;
    std::vector<std::string> found;
    for (; !devices.isEnd(); devices.next()) found.push_back(devices.getToken());
    return found;
}

TEST(SimulatedMachine, LaysOutModulesInSlotsThatComeAndGo) {
    const fs::path root = fs::temp_directory_path() / ("tiktal_machine." + std::to_string(::getpid()));
    fs::remove_all(root);
    ::setenv("TIKTAL_SYSROOT", root.c_str(), 1);
    ASSERT_EQ(machine("create " + root.string() +
                      R"( '{"chassis":[{"number":1,"slots":{"2":{},"4":{"device":"0x7406"},"6":{"kind":"other"}}},{"number":2}]}')"),
              0);
    EXPECT_TRUE(fs::is_directory(root / "var/lib/Korvane/tiktal"));
    // Chassis 1 is the first root; its bridge is device 0, its slots the devices of the next bus.
    EXPECT_EQ(tokens(), (std::vector<std::string>{"PCI:VEN_1093&DEV_7405&SUBSYS_10937A0B&REV_02/0000:00:00:10",
                                                  "PCI:VEN_1093&DEV_7406&SUBSYS_10937A0B&REV_02/0000:00:00:20"}));
    EXPECT_NE(machine("add " + root.string() + " 1 2"), 0) << "the slot is taken";
    ASSERT_EQ(machine("add " + root.string() + " 2 3 > /dev/null"), 0);
    EXPECT_EQ(tokens().size(), 3u);
    ASSERT_EQ(machine("remove " + root.string() + " tiktal0"), 0);
    EXPECT_EQ(tokens(), (std::vector<std::string>{"PCI:VEN_1093&DEV_7406&SUBSYS_10937A0B&REV_02/0000:00:00:20",
                                                  "PCI:VEN_1093&DEV_7405&SUBSYS_10937A0B&REV_02/0000:01:00:18"}));

    // The chassis query places every module in its slot, so each gets its PXI alias.
    zrerr::Exception loading;
    zrqpxi::DynamicQPXILibrary library(loading);
    ASSERT_EQ(library.status().code(), 0) << library.status().what();
    zrjsonconfig::PXIAliasFactory factory(&library);
    std::vector<std::string> aliases;
    for (zrjsonconfig::APALDeviceIterator devices; !devices.isEnd(); devices.next())
        aliases.push_back(factory.createAlias(devices, {}));
    EXPECT_EQ(aliases, (std::vector<std::string>{"PXI1Slot4", "PXI2Slot3"}));

    // With daemons, every module's interface path answers.
    ASSERT_EQ(machine("start-daemons " + root.string()), 0);
    zrjsonconfig::APALDeviceIterator devices;
    for (; !devices.isEnd(); devices.next()) {
        tiktalq300::tInterfaceProxy_tiktal proxy;
        nZRAPALS100::tStatus status;
        proxy.open(devices.getInterfacePath(), status);
        proxy.writeTerminalValue(58, 7, status);
        EXPECT_EQ(proxy.readTerminalValue(58, status), 7u) << devices.getInterfacePath();
        EXPECT_EQ(status.code, 0);
    }
    EXPECT_EQ(machine("stop-daemons " + root.string()), 0);
    ::unsetenv("TIKTAL_SYSROOT");
    fs::remove_all(root);
}

}  // namespace
