// The items of the PXI chassis query library (session, chassis, slots, trigger bridges, devices),
// each owning one handle of the library.
#pragma once

#include <cstdint>
#include <vector>

#include "QPXILibrary.h"

namespace zrqpxi {

// Attributes of items.
constexpr std::uint32_t kChassisNumber = 0x1000;
constexpr std::uint32_t kSlotNumber = 0x2008;
constexpr std::uint32_t kPciBusNumber = 0x3000;
constexpr std::uint32_t kPciDeviceNumber = 0x3001;
constexpr std::uint32_t kPciFunctionNumber = 0x3002;

// Item types of containers.
constexpr std::uint32_t kChassisOfSession = 0;
constexpr std::uint32_t kSlotsOfChassis = 0x1000;
constexpr std::uint32_t kTriggerBridgesOfChassis = 0x1001;
constexpr std::uint32_t kDevicesInSlot = 0x2000;

// Kinds of containing items.
constexpr std::uint32_t kContainingChassis = 1;
constexpr std::uint32_t kContainingSlot = 2;

using PciAddress = zrqpxi_PciAddress;

// One handle of the library: closed when the item is destroyed, duplicated when it is copied
// (each copy owns a handle of its own). A moved-from item holds no handle. The library must
// outlive its items.
class Item {
public:
    // Takes over `handle`, which `library` handed out.
    Item(QPXILibrary& library, std::uint32_t handle) noexcept : _library(&library), _handle(handle) {}
    Item(const Item& other);
    Item(Item&& other) noexcept;
    Item& operator=(const Item& other);
    Item& operator=(Item&& other) noexcept;
    virtual ~Item();

    std::uint32_t getStringAttribute(std::uint32_t id) const;
    std::uint32_t getU32Attribute(std::uint32_t id) const;
    // The items of the container of type `type` of this item.
    std::vector<Item> getItems(std::uint32_t type) const;

    std::uint32_t handle() const noexcept { return _handle; }

protected:
    // The container of type `type` read into items of class `T`: each handle the iteration yields
    // is duplicated into an item and then closed; the container is destroyed at the end.
    template <class T>
    std::vector<T> itemsOf(std::uint32_t type) const;
    // A new handle to the item of kind `kind` that contains this one.
    std::uint32_t containing(std::uint32_t kind) const;

    QPXILibrary* _library;
    std::uint32_t _handle;
};

class Chassis;
class Slot;
class Device;
class TriggerBridge;

class Session : public Item {
public:
    // Opens a session of the library (flags 1).
    explicit Session(QPXILibrary& library);

    Device openDeviceByAddr(const PciAddress& address) const;
    Chassis openChassisByNumber(std::uint32_t number) const;
    std::vector<Chassis> getChassis() const;
    std::int32_t waitForSessionInvalidation(std::uint32_t argument) const;
    std::int32_t cancelWaitForInvalidation() const;
};

class Chassis : public Item {
public:
    using Item::Item;
    std::vector<Slot> getSlots() const;
    std::vector<TriggerBridge> getTriggerBridges() const;
};

class Slot : public Item {
public:
    using Item::Item;
    std::vector<Device> getDevices() const;
    Chassis getChassis() const;
};

class Device : public Item {
public:
    using Item::Item;
    Slot getSlot() const;
    Chassis getChassis() const;
    // {0, bus, device, function}, read in the order function, device, bus.
    PciAddress getAddress() const;
};

class TriggerBridge : public Item {
public:
    using Item::Item;
    Chassis getChassis() const;
};

}  // namespace zrqpxi
