#include "timing/roco_session.h"

#include "timing/call_status.h"

namespace tiktal::roco {

using zrrocoapi::call;

ImmediateSession::ImmediateSession(RoCoLibInterface& lib)
    : _lib(lib), _handle(call([&](zrrocoapi_Status* st) { return lib.createImmediateSession(st); })) {}

ImmediateSession::~ImmediateSession() { _lib.destroySession(_handle); }

Session::Session(RoCoLibInterface& lib)
    : _lib(lib), _handle(call([&](zrrocoapi_Status* st) { return lib.createSession(st); })) {}

Session::~Session() { _lib.destroySession(_handle); }

RouteAttributes::RouteAttributes(RoCoLibInterface& lib)
    : _lib(lib), _handle(call([&](zrrocoapi_Status* st) { return lib.RouteAttributes_new(st); })) {}

RouteAttributes::~RouteAttributes() { _lib.RouteAttributes_destroy(_handle); }

void resetDevice(RoCoLibInterface& lib, const std::string& alias, const std::function<void()>& resetHardware) {
    const Session session(lib);
    call([&](zrrocoapi_Status* st) { lib.initiateDeviceReset(session.handle(), alias.c_str(), st); });
    resetHardware();
    call([&](zrrocoapi_Status* st) { lib.completeDeviceReset(session.handle(), alias.c_str(), st); });
}

}  // namespace tiktal::roco
