#include "config/device_list.h"

#include <exception>
#include <map>
#include <memory>
#include <string>
#include <tuple>
#include <vector>

#include "config/configuration.h"
#include "config/sync_attribute_provider.h"
#include "config/sync_fake_device_iterator.h"
#include "platform/platform.h"

namespace tiktalsae {
namespace {

using zrjsonconfig::ConfigurationData;
using zrjsonconfig::DeviceEntry;

void trace(const std::string& text) {
    const std::string line = text + "\n";
    platform::writeDebugOutput(line.data(), line.size());
}

using PciAddress = std::tuple<double, double, double>;

PciAddress pciAddressOf(const DeviceEntry& device) {
    const auto number = [&](const char* name) {
        const cJSON* item = cJSON_GetObjectItem(device.provided(), name);
        return cJSON_IsNumber(item) ? item->valuedouble : -1;
    };
    return {number("pci_bus"), number("pci_device"), number("pci_function")};
}

bool isPresent(const DeviceEntry& device) { return cJSON_IsTrue(cJSON_GetObjectItem(device.provided(), "is_present")); }

// A simulated device at the PCI address of a module present is found by that address as the
// module (the module wins the lookup); it still opens by its alias. Says so for each such file.
void reportShadowedSimulatedDevices(const ConfigurationData& data) {
    std::map<PciAddress, const DeviceEntry*> modules;
    for (const auto& [token, device] : data.entries())
        if (!isSimulatedDevice(token) && isPresent(*device)) modules.emplace(pciAddressOf(*device), device.get());
    for (const auto& [token, device] : data.entries()) {
        if (!isSimulatedDevice(token) || !isPresent(*device)) continue;
        const auto module = modules.find(pciAddressOf(*device));
        if (module == modules.end()) continue;
        const auto [bus, number, function] = module->first;
        trace("Simulated device " + simulatedDeviceFile(token) + " is left out of the lookup by PCI address: " +
              "the module " + module->second->token() + " present at bus " + std::to_string(static_cast<long>(bus)) +
              ", device " + std::to_string(static_cast<long>(number)) + ", function " +
              std::to_string(static_cast<long>(function)) + " has that address");
    }
}

}  // namespace

zrjsonconfig::ConfigurationData loadDeviceList() {
    using namespace zrjsonconfig;
    // Every failure is traced once: those of the load by the load itself, the others (opening
    // the file, listing the devices, reading the first simulated device, the lock) here.
    bool loadTraces = false;
    try {
        SyncAttributeProvider provider;
        LockableFile file(configFilePath(), true);
        std::vector<std::unique_ptr<DeviceIteratorInterface>> iterators;
        iterators.push_back(std::make_unique<APALDeviceIterator>());
        iterators.push_back(std::make_unique<SyncFakeDeviceIterator>());
        CompositeDeviceIterator devices(std::move(iterators));
        Configuration configuration(file);
        loadTraces = true;
        configuration.load(&devices, provider);
        loadTraces = false;
        ConfigurationData data = configuration.takeData();
        reportShadowedSimulatedDevices(data);
        return data;
    } catch (const std::exception& failure) {
        if (!loadTraces) trace(std::string("Fatal configuration error! ") + failure.what());
        throw;
    }
}

}  // namespace tiktalsae
