// The device list as the session factory builds it, on a simulated machine laid out by the
// machine command: the file's devices merged with the modules present, aliases that never change,
// devices that went away kept, the file written only when its JSON changes, and failures that
// leave the file as it was.
#include <sys/stat.h>

#include <gtest/gtest.h>

#include <cstdlib>
#include <memory>
#include <string>
#include <vector>

#include "config/configuration.h"
#include "config/device_list.h"
#include "config/sync_attribute_provider.h"
#include "config_test_support.h"
#include "json/zrjsonlh.h"
#include "machine_command.h"

namespace {

using zrjsonconfig::ConfigurationData;

std::string printed(const cJSON* item) { return zrjsonlh::printUnformatted(item); }

class DeviceList : public ::testing::Test {
protected:
    // Runs the machine command on this test's machine; its output is discarded.
    void machine(const std::string& arguments) { tiktaltest::runMachineCommand(arguments); }
    void create(const std::string& layout) { machine("create " + _root.root() + " '" + layout + "'"); }

    // The configured and provided attributes of the device with `alias`, printed.
    static std::string configured(const ConfigurationData& data, const std::string& alias) {
        for (const auto& [token, entry] : data.entries())
            if (const cJSON* item = cJSON_GetObjectItem(entry->configured(), "alias"); item && alias == item->valuestring)
                return printed(entry->configured());
        return "no device " + alias;
    }
    static std::string provided(const ConfigurationData& data, const std::string& alias) {
        for (const auto& [token, entry] : data.entries())
            if (const cJSON* item = cJSON_GetObjectItem(entry->configured(), "alias"); item && alias == item->valuestring)
                return printed(entry->provided());
        return "no device " + alias;
    }
    std::string fileText() const { return configtest::readText(_root.configPath()); }
    ino_t fileIdentity() const {
        struct stat status {};
        return ::stat(_root.configPath().c_str(), &status) == 0 ? status.st_ino : 0;
    }

    configtest::Sysroot _root;
};

constexpr char kToken1Slot2[] = "PCI:VEN_1093&DEV_7405&SUBSYS_10937A0B&REV_02/0000:00:00:10";

TEST_F(DeviceList, AMissingFileGetsTheModulesPresentAndIsWrittenOnlyWhenTheyChange) {
    create(R"({"chassis":[{"number":1,"slots":{"2":{"serial":"c0ffee01"},"4":{"device":"0x7406"},"6":{"kind":"other"}}},)"
           R"({"number":3,"slots":{"5":{"revision":"0x03","linkSpeed":"8.0 GT/s PCIe"}}}]})");
    const ConfigurationData data = tiktalsae::loadDeviceList();
    ASSERT_EQ(data.entries().size(), 3u);
    EXPECT_EQ(configured(data, "PXI1Slot2"),
              R"({"alias":"PXI1Slot2","serial_number":"c0ffee01","simulated":false,"device_id":29701,)"
              R"("subsystem_id":31243,"pxi_chassis_number":1,"pxi_slot_number":2})");
    EXPECT_EQ(provided(data, "PXI1Slot2"),
              R"({"is_present":true,"interface_path":")" + _root.root() + R"(/dev/tiktal0","pci_bus":2,"pci_device":2,)"
              R"("pci_function":0,"pci_link_width":4,"pci_max_link_width":4,"hardware_revision":"B","pci_link_speed":1,)"
              R"("pci_link_speed_max":1})");
    EXPECT_NE(configured(data, "PXI1Slot4").find(R"("device_id":29702)"), std::string::npos);
    EXPECT_NE(provided(data, "PXI3Slot5").find(R"("hardware_revision":"C","pci_link_speed":2)"), std::string::npos);
    ASSERT_NE(data.find(kToken1Slot2), nullptr);

    // The file holds exactly the configured attributes.
    const zrjsonconfig::JsonTree file(zrjsonlh::parse(fileText().c_str()));
    EXPECT_EQ(printed(file.get()), printed(data.configuredJson().get()));

    // Loading again with nothing changed writes nothing: the file is the same file.
    const ino_t written = fileIdentity();
    const std::string text = fileText();
    const ConfigurationData again = tiktalsae::loadDeviceList();
    EXPECT_EQ(fileIdentity(), written);
    EXPECT_EQ(fileText(), text);
    EXPECT_EQ(printed(again.configuredJson().get()), printed(data.configuredJson().get()));
    EXPECT_EQ(printed(again.providedJson().get()), printed(data.providedJson().get()));

    // A new module is a change.
    machine("add " + _root.root() + " 3 7");
    EXPECT_EQ(tiktalsae::loadDeviceList().entries().size(), 4u);
    EXPECT_NE(fileIdentity(), written);
}

TEST_F(DeviceList, ModulesThatGoAwayKeepTheirAliasAndComeBackUnderIt) {
    create(R"({"chassis":[{"number":1,"slots":{"2":{},"3":{}}}]})");
    tiktalsae::loadDeviceList();
    machine("remove " + _root.root() + " tiktal0");
    const ConfigurationData gone = tiktalsae::loadDeviceList();
    ASSERT_EQ(gone.entries().size(), 2u) << "no device is lost";
    EXPECT_EQ(provided(gone, "PXI1Slot2").substr(0, 44), R"({"is_present":false,"interface_path":"","pci)");
    EXPECT_EQ(configured(gone, "PXI1Slot2"),
              R"({"alias":"PXI1Slot2","serial_number":"1a2b0001","simulated":false,"device_id":29701,)"
              R"("subsystem_id":31243,"pxi_chassis_number":1,"pxi_slot_number":2})")
        << "a device not found keeps what the file holds";

    // Another module in the slot of the absent one has the same token: it is that device again.
    machine("add " + _root.root() + " 1 2 --serial 0badcafe");
    const ConfigurationData back = tiktalsae::loadDeviceList();
    EXPECT_EQ(back.entries().size(), 2u);
    EXPECT_NE(configured(back, "PXI1Slot2").find(R"("serial_number":"0badcafe")"), std::string::npos);
    EXPECT_NE(provided(back, "PXI1Slot2").find(R"("is_present":true)"), std::string::npos);
}

TEST_F(DeviceList, TheMergeKeepsWhatTheFileSaysOfItsDevicesAndOnlyThat) {
    create(R"({"chassis":[{"number":1,"slots":{"2":{},"4":{}}}]})");
    // Version 2 that version 1 can read; a member of the file the driver does not know; a
    // device with a note, named by the user; an absent device that holds the alias the module
    // in slot 4 would get; a simulated device; and a device with one identifier only.
    configtest::writeText(_root.configPath(), std::string(R"({"version":2,"oldest_compatible_version":1,"comment":"x",)") +
                                                   R"("devices":{")" + kToken1Slot2 +
                                                   R"(":{"alias":"Clock","note":{"rack":7}},)"
                                                   R"("PCI:gone":{"alias":"pxi1slot4"},)"
                                                   R"("FAKE:TIKTAL:board1":{"alias":"Sim","simulated":true},)"
                                                   R"("PCI:half":{"alias":"Half","device_id":29701}}})");
    std::vector<std::string> saves;
    zrjsonconfig::LockableFile file(zrjsonconfig::configFilePath(), false);
    ConfigurationData data;
    {
        zrjsonconfig::Configuration configuration(file, [&](const ConfigurationData& saved) {
            saves.push_back(printed(saved.configuredJson().get()));
        });
        tiktalsae::SyncAttributeProvider provider;
        zrjsonconfig::APALDeviceIterator devices;
        configuration.load(&devices, provider);
        data = configuration.data();
    }
    EXPECT_EQ(configured(data, "Clock").substr(0, 48), R"({"alias":"Clock","note":{"rack":7},"serial_numbe)");
    EXPECT_NE(configured(data, "PXI1Slot4_1"), "no device PXI1Slot4_1") << "PXI1Slot4 is taken, ignoring case";
    EXPECT_NE(provided(data, "Sim").find(R"("is_present":true,"interface_path":"")"), std::string::npos);
    EXPECT_NE(provided(data, "pxi1slot4").find(R"("is_present":false)"), std::string::npos);
    EXPECT_EQ(configured(data, "Half"),
              R"({"alias":"Half","device_id":0,"serial_number":"","simulated":false,"subsystem_id":0,)"
              R"("pxi_chassis_number":-1,"pxi_slot_number":-1})")
        << "one identifier alone: both from the hardware, here absent";

    const std::string text = fileText();
    EXPECT_EQ(text.find("comment"), std::string::npos);
    EXPECT_EQ(text.rfind("{\n\t\"version\":\t1,\n\t\"oldest_compatible_version\":\t1,\n\t\"devices\":", 0), 0u) << text;
    ASSERT_EQ(saves.size(), 1u);
    EXPECT_EQ(saves[0], printed(zrjsonconfig::JsonTree(zrjsonlh::parse(text.c_str())).get()));

    // Devices of the file that were found moved after those that were not, in the order found.
    std::vector<std::string> order;
    const zrjsonconfig::JsonTree json = data.configuredJson();
    for (const cJSON* device = cJSON_GetObjectItem(json.get(), "devices")->child; device; device = device->next)
        order.push_back(cJSON_GetObjectItem(device, "alias")->valuestring);
    EXPECT_EQ(order, (std::vector<std::string>{"pxi1slot4", "Sim", "Half", "Clock", "PXI1Slot4_1"}));
}

TEST_F(DeviceList, FailuresLeaveTheFileAsItWas) {
    create(R"({"chassis":[{"number":1,"slots":{"2":{}}}]})");
    const std::string versionZero = R"({"version":0,"devices":{}})";
    configtest::writeText(_root.configPath(), versionZero);
    testing::internal::CaptureStderr();
    const configtest::Details tooOld = configtest::failureOf([] { tiktalsae::loadDeviceList(); });
    const std::string trace = testing::internal::GetCapturedStderr();
    EXPECT_EQ(tooOld.code, static_cast<std::int32_t>(0xBFFA917E));
    EXPECT_EQ(fileText(), versionZero);
    EXPECT_EQ(trace.rfind("Fatal configuration error! {", 0), 0u) << trace;

    // The same module found twice would become one device.
    configtest::writeText(_root.configPath(), "");
    const configtest::Details twice = configtest::failureOf([] {
        std::vector<std::unique_ptr<zrjsonconfig::DeviceIteratorInterface>> both;
        both.push_back(std::make_unique<zrjsonconfig::APALDeviceIterator>());
        both.push_back(std::make_unique<zrjsonconfig::APALDeviceIterator>());
        zrjsonconfig::CompositeDeviceIterator devices(std::move(both));
        zrjsonconfig::LockableFile file(zrjsonconfig::configFilePath(), false);
        zrjsonconfig::Configuration configuration(file);
        tiktalsae::SyncAttributeProvider provider;
        testing::internal::CaptureStderr();
        try {
            configuration.load(&devices, provider);
        } catch (...) {
            testing::internal::GetCapturedStderr();
            throw;
        }
    });
    EXPECT_EQ(twice.code, -52013);
    EXPECT_EQ(twice.records, (std::vector<std::string>{std::string("kUsageTypeToken=") + kToken1Slot2,
                                                       "# Two devices have the same token"}));
    EXPECT_EQ(fileText(), "");

    // The list loads again once the file is mended.
    EXPECT_EQ(tiktalsae::loadDeviceList().entries().size(), 1u);
}

}  // namespace
