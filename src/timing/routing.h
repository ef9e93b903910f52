// Signal routes between the terminals of one timing module, made by the routing service: the
// checks the module applies first, the qualified terminal names, and the immediate session that
// holds the routes.
#pragma once

#include <memory>
#include <string>

#include <tiktal/tiktal.h>

#include "timing/auto_lib.h"
#include "timing/roco_session.h"

namespace tiktal {

using RoutingLibrary = zrdynlib::AutoLibWithInterface<zrrocoapi::dynlib::RoCoLib>;

// Loads the routing service (libzrrocoapi.so by the system's search order).
std::unique_ptr<RoutingLibrary> loadRoutingLibrary();

// "/ALIAS/NAME" for a name without a leading "/"; a name with one is used as it is.
std::string qualifyTerminal(const std::string& alias, const std::string& name);
// What follows the second "/" of a name that starts with "/"; other names as they are.
std::string stripTerminal(const std::string& name);
// Whether the module lets a route from `source` to `destination` (both stripped) be asked for.
bool isRoutable(const std::string& source, const std::string& destination);

class Routing {
public:
    // Starts an immediate session of `library` for the device known to the service as `alias`.
    Routing(std::string alias, std::unique_ptr<RoutingLibrary> library);
    Routing(const Routing&) = delete;
    Routing& operator=(const Routing&) = delete;

    void connectTrigTerminals(ViConstString srcTerminal, ViConstString destTerminal, ViConstString syncClock,
                              ViInt32 invert, ViInt32 updateEdge);
    void disconnectTrigTerminals(ViConstString srcTerminal, ViConstString destTerminal);
    void connectClkTerminals(ViConstString srcTerminal, ViConstString destTerminal);
    void disconnectClkTerminals(ViConstString srcTerminal, ViConstString destTerminal);

    const std::string& alias() const noexcept { return _alias; }
    zrrocoapi::dynlib::RoCoLibInterface& lib() noexcept { return _library->get(); }

private:
    void connect(const std::string& source, const std::string& destination, const int* inversionNeeded);
    void disconnect(const std::string& source, const std::string& destination);

    std::string _alias;
    std::unique_ptr<RoutingLibrary> _library;  // declared first: unloaded after the session ends
    roco::ImmediateSession _immediate;
};

}  // namespace tiktal
