// The list of local devices: the configuration file's devices merged, under the file's lock, with
// the timing modules present now and the simulated devices of the data directory (in that order),
// each with the attributes of the driver's provider.
#pragma once

#include "config/configuration_data.h"

namespace tiktalsae {

// Opens (or creates) the configuration file, loads it with the devices found now and writes it
// back when anything changed. Failures raise the status exception.
zrjsonconfig::ConfigurationData loadDeviceList();

}  // namespace tiktalsae
