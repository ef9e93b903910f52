#include "inventory.h"

#include "status.h"

#include <cjson/cJSON.h>

#include <cerrno>
#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <set>

namespace qpxisim {
namespace {

struct JsonDeleter {
    void operator()(cJSON* item) const { cJSON_Delete(item); }
};

[[noreturn]] void malformed(const std::string& where, const std::string& what) {
    fail(code::kBadInventory, where + ": " + what);
}

// A whole number from 0 to `max`; anything else (a fraction, a text, 1e400) is refused.
std::uint32_t number(const cJSON* object, const char* key, const std::string& where, double max) {
    const cJSON* item = cJSON_GetObjectItemCaseSensitive(object, key);
    if (!cJSON_IsNumber(item)) malformed(where, std::string("\"") + key + "\" is not a number");
    const double value = item->valuedouble;
    if (!std::isfinite(value) || value < 0 || value > max || std::floor(value) != value)
        malformed(where, std::string("\"") + key + "\" is not a whole number from 0 to " +
                             std::to_string(static_cast<unsigned long long>(max)));
    return static_cast<std::uint32_t>(value);
}

// The array `key` of the object; an absent member is an empty list.
const cJSON* list(const cJSON* object, const char* key, const std::string& where) {
    const cJSON* item = cJSON_GetObjectItemCaseSensitive(object, key);
    if (item && !cJSON_IsArray(item)) malformed(where, std::string("\"") + key + "\" is not an array");
    return item;
}

const cJSON* object(const cJSON* item, const std::string& where) {
    if (!cJSON_IsObject(item)) malformed(where, "not an object");
    return item;
}

constexpr double kU32 = 4294967295.0;

PciDevice readDevice(const cJSON* item, const std::string& where) {
    object(item, where);
    return {number(item, "bus", where, 255), number(item, "device", where, 31), number(item, "function", where, 7)};
}

Slot readSlot(const cJSON* item, const std::string& where) {
    object(item, where);
    Slot slot{number(item, "number", where, kU32), {}};
    const cJSON* device;
    int index = 0;
    cJSON_ArrayForEach(device, list(item, "devices", where))
        slot.devices.push_back(readDevice(device, where + ".devices[" + std::to_string(index++) + "]"));
    return slot;
}

Chassis readChassis(const cJSON* item, const std::string& where) {
    object(item, where);
    Chassis chassis{number(item, "number", where, kU32), {}, {}, {}};
    if (const cJSON* model = cJSON_GetObjectItemCaseSensitive(item, "model")) {
        if (!cJSON_IsString(model)) malformed(where, "\"model\" is not a text");
        chassis.model = model->valuestring;
    }
    std::set<std::uint32_t> slotNumbers;
    const cJSON* entry;
    int index = 0;
    cJSON_ArrayForEach(entry, list(item, "slots", where)) {
        const std::string at = where + ".slots[" + std::to_string(index++) + "]";
        chassis.slots.push_back(readSlot(entry, at));
        if (!slotNumbers.insert(chassis.slots.back().number).second) malformed(at, "a second slot of this number");
    }
    index = 0;
    cJSON_ArrayForEach(entry, list(item, "triggerBridges", where)) {
        const std::string at = where + ".triggerBridges[" + std::to_string(index++) + "]";
        object(entry, at);
        chassis.triggerBridges.push_back({number(entry, "number", at, kU32)});
    }
    return chassis;
}

// Enters the devices of the last chassis read in the inventory's places.
void placeDevices(Inventory& inventory, const std::string& where) {
    const std::size_t c = inventory.chassis.size() - 1;
    const std::vector<Slot>& slots = inventory.chassis[c].slots;
    for (std::size_t s = 0; s < slots.size(); ++s)
        for (std::size_t d = 0; d < slots[s].devices.size(); ++d) {
            const PciDevice& device = slots[s].devices[d];
            const PciKey key{device.bus, device.device, device.function};
            if (!inventory.places.emplace(key, DevicePlace{c, s, d}).second)
                malformed(where, "a PCI address that is already in another slot");
        }
}

}  // namespace

std::string inventoryPath() {
    const char* root = std::getenv("TIKTAL_SYSROOT");
    return std::string(root ? root : "") + "/etc/tiktal/chassis.json";
}

Inventory parseInventory(const std::string& text) {
    std::unique_ptr<cJSON, JsonDeleter> root(cJSON_ParseWithLength(text.data(), text.size()));
    if (!root) malformed("the file", "not JSON");
    object(root.get(), "the file");
    Inventory inventory;
    std::set<std::uint32_t> chassisNumbers;
    const cJSON* entry;
    int index = 0;
    cJSON_ArrayForEach(entry, list(root.get(), "chassis", "the file")) {
        const std::string at = "chassis[" + std::to_string(index++) + "]";
        inventory.chassis.push_back(readChassis(entry, at));
        if (!chassisNumbers.insert(inventory.chassis.back().number).second)
            malformed(at, "a second chassis of this number");
        placeDevices(inventory, at);
    }
    return inventory;
}

bool readInventoryText(const std::string& path, std::string& text) {
    FILE* file = std::fopen(path.c_str(), "rb");
    if (!file && errno == ENOENT) return false;
    const auto refuse = [&path](const std::string& what) {
        throw Failure{code::kBadInventory, what, {{"path", path}}, {}};
    };
    if (!file) refuse(std::string("cannot open the inventory file: ") + std::strerror(errno));
    text.clear();
    char buffer[4096];
    std::size_t got;
    while ((got = std::fread(buffer, 1, sizeof buffer, file)) > 0 && text.size() <= kMaxInventoryBytes)
        text.append(buffer, got);
    const bool failed = std::ferror(file);
    std::fclose(file);
    if (failed) refuse("cannot read the inventory file");
    if (text.size() > kMaxInventoryBytes) refuse("the inventory file is larger than 1 MiB");
    return true;
}

std::shared_ptr<const Inventory> parseInventoryOf(const std::string& text, const std::string& path) {
    try {
        return std::make_shared<const Inventory>(parseInventory(text));
    } catch (Failure& failure) {
        failure.texts.push_back({"path", path});
        throw;
    }
}

}  // namespace qpxisim
