// The driver's own attribute provider, which the device list gives every device: the providers
// of device discovery in their order, then the hardware revision and the PCI link speeds.
#pragma once

#include "config/attribute_provider.h"
#include "config/qpxi_library.h"

namespace tiktalsae {

using zrjsonconfig::AttributeProviderInterface;
using zrjsonconfig::ConfigurationData;
using zrjsonconfig::DeviceIteratorInterface;

// "hardware_revision": "A" to "Z" for a "pciRevision" from 1 to 26, else "".
class HardwareRevisionAttributeProvider final : public AttributeProviderInterface {
public:
    void provide(DeviceIteratorInterface* device, ConfigurationData& data, cJSON* configured,
                 cJSON* provided) override;
};

// "pci_link_speed" and "pci_link_speed_max" from "pcieTransferRate" and "pcieMaxTransferRate":
// 0, 1, 2 for the transfer rates 1, 2, 3 (2.5, 5 and 8 GT/s), else -1.
class PCILinkSpeedAttributeProvider final : public AttributeProviderInterface {
public:
    void provide(DeviceIteratorInterface* device, ConfigurationData& data, cJSON* configured,
                 cJSON* provided) override;
};

// Loads the PXI chassis query library when it is built. Without the library, new devices get
// numbered aliases (Sync1, Sync2, ...) and no PXI location.
class SyncAttributeProvider final : public AttributeProviderInterface {
public:
    SyncAttributeProvider();
    ~SyncAttributeProvider() override;
    SyncAttributeProvider(const SyncAttributeProvider&) = delete;
    SyncAttributeProvider& operator=(const SyncAttributeProvider&) = delete;

    void provide(DeviceIteratorInterface* device, ConfigurationData& data, cJSON* configured,
                 cJSON* provided) override;

private:
    zrqpxi::QPXILibrary* loadedLibrary() noexcept;

    zrerr::Exception _loading;
    zrqpxi::DynamicQPXILibrary _library;
    zrjsonconfig::PXIAliasFactory _aliases;
    zrjsonconfig::CompositeAttributeProvider _providers;
};

}  // namespace tiktalsae
