#include "state.h"

#include "status.h"

#include <chrono>

namespace qpxisim {
namespace {

// Attributes, item types and kinds of containing items that the library's callers use.
constexpr std::uint32_t kChassisNumber = 0x1000, kSlotNumber = 0x2008, kPciBus = 0x3000, kPciDevice = 0x3001,
                        kPciFunction = 0x3002;
constexpr std::uint32_t kChassisOfSession = 0, kSlotsOfChassis = 0x1000, kBridgesOfChassis = 0x1001,
                        kDevicesInSlot = 0x2000;
constexpr std::uint32_t kContainingChassis = 1, kContainingSlot = 2;
constexpr std::uint32_t kWaitWithoutEnd = 0xFFFFFFFFu;

[[noreturn]] void failNumbered(std::int32_t code, const char* msg, const char* key, std::uint32_t value) {
    throw Failure{code, msg, {}, {{key, value}}};
}

const char* kindName(Kind kind) {
    switch (kind) {
    case Kind::session: return "session";
    case Kind::chassis: return "chassis";
    case Kind::slot: return "slot";
    case Kind::device: return "device";
    case Kind::triggerBridge: return "trigger bridge";
    }
    return "item";
}

const Item& ofKind(const Item& item, Kind kind, std::uint32_t handle) {
    if (item.kind != kind)
        throw Failure{code::kInvalidArgument, std::string("the item is a ") + kindName(item.kind) + ", not a " +
                                                  kindName(kind), {}, {{"item", handle}}};
    return item;
}

}  // namespace

std::uint32_t State::newHandle() {
    if (_lastHandle == 0xFFFFFFFFu) fail(code::kOutOfResources, "no handles left");
    return ++_lastHandle;
}

std::uint32_t State::openSession(std::shared_ptr<const Inventory> inventory) {
    auto session = std::make_shared<SessionState>();
    session->inventory = std::move(inventory);
    return open(Item{Kind::session, std::move(session)});
}

std::uint32_t State::open(Item item) {
    const std::uint32_t handle = newHandle();
    _items.emplace(handle, std::move(item));
    return handle;
}

const Item& State::item(std::uint32_t handle) const {
    const auto found = _items.find(handle);
    if (found == _items.end()) failUnknownHandle("item", handle);
    return found->second;
}

void State::close(std::uint32_t handle) { _items.erase(handle); }

const std::shared_ptr<SessionState>& State::sessionOf(std::uint32_t handle) const {
    return ofKind(item(handle), Kind::session, handle).session;
}

std::uint32_t State::openChassisByNumber(std::uint32_t session, std::uint32_t number) {
    const auto& owner = sessionOf(session);
    const auto& chassis = owner->inventory->chassis;
    for (std::size_t c = 0; c < chassis.size(); ++c)
        if (chassis[c].number == number) return open(Item{Kind::chassis, owner, c});
    failNumbered(code::kNoSuchItem, "no chassis of this number", "chassisNumber", number);
}

std::uint32_t State::openSlotByNumber(std::uint32_t chassis, std::uint32_t number) {
    const Item& of = ofKind(item(chassis), Kind::chassis, chassis);
    const auto& slots = of.chassisInfo().slots;
    for (std::size_t s = 0; s < slots.size(); ++s)
        if (slots[s].number == number) return open(Item{Kind::slot, of.session, of.chassis, s});
    failNumbered(code::kNoSuchItem, "no slot of this number in the chassis", "slotNumber", number);
}

std::uint32_t State::openDeviceByAddr(std::uint32_t session, const zrqpxi_PciAddress* address) {
    const auto& owner = sessionOf(session);
    if (!address) fail(code::kInvalidArgument, "no address");
    if (address->reserved != 0) failNumbered(code::kInvalidArgument, "the address's first word is not 0", "reserved",
                                             address->reserved);
    const auto& places = owner->inventory->places;
    const auto found = places.find(PciKey{address->bus, address->device, address->function});
    if (found != places.end())
        return open(Item{Kind::device, owner, found->second.chassis, found->second.slot, found->second.index});
    throw Failure{code::kNoSuchItem, "no device at this address in any slot", {},
                  {{"bus", address->bus}, {"device", address->device}, {"function", address->function}}};
}

std::uint32_t State::openContainingItem(std::uint32_t handle, std::uint32_t kind) {
    Item of = item(handle);
    const bool inChassis = of.kind == Kind::slot || of.kind == Kind::device || of.kind == Kind::triggerBridge;
    if (kind == kContainingChassis && inChassis) return open(Item{Kind::chassis, of.session, of.chassis});
    if (kind == kContainingSlot && of.kind == Kind::device) return open(Item{Kind::slot, of.session, of.chassis, of.slot});
    throw Failure{code::kNotContained, std::string("a ") + kindName(of.kind) + " has no containing item of this kind",
                  {}, {{"item", handle}, {"kind", kind}}};
}

std::uint32_t State::u32Attribute(std::uint32_t handle, std::uint32_t attribute) const {
    const Item& of = item(handle);
    const bool inChassis = of.kind != Kind::session;
    const bool inSlot = of.kind == Kind::slot || of.kind == Kind::device;
    if (attribute == kChassisNumber && inChassis) return of.chassisInfo().number;
    if (attribute == kSlotNumber && inSlot) return of.slotInfo().number;
    if (of.kind == Kind::device) {
        const PciDevice& device = of.slotInfo().devices[of.index];
        if (attribute == kPciBus) return device.bus;
        if (attribute == kPciDevice) return device.device;
        if (attribute == kPciFunction) return device.function;
    }
    if (attribute == kBridgeNumber && of.kind == Kind::triggerBridge)
        return of.chassisInfo().triggerBridges[of.index].number;
    throw Failure{code::kNoSuchAttribute, std::string("a ") + kindName(of.kind) + " has no such attribute", {},
                  {{"item", handle}, {"attribute", attribute}}};
}

const std::string& State::stringAttribute(std::uint32_t handle, std::uint32_t attribute) const {
    const Item& of = item(handle);
    if (attribute == kChassisModel && of.kind == Kind::chassis) return of.chassisInfo().model;
    throw Failure{code::kNoSuchAttribute, std::string("a ") + kindName(of.kind) + " has no such text attribute", {},
                  {{"item", handle}, {"attribute", attribute}}};
}

std::uint32_t State::openContainer(std::uint32_t handle, std::uint32_t type) {
    const Item of = item(handle);
    std::vector<Item> items;
    if (type == kChassisOfSession && of.kind == Kind::session) {
        for (std::size_t c = 0; c < of.session->inventory->chassis.size(); ++c)
            items.push_back({Kind::chassis, of.session, c});
    } else if (type == kSlotsOfChassis && of.kind == Kind::chassis) {
        for (std::size_t s = 0; s < of.chassisInfo().slots.size(); ++s)
            items.push_back({Kind::slot, of.session, of.chassis, s});
    } else if (type == kBridgesOfChassis && of.kind == Kind::chassis) {
        for (std::size_t b = 0; b < of.chassisInfo().triggerBridges.size(); ++b)
            items.push_back({Kind::triggerBridge, of.session, of.chassis, 0, b});
    } else if (type == kDevicesInSlot && of.kind == Kind::slot) {
        for (std::size_t d = 0; d < of.slotInfo().devices.size(); ++d)
            items.push_back({Kind::device, of.session, of.chassis, of.slot, d});
    } else {
        throw Failure{code::kNotContained, std::string("a ") + kindName(of.kind) + " holds no items of this type", {},
                      {{"item", handle}, {"itemType", type}}};
    }
    const std::uint32_t container = newHandle();
    _containers.emplace(container, std::move(items));
    return container;
}

std::uint32_t State::duplicateContainer(std::uint32_t container) {
    containerSize(container);  // refuses unknown containers
    std::vector<Item> copy = _containers.at(container);
    const std::uint32_t handle = newHandle();
    _containers.emplace(handle, std::move(copy));
    return handle;
}

std::uint32_t State::containerSize(std::uint32_t container) const {
    const auto found = _containers.find(container);
    if (found == _containers.end()) failUnknownHandle("container", container);
    return static_cast<std::uint32_t>(found->second.size());
}

std::uint32_t State::nextItem(std::uint32_t container, std::uint32_t* iterator) {
    const std::uint32_t size = containerSize(container);
    if (!iterator) fail(code::kInvalidArgument, "no iterator");
    if (*iterator >= size) failNumbered(code::kInvalidArgument, "the iterator is at the end", "iterator", *iterator);
    const std::uint32_t handle = open(_containers.at(container)[*iterator]);
    ++*iterator;
    return handle;
}

void State::destroyContainer(std::uint32_t container) { _containers.erase(container); }

std::int32_t State::waitForInvalidation(std::unique_lock<std::mutex>& lock, std::uint32_t session,
                                        std::uint32_t timeoutInMs) {
    const std::shared_ptr<SessionState> waited = sessionOf(session);  // kept alive while it waits
    const std::uint64_t cancels = waited->cancels;
    const auto ended = [&] { return waited->invalidated || waited->cancels != cancels; };
    ++_waiting[waited.get()];
    if (timeoutInMs == kWaitWithoutEnd)
        _changed.wait(lock, ended);
    else
        _changed.wait_for(lock, std::chrono::milliseconds(timeoutInMs), ended);
    if (--_waiting[waited.get()] == 0) _waiting.erase(waited.get());
    return waited->invalidated ? 1 : waited->cancels != cancels ? 2 : 0;
}

std::int32_t State::cancelWaits(std::uint32_t session) {
    const auto& waited = sessionOf(session);
    ++waited->cancels;
    _changed.notify_all();
    const auto found = _waiting.find(waited.get());
    return found == _waiting.end() ? 0 : static_cast<std::int32_t>(found->second);
}

void State::invalidateAll() {
    for (auto& [handle, item] : _items) item.session->invalidated = true;
    _changed.notify_all();
}

void State::logCall(std::string line) {
    log.push_back(std::move(line));
    if (log.size() > kLogLines) log.pop_front();
}

void State::clear() {
    invalidateAll();
    _items.clear();
    _containers.clear();
    log.clear();
}

State& state() {
    static auto* instance = new State();  // never destroyed: calls may come during exit
    return *instance;
}

std::mutex& stateLock() {
    static auto* lock = new std::mutex();
    return *lock;
}

}  // namespace qpxisim
