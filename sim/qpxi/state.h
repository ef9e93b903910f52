// The state of the PXI chassis query stand-in: sessions, the items they reach (each open handle a
// counted object), containers, waits, and the log of calls. It takes no lock of its own: the
// entry points hold stateLock() around every use.
#pragma once

#include "inventory.h"
#include "zrqpxi.h"

#include <condition_variable>
#include <cstdint>
#include <deque>
#include <map>
#include <memory>
#include <mutex>
#include <string>
#include <vector>

namespace qpxisim {

// A session's view: the inventory read when it opened, and what happened to it since.
struct SessionState {
    std::shared_ptr<const Inventory> inventory;
    bool invalidated = false;
    std::uint64_t cancels = 0;  // waits that started before the last cancel end
};

enum class Kind { session, chassis, slot, device, triggerBridge };

// What a handle stands for: an item of the inventory of one session. `chassis`, `slot` and
// `index` (device or trigger bridge) locate it, as far as its kind needs.
struct Item {
    Kind kind;
    std::shared_ptr<SessionState> session;
    std::size_t chassis = 0, slot = 0, index = 0;

    const Chassis& chassisInfo() const { return session->inventory->chassis[chassis]; }
    const Slot& slotInfo() const { return chassisInfo().slots[slot]; }
};

// Attributes the stand-in answers, beside the library's own 0x1000, 0x2008 and 0x3000 to 0x3002.
constexpr std::uint32_t kChassisModel = 0x1001;  // string attribute of a chassis
constexpr std::uint32_t kBridgeNumber = 0x4000;  // the number of a trigger bridge

class State {
public:
    std::uint32_t openSession(std::shared_ptr<const Inventory> inventory);
    std::uint32_t open(Item item);
    // The item of `handle`; refuses handles that are not open items.
    const Item& item(std::uint32_t handle) const;
    std::uint32_t duplicate(std::uint32_t handle) { return open(item(handle)); }
    void close(std::uint32_t handle);

    std::uint32_t openChassisByNumber(std::uint32_t session, std::uint32_t number);
    std::uint32_t openSlotByNumber(std::uint32_t chassis, std::uint32_t number);
    std::uint32_t openDeviceByAddr(std::uint32_t session, const zrqpxi_PciAddress* address);
    std::uint32_t openContainingItem(std::uint32_t handle, std::uint32_t kind);
    std::uint32_t u32Attribute(std::uint32_t handle, std::uint32_t attribute) const;
    const std::string& stringAttribute(std::uint32_t handle, std::uint32_t attribute) const;

    std::uint32_t openContainer(std::uint32_t handle, std::uint32_t type);
    std::uint32_t duplicateContainer(std::uint32_t container);
    std::uint32_t containerSize(std::uint32_t container) const;
    std::uint32_t nextItem(std::uint32_t container, std::uint32_t* iterator);
    void destroyContainer(std::uint32_t container);

    // Waits, with the caller's lock on stateLock(), until the session is invalidated (1), a
    // cancel comes (2) or `timeoutInMs` passes (0; 0xFFFFFFFF waits without end).
    std::int32_t waitForInvalidation(std::unique_lock<std::mutex>& lock, std::uint32_t session,
                                     std::uint32_t timeoutInMs);
    // Ends the waits on the session; the number of waits ended.
    std::int32_t cancelWaits(std::uint32_t session);
    // Invalidates every open session, as a change of the chassis configuration does.
    void invalidateAll();

    std::uint32_t openItems() const { return static_cast<std::uint32_t>(_items.size()); }
    std::uint32_t openContainers() const { return static_cast<std::uint32_t>(_containers.size()); }
    // Closes every handle and container and ends every wait; handles go on counting.
    void clear();

    // Adds a call to the log, which keeps the last kLogLines calls: a process that goes on calling
    // does not grow without end.
    void logCall(std::string line);
    static constexpr std::size_t kLogLines = 1 << 16;
    std::deque<std::string> log;

private:
    std::uint32_t newHandle();
    const std::shared_ptr<SessionState>& sessionOf(std::uint32_t handle) const;

    std::uint32_t _lastHandle = 0;
    std::map<std::uint32_t, Item> _items;
    std::map<std::uint32_t, std::vector<Item>> _containers;
    std::map<const SessionState*, std::uint32_t> _waiting;  // waits in progress per session
    std::condition_variable _changed;
};

State& state();
std::mutex& stateLock();

}  // namespace qpxisim
