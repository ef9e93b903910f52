// Eight processes build the device list from one configuration file at once, over and over, while
// modules appear and disappear in the simulated machine and a ninth process is killed in the
// middle of its writes: after every step the file is whole JSON, no device is lost, and no alias
// ever changes or is given twice.
#include <gtest/gtest.h>

#include <chrono>
#include <cstdlib>
#include <filesystem>
#include <map>
#include <memory>
#include <string>
#include <thread>
#include <vector>

#include "config/configuration.h"
#include "config/device_list.h"
#include "config/loader.h"
#include "config/sync_attribute_provider.h"
#include "config_test_support.h"
#include "forked.h"
#include "machine_command.h"

namespace {

using namespace std::chrono_literals;
using configtest::exitStatusOf;
using configtest::KilledAtEnd;
using configtest::startProcess;

constexpr char kPadding[] = "PCI:padding";

// Counts its loads in the configured attributes of the device kPadding, which carries 2 MiB of
// text: every load of the process that runs it writes that much.
class Visits final : public zrjsonconfig::AttributeProviderInterface {
public:
    void provide(zrjsonconfig::DeviceIteratorInterface* device, zrjsonconfig::ConfigurationData&, cJSON* configured,
                 cJSON*) override {
        if (device || !cJSON_GetObjectItem(configured, "padding")) return;
        zrjsonconfig::setMember(configured, "visits", zrjsonconfig::newNumber(++_visits));
    }

private:
    double _visits = 0;
};

// Loads the list as the driver does, and also counts a visit, until it is killed.
[[noreturn]] void loadAndWriteForever() {
    for (;;) {
        zrjsonconfig::CompositeAttributeProvider provider;
        provider.add(std::make_unique<tiktalsae::SyncAttributeProvider>());
        provider.add(std::make_unique<Visits>());
        zrjsonconfig::LockableFile file(zrjsonconfig::configFilePath(), true);
        zrjsonconfig::APALDeviceIterator devices;
        zrjsonconfig::Configuration configuration(file);
        configuration.load(&devices, provider);
    }
}

class DeviceListProcesses : public ::testing::Test {
protected:
    void machine(const std::string& arguments) { tiktaltest::runMachineCommand(arguments); }

    // Reads the file as it is now, without its lock (it is only ever replaced whole), and checks
    // it against everything seen before.
    void checkFile(const std::string& when) {
        const std::string path = _root.configPath();
        const std::string text = configtest::readText(path);
        zrjsonconfig::LoadedConfiguration loaded;
        ASSERT_NO_THROW(loaded = zrjsonconfig::parseConfiguration(text, path)) << when << ": " << text.size() << " bytes";
        zrjsonconfig::AliasesInUse aliases;
        for (const auto& [token, entry] : loaded.data.entries()) {
            const cJSON* alias = cJSON_GetObjectItem(entry->configured(), "alias");
            ASSERT_TRUE(cJSON_IsString(alias)) << when << ": " << token;
            const auto [seen, isNew] = _aliases.emplace(token, alias->valuestring);
            EXPECT_EQ(seen->second, alias->valuestring) << when << ": the alias of " << token << " changed";
            EXPECT_FALSE(aliases.contains(alias->valuestring)) << when << ": " << alias->valuestring << " twice";
            aliases.add(alias->valuestring);
        }
        for (const auto& [token, alias] : _aliases)
            EXPECT_NE(loaded.data.find(token), nullptr) << when << ": " << token << " (" << alias << ") was lost";
    }

    configtest::Sysroot _root;
    std::map<std::string, std::string> _aliases;  // every token ever seen, with its alias
};

TEST_F(DeviceListProcesses, ModulesComeAndGoWhileEightProcessesLoadAndOneIsKilledWriting) {
    machine("create " + _root.root() + R"( '{"chassis":[{"number":1,"slots":{"2":{},"4":{}}},{"number":3,"slots":{"5":{}}}]}')");
    configtest::writeText(_root.configPath(), std::string(R"({"version":1,"devices":{")") + kPadding +
                                                  R"(":{"alias":"Padding","padding":")" + std::string(2 << 20, 'p') +
                                                  R"("}}})");
    const std::string stop = _root.root() + "/stop";
    std::vector<pid_t> loaders;
    std::vector<KilledAtEnd> guards;
    for (int n = 0; n < 8; ++n) {
        loaders.push_back(startProcess([stop] {
            while (!std::filesystem::exists(stop)) tiktalsae::loadDeviceList();
        }));
        guards.emplace_back(loaders.back());
    }

    // Modules appear in new slots and in the slots of removed ones, and disappear.
    const std::vector<std::string> steps = {"add 1 6", "remove tiktal0", "add 3 7",  "remove tiktal2",
                                            "add 1 2", "add 3 9",        "remove tiktal3", "add 3 5"};
    for (const std::string& change : steps) {
        std::this_thread::sleep_for(150ms);
        checkFile("before " + change);
        machine(change.substr(0, change.find(' ')) + " " + _root.root() + change.substr(change.find(' ')));
    }

    // The ninth process writes 2 MiB at each load. It is killed as soon as its new file appears
    // beside the configuration, that is, in the middle of a write; the others go on loading.
    int killedWhileWriting = 0;
    for (int kill = 0; kill < 5; ++kill) {
        const pid_t victim = startProcess(loadAndWriteForever);
        KilledAtEnd guard(victim);
        // Looked for every millisecond, not in a busy loop: on a machine of two cores a spinning
        // test takes the time the nine processes need.
        const auto limit = std::chrono::steady_clock::now() + 30s;
        while (configtest::namesIn(_root.dataDirectory()).size() < 2 && std::chrono::steady_clock::now() < limit)
            std::this_thread::sleep_for(1ms);
        ::kill(victim, SIGKILL);
        EXPECT_EQ(exitStatusOf(victim), 128 + SIGKILL);
        guard.pid = -1;
        if (configtest::namesIn(_root.dataDirectory()).size() > 1) ++killedWhileWriting;
        checkFile("after kill " + std::to_string(kill));
    }
    EXPECT_GT(killedWhileWriting, 0);

    configtest::writeText(stop, "");
    for (KilledAtEnd& guard : guards) {
        EXPECT_EQ(exitStatusOf(guard.pid), 0) << "a loader failed (its message is above)";
        guard.pid = -1;
    }
    checkFile("at the end");

    // Every module ever seen is in the list; those in the machine now are present.
    machine("add " + _root.root() + " 1 8");
    const zrjsonconfig::ConfigurationData data = tiktalsae::loadDeviceList();
    checkFile("after the last load");
    int present = 0;
    for (const auto& [token, entry] : data.entries())
        present += cJSON_IsTrue(cJSON_GetObjectItem(entry->provided(), "is_present"));
    EXPECT_EQ(present, 6) << "chassis/slot 1/2, 1/4, 1/8, 3/5, 3/7, 3/9";
    EXPECT_EQ(data.entries().size(), 1u + 7u) << "the padding device and the modules of seven slots";
    EXPECT_EQ(configtest::namesIn(_root.dataDirectory()), std::vector<std::string>{"tiktal.config"})
        << "the last writer removed what the killed ones left";
}

}  // namespace
