// Aliases for devices that discovery finds and the configuration does not hold yet: "PXI" +
// chassis + "Slot" + slot for a device in a PXI chassis, else a numbered name (Sync1, Sync2, ...),
// never one that a configured device already uses (compared ignoring case).
#pragma once

#include <cstdint>
#include <string>

#include "QPXILibrary.h"
#include "config/aliases_in_use.h"
#include "config/device_iterator.h"

namespace zrjsonconfig {

class AliasFactoryInterface {
public:
    virtual ~AliasFactoryInterface() = default;
    // An alias for `device`, the current device of a discovery, that no configured device uses.
    virtual std::string createAlias(DeviceIteratorInterface& device, const AliasesInUse& devices) = 0;
};

// Numbered aliases: the prefix followed by 1, 2, 3, ..., the first that is free.
class SimpleAliasFactory : public AliasFactoryInterface {
public:
    explicit SimpleAliasFactory(const char* prefix = "") noexcept : _prefix(prefix) {}
    SimpleAliasFactory(const SimpleAliasFactory&) = delete;
    SimpleAliasFactory& operator=(const SimpleAliasFactory&) = delete;

    // Ignores the device.
    std::string createAlias(DeviceIteratorInterface& device, const AliasesInUse& devices) override;
    virtual std::string createSimpleAlias(const AliasesInUse& devices);

private:
    const char* _prefix;
};

// The chassis and slot of a device in a PXI chassis; -1 where unknown.
struct PxiLocation {
    std::int32_t chassis = -1;
    std::int32_t slot = -1;
};

// Where the PXI chassis query library places the current device of `device` by its PCI address:
// unknown when the library fails to say. A failure of the device's own properties raises.
PxiLocation locatePxiDevice(zrqpxi::QPXILibrary& library, DeviceIteratorInterface& device);

// PXI<chassis>Slot<slot> for a device the library places in a chassis; without the library, or
// for a device it does not place, a numbered alias with the prefix "Sync".
class PXIAliasFactory : public AliasFactoryInterface {
public:
    // `library` may be null (not available); it must outlive the factory.
    explicit PXIAliasFactory(zrqpxi::QPXILibrary* library) noexcept : _library(library), _fallback("Sync") {}
    PXIAliasFactory(const PXIAliasFactory&) = delete;
    PXIAliasFactory& operator=(const PXIAliasFactory&) = delete;

    std::string createAlias(DeviceIteratorInterface& device, const AliasesInUse& devices) override;

private:
    zrqpxi::QPXILibrary* _library;
    SimpleAliasFactory _fallback;
};

// `text` with its trailing decimal digits counted up by one, as text: "9" carries to the left,
// a carry past the first digit puts "1" in front ("a_9" gives "a_10", "a_09" gives "a_10"), and
// a text without trailing digits gets "1".
std::string countUp(std::string text);

// The first of `candidate`, then (unless its trailing digits already follow "_") candidate + "_1",
// and from there counted up, that is not in use.
std::string firstFreeFrom(const std::string& candidate, const AliasesInUse& devices);

}  // namespace zrjsonconfig
