// Device interfaces of the timing module: none are enumerated on Windows yet.
#include "platform/platform.h"

namespace platform {

OsError enumerateDeviceInterfaces(std::vector<DeviceInterfaceEntry>& entries, std::string& failedPath) noexcept {
    entries.clear();
    failedPath.clear();
    return {};
}

}  // namespace platform
