// Simulated devices: the ".fake" files of the data directory as devices of their own, their
// properties and the mistakes of their files, and their place in the device list beside the
// modules of a machine that the machine command lays out.
#include <sys/stat.h>
#include <unistd.h>

#include <gtest/gtest.h>

#include <cerrno>
#include <cstdlib>
#include <filesystem>
#include <functional>
#include <stdexcept>
#include <string>
#include <vector>

#include "config/device_list.h"
#include "config/sync_fake_device_iterator.h"
#include "config_test_support.h"
#include "forked.h"
#include "json/zrjsonlh.h"
#include "platform/platform.h"
#include "machine_command.h"

namespace {

using configtest::Details;
using configtest::failureOf;
using tiktalsae::SyncFakeDeviceIterator;

constexpr char kBoard[] = R"({"serialNumber":"5eed0001","pciBusNumber":4294967295,"pcideviceNUMBER":0,)"
                          R"("fraction":1.5,"negative":-1,"tooLarge":4294967296,"digits":"7","flag":true,"seven":7})";

class FakeDevices : public ::testing::Test {
protected:
    std::string pathOf(const std::string& file) const { return _root.dataDirectory() + "/" + file; }
    void fake(const std::string& file, const std::string& text) const { configtest::writeText(pathOf(file), text); }
    void machine(const std::string& arguments) const { tiktaltest::runMachineCommand(arguments); }

    // The device names of the data directory, each checked to be its token, path and instance id.
    static std::vector<std::string> names() {
        std::vector<std::string> found;
        for (SyncFakeDeviceIterator devices; !devices.isEnd(); devices.next()) {
            found.push_back(devices.getToken());
            EXPECT_EQ(devices.getInterfacePath(), found.back());
            EXPECT_EQ(devices.getInstanceId(), found.back());
        }
        return found;
    }

    std::string member(const std::string& token, bool provided, const char* name) const {
        const zrjsonconfig::ConfigurationData data = tiktalsae::loadDeviceList();
        const auto entry = data.find(token);
        if (!entry) return "no device " + token;
        return zrjsonlh::printUnformatted(cJSON_GetObjectItem(provided ? entry->provided() : entry->configured(), name));
    }

    configtest::Sysroot _root;
};

// The platform's side: the listing tells regular files from the rest without following links,
// and reading refuses what is not a regular file at once, a pipe too (it would block).
TEST_F(FakeDevices, ThePlatformListsTheFolderSortedAndReadsOnlyRegularFiles) {
    std::vector<platform::DirectoryEntry> entries{{"stale", true}};
    EXPECT_EQ(platform::listDirectory(_root.dataDirectory(), entries), ENOENT);
    EXPECT_TRUE(entries.empty());
    fake("b", "text");
    fake("A", "");
    std::filesystem::create_symlink(pathOf("b"), pathOf("link"));
    ASSERT_EQ(::mkfifo(pathOf("pipe").c_str(), 0600), 0);
    std::filesystem::create_directories(pathOf("folder"));
    ASSERT_EQ(platform::listDirectory(_root.dataDirectory(), entries), 0);
    std::vector<std::string> listed;
    for (const platform::DirectoryEntry& entry : entries) listed.push_back(entry.name + (entry.regularFile ? " file" : ""));
    EXPECT_EQ(listed, (std::vector<std::string>{"A file", "b file", "folder", "link", "pipe"}));

    std::string text = "stale";
    EXPECT_FALSE(platform::readRegularFile(pathOf("b"), 4, text));
    EXPECT_EQ(text, "text");
    EXPECT_EQ(platform::readRegularFile(pathOf("b"), 3, text).code, EFBIG);
    EXPECT_EQ(text, "");
    for (const char* other : {"link", "pipe", "folder", "missing"})
        EXPECT_EQ(platform::readRegularFile(pathOf(other), 4, text).code, ENOENT) << other;
}

TEST_F(FakeDevices, EachFileWithTheExtensionFakeIsADeviceNamedAfterIt) {
    EXPECT_TRUE(names().empty()) << "no data directory: no devices";
    fake("board1.fake", "{}");
    fake("a.b.fake", "{}");
    for (const char* ignored : {"board2.FAKE", "board3.fake.bak", "fake", ".fake", "\xff.fake", "tiktal.config"})
        fake(ignored, "not even JSON");
    std::filesystem::create_directories(pathOf("folder.fake"));
    std::filesystem::create_symlink(pathOf("board1.fake"), pathOf("link.fake"));
    ASSERT_EQ(::mkfifo(pathOf("pipe.fake").c_str(), 0600), 0);
    EXPECT_EQ(names(), (std::vector<std::string>{"FAKE:TIKTAL:a.b", "FAKE:TIKTAL:board1"}));

    SyncFakeDeviceIterator devices;
    devices.next();
    devices.next();
    devices.next();
    EXPECT_TRUE(devices.isEnd());
    const Details none = failureOf([&] { devices.getToken(); });
    EXPECT_EQ(none.code, -52006);
    EXPECT_EQ(none.records, (std::vector<std::string>{"# No current simulated device"}));
}

TEST_F(FakeDevices, PropertiesAreTheMembersOfTheFileChecked) {
    fake("board1.fake", kBoard);
    SyncFakeDeviceIterator device;
    EXPECT_EQ(device.getBusPropertyU32("pciBusNumber"), 4294967295u);
    EXPECT_EQ(device.getDevicePropertyU32("pciDeviceNumber"), 0u) << "names match ignoring ASCII case";
    EXPECT_EQ(device.getDevicePropertyString("serialNumber"), "5eed0001");
    EXPECT_EQ(device.getBusPropertyString("digits"), "7");

    const std::string path = "kUsageTypeFilePath=" + pathOf("board1.fake");
    const Details missing = failureOf([&] { device.getBusPropertyU32("pciRevision"); });
    EXPECT_EQ(missing.code, -52006);
    EXPECT_EQ(missing.constant, "jsonErrorsObjectItemNotFound");
    EXPECT_EQ(missing.records, (std::vector<std::string>{path, "# No member \"pciRevision\""}));
    EXPECT_EQ(failureOf([&] { device.getDevicePropertyString("pciSlotPath"); }).code, -52006);

    for (const char* name : {"fraction", "negative", "tooLarge", "digits", "flag"}) {
        const Details wrong = failureOf([&] { device.getDevicePropertyU32(name); });
        EXPECT_EQ(wrong.code, -52004) << name;
        EXPECT_EQ(wrong.constant, "jsonErrorsTypeMismatch") << name;
        EXPECT_EQ(wrong.records.at(0), path) << name;
    }
    const Details notText = failureOf([&] { device.getBusPropertyString("seven"); });
    EXPECT_EQ(notText.code, -52004);
    EXPECT_EQ(notText.records, (std::vector<std::string>{path, "# \"seven\" is not text"}));
}

TEST_F(FakeDevices, AFileThatIsNoDeviceJsonFailsTheStepThatReachesItNamingTheFile) {
    fake("a.fake", "{}");  // read on construction; b.fake is read by the step after it
    const std::string padded = "{}" + std::string(SyncFakeDeviceIterator::kMaxFileSize - 2, ' ');
    const std::vector<std::pair<std::string, std::string>> invalid{
        {"", "# The file is not JSON"},
        {"{\"a\":", "# The file is not JSON"},
        {"{} {}", "# The file holds more after its JSON value"},
        {"{\"a\":\"\xc3\x28\"}", "# The file is not valid UTF-8"},
        {std::string("{\"a\":\"\0\"}", 9), "# The file holds a NUL byte"},
        {"{\"a\":1e999}", "# A number is beyond the range of a double"},
        {std::string(100000, '[') + std::string(100000, ']'), "# The file is not JSON"},
        {padded + " ", "# The file is larger than 1 MiB"}};
    for (const auto& [text, comment] : invalid) {
        fake("b.fake", text);
        SyncFakeDeviceIterator devices;
        const Details failed = failureOf([&] { devices.next(); });
        EXPECT_EQ(failed.code, -52005) << comment;
        EXPECT_EQ(failed.constant, "jsonErrorsInvalidJSON") << comment;
        EXPECT_EQ(failed.records, (std::vector<std::string>{"kUsageTypeFilePath=" + pathOf("b.fake"), comment}));
    }
    fake("b.fake", "[{}]");
    EXPECT_EQ(failureOf([] { SyncFakeDeviceIterator devices; devices.next(); }).code, -52004) << "not an object";

    fake("b.fake", padded);
    EXPECT_EQ(names().size(), 2u) << "exactly 1 MiB is still a device";
}

TEST_F(FakeDevices, AFileThatCannotBeOpenedFailsWithTheFileLayersStatus) {
    fake("board1.fake", "{}");
    ASSERT_EQ(::chmod(pathOf("board1.fake").c_str(), 0), 0);
    ASSERT_EQ(::chmod(_root.root().c_str(), 0755), 0);
    // Root opens any file, so the child drops to the user nobody first.
    const pid_t child = configtest::startProcess([&] {
        if (::geteuid() == 0 && (::setgid(65534) != 0 || ::setuid(65534) != 0)) throw std::runtime_error("setuid");
        const Details failed = failureOf([] { SyncFakeDeviceIterator devices; });
        if (failed.code != -52006 || failed.api != "open" || failed.osCode != EACCES ||
            failed.records != std::vector<std::string>{"kUsageTypeFilePath=" + pathOf("board1.fake"), "# Failed to open file"})
            throw std::runtime_error("not the failure to open the file");
    });
    EXPECT_EQ(configtest::exitStatusOf(child), 0);
}

TEST_F(FakeDevices, TheDeviceListHoldsThemAfterTheModulesAndKeepsThemWhenTheirFileGoes) {
    machine("create " + _root.root() + R"( '{"chassis":[{"number":1,"slots":{"2":{}}}]}')");
    machine("fake " + _root.root() + " board1");
    const std::string token = "FAKE:TIKTAL:board1";
    const zrjsonconfig::ConfigurationData data = tiktalsae::loadDeviceList();
    const zrjsonconfig::JsonTree file = data.configuredJson();
    const cJSON* devices = cJSON_GetObjectItem(file.get(), "devices");
    ASSERT_EQ(cJSON_GetArraySize(devices), 2);
    EXPECT_EQ(devices->child->next->string, token) << "modules first";
    // Its PCI address is in no chassis, so it gets a numbered alias and no PXI location.
    EXPECT_EQ(zrjsonlh::printUnformatted(data.find(token)->configured()),
              R"({"alias":"Sync1","serial_number":"5eed0001","simulated":false,"device_id":29701,)"
              R"("subsystem_id":31243,"pxi_chassis_number":-1,"pxi_slot_number":-1})");
    EXPECT_EQ(zrjsonlh::printUnformatted(data.find(token)->provided()),
              R"({"is_present":true,"interface_path":"FAKE:TIKTAL:board1","pci_bus":255,"pci_device":0,)"
              R"("pci_function":0,"pci_link_width":4,"pci_max_link_width":4,"hardware_revision":"B",)"
              R"("pci_link_speed":1,"pci_link_speed_max":1})");

    machine("remove-fake " + _root.root() + " board1");
    EXPECT_EQ(member(token, false, "alias"), "\"Sync1\"");
    EXPECT_EQ(member(token, true, "is_present"), "false");
    EXPECT_EQ(member(token, true, "interface_path"), "\"\"");

    std::string text = configtest::readText(_root.configPath());
    const std::string notSimulated = "\"simulated\":\tfalse";
    text.replace(text.rfind(notSimulated), notSimulated.size(), "\"simulated\":\ttrue");
    configtest::writeText(_root.configPath(), text);
    EXPECT_EQ(member(token, true, "is_present"), "true") << "configured as simulated";
}

TEST_F(FakeDevices, AnInvalidFileFailsTheDeviceListAndLeavesTheConfigurationFileAsItWas) {
    machine("create " + _root.root() + R"( '{"chassis":[{"number":1,"slots":{"2":{}}}]}')");
    tiktalsae::loadDeviceList();
    const std::string before = configtest::readText(_root.configPath());
    fake("broken.fake", "{\"pciRevision\":");
    const Details failed = failureOf([] { tiktalsae::loadDeviceList(); });
    EXPECT_EQ(failed.code, -52005);
    EXPECT_EQ(failed.records.at(0), "kUsageTypeFilePath=" + pathOf("broken.fake"));
    EXPECT_EQ(configtest::readText(_root.configPath()), before);

    // A file without a property that the providers ask for fails too; that failure comes during
    // the configuration's load, which traces it.
    fake("broken.fake", "{}");
    testing::internal::CaptureStderr();
    EXPECT_EQ(failureOf([] { tiktalsae::loadDeviceList(); }).code, -52006);
    const std::string trace = testing::internal::GetCapturedStderr();
    EXPECT_NE(trace.find(pathOf("broken.fake")), std::string::npos) << trace;
    EXPECT_NE(trace.find(R"(No member \")"), std::string::npos) << trace;
    EXPECT_EQ(configtest::readText(_root.configPath()), before);
}

}  // namespace
