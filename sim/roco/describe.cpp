// The JSON descriptions of routes: showRoute, getRouteInfo and the test control of the routes.
#include "json.h"
#include "state.h"
#include "status.h"

namespace rocosim {
namespace {

const char* stateName(RouteState state) {
    switch (state) {
        case RouteState::calculated:
            return "calculated";
        case RouteState::reserved:
            return "reserved";
        case RouteState::programmed:
            return "programmed";
    }
    return "unknown";
}

Json describeSettings(const Settings& settings) {
    Json object = newObject();
    for (const auto& [name, setting] : settings) {
        if (setting.isText)
            addText(object.get(), name.c_str(), setting.text);
        else
            addBool(object.get(), name.c_str(), setting.flag);
    }
    return object;
}

Json describe(std::uint32_t handle, const Route& route) {
    static const char* const kPartNames[kParts] = {"constraints", "sourceConstraints", "destinationConstraints",
                                                   "optionalModifiers", "requiredModifiers"};
    const RouteAttributes& attributes = route.attributes;
    Json object = newObject();
    addNumber(object.get(), "route", handle);
    addNumber(object.get(), "session", route.session);
    addText(object.get(), "device", route.device);
    addText(object.get(), "source", route.sourceName());
    addText(object.get(), "destination", route.destinationName());
    addText(object.get(), "state", stateName(route.state));
    addNumber(object.get(), "lifetime", attributes.lifetime);
    addBool(object.get(), "inversionNeeded", attributes.inversionNeeded());
    addText(object.get(), "owner", attributes.owner);
    addNumber(object.get(), "calculationTargetState", attributes.calculationTargetState);
    addBool(object.get(), "forceMultiDeviceRoute", attributes.forceMultiDeviceRoute);
    for (int part = 0; part < kParts; ++part)
        addItem(object.get(), kPartNames[part], describeSettings(attributes.parts[part]));
    return object;
}

}  // namespace

std::string Service::showRoute(std::uint32_t session, const char* source, const char* destination) {
    isImmediate(session);
    const RouteEnds ends = resolveRoute(source, destination);
    for (const auto& [handle, route] : _routes)
        if (route.state == RouteState::programmed && route.connects(ends.from, ends.to))
            return print(describe(handle, route).get());
    fail(code::kNoSuchRoute, "no such route", ends.context);
}

std::string Service::routeInfo(std::uint32_t session, std::uint32_t route) {
    return print(describe(route, routeOf(session, route)).get());
}

std::string Service::routesOn(const char* device) const {
    Json list(cJSON_CreateArray());
    if (!list) throw std::bad_alloc();
    for (const auto& [handle, route] : _routes)
        if (route.state == RouteState::programmed && (!device || equalIgnoringCase(route.device, device))) {
            Json item = describe(handle, route);
            if (!cJSON_AddItemToArray(list.get(), item.get())) throw std::bad_alloc();
            item.release();
        }
    return print(list.get());
}

}  // namespace rocosim
