// PXI resource names: the forms, their bounds, and the names that are refused.
#include <gtest/gtest.h>

#include <string>
#include <tuple>

#include "factory/pxi_resource_name.h"

namespace {

using tiktal::parsePxiResourceName;
using tiktal::PxiNameForm;
using tiktal::PxiResourceName;

constexpr std::int32_t kBoard = tiktal::pxiStatusBoardNotConfigured;
constexpr std::int32_t kInvalid = tiktal::pxiStatusInvalidName;

// form, bus, device, function, chassis, slot, function or index, text
using Fields = std::tuple<PxiNameForm, int, int, int, int, int, int, std::string>;

Fields fieldsOf(const PxiResourceName& n) {
    return {n.form, n.bus, n.device, n.function, n.chassis, n.slot, n.functionOrIndex, n.text};
}

std::int32_t statusOf(const std::string& name) {
    PxiResourceName parsed;
    return parsePxiResourceName(name, parsed);
}

TEST(PxiResourceName, ReadsEveryFormInAnyCaseOfItsKeywords) {
    const auto busDevice = PxiNameForm::busDevice, device = PxiNameForm::device;
    const std::pair<const char*, Fields> accepted[] = {
        {"PXI0::3-4.0::INSTR", {busDevice, 3, 4, 0, 0, 0, 0, ""}},
        {"PXI3::4::INSTR", {device, 3, 4, 0, 0, 0, 0, ""}},  // the board number is the bus
        {"PXI0::3-4", {busDevice, 3, 4, 0, 0, 0, 0, ""}},
        {"PCI::3-4.5::INSTR", {busDevice, 3, 4, 5, 0, 0, 0, ""}},
        {"pxi0::255-31.7::instr", {busDevice, 255, 31, 7, 0, 0, 0, ""}},
        {"PXI::7", {device, 0, 7, 0, 0, 0, 0, ""}},
        {"PXI0::4::5", {device, 0, 4, 5, 0, 0, 0, ""}},
        {"pci255::31::7::Instr", {device, 255, 31, 7, 0, 0, 0, ""}},
        {"PXI00::003-0004.07", {busDevice, 3, 4, 7, 0, 0, 0, ""}},  // leading zeros, read as decimal
        {"PXI010::4", {device, 10, 4, 0, 0, 0, 0, ""}},
        {"PXI0::MEMACC", {PxiNameForm::memoryAccess, 0, 0, 0, 0, 0, 0, ""}},
        {"pCi::MemAcc", {PxiNameForm::memoryAccess, 0, 0, 0, 0, 0, 0, ""}},
        {"PXI0::1::BACKPLANE", {PxiNameForm::backplane, 0, 0, 0, 1, 0, 0, ""}},
        {"pxi::32767::backplane", {PxiNameForm::backplane, 0, 0, 0, 32767, 0, 0, ""}},
        {"pxi0::chassis1::slot4", {PxiNameForm::chassisSlot, 0, 0, 0, 1, 4, 0, ""}},
        {"PXI0::CHASSIS32767::SLOT18::INSTR", {PxiNameForm::chassisSlot, 0, 0, 0, 32767, 18, 0, ""}},
        {"PXI0::Chassis2::Slot1::Func7::INSTR", {PxiNameForm::chassisSlotFunction, 0, 0, 0, 2, 1, 7, ""}},
        {"PXI0::CHASSIS1::SLOT2::FUNC0", {PxiNameForm::chassisSlotFunction, 0, 0, 0, 1, 2, 0, ""}},
        {"PXI0::CHASSIS1::SLOT2::index65535", {PxiNameForm::chassisSlotIndex, 0, 0, 0, 1, 2, 65535, ""}},
        {"PXI0::1,2::INSTR", {PxiNameForm::commaText, 0, 0, 0, 0, 0, 0, "1,2"}},
        {"PXI::2.0,.3.1,", {PxiNameForm::commaText, 0, 0, 0, 0, 0, 0, "2.0,.3.1,"}},
        {"PXI0::,", {PxiNameForm::commaText, 0, 0, 0, 0, 0, 0, ","}},
    };
    for (const auto& [name, fields] : accepted) {
        PxiResourceName parsed;
        ASSERT_EQ(parsePxiResourceName(name, parsed), 0) << name;
        EXPECT_EQ(parsed.board, 0) << name;
        EXPECT_EQ(fieldsOf(parsed), fields) << name;
    }
}

TEST(PxiResourceName, BoundsEveryNumber) {
    const std::pair<const char*, std::int32_t> cases[] = {
        // The board: only 0 (or none) opens; it is checked before the other bounds.
        {"PXI0::MEMACC", 0}, {"PXI1::MEMACC", kBoard}, {"PXI1::3-4.0::INSTR", kBoard},
        {"PXI1::1::BACKPLANE", kBoard}, {"PCI1::CHASSIS1::SLOT1", kBoard}, {"PXI1::1,2", kBoard},
        {"PXI1::256-0", kBoard}, {"PXI65535::0-0", kBoard}, {"PXI65536::0-0", kInvalid},
        // Bus, device and function; a run past 65535 matches no form, so no board check either.
        {"PXI0::255-0", 0}, {"PXI0::256-0", kInvalid}, {"PXI255::0", 0}, {"PXI256::0", kInvalid},
        {"PXI0::0-31", 0}, {"PXI0::0-32", kInvalid}, {"PXI0::31", 0}, {"PXI0::32", kInvalid},
        {"PXI0::0-0.7", 0}, {"PXI0::0-0.8", kInvalid}, {"PXI0::0::7", 0}, {"PXI0::0::8", kInvalid},
        {"PXI1::65535-0", kBoard}, {"PXI1::65536-0", kInvalid}, {"PXI1::0-65536", kInvalid},
        {"PXI1::0-0.65535", kBoard}, {"PXI1::0-0.65536", kInvalid}, {"PXI0::65536::0", kInvalid},
        {"PXI0::4294967296-0", kInvalid}, {"PXI0::99999999999999999999999-0", kInvalid},
        // Chassis and slot.
        {"PXI0::0::BACKPLANE", kInvalid}, {"PXI1::32767::BACKPLANE", kBoard},
        {"PXI1::32768::BACKPLANE", kInvalid}, {"PXI0::4294967297::BACKPLANE", kInvalid},
        {"PXI0::CHASSIS0::SLOT1", kInvalid}, {"PXI0::CHASSIS1::SLOT1", 0},
        {"PXI1::CHASSIS32767::SLOT1", kBoard}, {"PXI1::CHASSIS32768::SLOT1", kInvalid},
        {"PXI0::CHASSIS1::SLOT0", kInvalid}, {"PXI0::CHASSIS1::SLOT18", 0}, {"PXI0::CHASSIS1::SLOT19", kInvalid},
        {"PXI1::CHASSIS1::SLOT32767", kBoard}, {"PXI1::CHASSIS1::SLOT32768", kInvalid},
        {"PXI0::CHASSIS1::SLOT0::INDEX1", kInvalid}, {"PXI0::CHASSIS1::SLOT19::FUNC1", kInvalid},
        {"PXI0::CHASSIS0::SLOT1::FUNC1", kInvalid},
        // FUNC names a PCI function; INDEX is any number.
        {"PXI0::CHASSIS1::SLOT1::FUNC8", kInvalid}, {"PXI1::CHASSIS1::SLOT1::FUNC65535", kBoard},
        {"PXI1::CHASSIS1::SLOT1::FUNC65536", kInvalid}, {"PXI0::CHASSIS1::SLOT1::INDEX65536", kInvalid},
    };
    for (const auto& [name, status] : cases) EXPECT_EQ(statusOf(name), status) << name;
}

TEST(PxiResourceName, RefusesEveryOtherShape) {
    const std::string refused[] = {
             "", "PXI", "PXI0", "PXI0:", "PXI0::", "PXI0:::", "PXI0::::INSTR", "PXI0::INSTR", "GPIB0::3-4",
             "PXIE0::3-4", "XPXI0::3-4", "PXI0:3-4", "PXI0::3::", "PXI0::3-", "PXI0::3-4.", "PXI0::-4",
             "PXI0::3-4::", "PXI0::3-4.0.1", "PXI0::3-4-5", "PXI0::3::4::5", "PXI0::3-4::INSTR::INSTR",
             "PXI0::3-4:INSTR", "PXI0::3-4INSTR",
             // Signs, on unsigned and signed numbers alike.
             "PXI0::+3-4", "PXI0::3-+4", "PXI-1::3-4", "PXI+0::3-4", "PXI0::CHASSIS-1::SLOT1",
             "PXI0::CHASSIS+1::SLOT1", "PXI0::CHASSIS1::SLOT-1", "PXI0::-1::BACKPLANE",
             // White space and bytes outside the grammar.
             " PXI0::3-4", "PXI0::3-4 ", "PXI0:: 3-4", "PXI0::3 -4", "PXI0::3\t-4", "PXI0::3-4\n",
             std::string("PXI0::3-4\0", 10), std::string("PXI0\0::3-4", 10), "PXI0::\xEF\xBC\x93-4",
             "\xEF\xBC\xB0XI0::3-4", "PXI0::CHASS\xC4\xB0S1::SLOT1", "PXI0::1::BAC\xE2\x84\xAAPLANE",
             // Memory access and backplane: exactly their form, nothing around them.
             "PXIMEMACC", "PXI0::1MEMACC", "PXI0::3-4::MEMACC", "PXI0::MEMACC::INSTR", "PXI0::XMEMACC",
             "PXI0::BACKPLANE", "PXI0::::BACKPLANE", "PXI0::1::BACKPLANE::INSTR", "PXI0::CHASSIS1::BACKPLANE",
             // Incomplete chassis-slot forms, and the comma form without a comma or with another byte.
             "PXI0::CHASSIS1", "PXI0::CHASSIS1::SLOT", "PXI0::CHASSIS1::SLOT1::", "PXI0::CHASSIS1::SLOT1::FUNC",
             "PXI0::CHASSIS1::SLOT1::INDEX", "PXI0::CHASSIS1::SLOT1::FUNC1::INDEX1", "PXI0::CHASSIS1SLOT1",
             "PXI0::SLOT1::CHASSIS1", "PXI0::CHASSIS::SLOT1", "PXI0::1.2", "PXI0::1,a", "PXI0::1;2",
             "PXI0::1, 2"};
    for (const std::string& name : refused)
        EXPECT_EQ(statusOf(name), kInvalid) << testing::PrintToString(name);
}

TEST(PxiResourceName, BoundsTheCommaTextAndTheWholeName) {
    const std::string text239 = "1," + std::string(237, '0');
    PxiResourceName parsed;
    ASSERT_EQ(parsePxiResourceName("PXI0::" + text239 + "::INSTR", parsed), 0);
    EXPECT_EQ(parsed.text, text239);
    EXPECT_EQ(statusOf("PXI0::" + text239 + "0"), kInvalid);
    // The longest name of any form without leading zeros fits; one more character does not.
    const std::string longest = "PXI65535::" + text239 + "::INSTR";
    ASSERT_EQ(longest.size(), tiktal::kMaxPxiResourceNameLength);
    EXPECT_EQ(statusOf(longest), kBoard);
    EXPECT_EQ(statusOf("PXI065535::" + text239 + "::INSTR"), kInvalid);
    // Leading zeros count towards the length.
    EXPECT_EQ(statusOf("PXI0::" + std::string(247, '0') + "3-4"), 0);
    EXPECT_EQ(statusOf("PXI0::" + std::string(248, '0') + "3-4"), kInvalid);
    EXPECT_EQ(statusOf("PXI0::" + std::string(1 << 20, '1') + "-4"), kInvalid);
    EXPECT_EQ(statusOf("PXI0::" + std::string(1 << 20, ',')), kInvalid);
}

TEST(PxiResourceName, WritesTheWholeResultOnSuccessOnly) {
    PxiResourceName parsed;
    ASSERT_EQ(parsePxiResourceName("PXI0::CHASSIS3::SLOT4::INDEX5", parsed), 0);
    const Fields before = fieldsOf(parsed);
    EXPECT_EQ(parsePxiResourceName("PXI1::3-4", parsed), kBoard);
    EXPECT_EQ(parsePxiResourceName("PXI0::3-4x", parsed), kInvalid);
    EXPECT_EQ(fieldsOf(parsed), before);
    ASSERT_EQ(parsePxiResourceName("PXI0::7,8", parsed), 0);
    ASSERT_EQ(parsePxiResourceName("PXI0::3-4", parsed), 0);
    EXPECT_EQ(fieldsOf(parsed), Fields(PxiNameForm::busDevice, 3, 4, 0, 0, 0, 0, ""));
}

}  // namespace
