// The state of the routing service: sessions, route attributes, routes, device resets and the
// (always empty) device containers. It takes no lock: the entry points hold serviceLock() around
// every use.
#pragma once

#include "terminals.h"

#include <array>
#include <cstdint>
#include <functional>
#include <map>
#include <mutex>
#include <set>
#include <string>

namespace rocosim {

// A constraint or modifier: a Boolean or a text.
struct Setting {
    bool isText;
    bool flag;
    std::string text;
};
using Settings = std::map<std::string, Setting>;

// The parts of route attributes that callers reach through handles of their own.
enum Part { kConstraints, kSourceConstraints, kDestinationConstraints, kOptionalModifiers, kRequiredModifiers, kParts };

struct RouteAttributes {
    std::int32_t lifetime = 0;
    std::int32_t calculationTargetState = 0;
    bool forceMultiDeviceRoute = false;
    std::string owner;
    std::array<Settings, kParts> parts;
    std::array<std::uint32_t, kParts> partHandles{};

    // The Boolean constraint "inversionNeeded"; false when it is not set.
    bool inversionNeeded() const;
};

// A route takes effect when it is programmed; routes of an immediate session are programmed as
// soon as they are calculated.
enum class RouteState { calculated, reserved, programmed };

struct Route {
    std::uint32_t session;
    std::string device;  // as the caller spelled it
    const Terminal* source;
    const Terminal* destination;
    RouteAttributes attributes;
    RouteState state;

    // Whether the route runs from `from` to `to`.
    bool connects(const Endpoint& from, const Endpoint& to) const;
    std::string sourceName() const { return "/" + device + "/" + source->name; }
    std::string destinationName() const { return "/" + device + "/" + destination->name; }
};

class Service {
public:
    std::uint32_t createSession(bool immediate);
    void destroySession(std::uint32_t session);

    std::uint32_t newAttributes();
    void destroyAttributes(std::uint32_t attributes);
    // The handle of one part of the attributes; 0 when the attributes are unknown.
    std::uint32_t partOf(std::uint32_t attributes, Part part) const;
    RouteAttributes& attributes(std::uint32_t handle);
    // The settings behind a constraints handle (modifiers false) or a modifiers handle (true).
    Settings& settings(std::uint32_t part, bool modifiers);

    std::uint32_t calculateRoute(std::uint32_t session, const char* source, const char* destination,
                                 std::uint32_t attributes);
    void reserveRoute(std::uint32_t session, std::uint32_t route);
    void programRoute(std::uint32_t session, std::uint32_t route);
    void unprogramRoute(std::uint32_t session, std::uint32_t route);
    void unreserveRoute(std::uint32_t session, std::uint32_t route);
    void destroyRoute(std::uint32_t session, std::uint32_t route);

    void destroyImmediateRoute(std::uint32_t session, const char* source, const char* destination);
    void destroyAllImmediateRoutes(std::uint32_t session);
    void destroyImmediateRoutesOnDevice(std::uint32_t session, const char* device);
    void destroyImmediateRoutesFromSource(std::uint32_t session, const char* source);
    void destroyImmediateRoutesToDest(std::uint32_t session, const char* destination);
    void resetTerminal(std::uint32_t session, const char* terminal);
    // Refuses a terminal that does not exist, as a destination would be refused.
    void checkTerminal(std::uint32_t session, const char* terminal);

    std::string showRoute(std::uint32_t session, const char* source, const char* destination);
    std::string routeInfo(std::uint32_t session, std::uint32_t route);

    void initiateDeviceReset(std::uint32_t session, const char* device);
    void completeDeviceReset(std::uint32_t session, const char* device);

    std::uint32_t newDeviceContainer();
    std::uint32_t beginDevices(std::uint32_t container);
    // Device iterators are all at their end: refuses what needs a device, naming the fault.
    [[noreturn]] void refuseAtEnd(std::uint32_t iterator) const;
    void destroyDeviceContainer(std::uint32_t container);

    // Test controls: the routes in effect on the device (every device when null) as a JSON array,
    // and a service without sessions, attributes, routes or resets. Handles are never reused.
    std::string routesOn(const char* device) const;
    void clear();

private:
    std::uint32_t nextHandle();
    bool isImmediate(std::uint32_t session) const;  // throws for an unknown session
    Route& routeOf(std::uint32_t session, std::uint32_t route);
    // The route in effect, other than `self`, that already does what `route` would: the same
    // source, inversion and session; 0 when the destination is free. Refuses a destination that
    // another route drives (-89123, -89127, -89132).
    std::uint32_t existingRoute(const Route& route, std::uint32_t self) const;
    void checkResetting(const std::string& device) const;
    // Removes the routes in effect that `match` picks: immediate routes end, the others go back to
    // reserved. Returns how many.
    std::size_t removeRoutes(const std::function<bool(const Route&)>& match);
    // Removes the immediate routes from (source), to (destination) or at (either) a terminal.
    enum class End { source, destination, either };
    void removeImmediateAt(std::uint32_t session, const char* terminal, End end);

    std::uint32_t _lastHandle = 0;
    std::map<std::uint32_t, bool> _sessions;  // handle -> immediate
    std::map<std::uint32_t, RouteAttributes> _attributes;
    std::map<std::uint32_t, std::pair<std::uint32_t, Part>> _parts;  // part handle -> attributes, part
    std::map<std::uint32_t, Route> _routes;
    std::set<std::string> _resetting;  // device names in lower case
    std::set<std::uint32_t> _deviceContainers;
    std::map<std::uint32_t, std::uint32_t> _deviceIterators;  // iterator -> container
};

// The one service of the process, and the lock every entry point holds while it uses it.
Service& service();
std::mutex& serviceLock();

}  // namespace rocosim
