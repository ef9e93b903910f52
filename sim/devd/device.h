// The timing module as the driver models it: its terminal values, its fixed model data and the
// routing requests' counter. Carries out the requests of the table (not waits and cancels, which
// Waits keeps); every operation takes the device's one lock, so connections may call it at once.
#pragma once

#include "wire.h"

#include <cstdint>
#include <map>
#include <mutex>

namespace devd {

// resetDevice, after which the connection also cancels the armed waits.
inline constexpr std::uint32_t kResetDeviceCode = 0x80022004u;

// The driver's status for a terminal identifier the module does not have (in the trailing status
// field of the output).
inline constexpr std::int32_t kUnknownTerminal = -52005;

// The module's terminals, the only ones whose values it keeps.
inline constexpr std::uint32_t kTerminals[] = {58, 65, 72, 79, 86, 93};

// The fixed model data that readInfo1..readInfo6 answer (see README.md).
inline constexpr std::uint32_t kHardwareRevision = 3;                // readInfo1
inline constexpr std::uint32_t kBoardIdentity = 0x5A3C7405;          // readInfo2: variant << 16 | device id
inline constexpr std::uint32_t kFirmwareVersion = 0x02030011;        // readInfo3: 2.3.17
inline constexpr std::uint32_t kFpgaImageDate = 0x20231115;          // readInfo4: BCD yyyymmdd
inline constexpr std::uint32_t kTerminalCount = 6;                   // readInfo5
inline constexpr std::uint32_t kBoardTemperature = 41250;            // readInfo6: millidegrees Celsius

class Device {
public:
    // Carries out a decoded request of the table and returns its output packet (the table's output
    // size, the driver's status last).
    Bytes perform(const Request& request);

    // The terminal values written since the start or the last reset.
    std::map<std::uint32_t, std::uint32_t> terminalValues() const;

private:
    void performLocked(const Request& request, Bytes& output);
    std::int32_t writeTerminal(const Bytes& input);
    std::int32_t readTerminal(const Bytes& input, Bytes& output) const;
    void performRouting(const Request& request, Bytes& output);
    void resetLocked();

    mutable std::mutex _lock;
    std::map<std::uint32_t, std::uint32_t> _terminals;
    std::uint32_t _routingRequests = 0;  // routing requests since the start or the last reset
};

// An output packet of the request's size holding only the given driver status: what a request
// answers when a test control makes it fail without carrying it out.
Bytes failedOutput(const Request& request, std::int32_t driverStatus);

}  // namespace devd
