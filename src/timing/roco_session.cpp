#include "timing/roco_session.h"

#include "timing/call_status.h"

namespace tiktal::roco {

using zrrocoapi::call;

ImmediateSession::ImmediateSession(RoCoLibInterface& lib)
    : ServiceHandle(lib, call([&](zrrocoapi_Status* st) { return lib.createImmediateSession(st); }),
                    &RoCoLibInterface::destroySession) {}

Session::Session(RoCoLibInterface& lib)
    : ServiceHandle(lib, call([&](zrrocoapi_Status* st) { return lib.createSession(st); }),
                    &RoCoLibInterface::destroySession) {}

RouteAttributes::RouteAttributes(RoCoLibInterface& lib)
    : ServiceHandle(lib, call([&](zrrocoapi_Status* st) { return lib.RouteAttributes_new(st); }),
                    &RoCoLibInterface::RouteAttributes_destroy) {}

void resetDevice(RoCoLibInterface& lib, const std::string& alias, const std::function<void()>& resetHardware) {
    const Session session(lib);
    call([&](zrrocoapi_Status* st) { lib.initiateDeviceReset(session.handle(), alias.c_str(), st); });
    resetHardware();
    call([&](zrrocoapi_Status* st) { lib.completeDeviceReset(session.handle(), alias.c_str(), st); });
}

}  // namespace tiktal::roco
