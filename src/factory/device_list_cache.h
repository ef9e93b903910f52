// The process's one cached list of local devices: building it reads and merges the configuration
// file and enumerates the devices, so it is built when first needed and kept until a lookup that
// fails drops it.
#pragma once

#include <memory>

#include "config/configuration_data.h"

namespace tiktal {

using DeviceList = std::shared_ptr<const zrjsonconfig::ConfigurationData>;

// The list a lookup works on, and whether this call built it.
struct CachedDeviceList {
    DeviceList devices;
    bool built = false;
};

// The cached list, built first when there is none. Building, taking and dropping happen under
// the device-list lock; the list itself never changes once built, so every caller may keep and
// read it without the lock (a rebuild makes a new one).
CachedDeviceList cachedDeviceList();
// Drops the cached list, if it is still `seen`, so that the next lookup builds a new one.
void dropDeviceList(const DeviceList& seen);

}  // namespace tiktal
