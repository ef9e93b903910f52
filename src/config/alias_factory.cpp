#include "config/alias_factory.h"

#include "config/qpxi_items.h"
#include "errors/zrerr.h"

namespace zrjsonconfig {
namespace {

bool isDigit(char c) { return c >= '0' && c <= '9'; }

// Where the trailing decimal digits of `text` begin (its size when there are none).
std::size_t trailingDigits(const std::string& text) {
    std::size_t at = text.size();
    while (at > 0 && isDigit(text[at - 1])) --at;
    return at;
}

}  // namespace

std::string countUp(std::string text) {
    const std::size_t first = trailingDigits(text);
    std::size_t at = text.size();
    while (at > first && text[at - 1] == '9') text[--at] = '0';
    if (at > first)
        ++text[at - 1];
    else
        text.insert(first, 1, '1');  // a carry past the first digit, or no digits at all
    return text;
}

std::string firstFreeFrom(const std::string& candidate, const AliasesInUse& devices) {
    if (!devices.contains(candidate)) return candidate;
    const std::size_t firstDigit = trailingDigits(candidate);
    // Counting on from candidate + "_1", or from a candidate that ends in "_", is numbering
    // after a prefix that ends in "_".
    if (firstDigit == 0 || candidate[firstDigit - 1] != '_') {
        const std::string prefix = candidate + "_";
        return prefix + std::to_string(devices.firstFreeNumber(prefix));
    }
    if (firstDigit == candidate.size()) return candidate + std::to_string(devices.firstFreeNumber(candidate));
    std::string alias = candidate;  // its own digits after "_" count on, as written ("_09" gives "_10")
    while (devices.contains(alias)) alias = countUp(std::move(alias));
    return alias;
}

std::string SimpleAliasFactory::createAlias(DeviceIteratorInterface&, const AliasesInUse& devices) {
    return createSimpleAlias(devices);
}

std::string SimpleAliasFactory::createSimpleAlias(const AliasesInUse& devices) {
    return _prefix + std::to_string(devices.firstFreeNumber(_prefix));
}

PxiLocation locatePxiDevice(zrqpxi::QPXILibrary& library, DeviceIteratorInterface& device) {
    const std::uint32_t bus = device.getBusPropertyU32("pciBusNumber");
    const std::uint32_t deviceNumber = device.getBusPropertyU32("pciDeviceNumber");
    const std::uint32_t function = device.getBusPropertyU32("pciFunctionNumber");
    try {
        const zrqpxi::Session session(library);
        const zrqpxi::Device found = session.openDeviceByAddr({0, bus, deviceNumber, function});
        return {static_cast<std::int32_t>(found.getU32Attribute(zrqpxi::kChassisNumber)),
                static_cast<std::int32_t>(found.getU32Attribute(zrqpxi::kSlotNumber))};
    } catch (const zrerr::Exception&) {
        return {};  // not in a chassis as far as the library knows
    }
}

std::string PXIAliasFactory::createAlias(DeviceIteratorInterface& device, const AliasesInUse& devices) {
    if (!_library) return _fallback.createAlias(device, devices);
    const PxiLocation location = locatePxiDevice(*_library, device);
    if (location.chassis <= 0 || location.slot <= 0) return _fallback.createAlias(device, devices);
    return firstFreeFrom("PXI" + std::to_string(location.chassis) + "Slot" + std::to_string(location.slot), devices);
}

}  // namespace zrjsonconfig
