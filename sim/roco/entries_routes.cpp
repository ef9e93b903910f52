// Entry points: making, removing and describing routes, and terminal names.
#include "frame.h"

using namespace rocosim;

uint32_t zrrocoapi_calculateRoute(uint32_t session, const char* source, const char* destination, uint32_t attributes,
                                  zrrocoapi_Status* st) {
    return Call("calculateRoute")
        .arg("session", session)
        .arg("source", source)
        .arg("destination", destination)
        .arg("attributes", attributes)
        .run(st, [=](Service& s) { return s.calculateRoute(session, source, destination, attributes); });
}

// The five calls on one route handle of a session.
#define ZRROCOAPI_SIM_ROUTE_CALL(name)                                                                                \
    void zrrocoapi_##name(uint32_t session, uint32_t route, zrrocoapi_Status* st) {                                   \
        Call(#name).arg("session", session).arg("route", route).run(st, [=](Service& s) { s.name(session, route); }); \
    }
ZRROCOAPI_SIM_ROUTE_CALL(reserveRoute)
ZRROCOAPI_SIM_ROUTE_CALL(programRoute)
ZRROCOAPI_SIM_ROUTE_CALL(unprogramRoute)
ZRROCOAPI_SIM_ROUTE_CALL(unreserveRoute)
ZRROCOAPI_SIM_ROUTE_CALL(destroyRoute)
#undef ZRROCOAPI_SIM_ROUTE_CALL

void zrrocoapi_destroyImmediateRoute(uint32_t session, const char* source, const char* destination,
                                     zrrocoapi_Status* st) {
    Call("destroyImmediateRoute")
        .arg("session", session)
        .arg("source", source)
        .arg("destination", destination)
        .run(st, [=](Service& s) { s.destroyImmediateRoute(session, source, destination); });
}

void zrrocoapi_destroyAllImmediateRoutes(uint32_t session, zrrocoapi_Status* st) {
    Call("destroyAllImmediateRoutes").arg("session", session).run(st, [=](Service& s) {
        s.destroyAllImmediateRoutes(session);
    });
}

// The calls with a session and one text.
#define ZRROCOAPI_SIM_TEXT_CALL(name, key)                                                                     \
    void zrrocoapi_##name(uint32_t session, const char* key, zrrocoapi_Status* st) {                           \
        Call(#name).arg("session", session).arg(#key, key).run(st, [=](Service& s) { s.name(session, key); }); \
    }
ZRROCOAPI_SIM_TEXT_CALL(destroyImmediateRoutesOnDevice, device)
ZRROCOAPI_SIM_TEXT_CALL(destroyImmediateRoutesFromSource, source)
ZRROCOAPI_SIM_TEXT_CALL(destroyImmediateRoutesToDest, destination)
ZRROCOAPI_SIM_TEXT_CALL(resetTerminal, terminal)
#undef ZRROCOAPI_SIM_TEXT_CALL

// Checks the terminal; no route is needed to reset a terminal of the stand-in, so the handle is 0.
uint32_t zrrocoapi_calculateResetTerminal(uint32_t session, const char* terminal, zrrocoapi_Status* st) {
    return Call("calculateResetTerminal").arg("session", session).arg("terminal", terminal).run(st, [=](Service& s) {
        s.checkTerminal(session, terminal);
        return uint32_t{0};
    });
}

#ifndef ZRROCOAPI_SIM_WITHOUT_SOME_SYMBOLS
char* zrrocoapi_showRoute(uint32_t session, const char* source, const char* destination, zrrocoapi_Status* st) {
    return Call("showRoute")
        .arg("session", session)
        .arg("source", source)
        .arg("destination", destination)
        .run(st, [=](Service& s) { return handOut(s.showRoute(session, source, destination)); });
}
#endif

char* zrrocoapi_getRouteInfo(uint32_t session, uint32_t route, zrrocoapi_Status* st) {
    return Call("getRouteInfo").arg("session", session).arg("route", route).run(st, [=](Service& s) {
        return handOut(s.routeInfo(session, route));
    });
}

// 1 when the name is a terminal that exists, 0 otherwise; never a failure.
int32_t zrrocoapi_validateTerminalURI(const char* terminal, zrrocoapi_Status* st) {
    return Call("validateTerminalURI").arg("terminal", terminal).run(st, [=](Service&) {
        try {
            resolve(terminal, false, {});
            return int32_t{1};
        } catch (const Failure&) {
            return int32_t{0};
        }
    });
}

// 1 when both are well-formed names that differ at most in ASCII case, 0 otherwise.
int32_t zrrocoapi_areTerminalURIsEqual(const char* first, const char* second, zrrocoapi_Status* st) {
    return Call("areTerminalURIsEqual").arg("first", first).arg("second", second).run(st, [=](Service&) {
        QualifiedName a, b;
        return static_cast<int32_t>(parseQualified(first, a).empty() && parseQualified(second, b).empty() &&
                                    equalIgnoringCase(a.device, b.device) && equalIgnoringCase(a.terminal, b.terminal));
    });
}
