#include "tsession/enums.h"

#include "enumerations.h"
#include "errors/zrerr.h"

namespace tiktal {
namespace {

// The member whose service text is `text`, or null.
template <std::size_t N>
const EnumerationMember* byText(const EnumerationMember (&members)[N], const std::string& text) {
    for (const EnumerationMember& member : members)
        if (member.text && text == member.text) return &member;
    return nullptr;
}

// The member of `text`, else the one that takes the texts the enumeration does not list.
template <std::size_t N>
const EnumerationMember& byTextOrOthers(const EnumerationMember (&members)[N], const std::string& text) {
    if (const EnumerationMember* member = byText(members, text)) return *member;
    for (const EnumerationMember& member : members)
        if (member.others) return member;
    throw ZRERR_RAISE(tiktalerr_internalSoftware).debug("func", "tiktal::byTextOrOthers");
}

}  // namespace

std::uint8_t getClockAccuracyCodeFromString(const std::string& name) {
    return static_cast<std::uint8_t>(byTextOrOthers(kGptpClockAccuracy, name).value);
}

ViInt32 getPtpClockAccuracyFromString(const std::string& name) { return byTextOrOthers(kPtpClockAccuracy, name).value; }

ViInt32 getPtpPortStateEnumFromString(const std::string& text) {
    const EnumerationMember* state = byText(kPtpPortState, text);
    if (!state)
        throw ZRERR_RAISE(tiktalerr_internalSoftware).debug("func", "`anonymous-namespace'::getPtpPortStateEnumFromString");
    return state->value;
}

// The service names 802.1AS port states with the IEEE 1588 texts; those other than master and
// slave read as one number.
ViInt32 get8021asPortStateEnumFromString(const std::string& text) {
    if (!byText(kPtpPortState, text))
        throw ZRERR_RAISE(tiktalerr_internalSoftware).debug("func", "`anonymous-namespace'::get8021asPortStateEnumFromString");
    return byTextOrOthers(kGptpPortState, text).value;
}

ViInt32 getBmcaModeEnumFromString(const std::string& text) {
    const EnumerationMember* mode = byText(kBmcaMode, text);
    if (!mode)
        throw ZRERR_RAISE(tiktalerr_internalSoftware).debug("func", "`anonymous-namespace'::getBmcaModeEnumFromString");
    return mode->value;
}

std::string getBmcaModeStringFromEnum(ViInt32 value) {
    for (const EnumerationMember& mode : kBmcaMode)
        if (mode.value == value && mode.text) return mode.text;
    throw ZRERR_RAISE(tiktalerr_invParameter).debug("func", "`anonymous-namespace'::getBmcaModeStringFromEnum");
}

}  // namespace tiktal
