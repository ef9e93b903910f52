#include "device.h"

#include <algorithm>
#include <iterator>

namespace devd {
namespace {

bool isTerminal(std::uint32_t id) { return std::find(std::begin(kTerminals), std::end(kTerminals), id) != std::end(kTerminals); }

// readInfo1..readInfo6 by control code.
const std::map<std::uint32_t, std::uint32_t>& modelData() {
    static const std::map<std::uint32_t, std::uint32_t> data = {
        {0x807F2004u, kHardwareRevision}, {0x807F2008u, kBoardIdentity}, {0x807F200Cu, kFirmwareVersion},
        {0x807F2010u, kFpgaImageDate},    {0x807F2014u, kTerminalCount}, {0x807F2018u, kBoardTemperature},
    };
    return data;
}

constexpr std::uint32_t kWriteTerminalValue = 0x80012004u;
constexpr std::uint32_t kReadTerminalValue = 0x80012008u;
constexpr std::uint32_t kRoutingFirst = 0x80802000u;  // routingRequest0
constexpr std::uint32_t kRoutingLast = 0x8080202Cu;   // routingRequest10

}  // namespace

Bytes failedOutput(const Request& request, std::int32_t driverStatus) {
    Bytes output(request.entry ? request.entry->outputSize : 0);
    setTrailingStatus(output, driverStatus);
    return output;
}

Bytes Device::perform(const Request& request) {
    Bytes output = failedOutput(request, 0);
    std::lock_guard<std::mutex> guard(_lock);
    performLocked(request, output);
    return output;
}

void Device::performLocked(const Request& request, Bytes& output) {
    const auto info = modelData().find(request.code);
    if (info != modelData().end())
        writeU32(output, 0, info->second);
    else if (request.code == kWriteTerminalValue)
        setTrailingStatus(output, writeTerminal(request.input));
    else if (request.code == kReadTerminalValue)
        setTrailingStatus(output, readTerminal(request.input, output));
    else if (request.code == kResetDeviceCode)
        resetLocked();
    else if (request.code >= kRoutingFirst && request.code <= kRoutingLast)
        performRouting(request, output);
}

std::int32_t Device::writeTerminal(const Bytes& input) {
    const std::uint32_t terminal = readU32(input, 0);
    if (!isTerminal(terminal)) return kUnknownTerminal;
    _terminals[terminal] = readU32(input, 4);
    return 0;
}

std::int32_t Device::readTerminal(const Bytes& input, Bytes& output) const {
    const std::uint32_t terminal = readU32(input, 0);
    if (!isTerminal(terminal)) return kUnknownTerminal;
    const auto found = _terminals.find(terminal);
    writeU32(output, 0, found == _terminals.end() ? 0 : found->second);
    return 0;
}

// Routing requests count themselves; routingRequest0 answers the count (this one included). The
// others give back what they were handed: routingRequest1 its a1 as result and its in-out value
// unchanged, routingRequest3 and routingRequest7 their in-out value, routingRequest10 its a1.
void Device::performRouting(const Request& request, Bytes& output) {
    ++_routingRequests;
    switch (request.code) {
        case 0x80802000u: writeU32(output, 0, _routingRequests); break;
        case 0x80802004u:
            writeU32(output, 0, readU32(request.input, 0));
            writeU32(output, 4, readU32(request.input, 48));  // io9, after a1..a8
            break;
        case 0x8080200Cu:
        case 0x8080201Cu: writeU32(output, 0, readU32(request.input, 16)); break;  // io3, after a1, pad, a2
        case 0x8080202Cu: writeU32(output, 0, readU32(request.input, 0)); break;
        default: break;  // only the driver's status
    }
}

void Device::resetLocked() {
    _terminals.clear();
    _routingRequests = 0;
}

std::map<std::uint32_t, std::uint32_t> Device::terminalValues() const {
    std::lock_guard<std::mutex> guard(_lock);
    return _terminals;
}

}  // namespace devd
