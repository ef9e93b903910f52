#include "factory/device_lookup.h"

#include "config/sync_fake_device_iterator.h"
#include "factory/pxi_resource_name.h"
#include "json/zrjsonlh.h"

namespace tiktal {
namespace {

char upper(char c) { return c >= 'a' && c <= 'z' ? static_cast<char>(c - 'a' + 'A') : c; }

bool equalsInUpperCase(const std::string& a, const std::string& b) {
    if (a.size() != b.size()) return false;
    for (std::size_t i = 0; i < a.size(); ++i)
        if (upper(a[i]) != upper(b[i])) return false;
    return true;
}

// Whether the number `name` of `object`, cut toward zero, is `expected`.
bool memberIs(const cJSON* object, const char* name, std::uint32_t expected) {
    const cJSON* item = zrjsonlh::getObjectItem(object, name);
    zrjsonlh::checkNumber(item);
    return item->valuedouble >= 0 && item->valuedouble < 4294967296.0 &&
           static_cast<std::uint32_t>(item->valuedouble) == expected;
}

}  // namespace

DeviceEntryPtr findByAlias(const zrjsonconfig::ConfigurationData& devices, const std::string& name) {
    for (const auto& [token, entry] : devices.entries()) {
        const cJSON* alias = cJSON_GetObjectItem(entry->configured(), "alias");
        if (cJSON_IsString(alias) && equalsInUpperCase(alias->valuestring, name)) return entry;
    }
    return nullptr;
}

DeviceEntryPtr findByPciAddress(const zrjsonconfig::ConfigurationData& devices, const std::string& name) {
    PxiResourceName address;
    if (parsePxiResourceName(name, address) != 0) return nullptr;
    DeviceEntryPtr first;
    for (const auto& [token, entry] : devices.entries()) {
        const cJSON* provided = entry->provided();
        if (!memberIs(provided, "pci_bus", address.bus) || !memberIs(provided, "pci_device", address.device) ||
            !memberIs(provided, "pci_function", address.function))
            continue;
        if (!tiktalsae::isSimulatedDevice(token) && cJSON_IsTrue(cJSON_GetObjectItem(provided, "is_present")))
            return entry;
        if (!first) first = entry;
    }
    return first;
}

}  // namespace tiktal
