// Entry points: sessions, items and their attributes, duplicating and closing handles.
#include "frame.h"

using namespace qpxisim;

namespace {
constexpr std::uint32_t kSessionFlags = 1;
}  // namespace

uint32_t zrqpxi_openPXISession(uint32_t flags, zrqpxi_Status* st) {
    // The file is read before the lock is taken: a slow file system holds up no other call.
    std::shared_ptr<const Inventory> inventory;
    Failure unreadable{0, {}, {}, {}};
    if (flags == kSessionFlags) {
        try {
            inventory = readInventory(inventoryPath());
        } catch (Failure& failure) {
            unreadable = std::move(failure);
        } catch (const std::bad_alloc&) {
            unreadable = Failure{code::kOutOfResources, "out of memory", {}, {}};
        }
    }
    return run("openPXISession", {flags}, st, [&](State& s) {
        if (flags != kSessionFlags) throw Failure{code::kInvalidArgument, "the flags are not 1", {}, {{"flags", flags}}};
        if (unreadable.code) throw unreadable;
        return s.openSession(inventory);
    });
}

uint32_t zrqpxi_openChassisByNumber(uint32_t session, uint32_t chassisNumber, zrqpxi_Status* st) {
    return run("openChassisByNumber", {session, chassisNumber}, st,
               [=](State& s) { return s.openChassisByNumber(session, chassisNumber); });
}

uint32_t zrqpxi_openSlotByNumber(uint32_t chassis, uint32_t slotNumber, zrqpxi_Status* st) {
    return run("openSlotByNumber", {chassis, slotNumber}, st,
               [=](State& s) { return s.openSlotByNumber(chassis, slotNumber); });
}

uint32_t zrqpxi_openDeviceByAddr(uint32_t session, const zrqpxi_PciAddress* address, zrqpxi_Status* st) {
    return run("openDeviceByAddr",
               address ? std::initializer_list<std::uint64_t>{session, address->bus, address->device, address->function}
                       : std::initializer_list<std::uint64_t>{session},
               st, [=](State& s) { return s.openDeviceByAddr(session, address); });
}

uint32_t zrqpxi_openContainingItem(uint32_t item, uint32_t kind, zrqpxi_Status* st) {
    return run("openContainingItem", {item, kind}, st, [=](State& s) { return s.openContainingItem(item, kind); });
}

uint32_t zrqpxi_getU32Attribute(uint32_t item, uint32_t attribute, zrqpxi_Status* st) {
    return run("getU32Attribute", {item, attribute}, st, [=](State& s) { return s.u32Attribute(item, attribute); });
}

// The stand-in answers the length in bytes of the text: the library passes the word on unread.
uint32_t zrqpxi_getStringAttribute(uint32_t item, uint32_t attribute, zrqpxi_Status* st) {
    return run("getStringAttribute", {item, attribute}, st, [=](State& s) {
        return static_cast<uint32_t>(s.stringAttribute(item, attribute).size());
    });
}

uint32_t zrqpxi_duplicate(uint32_t item, zrqpxi_Status* st) {
    return run("duplicate", {item}, st, [=](State& s) { return s.duplicate(item); });
}

void zrqpxi_close(uint32_t item) {
    run("close", {item}, nullptr, [=](State& s) { s.close(item); });
}
