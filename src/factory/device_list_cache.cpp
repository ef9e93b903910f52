#include "factory/device_list_cache.h"

#include <mutex>

#include "api/globals.h"
#include "config/device_list.h"

namespace tiktal {
namespace {

DeviceList gCached;  // guarded by the device-list lock

std::unique_lock<platform::Mutex> deviceListLock() {
    checkGlobalInit();
    return std::unique_lock<platform::Mutex>(globals().deviceListLock.get());
}

}  // namespace

CachedDeviceList cachedDeviceList() {
    const auto lock = deviceListLock();
    if (gCached) return {gCached, false};
    gCached = std::make_shared<const zrjsonconfig::ConfigurationData>(tiktalsae::loadDeviceList());
    return {gCached, true};
}

void dropDeviceList(const DeviceList& seen) {
    const auto lock = deviceListLock();
    if (gCached == seen) gCached.reset();
}

}  // namespace tiktal
