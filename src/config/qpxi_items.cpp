#include "config/qpxi_items.h"

#include <utility>

#include "config/qpxi_library.h"

namespace zrqpxi {
namespace {

// One call of the library with a fresh status record; a failure raises.
template <class Function>
auto call(Function&& function) {
    return CallStatus::call(std::forward<Function>(function));
}

// Destroys a container when the reading of it ends, also by an exception.
class ContainerGuard {
public:
    ContainerGuard(QPXILibrary& library, std::uint32_t container) noexcept : _library(library), _container(container) {}
    ~ContainerGuard() { _library.destroyItemContainer(_container); }
    ContainerGuard(const ContainerGuard&) = delete;
    ContainerGuard& operator=(const ContainerGuard&) = delete;

private:
    QPXILibrary& _library;
    std::uint32_t _container;
};

}  // namespace

Item::Item(const Item& other)
    : _library(other._library),
      _handle(other._handle ? call([&](zrqpxi_Status* st) { return other._library->duplicate(other._handle, st); })
                            : 0) {}

Item::Item(Item&& other) noexcept : _library(other._library), _handle(std::exchange(other._handle, 0)) {}

Item& Item::operator=(const Item& other) {
    if (this != &other) *this = Item(other);
    return *this;
}

Item& Item::operator=(Item&& other) noexcept {
    if (this != &other) {
        if (_handle) _library->close(_handle);
        _library = other._library;
        _handle = std::exchange(other._handle, 0);
    }
    return *this;
}

Item::~Item() {
    if (_handle) _library->close(_handle);
}

std::uint32_t Item::getStringAttribute(std::uint32_t id) const {
    return call([&](zrqpxi_Status* st) { return _library->getStringAttribute(_handle, id, st); });
}

std::uint32_t Item::getU32Attribute(std::uint32_t id) const {
    return call([&](zrqpxi_Status* st) { return _library->getU32Attribute(_handle, id, st); });
}

template <class T>
std::vector<T> Item::itemsOf(std::uint32_t type) const {
    QPXILibrary& library = *_library;
    const std::uint32_t container = call([&](zrqpxi_Status* st) { return library.getItemContainer(_handle, type, st); });
    const ContainerGuard guard(library, container);
    std::uint32_t iterator = call([&](zrqpxi_Status* st) { return library.ItemIterator_begin(container, st); });
    const std::uint32_t end = call([&](zrqpxi_Status* st) { return library.ItemIterator_end(container, st); });
    std::vector<T> items;
    while (iterator != end) {
        const Item yielded(library, call([&](zrqpxi_Status* st) {
                               return library.ItemIterator_nextItem(container, &iterator, st);
                           }));
        T item(library, call([&](zrqpxi_Status* st) { return library.duplicate(yielded.handle(), st); }));
        items.push_back(std::move(item));
    }
    return items;
}

std::vector<Item> Item::getItems(std::uint32_t type) const { return itemsOf<Item>(type); }

std::uint32_t Item::containing(std::uint32_t kind) const {
    return call([&](zrqpxi_Status* st) { return _library->openContainingItem(_handle, kind, st); });
}

Session::Session(QPXILibrary& library)
    : Item(library, call([&](zrqpxi_Status* st) { return library.openPXISession(1, st); })) {}

Device Session::openDeviceByAddr(const PciAddress& address) const {
    return Device(*_library, call([&](zrqpxi_Status* st) { return _library->openDeviceByAddr(_handle, &address, st); }));
}

Chassis Session::openChassisByNumber(std::uint32_t number) const {
    return Chassis(*_library,
                   call([&](zrqpxi_Status* st) { return _library->openChassisByNumber(_handle, number, st); }));
}

std::vector<Chassis> Session::getChassis() const { return itemsOf<Chassis>(kChassisOfSession); }

std::int32_t Session::waitForSessionInvalidation(std::uint32_t argument) const {
    return call([&](zrqpxi_Status* st) { return _library->waitForSessionInvalidation(_handle, argument, st); });
}

std::int32_t Session::cancelWaitForInvalidation() const { return _library->cancelWaitForInvalidation(_handle); }

std::vector<Slot> Chassis::getSlots() const { return itemsOf<Slot>(kSlotsOfChassis); }

std::vector<TriggerBridge> Chassis::getTriggerBridges() const {
    return itemsOf<TriggerBridge>(kTriggerBridgesOfChassis);
}

std::vector<Device> Slot::getDevices() const { return itemsOf<Device>(kDevicesInSlot); }

Chassis Slot::getChassis() const { return Chassis(*_library, containing(kContainingChassis)); }

Slot Device::getSlot() const { return Slot(*_library, containing(kContainingSlot)); }

Chassis Device::getChassis() const { return Chassis(*_library, containing(kContainingChassis)); }

PciAddress Device::getAddress() const {
    PciAddress address{0, 0, 0, 0};
    address.function = getU32Attribute(kPciFunctionNumber);
    address.device = getU32Attribute(kPciDeviceNumber);
    address.bus = getU32Attribute(kPciBusNumber);
    return address;
}

Chassis TriggerBridge::getChassis() const { return Chassis(*_library, containing(kContainingChassis)); }

}  // namespace zrqpxi
