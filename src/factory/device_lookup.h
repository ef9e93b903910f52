// Finding a local device in the device list by the resource name that a caller opens.
#pragma once

#include <memory>
#include <string>

#include "config/configuration_data.h"

namespace tiktal {

using DeviceEntryPtr = std::shared_ptr<zrjsonconfig::DeviceEntry>;

// The first device, in token order, whose "alias" equals the whole name, ASCII letters compared
// without case. A device without a text "alias" (a hand-edited file may hold one) matches no name.
DeviceEntryPtr findByAlias(const zrjsonconfig::ConfigurationData& devices, const std::string& name);
// The device whose "pci_bus", "pci_device" and "pci_function" are those of the name read as a PXI
// resource name: a module present there, else the first in token order (a simulated device at a
// present module's address does not take it over); none when the name is not one.
DeviceEntryPtr findByPciAddress(const zrjsonconfig::ConfigurationData& devices, const std::string& name);

}  // namespace tiktal
