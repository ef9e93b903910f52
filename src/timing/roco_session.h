// The routing service's sessions and route attributes, each owning its handle for its lifetime.
#pragma once

#include <cstdint>
#include <functional>
#include <string>

#include "RoCoLib.h"

namespace tiktal::roco {

using zrrocoapi::dynlib::RoCoLibInterface;

// A session whose routes take effect as soon as they are calculated.
class ImmediateSession {
public:
    explicit ImmediateSession(RoCoLibInterface& lib);
    ~ImmediateSession();
    ImmediateSession(const ImmediateSession&) = delete;
    ImmediateSession& operator=(const ImmediateSession&) = delete;

    RoCoLibInterface& lib() const noexcept { return _lib; }
    std::uint32_t handle() const noexcept { return _handle; }

private:
    RoCoLibInterface& _lib;
    std::uint32_t _handle;
};

// A session for one device reset.
class Session {
public:
    explicit Session(RoCoLibInterface& lib);
    ~Session();
    Session(const Session&) = delete;
    Session& operator=(const Session&) = delete;

    std::uint32_t handle() const noexcept { return _handle; }

private:
    RoCoLibInterface& _lib;
    std::uint32_t _handle;
};

// Attributes of one route calculation.
class RouteAttributes {
public:
    explicit RouteAttributes(RoCoLibInterface& lib);
    ~RouteAttributes();
    RouteAttributes(const RouteAttributes&) = delete;
    RouteAttributes& operator=(const RouteAttributes&) = delete;

    std::uint32_t handle() const noexcept { return _handle; }

private:
    RoCoLibInterface& _lib;
    std::uint32_t _handle;
};

// Resets the device `alias`: the service is told that the reset begins, `resetDevice` resets the
// hardware, and the service is told that it has ended; the reset session ends in any case.
void resetDevice(RoCoLibInterface& lib, const std::string& alias, const std::function<void()>& resetHardware);

}  // namespace tiktal::roco
