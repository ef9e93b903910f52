// The PXI chassis query library as the device configuration uses it: DynamicQPXILibrary loaded
// from the stand-in (LD_LIBRARY_PATH names its folder), the item classes over an inventory file
// in a temporary machine, and the handles they leave open: none.
#include <gtest/gtest.h>

#include <algorithm>
#include <atomic>
#include <chrono>
#include <thread>
#include <vector>

#include "config/qpxi_items.h"
#include "config/qpxi_library.h"
#include "qpxi_stand_in.h"

using namespace qpxi_test;

// Addresses compare and print whole (found by argument lookup: the C type is global).
bool operator==(const zrqpxi_PciAddress& a, const zrqpxi_PciAddress& b) {
    return a.reserved == b.reserved && a.bus == b.bus && a.device == b.device && a.function == b.function;
}
void PrintTo(const zrqpxi_PciAddress& a, std::ostream* out) {
    *out << "{" << a.reserved << ", " << a.bus << ", " << a.device << ", " << a.function << "}";
}

namespace {

constexpr std::int32_t kUnknownHandle = -88501, kNoSuchAttribute = -88502, kNoSuchItem = -88503,
                       kNotContained = -88504, kBadInventory = -88505;

class QpxiLibrary : public ::testing::Test {
protected:
    void SetUp() override {
        sysroot.writeInventory(kTwoChassis);
        ASSERT_EQ(status.code(), 0) << status.what();
        standIn.reset();
    }
    void TearDown() override {
        EXPECT_EQ(standIn.openItems(), 0u) << "handles left open:\n" << standIn.log();
        EXPECT_EQ(standIn.openContainers(), 0u) << "containers left:\n" << standIn.log();
    }

    // The code and details of what `action` raised; code 0 when it raised nothing.
    template <class Action>
    static std::pair<std::int32_t, std::string> failureOf(Action&& action) {
        try {
            action();
        } catch (const zrerr::Exception& e) {
            return {e.code(), e.what()};
        }
        return {0, {}};
    }

    static std::vector<std::uint32_t> numbersOf(const std::vector<zrqpxi::Slot>& slots) {
        std::vector<std::uint32_t> numbers;
        for (const auto& slot : slots) numbers.push_back(slot.getU32Attribute(zrqpxi::kSlotNumber));
        return numbers;
    }

    Sysroot sysroot;
    zrerr::Exception status;
    zrqpxi::DynamicQPXILibrary library{status};
    StandIn standIn;
};

TEST_F(QpxiLibrary, LoadsAllSeventeenFunctionsInTableOrder) {
    EXPECT_EQ(library.status().code(), 0);
    for (std::size_t i = 0; i < zrqpxi::kFunctionCount; ++i) EXPECT_NE(library.function(i), nullptr) << i;
    Dl_info info{};
    ASSERT_NE(dladdr(library.function(10), &info), 0);
    EXPECT_STREQ(info.dli_sname, "zrqpxi_ItemIterator_nextItem");
}

TEST_F(QpxiLibrary, WalksChassisSlotsDevicesAndTriggerBridges) {
    {
        const zrqpxi::Session session(library);
        const std::vector<zrqpxi::Chassis> chassis = session.getChassis();
        ASSERT_EQ(chassis.size(), 2u);
        EXPECT_EQ(chassis[0].getU32Attribute(zrqpxi::kChassisNumber), 1u);
        EXPECT_EQ(chassis[1].getU32Attribute(zrqpxi::kChassisNumber), 7u);
        EXPECT_EQ(chassis[0].getStringAttribute(0x1001), 10u) << "the stand-in answers the model's length";

        const std::vector<zrqpxi::Slot> slots = chassis[0].getSlots();
        EXPECT_EQ(numbersOf(slots), (std::vector<std::uint32_t>{1, 2, 3, 4}));
        EXPECT_TRUE(slots[2].getDevices().empty());
        const std::vector<zrqpxi::Device> devices = slots[1].getDevices();
        ASSERT_EQ(devices.size(), 2u);
        EXPECT_EQ(devices[0].getAddress(), (zrqpxi::PciAddress{0, 3, 0, 0}));
        EXPECT_EQ(devices[1].getAddress(), (zrqpxi::PciAddress{0, 3, 0, 1}));
        EXPECT_EQ(slots[3].getDevices().at(0).getAddress(), (zrqpxi::PciAddress{0, 255, 31, 7}));
        EXPECT_EQ(slots[1].getChassis().getU32Attribute(zrqpxi::kChassisNumber), 1u);

        const std::vector<zrqpxi::TriggerBridge> bridges = chassis[0].getTriggerBridges();
        ASSERT_EQ(bridges.size(), 2u);
        EXPECT_EQ(bridges[1].getU32Attribute(0x4000), 2u);
        EXPECT_EQ(bridges[1].getChassis().getU32Attribute(zrqpxi::kChassisNumber), 1u);
        EXPECT_TRUE(chassis[1].getTriggerBridges().empty());

        // The generic reading gives the same items as the typed one.
        const std::vector<zrqpxi::Item> items = chassis[1].getItems(zrqpxi::kSlotsOfChassis);
        ASSERT_EQ(items.size(), 1u);
        EXPECT_EQ(items[0].getU32Attribute(zrqpxi::kSlotNumber), 10u);
    }
    // Every yielded handle was duplicated and closed, every container destroyed (TearDown).
}

TEST_F(QpxiLibrary, OpensByNumberAndByAddressAndFindsWhatContainsADevice) {
    const zrqpxi::Session session(library);
    const zrqpxi::Device device = session.openDeviceByAddr({0, 9, 4, 2});
    EXPECT_EQ(device.getU32Attribute(zrqpxi::kChassisNumber), 7u);
    EXPECT_EQ(device.getU32Attribute(zrqpxi::kSlotNumber), 10u);
    EXPECT_EQ(device.getSlot().getU32Attribute(zrqpxi::kSlotNumber), 10u);
    EXPECT_EQ(device.getChassis().getU32Attribute(zrqpxi::kChassisNumber), 7u);
    const zrqpxi::Chassis chassis = session.openChassisByNumber(1);
    EXPECT_EQ(numbersOf(chassis.getSlots()).size(), 4u);
}

TEST_F(QpxiLibrary, ReadsAnAddressAsFunctionDeviceThenBus) {
    const zrqpxi::Session session(library);
    const zrqpxi::Device device = session.openDeviceByAddr({0, 3, 0, 1});
    const std::size_t before = standIn.log().size();
    EXPECT_EQ(device.getAddress(), (zrqpxi::PciAddress{0, 3, 0, 1}));
    const std::string h = std::to_string(device.handle());
    EXPECT_EQ(standIn.log().substr(before),
              "getU32Attribute(" + h + ",12290)\ngetU32Attribute(" + h + ",12289)\ngetU32Attribute(" + h + ",12288)\n");
}

TEST_F(QpxiLibrary, TheLogKeepsTheLast65536Calls) {
    constexpr std::uint32_t kKept = 65536, kCalls = kKept + 10;
    for (std::uint32_t unknown = 1; unknown <= kCalls; ++unknown) library.close(unknown);
    const std::string log = standIn.log();
    EXPECT_EQ(std::count(log.begin(), log.end(), '\n'), kKept);
    EXPECT_EQ(log.substr(0, log.find('\n')), "close(11)") << "the first ten calls are gone";
    const std::string last = "\nclose(" + std::to_string(kCalls) + ")\n";
    EXPECT_EQ(log.substr(log.size() - last.size()), last);
}

TEST_F(QpxiLibrary, ReadsAContainerByDuplicatingAndClosingEachItemThenDestroysIt) {
    const zrqpxi::Session session(library);
    const zrqpxi::Chassis chassis = session.openChassisByNumber(1);
    const std::string before = standIn.log();
    const std::vector<zrqpxi::TriggerBridge> bridges = chassis.getTriggerBridges();
    ASSERT_EQ(bridges.size(), 2u);
    const std::string log = standIn.log().substr(before.size());
    // Handles are counted upward: container c, the yielded items c+1 and c+3, their duplicates
    // c+2 and c+4 (the handles the list keeps).
    const std::uint32_t c = bridges[0].handle() - 2;
    const auto n = [](std::uint32_t v) { return std::to_string(v); };
    EXPECT_EQ(log, "getItemContainer(" + n(chassis.handle()) + ",4097)\n" +
                       "ItemIterator_begin(" + n(c) + ")\nItemIterator_end(" + n(c) + ")\n" +
                       "ItemIterator_nextItem(" + n(c) + ",0)\nduplicate(" + n(c + 1) + ")\nclose(" + n(c + 1) + ")\n" +
                       "ItemIterator_nextItem(" + n(c) + ",1)\nduplicate(" + n(c + 3) + ")\nclose(" + n(c + 3) + ")\n" +
                       "destroyItemContainer(" + n(c) + ")\n");
    EXPECT_EQ(bridges[1].handle(), c + 4);
}

TEST_F(QpxiLibrary, CopyingDuplicatesTheHandleAndDestroyingClosesIt) {
    const zrqpxi::Session session(library);
    const zrqpxi::Chassis chassis = session.openChassisByNumber(7);
    EXPECT_EQ(standIn.openItems(), 2u);
    {
        const zrqpxi::Chassis copy = chassis;  // NOLINT(performance-unnecessary-copy-initialization)
        EXPECT_NE(copy.handle(), chassis.handle());
        EXPECT_EQ(copy.getU32Attribute(zrqpxi::kChassisNumber), 7u);
        EXPECT_EQ(standIn.openItems(), 3u);
    }
    EXPECT_EQ(standIn.openItems(), 2u) << "the copy's handle is closed, the original's kept";
    EXPECT_EQ(chassis.getU32Attribute(zrqpxi::kChassisNumber), 7u);

    zrqpxi::Chassis assigned = session.openChassisByNumber(1);
    const std::uint32_t replaced = assigned.handle();
    assigned = chassis;
    EXPECT_EQ(standIn.openItems(), 3u) << "assignment closes the handle it replaces";
    EXPECT_EQ(assigned.getU32Attribute(zrqpxi::kChassisNumber), 7u);
    EXPECT_NE(standIn.log().find("close(" + std::to_string(replaced) + ")"), std::string::npos);
    assigned = assigned;  // NOLINT(clang-diagnostic-self-assign-overloaded)
    EXPECT_EQ(assigned.getU32Attribute(zrqpxi::kChassisNumber), 7u);

    zrqpxi::Chassis moved = std::move(assigned);
    EXPECT_EQ(standIn.openItems(), 3u) << "moving opens no handle";
    EXPECT_EQ(assigned.handle(), 0u);
    EXPECT_EQ(moved.getU32Attribute(zrqpxi::kChassisNumber), 7u);
}

TEST_F(QpxiLibrary, FailuresRaiseTheLibrarysCodeAndDetailsAndLeakNoHandle) {
    const zrqpxi::Session session(library);
    auto [code, details] = failureOf([&] { session.openChassisByNumber(99); });
    EXPECT_EQ(code, kNoSuchItem);
    EXPECT_NE(details.find(R"("func":"zrqpxi_openChassisByNumber")"), std::string::npos) << details;
    EXPECT_NE(details.find(R"("chassisNumber":99)"), std::string::npos) << details;

    EXPECT_EQ(failureOf([&] { session.openDeviceByAddr({0, 3, 0, 2}); }).first, kNoSuchItem);
    EXPECT_EQ(failureOf([&] { session.getU32Attribute(zrqpxi::kChassisNumber); }).first, kNoSuchAttribute);
    const zrqpxi::Chassis chassis = session.openChassisByNumber(1);
    EXPECT_EQ(failureOf([&] { chassis.getU32Attribute(zrqpxi::kSlotNumber); }).first, kNoSuchAttribute);
    EXPECT_EQ(failureOf([&] { chassis.getItems(zrqpxi::kDevicesInSlot); }).first, kNotContained);
    EXPECT_EQ(failureOf([&] { session.getItems(zrqpxi::kSlotsOfChassis); }).first, kNotContained);
    const zrqpxi::Device device = session.openDeviceByAddr({0, 2, 0, 0});
    EXPECT_EQ(failureOf([&] { device.getItems(zrqpxi::kChassisOfSession); }).first, kNotContained);
    EXPECT_EQ(standIn.openItems(), 3u);
    EXPECT_EQ(standIn.openContainers(), 0u);

    // A handle the library no longer knows: its own reset closed it.
    standIn.reset();
    EXPECT_EQ(failureOf([&] { chassis.getSlots(); }).first, kUnknownHandle);
    EXPECT_EQ(failureOf([&] { const zrqpxi::Chassis copy = chassis; }).first, kUnknownHandle);
}

TEST_F(QpxiLibrary, AWaitEndsByTimeOutCancelOrInvalidation) {
    const zrqpxi::Session session(library);
    EXPECT_EQ(session.waitForSessionInvalidation(0), 0) << "time-out";
    EXPECT_EQ(session.cancelWaitForInvalidation(), 0) << "no wait to end";
    EXPECT_EQ(session.waitForSessionInvalidation(0), 0) << "a cancel ends only the waits begun before it";

    std::atomic<std::int32_t> result{-1};
    std::thread waiter([&] { result = session.waitForSessionInvalidation(0xFFFFFFFFu); });
    std::int32_t ended = 0;
    while ((ended = session.cancelWaitForInvalidation()) == 0) std::this_thread::yield();
    waiter.join();
    EXPECT_EQ(ended, 1);
    EXPECT_EQ(result, 2) << "cancelled";

    // The second wait without end has begun when the log shows it.
    const std::string endless = "waitForSessionInvalidation(" + std::to_string(session.handle()) + ",4294967295)";
    const auto waitsBegun = [&] {
        const std::string log = standIn.log();
        std::size_t count = 0;
        for (std::size_t at = log.find(endless); at != std::string::npos; at = log.find(endless, at + 1)) ++count;
        return count;
    };
    std::thread invalidated([&] { result = session.waitForSessionInvalidation(0xFFFFFFFFu); });
    while (waitsBegun() < 2) std::this_thread::yield();
    standIn.invalidate();
    invalidated.join();
    EXPECT_EQ(result, 1);
    EXPECT_EQ(session.waitForSessionInvalidation(0), 1) << "an invalidated session stays so";
}

TEST_F(QpxiLibrary, ANewSessionSeesTheFileAsItIsNow) {
    const zrqpxi::Session before(library);
    sysroot.writeInventory(R"({"chassis": [{"number": 4294967295, "slots": [{"number": 0}]}]})");
    EXPECT_EQ(before.getChassis().size(), 2u);
    const zrqpxi::Session after(library);
    const auto chassis = after.getChassis();
    ASSERT_EQ(chassis.size(), 1u);
    EXPECT_EQ(chassis[0].getU32Attribute(zrqpxi::kChassisNumber), 4294967295u) << "the largest number passes whole";
    EXPECT_EQ(numbersOf(chassis[0].getSlots()), (std::vector<std::uint32_t>{0}));
    EXPECT_EQ(chassis[0].getStringAttribute(0x1001), 0u) << "no model: an empty text";
}

TEST_F(QpxiLibrary, ANewSessionSeesARewriteOfTheSameSizeAndModificationTime) {
    const auto chassisNumber = [&] {
        const zrqpxi::Session session(library);
        return session.getChassis().at(0).getU32Attribute(zrqpxi::kChassisNumber);
    };
    sysroot.writeInventory(R"({"chassis": [{"number": 1}]})");
    const auto modified = std::filesystem::last_write_time(sysroot.inventory());
    EXPECT_EQ(chassisNumber(), 1u);
    // Rewritten in place as a copy that keeps the times does, or twice within one clock tick.
    for (const std::uint32_t number : {2u, 1u}) {
        sysroot.writeInventory(R"({"chassis": [{"number": )" + std::to_string(number) + "}]}");
        std::filesystem::last_write_time(sysroot.inventory(), modified);
        EXPECT_EQ(chassisNumber(), number);
    }
}

TEST_F(QpxiLibrary, NoInventoryFileIsAMachineWithoutChassis) {
    std::filesystem::remove(sysroot.inventory());
    const zrqpxi::Session session(library);
    EXPECT_TRUE(session.getChassis().empty());
    EXPECT_EQ(failureOf([&] { session.openDeviceByAddr({0, 2, 0, 0}); }).first, kNoSuchItem);
}

TEST_F(QpxiLibrary, AHostileInventoryFileFailsTheSessionNeverTheProcess) {
    const std::vector<std::pair<const char*, std::string>> cases = {
        {"not JSON", "chassis: 1"},
        {"empty", ""},
        {"an array", R"([{"number": 1}])"},
        {"chassis not an array", R"({"chassis": {"number": 1}})"},
        {"a chassis that is a number", R"({"chassis": [1]})"},
        {"number a text", R"({"chassis": [{"number": "1"}]})"},
        {"no number", R"({"chassis": [{"model": "x"}]})"},
        {"number beyond 32 bits", R"({"chassis": [{"number": 4294967296}]})"},
        {"number beyond a double", R"({"chassis": [{"number": 1e400}]})"},
        {"negative number", R"({"chassis": [{"number": -1}]})"},
        {"fraction", R"({"chassis": [{"number": 1.5}]})"},
        {"model a number", R"({"chassis": [{"number": 1, "model": 5}]})"},
        {"slots an object", R"({"chassis": [{"number": 1, "slots": {}}]})"},
        {"bus beyond 255", R"({"chassis": [{"number": 1, "slots": [{"number": 1, "devices": [{"bus": 256, "device": 0, "function": 0}]}]}]})"},
        {"device beyond 31", R"({"chassis": [{"number": 1, "slots": [{"number": 1, "devices": [{"bus": 1, "device": 32, "function": 0}]}]}]})"},
        {"function beyond 7", R"({"chassis": [{"number": 1, "slots": [{"number": 1, "devices": [{"bus": 1, "device": 0, "function": 8}]}]}]})"},
        {"a device without function", R"({"chassis": [{"number": 1, "slots": [{"number": 1, "devices": [{"bus": 1, "device": 0}]}]}]})"},
        {"a bridge without number", R"({"chassis": [{"number": 1, "triggerBridges": [{}]}]})"},
        {"two chassis of one number", R"({"chassis": [{"number": 1}, {"number": 1}]})"},
        {"two slots of one number", R"({"chassis": [{"number": 1, "slots": [{"number": 2}, {"number": 2}]}]})"},
        {"one address in two slots", R"({"chassis": [{"number": 1, "slots": [{"number": 1, "devices": [{"bus": 1, "device": 0, "function": 0}]}]},
                                                     {"number": 2, "slots": [{"number": 1, "devices": [{"bus": 1, "device": 0, "function": 0}]}]}]})"},
        {"nested deeper than the parser takes", std::string(100000, '[') + std::string(100000, ']')},
        {"larger than 1 MiB", R"({"chassis": [], "pad": ")" + std::string(1 << 20, 'x') + R"("})"},
        {"bytes that are not UTF-8 in a text", "{\"chassis\": [{\"number\": \"\xff\xfe\"}]}"},
    };
    for (const auto& [what, text] : cases) {
        sysroot.writeInventory(text);
        const auto [code, details] = failureOf([&] { const zrqpxi::Session session(library); });
        EXPECT_EQ(code, kBadInventory) << what;
        EXPECT_NE(details.find(sysroot.inventory().string()), std::string::npos) << what << ": " << details;
        EXPECT_EQ(standIn.openItems(), 0u) << what;
    }

    std::filesystem::remove(sysroot.inventory());
    std::filesystem::create_directory(sysroot.inventory());
    EXPECT_EQ(failureOf([&] { const zrqpxi::Session session(library); }).first, kBadInventory) << "a folder";
}

TEST_F(QpxiLibrary, IgnoresMembersItDoesNotKnow) {
    sysroot.writeInventory(R"({"version": 3, "chassis": [{"number": 2, "colour": "grey", "slots": [{"number": 1, "x": []}]}]})");
    const zrqpxi::Session session(library);
    EXPECT_EQ(numbersOf(session.openChassisByNumber(2).getSlots()), (std::vector<std::uint32_t>{1}));
}

TEST_F(QpxiLibrary, ConcurrentSessionsOnOneLibraryCloseEveryHandle) {
    constexpr int kThreads = 8, kRounds = 150;
    std::atomic<int> wrong{0};
    std::vector<std::thread> threads;
    for (int t = 0; t < kThreads; ++t)
        threads.emplace_back([&, t] {
            for (int round = 0; round < kRounds; ++round) {
                const zrqpxi::Session session(library);
                for (const zrqpxi::Chassis& chassis : session.getChassis())
                    for (const zrqpxi::Slot& slot : chassis.getSlots())
                        for (const zrqpxi::Device& device : slot.getDevices()) {
                            const zrqpxi::Device copy = device;
                            if (copy.getSlot().getU32Attribute(zrqpxi::kSlotNumber) !=
                                slot.getU32Attribute(zrqpxi::kSlotNumber))
                                ++wrong;
                        }
                if (t % 2 && session.waitForSessionInvalidation(0) != 0) ++wrong;
                if (failureOf([&] { session.openChassisByNumber(3); }).first != kNoSuchItem) ++wrong;
            }
        });
    for (std::thread& thread : threads) thread.join();
    EXPECT_EQ(wrong, 0);
}

TEST(QpxiLibraryLoading, AnErrorAlreadyRecordedLoadsNothing) {
    zrerr::Exception status = zrerr::raise(-52003, "zrapalerr_deviceNotFunctioning", "here.cpp", 1);
    const std::string before = status.what();
    const zrqpxi::DynamicQPXILibrary library(status);
    EXPECT_EQ(status.code(), -52003);
    EXPECT_EQ(status.what(), before);
    EXPECT_EQ(library.status().code(), 0);
    for (std::size_t i = 0; i < zrqpxi::kFunctionCount; ++i) EXPECT_EQ(library.function(i), nullptr) << i;

    // Calls of a function that is not there fail as loading does, or do nothing when they take no record.
    zrqpxi::DynamicQPXILibrary& unloaded = const_cast<zrqpxi::DynamicQPXILibrary&>(library);
    try {
        zrqpxi::Session session(unloaded);
        ADD_FAILURE() << "a session opened without the library";
    } catch (const zrerr::Exception& e) {
        EXPECT_EQ(e.code(), -52005);
        EXPECT_NE(std::string(e.what()).find(R"("func":"zrqpxi_openPXISession")"), std::string::npos) << e.what();
    }
    unloaded.close(5);
    unloaded.destroyItemContainer(5);
    EXPECT_EQ(unloaded.cancelWaitForInvalidation(5), 0);
}

TEST(QpxiLibraryLoading, AWarningDoesNotStopLoading) {
    zrerr::Exception status;
    status.setCode(52011);
    const zrqpxi::DynamicQPXILibrary library(status);
    EXPECT_EQ(status.code(), 52011);
    EXPECT_NE(library.function(16), nullptr);
}

}  // namespace
