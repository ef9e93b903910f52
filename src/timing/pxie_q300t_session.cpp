#include "timing/pxie_q300t_session.h"

#include <boost/numeric/conversion/cast.hpp>
#include <cmath>

#include "errors/zrerr.h"
#include "json/zrjsonlh.h"

namespace tiktal {
namespace {

constexpr ViAttr kSerialNumber = 1150001;
constexpr ViAttr kDeviceId = 1150002;
constexpr ViAttr kFirstTerminalValue = 1150100;
constexpr ViAttr kTerminalValues = 6;
using zrerr::kMissingParameter;

// A failed device request as the status exception, with where the request failed.
void raiseIfError(const nZRAPALS100::tStatus& status) {
    if (!status.isError()) return;
    zrerr::Exception failure;
    failure.setCode(status.code);
    failure.addText("error_constant", "nZRAPALS100::tStatus");
    failure.addText("file", status.file);
    failure.addInteger("line", status.line);
    failure.addText("component", status.component);
    throw failure;
}

void requireOutput(const void* value) {
    if (!value) throw ZRERR_RAISE(tiktalerr_invParameter).debug("message", kMissingParameter).debug("value", "NULL");
}

[[noreturn]] void notSupported(const char* function, ViAttr attribute) {
    throw ZRERR_RAISE(tiktalerr_nsupAttr).debug("func", function).debug("attribute", attribute);
}

// The count of thousandths the device holds for `value`; a value without one (negative, not a
// number, infinite, 2^32 thousandths or more) is refused before anything is sent.
std::uint32_t thousandths(ViReal64 value) {
    const double count = value * 1000.0;
    if (!(value >= 0) || !(count < 4294967296.0))
        throw ZRERR_RAISE(tiktalerr_invParameter).debug("message", "A terminal value is from 0 to 4294967.295").debug("value", std::to_string(value));
    return static_cast<std::uint32_t>(count);
}

std::uint32_t deviceIdOf(const cJSON* configured) {
    const cJSON* id = zrjsonlh::getObjectItem(configured, "device_id");
    zrjsonlh::checkNumber(id);
    // Below or at -1, or at or above 2^32, has no 32-bit identifier; between, toward zero.
    if (id->valuedouble <= -1.0) throw boost::numeric::negative_overflow();
    if (!(id->valuedouble < 4294967296.0)) throw boost::numeric::positive_overflow();
    return static_cast<std::uint32_t>(std::trunc(id->valuedouble));
}

bool isTerminalValue(ViAttr attribute) { return attribute - kFirstTerminalValue < kTerminalValues; }  // unsigned

}  // namespace

std::uint32_t getTerminalIdWithAttribute(ViAttr attribute) {
    if (!isTerminalValue(attribute)) throw ZRERR_RAISE(tiktalerr_nsupAttr).debug("attribute", attribute);
    return 58 + 7 * (attribute - kFirstTerminalValue);
}

std::uint32_t parseSerialNumber(const std::string& text) noexcept {
    if (text.empty() || text.size() > 8) return 0;
    std::uint32_t value = 0;
    for (const char c : text) {
        const int digit = c >= '0' && c <= '9' ? c - '0' : c >= 'a' && c <= 'f' ? c - 'a' + 10 : c >= 'A' && c <= 'F' ? c - 'A' + 10 : -1;
        if (digit < 0) return 0;
        value = value << 4 | static_cast<std::uint32_t>(digit);
    }
    return value;
}

std::unique_ptr<PxieQ300tSession> PxieQ300tSession::open(const zrjsonconfig::DeviceEntry& entry) {
    auto proxy = std::make_unique<Proxy>();
    std::unique_ptr<RoutingLibrary> library = loadRoutingLibrary();
    nZRAPALS100::tStatus status;
    proxy->open(zrjsonlh::getString(zrjsonlh::getObjectItem(entry.provided(), "interface_path")), status);
    raiseIfError(status);
    const cJSON* configured = entry.configured();
    const std::uint32_t serialNumber =
        parseSerialNumber(zrjsonlh::getString(zrjsonlh::getObjectItem(configured, "serial_number")));
    std::string alias = zrjsonlh::getString(zrjsonlh::getObjectItem(configured, "alias"));
    const std::uint32_t deviceId = deviceIdOf(configured);
    return std::unique_ptr<PxieQ300tSession>(
        new PxieQ300tSession(std::move(proxy), std::move(alias), deviceId, serialNumber, std::move(library)));
}

PxieQ300tSession::PxieQ300tSession(std::unique_ptr<Proxy> proxy, std::string alias, std::uint32_t deviceId,
                                   std::uint32_t serialNumber, std::unique_ptr<RoutingLibrary> library)
    : _proxy(std::move(proxy)), _deviceId(deviceId), _serialNumber(serialNumber), _routing(std::move(alias), std::move(library)) {}

void PxieQ300tSession::connectTrigTerminals(ViConstString srcTerminal, ViConstString destTerminal,
                                            ViConstString syncClock, ViInt32 invert, ViInt32 updateEdge) {
    _routing.connectTrigTerminals(srcTerminal, destTerminal, syncClock, invert, updateEdge);
}

void PxieQ300tSession::disconnectTrigTerminals(ViConstString srcTerminal, ViConstString destTerminal) {
    _routing.disconnectTrigTerminals(srcTerminal, destTerminal);
}

void PxieQ300tSession::connectClkTerminals(ViConstString srcTerminal, ViConstString destTerminal) {
    _routing.connectClkTerminals(srcTerminal, destTerminal);
}

void PxieQ300tSession::disconnectClkTerminals(ViConstString srcTerminal, ViConstString destTerminal) {
    _routing.disconnectClkTerminals(srcTerminal, destTerminal);
}

void PxieQ300tSession::reset() {
    roco::resetDevice(_routing.lib(), _routing.alias(), [this] {
        nZRAPALS100::tStatus status;
        _proxy->resetDevice(status);
        raiseIfError(status);
    });
}

void PxieQ300tSession::getAttributeViInt32(ViConstString, ViAttr attribute, ViInt32* value) {
    requireOutput(value);
    if (attribute == kSerialNumber)
        *value = static_cast<ViInt32>(_serialNumber);
    else if (attribute == kDeviceId)
        *value = static_cast<ViInt32>(_deviceId);
    else
        notSupported("tiktal::PxieQ300tSession::getAttributeViInt32", attribute);
}

void PxieQ300tSession::getAttributeViReal64(ViConstString, ViAttr attribute, ViReal64* value) {
    requireOutput(value);
    if (!isTerminalValue(attribute)) notSupported("tiktal::PxieQ300tSession::getAttributeViReal64", attribute);
    nZRAPALS100::tStatus status;
    *value = _proxy->readTerminalValue(getTerminalIdWithAttribute(attribute), status) / 1000.0;
    raiseIfError(status);
}

void PxieQ300tSession::setAttributeViReal64(ViConstString, ViAttr attribute, ViReal64 value) {
    if (!isTerminalValue(attribute)) notSupported("tiktal::PxieQ300tSession::setAttributeViReal64", attribute);
    const std::uint32_t count = thousandths(value);
    nZRAPALS100::tStatus status;
    _proxy->writeTerminalValue(getTerminalIdWithAttribute(attribute), count, status);
    raiseIfError(status);
}

}  // namespace tiktal
