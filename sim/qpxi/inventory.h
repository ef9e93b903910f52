// The chassis inventory of the simulated machine: $TIKTAL_SYSROOT/etc/tiktal/chassis.json, as it
// is when a session opens, read and checked whole (README.md describes the format).
#pragma once

#include <cstdint>
#include <map>
#include <memory>
#include <string>
#include <tuple>
#include <vector>

namespace qpxisim {

struct PciDevice {
    std::uint32_t bus, device, function;
};

struct Slot {
    std::uint32_t number;
    std::vector<PciDevice> devices;
};

struct TriggerBridge {
    std::uint32_t number;
};

struct Chassis {
    std::uint32_t number;
    std::string model;
    std::vector<Slot> slots;
    std::vector<TriggerBridge> triggerBridges;
};

// A device's place in the inventory: the positions of its chassis, slot and address in their lists.
struct DevicePlace {
    std::size_t chassis, slot, index;
};

using PciKey = std::tuple<std::uint32_t, std::uint32_t, std::uint32_t>;  // bus, device, function

struct Inventory {
    std::vector<Chassis> chassis;
    std::map<PciKey, DevicePlace> places;  // every device's place by its address
};

// The largest inventory file read; a larger one is refused.
constexpr std::size_t kMaxInventoryBytes = 1 << 20;

// The path of the inventory file.
std::string inventoryPath();

// The inventory of the file: none when the file does not exist (a machine without chassis).
// Throws a Failure (kBadInventory, the path and what is wrong) when it cannot be read or breaks
// the format. A file parsed once is not parsed again while it stays the same (inventory_cache.cpp).
std::shared_ptr<const Inventory> readInventory(const std::string& path);

// Reads the whole text of the file: false when the file does not exist. Throws as readInventory.
bool readInventoryText(const std::string& path, std::string& text);

// Parses the text read from the file at `path`; a Failure names the path.
std::shared_ptr<const Inventory> parseInventoryOf(const std::string& text, const std::string& path);

// Parses the text of an inventory file; throws a Failure naming what is wrong.
Inventory parseInventory(const std::string& text);

}  // namespace qpxisim
