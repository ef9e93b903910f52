// Finding a local device in the device list by the resource name that a caller opens.
#pragma once

#include <memory>
#include <string>

#include "config/configuration_data.h"

namespace tiktal {

using DeviceEntryPtr = std::shared_ptr<zrjsonconfig::DeviceEntry>;

// The first device, in token order, whose "alias" equals the whole name, ASCII letters compared
// without case. A device without a text "alias" fails with the JSON layer's status.
DeviceEntryPtr findByAlias(const zrjsonconfig::ConfigurationData& devices, const std::string& name);
// The first device whose "pci_bus", "pci_device" and "pci_function" are those of the name read as
// a PXI resource name; none when the name is not one.
DeviceEntryPtr findByPciAddress(const zrjsonconfig::ConfigurationData& devices, const std::string& name);

}  // namespace tiktal
