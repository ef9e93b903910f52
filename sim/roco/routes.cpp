// How routes are made, put into effect and removed, and which routes the service refuses.
#include "state.h"

#include "status.h"

namespace rocosim {
namespace {

bool sameDevice(const Route& a, const std::string& device) { return equalIgnoringCase(a.device, device); }

// The refusals of a route that do not depend on other routes.
void checkRoute(const Endpoint& source, const Endpoint& destination, const Args& context) {
    if (!source.terminal->drives) fail(code::kSourceCannotDrive, "the source terminal cannot drive a route", context);
    if (!destination.terminal->driven)
        fail(code::kDestinationInvalid, "the destination terminal cannot be driven by a route", context);
    if (!equalIgnoringCase(source.device, destination.device))
        fail(code::kAcrossDevices, "the terminals are on different devices", context);
    if (source.terminal == destination.terminal)
        fail(code::kDestinationInvalid, "the source and the destination are the same terminal", context);
}

}  // namespace

bool Route::connects(const Endpoint& from, const Endpoint& to) const {
    return source == from.terminal && destination == to.terminal && sameDevice(*this, from.device) &&
           sameDevice(*this, to.device);
}

std::uint32_t Service::calculateRoute(std::uint32_t session, const char* source, const char* destination,
                                      std::uint32_t attributes) {
    const bool immediate = isImmediate(session);
    const RouteAttributes recorded = attributes ? this->attributes(attributes) : RouteAttributes();
    const RouteEnds ends = resolveRoute(source, destination);
    checkRoute(ends.from, ends.to, ends.context);
    Route route{session, ends.from.device, ends.from.terminal, ends.to.terminal, recorded, RouteState::calculated};
    if (immediate) {
        checkResetting(route.device);
        if (const std::uint32_t existing = existingRoute(route, 0)) return existing;
        route.state = RouteState::programmed;
    }
    const std::uint32_t handle = nextHandle();
    _routes.emplace(handle, std::move(route));
    return handle;
}

std::uint32_t Service::existingRoute(const Route& route, std::uint32_t self) const {
    for (const auto& [handle, other] : _routes) {
        if (handle == self || other.state != RouteState::programmed || other.destination != route.destination ||
            !sameDevice(other, route.device))
            continue;
        const Args args = {
            {"source", route.sourceName()}, {"destination", route.destinationName()}, {"drivenBy", other.sourceName()}};
        if (other.source != route.source)
            fail(code::kDestinationInUse, "the destination is driven by another source", args);
        if (other.attributes.inversionNeeded() != route.attributes.inversionNeeded())
            fail(code::kDestinationInverted, "the destination is driven by the source with the other inversion", args);
        if (other.session != route.session) fail(code::kRoutedBySession, "the route was made by another session", args);
        return handle;
    }
    return 0;
}

Route& Service::routeOf(std::uint32_t session, std::uint32_t route) {
    isImmediate(session);
    const auto found = _routes.find(route);
    if (found == _routes.end() || found->second.session != session)
        fail(code::kInvalidArgument, "no such route handle in the session",
             {{"session", std::to_string(session)}, {"route", std::to_string(route)}});
    return found->second;
}

void Service::reserveRoute(std::uint32_t session, std::uint32_t route) {
    Route& found = routeOf(session, route);
    if (found.state == RouteState::calculated) found.state = RouteState::reserved;
}

void Service::programRoute(std::uint32_t session, std::uint32_t route) {
    Route& found = routeOf(session, route);
    if (found.state == RouteState::programmed) return;
    checkResetting(found.device);
    existingRoute(found, route);
    found.state = RouteState::programmed;
}

void Service::unprogramRoute(std::uint32_t session, std::uint32_t route) {
    Route& found = routeOf(session, route);
    if (found.state == RouteState::programmed && !isImmediate(session)) found.state = RouteState::reserved;
}

void Service::unreserveRoute(std::uint32_t session, std::uint32_t route) {
    Route& found = routeOf(session, route);
    if (!isImmediate(session)) found.state = RouteState::calculated;
}

void Service::destroyRoute(std::uint32_t session, std::uint32_t route) {
    routeOf(session, route);
    _routes.erase(route);
}

std::size_t Service::removeRoutes(const std::function<bool(const Route&)>& match) {
    std::size_t removed = 0;
    for (auto it = _routes.begin(); it != _routes.end();) {
        Route& route = it->second;
        if (route.state != RouteState::programmed || !match(route)) {
            ++it;
            continue;
        }
        ++removed;
        if (isImmediate(route.session)) {
            it = _routes.erase(it);
        } else {
            route.state = RouteState::reserved;
            ++it;
        }
    }
    return removed;
}

void Service::destroyImmediateRoute(std::uint32_t session, const char* source, const char* destination) {
    isImmediate(session);
    const RouteEnds ends = resolveRoute(source, destination);
    const auto same = [&](const Route& route) {
        return isImmediate(route.session) && route.connects(ends.from, ends.to);
    };
    if (!removeRoutes(same)) fail(code::kNoSuchRoute, "no such route", ends.context);
}

void Service::destroyAllImmediateRoutes(std::uint32_t session) {
    if (!isImmediate(session)) return;
    removeRoutes([&](const Route& route) { return route.session == session; });
}

void Service::destroyImmediateRoutesOnDevice(std::uint32_t session, const char* device) {
    isImmediate(session);
    const std::string name = knownDevice(device);
    removeRoutes([&](const Route& route) { return isImmediate(route.session) && sameDevice(route, name); });
}

void Service::removeImmediateAt(std::uint32_t session, const char* terminal, End end) {
    isImmediate(session);
    const char* key = end == End::source ? "source" : end == End::destination ? "destination" : "terminal";
    const Endpoint at = resolve(terminal, end == End::source, {{key, textOf(terminal)}});
    removeRoutes([&](const Route& route) {
        const bool from = route.source == at.terminal && end != End::destination;
        const bool to = route.destination == at.terminal && end != End::source;
        return isImmediate(route.session) && sameDevice(route, at.device) && (from || to);
    });
}

void Service::destroyImmediateRoutesFromSource(std::uint32_t session, const char* source) {
    removeImmediateAt(session, source, End::source);
}

void Service::destroyImmediateRoutesToDest(std::uint32_t session, const char* destination) {
    removeImmediateAt(session, destination, End::destination);
}

void Service::resetTerminal(std::uint32_t session, const char* terminal) {
    removeImmediateAt(session, terminal, End::either);
}

void Service::checkTerminal(std::uint32_t session, const char* terminal) {
    isImmediate(session);
    resolve(terminal, false, {{"terminal", textOf(terminal)}});
}

}  // namespace rocosim
