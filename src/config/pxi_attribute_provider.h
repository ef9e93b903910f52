// The PCI identity and location of a device, and where it sits in a PXI chassis.
#pragma once

#include "QPXILibrary.h"
#include "config/attribute_provider.h"

namespace zrjsonconfig {

// Configured: "device_id", "subsystem_id", "pxi_chassis_number", "pxi_slot_number" (-1 where
// unknown; a location the file holds that is not a number within 32 bits fails with -52004,
// jsonErrorsTypeMismatch). Provided: "pci_bus", "pci_device", "pci_function", "pci_link_width",
// "pci_max_link_width" (0, 0, 0, -1, -1 for a device not discovered).
class PXIAttributeProvider final : public AttributeProviderInterface {
public:
    // `library` may be null (not available): the file's PXI location of a discovered device then
    // stands. It must outlive the provider.
    explicit PXIAttributeProvider(zrqpxi::QPXILibrary* library) noexcept : _library(library) {}

    void provide(DeviceIteratorInterface* device, ConfigurationData& data, cJSON* configured,
                 cJSON* provided) override;
    // "device_id" and "subsystem_id": a discovered device's from the device (what the file holds
    // can only be stale, or the 0 that loading the file gave it before discovery); another's as the
    // file holds them when both are numbers, else 0.
    void identifiers(DeviceIteratorInterface* device, cJSON* configured);
    // The PCI address and link widths; a width above 0x7FFFFFFF reads as unknown (-1).
    void pciLocation(DeviceIteratorInterface* device, cJSON* provided);

private:
    void pxiLocation(DeviceIteratorInterface* device, cJSON* configured);

    zrqpxi::QPXILibrary* _library;
};

}  // namespace zrjsonconfig
