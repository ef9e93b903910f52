// The routing service's sessions and route attributes, each owning its handle for its lifetime.
#pragma once

#include <cstdint>
#include <functional>
#include <string>

#include "RoCoLib.h"

namespace tiktal::roco {

using zrrocoapi::dynlib::RoCoLibInterface;

// One handle of the routing service, ended by the service function `destroy` when it goes.
class ServiceHandle {
public:
    ServiceHandle(const ServiceHandle&) = delete;
    ServiceHandle& operator=(const ServiceHandle&) = delete;

    RoCoLibInterface& lib() const noexcept { return _lib; }
    std::uint32_t handle() const noexcept { return _handle; }

protected:
    using Destroy = void (RoCoLibInterface::*)(std::uint32_t);
    ServiceHandle(RoCoLibInterface& lib, std::uint32_t handle, Destroy destroy) noexcept
        : _lib(lib), _handle(handle), _destroy(destroy) {}
    ~ServiceHandle() { (_lib.*_destroy)(_handle); }

private:
    RoCoLibInterface& _lib;
    std::uint32_t _handle;
    Destroy _destroy;
};

// A session whose routes take effect as soon as they are calculated.
class ImmediateSession : public ServiceHandle {
public:
    explicit ImmediateSession(RoCoLibInterface& lib);
};

// A session for one device reset.
class Session : public ServiceHandle {
public:
    explicit Session(RoCoLibInterface& lib);
};

// Attributes of one route calculation.
class RouteAttributes : public ServiceHandle {
public:
    explicit RouteAttributes(RoCoLibInterface& lib);
};

// Resets the device `alias`: the service is told that the reset begins, `resetDevice` resets the
// hardware, and the service is told that it has ended; the reset session ends in any case.
void resetDevice(RoCoLibInterface& lib, const std::string& alias, const std::function<void()>& resetHardware);

}  // namespace tiktal::roco
