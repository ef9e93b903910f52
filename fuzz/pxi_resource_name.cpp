// PXI resource names from arbitrary bytes, read in place so that a read past the name is caught.
//
// The parser returns 0 or one of its two statuses, leaves the result alone when it fails, and
// refuses a name longer than 256 bytes as invalid. An accepted name has fields within the bounds
// of its form, and once its letters are upper-cased and its numbers lose their leading zeros it
// is one of the ways of writing those fields in that form. Its address, printed as
// "PXI0::B-D.F::INSTR", reads back the same. Written with board 1 it is refused for its board,
// except a device name, which reads that 1 as its bus. Upper-casing the ASCII letters of a name,
// or appending "::INSTR" to an accepted name of an instrument form without it, changes nothing.
#include <string>
#include <vector>

#include "factory/pxi_resource_name.h"
#include "property.h"

namespace {

using tiktal::PxiNameForm;
using tiktal::PxiResourceName;
using tiktalfuzz::require;

bool same(const PxiResourceName& a, const PxiResourceName& b) {
    return a.form == b.form && a.board == b.board && a.bus == b.bus && a.device == b.device &&
           a.function == b.function && a.chassis == b.chassis && a.slot == b.slot &&
           a.functionOrIndex == b.functionOrIndex && a.text == b.text;
}

std::string upperCase(std::string_view name) {
    std::string upper(name);
    for (char& c : upper)
        if (c >= 'a' && c <= 'z') c = static_cast<char>(c - 'a' + 'A');
    return upper;
}

bool isAddressForm(PxiNameForm form) { return form == PxiNameForm::busDevice || form == PxiNameForm::device; }

bool isChassisSlotForm(PxiNameForm form) {
    return form == PxiNameForm::chassisSlot || form == PxiNameForm::chassisSlotFunction ||
           form == PxiNameForm::chassisSlotIndex;
}

bool isCommaText(const std::string& text) {
    return !text.empty() && text.size() <= tiktal::kMaxPxiCommaTextLength && text.find(',') != std::string::npos &&
           text.find_first_not_of("0123456789,.") == std::string::npos;
}

bool isDigit(char c) { return c >= '0' && c <= '9'; }

// Each run of digits without its leading zeros: "007" is "7", "000" is "0".
std::string withoutLeadingZeros(std::string_view text) {
    std::string out;
    bool runStart = true;  // only skipped zeros since the last byte that is not a digit
    for (std::size_t i = 0; i < text.size(); ++i) {
        if (text[i] == '0' && runStart && i + 1 < text.size() && isDigit(text[i + 1])) continue;
        out += text[i];
        runStart = !isDigit(text[i]);
    }
    return out;
}

// What may follow "PXI<board>::" for the fields of `n`, numbers written without leading zeros.
std::vector<std::string> bodiesOf(const PxiResourceName& n) {
    const auto number = [](int value) { return std::to_string(value); };
    const std::string chassisSlot = "CHASSIS" + number(n.chassis) + "::SLOT" + number(n.slot);
    const std::string function = number(n.function);
    switch (n.form) {
    case PxiNameForm::memoryAccess: return {"MEMACC"};
    case PxiNameForm::backplane: return {number(n.chassis) + "::BACKPLANE"};
    case PxiNameForm::busDevice: {
        const std::string address = number(n.bus) + "-" + number(n.device);
        if (n.function != 0) return {address + "." + function};
        return {address, address + ".0"};
    }
    case PxiNameForm::device:
        if (n.function != 0) return {number(n.device) + "::" + function};
        return {number(n.device), number(n.device) + "::0"};
    case PxiNameForm::chassisSlot: return {chassisSlot};
    case PxiNameForm::chassisSlotFunction: return {chassisSlot + "::FUNC" + number(n.functionOrIndex)};
    case PxiNameForm::chassisSlotIndex: return {chassisSlot + "::INDEX" + number(n.functionOrIndex)};
    case PxiNameForm::commaText: return {withoutLeadingZeros(n.text)};
    default: return {};
    }
}

bool isWrittenAs(std::string_view name, const PxiResourceName& n) {
    const std::string written = withoutLeadingZeros(upperCase(name));
    const bool instrumentForm = n.form != PxiNameForm::memoryAccess && n.form != PxiNameForm::backplane;
    const bool busIsBoard = n.form == PxiNameForm::device && n.bus != 0;
    for (const char* type : {"PXI", "PCI"})
        for (const std::string& board : busIsBoard ? std::vector<std::string>{std::to_string(n.bus)}
                                                   : std::vector<std::string>{"", "0"})
            for (const std::string& body : bodiesOf(n))
                for (const char* suffix : {"", "::INSTR"})
                    if ((instrumentForm || *suffix == '\0') && written == type + board + "::" + body + suffix)
                        return true;
    return false;
}

void checkAccepted(std::string_view name, const PxiResourceName& n) {
    require(name.size() <= tiktal::kMaxPxiResourceNameLength, "an accepted name is within the length");
    require(isWrittenAs(name, n), "an accepted name writes its fields in its form");
    require(n.form != PxiNameForm::none && n.board == 0, "an accepted name has a form and board 0");
    require(n.bus < 256 && n.device < 32 && n.function < 8, "bus, device and function are within bounds");
    require(isAddressForm(n.form) || (n.bus == 0 && n.device == 0 && n.function == 0),
            "only the bus-device and device forms set an address");
    const bool located = n.form == PxiNameForm::backplane || isChassisSlotForm(n.form);
    require(located ? n.chassis >= 1 : n.chassis == 0, "a chassis is at least 1, and only where a form has one");
    require(isChassisSlotForm(n.form) ? n.slot >= 1 && n.slot <= 18 : n.slot == 0, "a slot is from 1 to 18");
    require(n.form == PxiNameForm::chassisSlotFunction ? n.functionOrIndex < 8
                                                       : n.form == PxiNameForm::chassisSlotIndex || n.functionOrIndex == 0,
            "a FUNC number is a PCI function");
    require(n.form == PxiNameForm::commaText ? isCommaText(n.text) : n.text.empty(),
            "the comma text is 1 to 239 digits, commas and dots with a comma");
}

void checkCanonicalAddress(const PxiResourceName& n) {
    const std::string canonical = "PXI0::" + std::to_string(n.bus) + "-" + std::to_string(n.device) + "." +
                                  std::to_string(n.function) + "::INSTR";
    PxiResourceName again;
    require(tiktal::parsePxiResourceName(canonical, again) == 0 && again.form == PxiNameForm::busDevice &&
                again.bus == n.bus && again.device == n.device && again.function == n.function,
            "the canonical name reads back as the same address");
}

// The accepted name written with board 1: a device name then reads its bus as 1, any other is
// refused for its board.
void checkOnBoardOne(std::string_view name, const PxiResourceName& n) {
    const std::string onBoardOne = std::string(name.substr(0, 3)) + "1" + std::string(name.substr(name.find("::")));
    if (onBoardOne.size() > tiktal::kMaxPxiResourceNameLength) return;
    PxiResourceName parsed;
    const std::int32_t status = tiktal::parsePxiResourceName(onBoardOne, parsed);
    if (n.form != PxiNameForm::device) {
        require(status == tiktal::pxiStatusBoardNotConfigured, "a name on board 1 is refused for its board");
        return;
    }
    PxiResourceName onBus1 = n;
    onBus1.bus = 1;
    require(status == 0 && same(parsed, onBus1), "a device name on board 1 is on bus 1");
}

void checkInstrSuffix(std::string_view name, const PxiResourceName& n) {
    const bool instrumentForm = n.form != PxiNameForm::memoryAccess && n.form != PxiNameForm::backplane;
    const bool endsInInstr = name.size() >= 7 && upperCase(name.substr(name.size() - 7)) == "::INSTR";
    if (!instrumentForm || endsInInstr || name.size() + 7 > tiktal::kMaxPxiResourceNameLength) return;
    PxiResourceName suffixed;
    require(tiktal::parsePxiResourceName(std::string(name) + "::INSTR", suffixed) == 0 && same(suffixed, n),
            "a trailing ::INSTR changes nothing");
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const std::string_view name = tiktalfuzz::bytes(data, size);
    PxiResourceName parsed, untouched;
    parsed.text = untouched.text = "untouched";
    const std::int32_t status = tiktal::parsePxiResourceName(name, parsed);
    require(status == 0 || status == tiktal::pxiStatusBoardNotConfigured || status == tiktal::pxiStatusInvalidName,
            "only 0 or one of the two statuses");
    require(size <= tiktal::kMaxPxiResourceNameLength || status == tiktal::pxiStatusInvalidName,
            "a longer name is invalid");

    PxiResourceName upper = untouched;
    require(tiktal::parsePxiResourceName(upperCase(name), upper) == status && same(upper, parsed),
            "the case of the letters changes nothing");
    if (status != 0) {
        require(same(parsed, untouched), "a refused name leaves the result alone");
        return 0;
    }
    checkAccepted(name, parsed);
    if (isAddressForm(parsed.form)) checkCanonicalAddress(parsed);
    checkInstrSuffix(name, parsed);
    checkOnBoardOne(name, parsed);
    return 0;
}
