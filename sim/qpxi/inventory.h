// The chassis inventory of the simulated machine: $TIKTAL_SYSROOT/etc/tiktal/chassis.json, read
// and checked whole when a session opens (README.md describes the format).
#pragma once

#include <cstdint>
#include <memory>
#include <string>
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

struct Inventory {
    std::vector<Chassis> chassis;
};

// The largest inventory file read; a larger one is refused.
constexpr std::size_t kMaxInventoryBytes = 1 << 20;

// The path of the inventory file.
std::string inventoryPath();

// Reads the inventory file: none when the file does not exist (a machine without chassis).
// Throws a Failure (kBadInventory, the path and what is wrong) when it cannot be read or breaks
// the format.
std::shared_ptr<const Inventory> readInventory(const std::string& path);

// Parses the text of an inventory file; throws a Failure naming what is wrong.
Inventory parseInventory(const std::string& text);

}  // namespace qpxisim
