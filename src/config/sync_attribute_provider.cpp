#include "config/sync_attribute_provider.h"

#include <memory>

#include "config/pxi_attribute_provider.h"

namespace tiktalsae {
namespace {

std::int32_t linkSpeed(std::uint32_t transferRate) {
    const std::uint32_t rate = transferRate & 0xFF;
    return rate >= 1 && rate <= 3 ? static_cast<std::int32_t>(rate) - 1 : -1;
}

}  // namespace

void HardwareRevisionAttributeProvider::provide(DeviceIteratorInterface* device, ConfigurationData&, cJSON*,
                                                cJSON* provided) {
    const std::uint32_t revision = device ? device->getBusPropertyU32("pciRevision") : 0;
    const std::string letter = revision >= 1 && revision <= 26 ? std::string(1, static_cast<char>('A' + revision - 1)) : "";
    zrjsonconfig::setMember(provided, "hardware_revision", zrjsonconfig::newString(letter));
}

void PCILinkSpeedAttributeProvider::provide(DeviceIteratorInterface* device, ConfigurationData&, cJSON*,
                                            cJSON* provided) {
    const std::int32_t speed = device ? linkSpeed(device->getBusPropertyU32("pcieTransferRate")) : -1;
    const std::int32_t maxSpeed = device ? linkSpeed(device->getBusPropertyU32("pcieMaxTransferRate")) : -1;
    zrjsonconfig::setMember(provided, "pci_link_speed", zrjsonconfig::newNumber(speed));
    zrjsonconfig::setMember(provided, "pci_link_speed_max", zrjsonconfig::newNumber(maxSpeed));
}

SyncAttributeProvider::SyncAttributeProvider() : _library(_loading), _aliases(loadedLibrary()) {
    using namespace zrjsonconfig;
    _providers.add(std::make_unique<AliasAttributeProvider>(_aliases));
    _providers.add(std::make_unique<SerialNumberAttributeProvider>());
    _providers.add(std::make_unique<IsSimulatedAndIsPresentAttributeProvider>("simulated", false));
    _providers.add(std::make_unique<InterfacePathAttributeProvider>());
    _providers.add(std::make_unique<PXIAttributeProvider>(loadedLibrary()));
    _providers.add(std::make_unique<HardwareRevisionAttributeProvider>());
    _providers.add(std::make_unique<PCILinkSpeedAttributeProvider>());
}

SyncAttributeProvider::~SyncAttributeProvider() = default;

zrqpxi::QPXILibrary* SyncAttributeProvider::loadedLibrary() noexcept {
    return _library.status().code() == 0 ? &_library : nullptr;
}

void SyncAttributeProvider::provide(DeviceIteratorInterface* device, ConfigurationData& data, cJSON* configured,
                                    cJSON* provided) {
    _providers.provide(device, data, configured, provided);
}

}  // namespace tiktalsae
