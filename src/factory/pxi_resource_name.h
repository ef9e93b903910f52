// PXI resource names, by which a local device is opened at its PCI address:
//
//   name      = ("PXI" | "PCI") [board] "::" rest
//   rest      = "MEMACC"                                            memory access
//             | chassis "::BACKPLANE"                               backplane
//             | body ["::INSTR"]
//   body      = bus "-" device ["." function]                       bus-device
//             | device ["::" function]                              device: bus = board, board = 0
//             | "CHASSIS" chassis "::SLOT" slot
//               ["::FUNC" function | "::INDEX" index]               chassis-slot
//             | 1 to 239 of "0".."9" "," "." with at least one ","  comma text, kept as written
//
// Keywords match in any ASCII case; a rest that ends in "MEMACC" is the memory-access form or
// nothing. Numbers are runs of decimal digits up to 65535, chassis and slot up to 32767; a
// longer-valued run matches no form. Accepted names then need board 0 (else
// pxiStatusBoardNotConfigured), bus < 256, device < 32, function < 8 (the FUNC number too),
// chassis >= 1 and slot 1..18 (else pxiStatusInvalidName).
//
// What the grammar alone leaves open:
// - A name longer than kMaxPxiResourceNameLength is refused as invalid before it is read. That
//   length holds the longest name of any form written without leading zeros
//   ("PXI65535::" + 239 characters of comma text + "::INSTR"), and it bounds the work.
// - Leading zeros are allowed and read as decimal ("010" is ten), within that length.
// - No number takes a sign, chassis and slot included: "+1" or "-1" matches no form.
// - White space is never skipped, anywhere: " PXI0::1-2" and "PXI0:: 1-2" are invalid. So is
//   any byte outside the grammar (NUL, non-ASCII), and keywords ignore ASCII case only.
// - The empty name, a "::" with nothing after it ("PXI0::", "PXI0::3::") and a second "::INSTR"
//   are invalid.
// - A name matches a form before its board is looked at: "PXI1::x" is invalid, "PXI1::3-4"
//   fails for its board, and the board is checked before the other bounds.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>

namespace tiktal {

// The board number of the name is not 0: no such PXI interface.
inline constexpr std::int32_t pxiStatusBoardNotConfigured = static_cast<std::int32_t>(0xBFFF00A5u);
// The name is not a PXI resource name, or a number in it is out of bounds.
inline constexpr std::int32_t pxiStatusInvalidName = static_cast<std::int32_t>(0xBFFF0012u);

inline constexpr std::size_t kMaxPxiResourceNameLength = 256;
inline constexpr std::size_t kMaxPxiCommaTextLength = 239;

enum class PxiNameForm {
    none,  // not parsed
    memoryAccess,
    backplane,
    busDevice,
    device,
    chassisSlot,
    chassisSlotFunction,
    chassisSlotIndex,
    commaText,
};

// Fields that a form does not set stay 0 (text stays empty); only the bus-device and device
// forms set bus, device and function.
struct PxiResourceName {
    PxiNameForm form = PxiNameForm::none;
    std::uint16_t board = 0;
    std::uint16_t bus = 0;
    std::uint16_t device = 0;
    std::uint16_t function = 0;
    std::int16_t chassis = 0;
    std::int16_t slot = 0;
    std::uint16_t functionOrIndex = 0;  // the FUNC or INDEX number of the chassis-slot forms
    std::string text;                   // the comma text
};

// 0 with `out` set, or pxiStatusBoardNotConfigured or pxiStatusInvalidName with `out` unchanged.
std::int32_t parsePxiResourceName(std::string_view name, PxiResourceName& out);

}  // namespace tiktal
