// Entry points: sessions, device resets and the change number.
#include "frame.h"

using namespace rocosim;

namespace {

// Terminal information never changes in the stand-in.
constexpr uint32_t kChangeNumber = 1;

}  // namespace

uint32_t zrrocoapi_createSession(zrrocoapi_Status* st) {
    return Call("createSession").run(st, [](Service& s) { return s.createSession(false); });
}

uint32_t zrrocoapi_createRemoteSession(const char* host, zrrocoapi_Status* st) {
    return Call("createRemoteSession").arg("host", host).run(st, [host](Service&) -> uint32_t {
        fail(code::kDeviceNotFound, "remote routing sessions are not offered", {{"host", textOf(host)}});
    });
}

uint32_t zrrocoapi_createImmediateSession(zrrocoapi_Status* st) {
    return Call("createImmediateSession").run(st, [](Service& s) { return s.createSession(true); });
}

void zrrocoapi_destroySession(uint32_t session) {
    Call("destroySession").arg("session", session).run(nullptr, [=](Service& s) { s.destroySession(session); });
}

void zrrocoapi_initiateDeviceReset(uint32_t session, const char* device, zrrocoapi_Status* st) {
    Call("initiateDeviceReset").arg("session", session).arg("device", device).run(st, [=](Service& s) {
        s.initiateDeviceReset(session, device);
    });
}

#ifndef ZRROCOAPI_SIM_WITHOUT_SOME_SYMBOLS
void zrrocoapi_completeDeviceReset(uint32_t session, const char* device, zrrocoapi_Status* st) {
    Call("completeDeviceReset").arg("session", session).arg("device", device).run(st, [=](Service& s) {
        s.completeDeviceReset(session, device);
    });
}
#endif

uint32_t zrrocoapi_getSystemChangeNumber(zrrocoapi_Status* st) {
    return Call("getSystemChangeNumber").run(st, [](Service&) { return kChangeNumber; });
}

int32_t zrrocoapi_hasTerminalInformationChanged(uint32_t changeNumber, zrrocoapi_Status* st) {
    return Call("hasTerminalInformationChanged").arg("changeNumber", changeNumber).run(st, [=](Service&) {
        return static_cast<int32_t>(changeNumber != kChangeNumber);
    });
}
