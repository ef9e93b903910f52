#include "factory/session_factory.h"

#include <string>

#include "client/horlo_uri.h"
#include "config/sync_fake_device_iterator.h"
#include "errors/zrerr.h"
#include "factory/device_list_cache.h"
#include "factory/device_lookup.h"
#include "json/zrjsonlh.h"
#include "sessions/session.h"
#include "support/casefold.h"
#include "timing/pxie_q300t_session.h"
#include "tsession/horlo_session.h"

namespace tiktal {
namespace {

bool isTimingModule(const cJSON* configured) {
    const cJSON* id = zrjsonlh::getObjectItem(configured, "device_id");
    zrjsonlh::checkNumber(id);
    return id->valuedouble == 0x7405 || id->valuedouble == 0x7406;
}

bool isPresent(const zrjsonconfig::DeviceEntry& device) {
    const cJSON* present = zrjsonlh::getObjectItem(device.provided(), "is_present");
    zrjsonlh::checkBool(present);
    return cJSON_IsTrue(present);
}

[[noreturn]] void unknownName(const char* resourceName) {
    throw ZRERR_RAISE(tiktalerr_deviceNotFound)
        .debug("msg", "createSession unknown resource name")
        .debug("resourceName", resourceName);
}

// The session of the local device `name` names, from a list built now if the cached one does
// not hold it present: a device that appeared since is found, a name that no device has costs
// one rebuild. (When another thread rebuilt the list in between, the list of the second pass is
// as new as one this call would build.)
std::unique_ptr<Session> openLocalDevice(const char* resourceName) {
    const std::string name = resourceName;
    for (int pass = 0;; ++pass) {
        const CachedDeviceList list = cachedDeviceList();
        DeviceEntryPtr device = findByAlias(*list.devices, name);
        if (!device) device = findByPciAddress(*list.devices, name);
        if (device && isPresent(*device)) {
            if (tiktalsae::isSimulatedDevice(device->token())) return std::make_unique<SessionDebugPrintOnly>();
            if (isTimingModule(device->configured())) return PxieQ300tSession::open(*device);
            unknownName(resourceName);  // present, but no device this driver opens
        }
        if (list.built || pass > 0) unknownName(resourceName);
        dropDeviceList(list.devices);
    }
}

}  // namespace

std::unique_ptr<Session> createSession(const char* resourceName) {
    if (support::equalsIgnoringCase(resourceName, kTestResourceName))
        return std::make_unique<SessionDebugPrintOnly>();
    if (horloUtils::isHorloUri(resourceName)) return createHorloSession(resourceName);
    return openLocalDevice(resourceName);
}

}  // namespace tiktal
