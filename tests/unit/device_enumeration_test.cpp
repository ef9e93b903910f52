// Enumeration of timing modules over a simulated sysfs tree: properties, tokens and slot paths
// through PCI bridges under the first and the second root, missing and malformed files, and the
// composite iterator.
#include <gtest/gtest.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>

#include "config/device_iterator.h"
#include "errors/zrerr.h"

namespace {

namespace fs = std::filesystem;
using zrjsonconfig::APALDeviceIterator;

// A machine under a fresh folder that TIKTAL_SYSROOT points at while the test runs.
class Machine : public ::testing::Test {
protected:
    void SetUp() override {
        root = fs::temp_directory_path() / ("tiktal_enum." + std::to_string(::getpid()) + "." +
                                            ::testing::UnitTest::GetInstance()->current_test_info()->name());
        fs::remove_all(root);
        fs::create_directories(root / "sys/devices");
        ::setenv("TIKTAL_SYSROOT", root.c_str(), 1);
    }
    void TearDown() override {
        ::unsetenv("TIKTAL_SYSROOT");
        fs::remove_all(root);
    }
    static void write(const fs::path& file, const std::string& text) { std::ofstream(file) << text; }
    // A timing module at the PCI folder `path` (below sys/devices), enumerated as `entry`.
    void addModule(const std::string& entry, const std::string& path, const std::string& device = "0x7405") {
        const fs::path folder = root / "sys/devices" / path;
        fs::create_directories(folder);
        write(folder / "vendor", "0x1093\n");
        write(folder / "device", device + "\n");
        write(folder / "subsystem_vendor", "0x1093\n");
        write(folder / "subsystem_device", "0x7a0b\n");
        write(folder / "revision", "0x02\n");
        write(folder / "current_link_width", "4\n");
        write(folder / "max_link_width", "8\n");
        write(folder / "current_link_speed", "5.0 GT/s PCIe\n");
        write(folder / "max_link_speed", "16.0 GT/s PCIe\n");
        const fs::path classEntry = root / "sys/class/tiktal" / entry;
        fs::create_directories(classEntry);
        write(classEntry / "serial_number", "1a2b3c4d\n");
        fs::create_directory_symlink(fs::relative(folder, classEntry), classEntry / "device");
    }
    fs::path root;
};

TEST_F(Machine, NoDriverClassMeansNoDevices) {
    APALDeviceIterator devices;
    EXPECT_TRUE(devices.isEnd());
    EXPECT_THROW(devices.getToken(), zrerr::Exception);
}

TEST_F(Machine, PropertiesTokensAndSlotPathsThroughBridges) {
    fs::create_directories(root / "sys/devices/pci0000:40");
    addModule("tiktal0", "pci0000:00/0000:00:1c.0/0000:03:00.0/0000:04:0a.1");
    addModule("tiktal1", "pci0000:40/0000:40:02.0/0000:41:00.0", "0x7406");
    APALDeviceIterator devices;
    ASSERT_FALSE(devices.isEnd());
    EXPECT_EQ(devices.getBusPropertyU32("pciVendorID"), 0x1093u);
    EXPECT_EQ(devices.getBusPropertyU32("pciDeviceID"), 0x7405u);
    EXPECT_EQ(devices.getBusPropertyU32("pciSubsystemID"), 0x7A0Bu);
    EXPECT_EQ(devices.getBusPropertyU32("pciBusNumber"), 4u);
    EXPECT_EQ(devices.getBusPropertyU32("pciDeviceNumber"), 0x0Au);
    EXPECT_EQ(devices.getBusPropertyU32("pciFunctionNumber"), 1u);
    EXPECT_EQ(devices.getBusPropertyU32("pcieLinkWidth"), 4u);
    EXPECT_EQ(devices.getBusPropertyU32("pcieMaxLinkWidth"), 8u);
    EXPECT_EQ(devices.getBusPropertyU32("pcieTransferRate"), 2u);
    EXPECT_EQ(devices.getBusPropertyU32("pcieMaxTransferRate"), 4u);
    EXPECT_EQ(devices.getDevicePropertyString("serialNumber"), "1a2b3c4d");
    EXPECT_EQ(devices.getDevicePropertyU32("serialNumber"), 0x1A2B3C4Du);
    // Root 0, then 1c.0 -> E0, 00.0 -> 00, the device's 0a.1 -> 51.
    EXPECT_EQ(devices.getBusPropertyString("pciSlotPath"), "0000:00:E0:00:51");
    EXPECT_EQ(devices.getToken(), "PCI:VEN_1093&DEV_7405&SUBSYS_10937A0B&REV_02/0000:00:E0:00:51");
    EXPECT_EQ(devices.getInterfacePath(), root.string() + "/dev/tiktal0");
    devices.next();
    ASSERT_FALSE(devices.isEnd());
    EXPECT_EQ(devices.getToken(), "PCI:VEN_1093&DEV_7406&SUBSYS_10937A0B&REV_02/0000:01:10:00");  // the second root
    devices.next();
    EXPECT_TRUE(devices.isEnd());
}

TEST_F(Machine, MissingAndMalformedPropertiesFail) {
    addModule("tiktal0", "pci0000:00/0000:00:02.0");
    const fs::path folder = root / "sys/devices/pci0000:00/0000:00:02.0";
    fs::remove(folder / "revision");
    write(folder / "vendor", "0x1093zz\n");
    write(folder / "max_link_width", "99999999999\n");
    APALDeviceIterator devices;
    const auto status = [&](auto read) {
        try {
            read();
        } catch (const zrerr::Exception& e) {
            return e.code();
        }
        return 0;
    };
    EXPECT_EQ(status([&] { devices.getBusPropertyU32("pciRevision"); }), -52006);
    EXPECT_EQ(status([&] { devices.getBusPropertyU32("pciVendorID"); }), -52005);
    EXPECT_EQ(status([&] { devices.getBusPropertyU32("pcieMaxLinkWidth"); }), -52005);
    EXPECT_EQ(status([&] { devices.getBusPropertyU32("noSuchProperty"); }), -52006);
    EXPECT_EQ(status([&] { devices.getToken(); }), -52005);  // the vendor, read first, is malformed
    write(folder / "vendor", "0x1093\n");
    EXPECT_EQ(status([&] { devices.getToken(); }), -52005) << "the files as they were when the iterator came";
    EXPECT_EQ(status([&] { APALDeviceIterator().getToken(); }), -52006);  // then the revision is missing
}

TEST_F(Machine, ModulesRemovedWhileEnumeratingAreNotPresent) {
    addModule("tiktal0", "pci0000:00/0000:00:02.0");
    addModule("tiktal1", "pci0000:00/0000:00:03.0");
    addModule("tiktal2", "pci0000:00/0000:00:04.0");
    // A class entry whose device is gone already.
    fs::remove_all(root / "sys/devices/pci0000:00/0000:00:04.0");
    APALDeviceIterator devices;
    EXPECT_EQ(devices.getInterfacePath(), root.string() + "/dev/tiktal0");
    // The second goes away before the iterator reaches it.
    fs::remove_all(root / "sys/class/tiktal/tiktal1");
    fs::remove_all(root / "sys/devices/pci0000:00/0000:00:03.0");
    devices.next();
    EXPECT_TRUE(devices.isEnd());
}

// An iterator over fixed tokens, for the composite.
class Listed final : public zrjsonconfig::DeviceIteratorInterface {
public:
    explicit Listed(std::vector<std::string> tokens) : _tokens(std::move(tokens)) {}
    std::uint32_t getBusPropertyU32(const std::string&) override { return 0; }
    std::string getBusPropertyString(const std::string&) override { return {}; }
    std::uint32_t getDevicePropertyU32(const std::string&) override { return 0; }
    std::string getDevicePropertyString(const std::string&) override { return {}; }
    std::string getInterfacePath() override { return {}; }
    std::string getToken() override { return _tokens.at(_at); }
    std::string getInstanceId() override { return {}; }
    void next() override { ++_at; }
    bool isEnd() override { return _at >= _tokens.size(); }

private:
    std::vector<std::string> _tokens;
    std::size_t _at = 0;
};

TEST(CompositeDeviceIterator, ChainsItsIteratorsAndSkipsThoseAtTheirEnd) {
    std::vector<std::unique_ptr<zrjsonconfig::DeviceIteratorInterface>> parts;
    parts.push_back(std::make_unique<Listed>(std::vector<std::string>{}));
    parts.push_back(std::make_unique<Listed>(std::vector<std::string>{"a", "b"}));
    parts.push_back(nullptr);
    parts.push_back(std::make_unique<Listed>(std::vector<std::string>{}));
    parts.push_back(std::make_unique<Listed>(std::vector<std::string>{"c"}));
    zrjsonconfig::CompositeDeviceIterator all(std::move(parts));
    std::vector<std::string> tokens;
    for (; !all.isEnd(); all.next()) tokens.push_back(all.getToken());
    EXPECT_EQ(tokens, (std::vector<std::string>{"a", "b", "c"}));
    all.next();  // past the end stays there
    EXPECT_TRUE(all.isEnd());
    EXPECT_THROW(all.getToken(), zrerr::Exception);
    zrjsonconfig::CompositeDeviceIterator none({});
    EXPECT_TRUE(none.isEnd());
}

}  // namespace
