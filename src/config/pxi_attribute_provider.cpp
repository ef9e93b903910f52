#include "config/pxi_attribute_provider.h"

#include "config/failure.h"
#include "json/zrjsonlh.h"

namespace zrjsonconfig {
namespace {

// A configured location member as the file holds it, -1 when missing. A value that is not a
// number within 32 bits fails as the file's other mistyped members do, naming the member.
std::int32_t configuredLocation(const cJSON* configured, const char* name) {
    const cJSON* item = cJSON_GetObjectItem(configured, name);
    if (!item) return -1;
    if (!cJSON_IsNumber(item) || !(item->valuedouble > -2147483649.0 && item->valuedouble < 2147483648.0))
        ZRJSONCONFIG_FAILURE(kTypeMismatch)
            .comment(std::string("\"") + name + "\" is not a number within 32 bits")
            .raise();
    return zrjsonlh::getInt32(item);
}

// A width beyond 31 bits is no width a link has: unknown (-1), as for a device not discovered.
std::int32_t linkWidth(DeviceIteratorInterface& device, const char* name) {
    const std::uint32_t width = device.getBusPropertyU32(name);
    return width <= 0x7FFFFFFFu ? static_cast<std::int32_t>(width) : -1;
}

}  // namespace

void PXIAttributeProvider::provide(DeviceIteratorInterface* device, ConfigurationData&, cJSON* configured,
                                   cJSON* provided) {
    identifiers(device, configured);
    pciLocation(device, provided);
    pxiLocation(device, configured);
}

void PXIAttributeProvider::identifiers(DeviceIteratorInterface* device, cJSON* configured) {
    if (!device && cJSON_IsNumber(cJSON_GetObjectItem(configured, "device_id")) &&
        cJSON_IsNumber(cJSON_GetObjectItem(configured, "subsystem_id")))
        return;
    const std::uint32_t deviceId = device ? device->getBusPropertyU32("pciDeviceID") : 0;
    const std::uint32_t subsystemId = device ? device->getBusPropertyU32("pciSubsystemID") : 0;
    setMember(configured, "device_id", newNumber(deviceId));
    setMember(configured, "subsystem_id", newNumber(subsystemId));
}

void PXIAttributeProvider::pciLocation(DeviceIteratorInterface* device, cJSON* provided) {
    setMember(provided, "pci_bus", newNumber(device ? device->getBusPropertyU32("pciBusNumber") : 0));
    setMember(provided, "pci_device", newNumber(device ? device->getBusPropertyU32("pciDeviceNumber") : 0));
    setMember(provided, "pci_function", newNumber(device ? device->getBusPropertyU32("pciFunctionNumber") : 0));
    setMember(provided, "pci_link_width", newNumber(device ? linkWidth(*device, "pcieLinkWidth") : -1));
    setMember(provided, "pci_max_link_width", newNumber(device ? linkWidth(*device, "pcieMaxLinkWidth") : -1));
}

// A discovered device is where the chassis query library finds it now (-1 when it finds it in no
// chassis). Without the library, or for a device not discovered, the file's location stands.
void PXIAttributeProvider::pxiLocation(DeviceIteratorInterface* device, cJSON* configured) {
    PxiLocation location;
    if (device && _library)
        location = locatePxiDevice(*_library, *device);
    else
        location = {configuredLocation(configured, "pxi_chassis_number"),
                    configuredLocation(configured, "pxi_slot_number")};
    setMember(configured, "pxi_chassis_number", newNumber(location.chassis));
    setMember(configured, "pxi_slot_number", newNumber(location.slot));
}

}  // namespace zrjsonconfig
