// The session of a timing module in the local machine: routes between its terminals, its serial
// number and device identifier, the values of its six terminals, and its reset.
#pragma once

#include <cstdint>
#include <memory>

#include "InterfaceProxyTiktal.h"
#include "SessionClass.h"
#include "config/configuration_data.h"
#include "timing/routing.h"

namespace tiktal {

class PxieQ300tSession final : public Session {
public:
    // The session of the configured device `entry` ("interface_path" of its provided attributes;
    // "serial_number", "alias" and "device_id" of its configured ones). Opens the module's driver
    // and an immediate session of the routing service; fails with the status of the first step
    // that fails, having released what it built.
    static std::unique_ptr<PxieQ300tSession> open(const zrjsonconfig::DeviceEntry& entry);

    void connectTrigTerminals(ViConstString srcTerminal, ViConstString destTerminal, ViConstString syncClock,
                              ViInt32 invert, ViInt32 updateEdge) override;
    void disconnectTrigTerminals(ViConstString srcTerminal, ViConstString destTerminal) override;
    void connectClkTerminals(ViConstString srcTerminal, ViConstString destTerminal) override;
    void disconnectClkTerminals(ViConstString srcTerminal, ViConstString destTerminal) override;

    void reset() override;
    void getAttributeViInt32(ViConstString terminalName, ViAttr attribute, ViInt32* value) override;
    void getAttributeViReal64(ViConstString terminalName, ViAttr attribute, ViReal64* value) override;
    void setAttributeViReal64(ViConstString terminalName, ViAttr attribute, ViReal64 value) override;

private:
    using Proxy = tiktalq300::tInterfaceProxy_tiktal;

    PxieQ300tSession(std::unique_ptr<Proxy> proxy, std::string alias, std::uint32_t deviceId,
                     std::uint32_t serialNumber, std::unique_ptr<RoutingLibrary> library);

    // Declared first: the routing session and its library end before the driver is closed.
    std::unique_ptr<Proxy> _proxy;
    std::uint32_t _deviceId;
    std::uint32_t _serialNumber;
    Routing _routing;
};

// The terminal of a terminal-value attribute: 1150100 + k is terminal 58 + 7k for k from 0 to 5;
// any other attribute fails with tiktalerr_nsupAttr.
std::uint32_t getTerminalIdWithAttribute(ViAttr attribute);

// The serial number of a configured "serial_number": 1 to 8 hexadecimal digits ("1A2B" is
// 6699); any other text is 0.
std::uint32_t parseSerialNumber(const std::string& text) noexcept;

}  // namespace tiktal
