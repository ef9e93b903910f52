// The terminals of the timing module as the routing service knows them, the form of qualified
// terminal names, and which devices exist (chosen by the environment, see README.md).
#pragma once

#include "status.h"

#include <string>
#include <vector>

namespace rocosim {

struct Terminal {
    std::string name;  // as the service spells it
    bool drives;       // may be the source of a route
    bool driven;       // may be the destination of a route
    bool backplane;    // a trigger line of the chassis: exists only when the chassis is identified
};

// Every terminal of a timing module, in a fixed order.
const std::vector<Terminal>& terminals();

// The terminal named `name` ignoring ASCII case, or null.
const Terminal* findTerminal(const std::string& name);

bool equalIgnoringCase(const std::string& a, const std::string& b);

// "/DEVICE/TERMINAL".
struct QualifiedName {
    std::string device;
    std::string terminal;
};

// Splits a qualified name; returns what is wrong with it, empty when nothing is. A name needs a
// leading "/", exactly one more "/", and non-empty device and terminal parts.
std::string parseQualified(const char* text, QualifiedName& name);

// Whether the device exists: every name when ZRROCOAPI_SIM_DEVICES is unset, otherwise the names
// of its comma-separated list (ignoring ASCII case). Read at each call.
bool deviceExists(const std::string& device);

// The unqualified device name when the device exists; refuses it otherwise (-89130).
std::string knownDevice(const char* device);

// Whether the chassis of the device is identified: not when ZRROCOAPI_SIM_UNIDENTIFIED lists it.
bool chassisIdentified(const std::string& device);

// A terminal of a device.
struct Endpoint {
    std::string device;
    const Terminal* terminal;
};

// The device and terminal of a qualified source (or destination) name, or the refusal that names
// `context`: a malformed name or an unknown terminal is an invalid source -89120 (destination
// -89121), a device that does not exist -89130, a trigger line of a device whose chassis is not
// identified -89141 (-89142).
Endpoint resolve(const char* text, bool source, const Args& context);

// Both ends of a route, resolved; `context` names them for the refusals.
struct RouteEnds {
    Args context;
    Endpoint from;
    Endpoint to;
};
RouteEnds resolveRoute(const char* source, const char* destination);

}  // namespace rocosim
