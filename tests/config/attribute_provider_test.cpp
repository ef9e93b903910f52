// The attribute providers one by one, for a discovered device and for a device that only the file
// knows: what each writes into the configured and the provided attributes, what it keeps, and
// what it refuses.
#include <gtest/gtest.h>

#include <map>
#include <memory>
#include <string>

#include "config/attribute_provider.h"
#include "config/pxi_attribute_provider.h"
#include "config/sync_attribute_provider.h"
#include "json/zrjsonlh.h"

namespace {

using zrjsonconfig::ConfigurationData;
using zrjsonconfig::JsonTree;

// A discovered device with fixed properties; one that is not there fails as a missing file does.
class FakeDevice final : public zrjsonconfig::DeviceIteratorInterface {
public:
    std::map<std::string, std::uint32_t> numbers{
        {"pciDeviceID", 0x7405},    {"pciSubsystemID", 0x7A0B},     {"pciBusNumber", 3},
        {"pciDeviceNumber", 4},     {"pciFunctionNumber", 1},       {"pcieLinkWidth", 4},
        {"pcieMaxLinkWidth", 8},    {"pciRevision", 3},             {"pcieTransferRate", 2},
        {"pcieMaxTransferRate", 0x103}};
    std::string serial = "1a2b3c4d";

    std::uint32_t getBusPropertyU32(const std::string& name) override {
        const auto found = numbers.find(name);
        if (found == numbers.end()) throw zrerr::raise(-52006, "zrapalerr_resourceNotFound", "fake.cpp", 1);
        return found->second;
    }
    std::string getBusPropertyString(const std::string& name) override { return std::to_string(getBusPropertyU32(name)); }
    std::uint32_t getDevicePropertyU32(const std::string&) override { return 0; }
    std::string getDevicePropertyString(const std::string& name) override {
        if (name != "serialNumber") throw zrerr::raise(-52006, "zrapalerr_resourceNotFound", "fake.cpp", 1);
        return serial;
    }
    std::string getInterfacePath() override { return "/dev/tiktal0"; }
    std::string getToken() override { return "PCI:VEN_1093&DEV_7405&SUBSYS_10937A0B&REV_03/0000:00:21"; }
    std::string getInstanceId() override { return "PCI\\0000:03:04.1"; }
    void next() override {}
    bool isEnd() override { return false; }
};

// Runs `provider` on the attributes `configured` (JSON text) and an empty provided object;
// returns both printed as "configured | provided".
std::string provide(zrjsonconfig::AttributeProviderInterface& provider, zrjsonconfig::DeviceIteratorInterface* device,
                    const char* configured, ConfigurationData& data) {
    JsonTree attributes(zrjsonlh::parse(configured));
    JsonTree provided = zrjsonconfig::newObject();
    provider.provide(device, data, attributes.get(), provided.get());
    return zrjsonlh::printUnformatted(attributes.get()) + " | " + zrjsonlh::printUnformatted(provided.get());
}

std::string provide(zrjsonconfig::AttributeProviderInterface& provider, zrjsonconfig::DeviceIteratorInterface* device,
                    const char* configured) {
    ConfigurationData data;
    return provide(provider, device, configured, data);
}

TEST(AttributeProviders, AliasIsMadeOnceForADiscoveredDeviceAndNeverChanged) {
    zrjsonconfig::SimpleAliasFactory factory("Sync");
    zrjsonconfig::AliasAttributeProvider aliases(factory);
    FakeDevice device;
    ConfigurationData data;
    data.add("other", JsonTree(zrjsonlh::parse(R"({"alias":"SYNC1"})")), zrjsonconfig::newObject());
    EXPECT_EQ(provide(aliases, &device, "{}", data), R"({"alias":"Sync2"} | {})") << "Sync1 is taken, ignoring case";
    EXPECT_EQ(provide(aliases, &device, R"({"alias":"Mine"})", data), R"({"alias":"Mine"} | {})");
    EXPECT_EQ(provide(aliases, &device, R"({"Alias":"Mine"})", data), R"({"Alias":"Mine"} | {})")
        << "the member in any case is the alias";
    EXPECT_EQ(provide(aliases, &device, R"({"alias":null,"n":1})", data), R"({"alias":"Sync2","n":1} | {})")
        << "no one could open a device by an alias that is not text";
    EXPECT_EQ(provide(aliases, nullptr, "{}", data), "{} | {}") << "a device of the file alone gets none";
}

TEST(AttributeProviders, SerialNumberComesFromTheDeviceOrStaysAsTheFileHasIt) {
    zrjsonconfig::SerialNumberAttributeProvider serials;
    FakeDevice device;
    EXPECT_EQ(provide(serials, &device, R"({"serial_number":"old"})"), R"({"serial_number":"1a2b3c4d"} | {})");
    EXPECT_EQ(provide(serials, nullptr, R"({"serial_number":"old"})"), R"({"serial_number":"old"} | {})");
    EXPECT_EQ(provide(serials, nullptr, "{}"), R"({"serial_number":""} | {})");
}

TEST(AttributeProviders, ADeviceIsPresentWhenDiscoveredOrSimulated) {
    zrjsonconfig::IsSimulatedAndIsPresentAttributeProvider presence;
    zrjsonconfig::InterfacePathAttributeProvider paths;
    FakeDevice device;
    EXPECT_EQ(provide(presence, &device, "{}"), R"({"simulated":false} | {"is_present":true})");
    EXPECT_EQ(provide(presence, nullptr, "{}"), R"({"simulated":false} | {"is_present":false})");
    EXPECT_EQ(provide(presence, nullptr, R"({"simulated":true})"), R"({"simulated":true} | {"is_present":true})");
    EXPECT_EQ(provide(presence, nullptr, R"({"simulated":1})"), R"({"simulated":1} | {"is_present":false})")
        << "only the JSON value true";
    EXPECT_EQ(provide(paths, &device, "{}"), R"({} | {"interface_path":"/dev/tiktal0"})");
    EXPECT_EQ(provide(paths, nullptr, "{}"), R"({} | {"interface_path":""})");
}

TEST(AttributeProviders, PciIdentityAndLocationWithoutTheChassisLibrary) {
    zrjsonconfig::PXIAttributeProvider pxi(nullptr);
    FakeDevice device;
    EXPECT_EQ(provide(pxi, &device, R"({"pxi_chassis_number":2,"pxi_slot_number":5})"),
              R"({"pxi_chassis_number":2,"pxi_slot_number":5,"device_id":29701,"subsystem_id":31243} | )"
              R"({"pci_bus":3,"pci_device":4,"pci_function":1,"pci_link_width":4,"pci_max_link_width":8})")
        << "without the library the file's location stands";
    EXPECT_EQ(provide(pxi, &device, R"({"device_id":1})"),
              R"({"device_id":29701,"subsystem_id":31243,"pxi_chassis_number":-1,"pxi_slot_number":-1} | )"
              R"({"pci_bus":3,"pci_device":4,"pci_function":1,"pci_link_width":4,"pci_max_link_width":8})")
        << "one identifier alone: both from the hardware";
    EXPECT_EQ(provide(pxi, &device, R"({"device_id":0,"subsystem_id":0})"),
              R"({"device_id":29701,"subsystem_id":31243,"pxi_chassis_number":-1,"pxi_slot_number":-1} | )"
              R"({"pci_bus":3,"pci_device":4,"pci_function":1,"pci_link_width":4,"pci_max_link_width":8})")
        << "a discovered device is what the hardware says";
    EXPECT_EQ(provide(pxi, nullptr, R"({"device_id":1,"subsystem_id":2})"),
              R"({"device_id":1,"subsystem_id":2,"pxi_chassis_number":-1,"pxi_slot_number":-1} | )"
              R"({"pci_bus":0,"pci_device":0,"pci_function":0,"pci_link_width":-1,"pci_max_link_width":-1})");
    EXPECT_EQ(provide(pxi, nullptr, R"({"device_id":1})"),
              R"({"device_id":0,"subsystem_id":0,"pxi_chassis_number":-1,"pxi_slot_number":-1} | )"
              R"({"pci_bus":0,"pci_device":0,"pci_function":0,"pci_link_width":-1,"pci_max_link_width":-1})");

    // A width beyond 31 bits is unknown; a mistyped location in the file and a missing property fail.
    device.numbers["pcieLinkWidth"] = 0x7FFFFFFFu;
    device.numbers["pcieMaxLinkWidth"] = 0x80000000u;
    EXPECT_NE(provide(pxi, &device, "{}").find(R"("pci_link_width":2147483647,"pci_max_link_width":-1})"), std::string::npos);
    device.numbers["pcieLinkWidth"] = 0xFFFFFFFFu;
    EXPECT_NE(provide(pxi, &device, "{}").find(R"("pci_link_width":-1,)"), std::string::npos);
    EXPECT_THROW(provide(pxi, nullptr, R"({"pxi_slot_number":"4"})"), zrerr::Exception);
    device.numbers.erase("pciBusNumber");
    EXPECT_THROW(provide(pxi, &device, "{}"), zrerr::Exception);
}

TEST(AttributeProviders, HardwareRevisionLetterAndLinkSpeeds) {
    tiktalsae::HardwareRevisionAttributeProvider revisions;
    tiktalsae::PCILinkSpeedAttributeProvider speeds;
    FakeDevice device;
    EXPECT_EQ(provide(revisions, &device, "{}"), R"({} | {"hardware_revision":"C"})");
    for (std::uint32_t revision : {0u, 27u, 0x101u}) {
        device.numbers["pciRevision"] = revision;
        EXPECT_EQ(provide(revisions, &device, "{}"), R"({} | {"hardware_revision":""})") << revision;
    }
    device.numbers["pciRevision"] = 26;
    EXPECT_EQ(provide(revisions, &device, "{}"), R"({} | {"hardware_revision":"Z"})");
    EXPECT_EQ(provide(revisions, nullptr, "{}"), R"({} | {"hardware_revision":""})");

    // 2 (5 GT/s) is speed 1; the low 8 bits of 0x103 are 3 (8 GT/s), speed 2.
    EXPECT_EQ(provide(speeds, &device, "{}"), R"({} | {"pci_link_speed":1,"pci_link_speed_max":2})");
    device.numbers["pcieTransferRate"] = 4;
    device.numbers["pcieMaxTransferRate"] = 0;
    EXPECT_EQ(provide(speeds, &device, "{}"), R"({} | {"pci_link_speed":-1,"pci_link_speed_max":-1})");
    EXPECT_EQ(provide(speeds, nullptr, "{}"), R"({} | {"pci_link_speed":-1,"pci_link_speed_max":-1})");
}

}  // namespace
