// Aliases of newly discovered devices: PXI<chassis>Slot<slot> from the PXI chassis query library
// (the stand-in, over an inventory file in a temporary machine), numbered aliases otherwise, and
// never an alias in use, compared ignoring case.
#include <gtest/gtest.h>

#include <map>
#include <memory>
#include <random>
#include <set>
#include <string>

#include "config/alias_factory.h"
#include "config/qpxi_library.h"
#include "qpxi_stand_in.h"

using namespace qpxi_test;
using zrjsonconfig::AliasesInUse;

namespace {

// A discovered device at a PCI address; `failing` makes every question fail, as a device that
// went away does. Alias creation asks nothing but the address.
class FakeDevice : public zrjsonconfig::DeviceIteratorInterface {
public:
    FakeDevice(std::uint32_t bus, std::uint32_t device, std::uint32_t function)
        : _properties{{"pciBusNumber", bus}, {"pciDeviceNumber", device}, {"pciFunctionNumber", function}} {}

    std::uint32_t getBusPropertyU32(const std::string& name) override {
        const auto found = _properties.find(name);
        if (failing || found == _properties.end()) throw zrerr::raise(-52006, "zrapalerr_deviceNotFound", "fake.cpp", 1);
        return found->second;
    }
    std::string getBusPropertyString(const std::string&) override { return unasked(); }
    std::uint32_t getDevicePropertyU32(const std::string&) override {
        unasked();
        return 0;
    }
    std::string getDevicePropertyString(const std::string&) override { return unasked(); }
    std::string getInterfacePath() override { return unasked(); }
    std::string getToken() override { return unasked(); }
    std::string getInstanceId() override { return unasked(); }
    void next() override { unasked(); }
    bool isEnd() override {
        unasked();
        return false;
    }

    bool failing = false;

private:
    static std::string unasked() {
        ADD_FAILURE() << "alias creation asks only for the PCI address";
        return {};
    }

    std::map<std::string, std::uint32_t> _properties;
};

// Chassis 1: slot 2 holds 3:0.0; slot 0 holds 4:0.0. Chassis 0: slot 5 holds 5:0.0. Chassis
// 4294967295: slot 1 holds 6:0.0. Chassis 2: slot 3 holds 0:0.0.
constexpr const char* kChassis = R"({"chassis": [
  {"number": 1, "slots": [{"number": 2, "devices": [{"bus": 3, "device": 0, "function": 0}]},
                          {"number": 0, "devices": [{"bus": 4, "device": 0, "function": 0}]}]},
  {"number": 0, "slots": [{"number": 5, "devices": [{"bus": 5, "device": 0, "function": 0}]}]},
  {"number": 4294967295, "slots": [{"number": 1, "devices": [{"bus": 6, "device": 0, "function": 0}]}]},
  {"number": 2, "slots": [{"number": 3, "devices": [{"bus": 0, "device": 0, "function": 0}]}]}
]})";

class PxiAliases : public ::testing::Test {
protected:
    void SetUp() override {
        standIn.reset();
        sysroot.writeInventory(kChassis);
        ASSERT_EQ(status.code(), 0) << status.what();
    }
    void TearDown() override {
        EXPECT_EQ(standIn.openItems(), 0u) << standIn.log();
        EXPECT_EQ(standIn.openContainers(), 0u);
    }

    Sysroot sysroot;
    zrerr::Exception status;
    zrqpxi::DynamicQPXILibrary library{status};
    StandIn standIn;
    zrjsonconfig::PXIAliasFactory factory{&library};
};

TEST_F(PxiAliases, ADeviceInChassisAndSlotGetsTheirNumbersAndAFreeSuffixWhenTaken) {
    FakeDevice device(3, 0, 0);
    EXPECT_EQ(factory.createAlias(device, {}), "PXI1Slot2");
    EXPECT_EQ(factory.createAlias(device, {"PXI1Slot2"}), "PXI1Slot2_1");
    EXPECT_EQ(factory.createAlias(device, {"PXI1Slot2", "PXI1Slot2_1"}), "PXI1Slot2_2");
    EXPECT_EQ(factory.createAlias(device, {"pxi1slot2"}), "PXI1Slot2_1") << "taken ignoring case";
    EXPECT_EQ(factory.createAlias(device, {"PXI1SLOT2", "pxi1slot2_1", "Pxi1Slot2_2"}), "PXI1Slot2_3");
    EXPECT_EQ(factory.createAlias(device, {"PXI1Slot2_1"}), "PXI1Slot2") << "a free candidate is taken as it is";
    EXPECT_EQ(factory.createAlias(device, {"PXI1Slot2", "PXI1Slot2_1", "PXI1Slot2_2", "PXI1Slot2_3", "PXI1Slot2_4",
                                           "PXI1Slot2_5", "PXI1Slot2_6", "PXI1Slot2_7", "PXI1Slot2_8", "PXI1Slot2_9"}),
              "PXI1Slot2_10");
}

TEST_F(PxiAliases, AddressZeroIsAnAddressLikeAnyOther) {
    FakeDevice first(0, 0, 0);
    EXPECT_EQ(factory.createAlias(first, {}), "PXI2Slot3");
}

TEST_F(PxiAliases, AskTheLibraryForChassisThenSlotAndCloseDeviceAndSession) {
    FakeDevice device(3, 0, 0);
    const zrjsonconfig::PxiLocation location = zrjsonconfig::locatePxiDevice(library, device);
    EXPECT_EQ(location.chassis, 1);
    EXPECT_EQ(location.slot, 2);
    // Handles are counted upward: the session's s, the device's s + 1.
    const std::string log = standIn.log();
    const std::size_t open = log.find("openDeviceByAddr(");
    ASSERT_NE(open, std::string::npos) << log;
    const std::uint32_t s = std::stoul(log.substr(open + 17));
    const std::string S = std::to_string(s), D = std::to_string(s + 1);
    EXPECT_EQ(log, "openPXISession(1)\nopenDeviceByAddr(" + S + ",3,0,0)\ngetU32Attribute(" + D + ",4096)\n" +
                       "getU32Attribute(" + D + ",8200)\nclose(" + D + ")\nclose(" + S + ")\n");
}

TEST_F(PxiAliases, ChassisOrSlotZeroOrNegativeOrUnknownGetANumberedAlias) {
    FakeDevice slotZero(4, 0, 0), chassisZero(5, 0, 0), chassisNegative(6, 0, 0), nowhere(7, 0, 0);
    EXPECT_EQ(factory.createAlias(slotZero, {}), "Sync1");
    EXPECT_EQ(factory.createAlias(chassisZero, {"Sync1"}), "Sync2");
    EXPECT_EQ(factory.createAlias(chassisNegative, {}), "Sync1") << "4294967295 is -1 as a signed number";
    EXPECT_EQ(zrjsonconfig::locatePxiDevice(library, chassisNegative).chassis, -1);
    EXPECT_EQ(factory.createAlias(nowhere, {"sync1"}), "Sync2");
    const zrjsonconfig::PxiLocation unknown = zrjsonconfig::locatePxiDevice(library, nowhere);
    EXPECT_EQ(unknown.chassis, -1);
    EXPECT_EQ(unknown.slot, -1);
}

TEST_F(PxiAliases, ALibraryThatFailsGivesANumberedAliasButAFailingDeviceRaises) {
    sysroot.writeInventory("not json");
    FakeDevice device(3, 0, 0);
    EXPECT_EQ(factory.createAlias(device, {"Sync1", "Sync2"}), "Sync3");

    device.failing = true;
    try {
        factory.createAlias(device, {});
        ADD_FAILURE() << "the device's failure was swallowed";
    } catch (const zrerr::Exception& e) {
        EXPECT_EQ(e.code(), -52006);
    }
}

TEST(PxiAliasesWithoutLibrary, EveryDeviceGetsANumberedAlias) {
    zrjsonconfig::PXIAliasFactory factory(nullptr);
    FakeDevice device(3, 0, 0);
    device.failing = true;  // not even asked
    EXPECT_EQ(factory.createAlias(device, {}), "Sync1");
    EXPECT_EQ(factory.createAlias(device, {"Sync1", "Sync3"}), "Sync2");
}

TEST(SimpleAliases, TheFirstFreeNumberAfterThePrefixIgnoringCase) {
    zrjsonconfig::SimpleAliasFactory sync("Sync");
    EXPECT_EQ(sync.createSimpleAlias({}), "Sync1");
    EXPECT_EQ(sync.createSimpleAlias({"Sync1", "Sync3"}), "Sync2");
    EXPECT_EQ(sync.createSimpleAlias({"SYNC1", "sync2", "Sync10"}), "Sync3");
    EXPECT_EQ(sync.createSimpleAlias({"Sync01"}), "Sync1") << "compared as texts, not numbers";
    FakeDevice device(3, 0, 0);
    device.failing = true;  // not even asked
    EXPECT_EQ(sync.createAlias(device, {"Sync1"}), "Sync2");

    zrjsonconfig::SimpleAliasFactory none;
    EXPECT_EQ(none.createSimpleAlias({"1", "2"}), "3");

    zrjsonconfig::SimpleAliasFactory accented("Horloge\xC3\xA9");  // "Horlogeé"
    EXPECT_EQ(accented.createSimpleAlias({"HORLOGE\xC3\x89" "1"}), "Horloge\xC3\xA9" "2") << "É folds to é";
}

// The set remembers where its numbering got to; whatever was added and removed since, the alias
// is still the first free one.
TEST(SimpleAliases, AfterAddsAndRemovesStillTheFirstFreeNumber) {
    zrjsonconfig::SimpleAliasFactory sync("Sync");
    AliasesInUse devices{"PXI1Slot2"};
    std::multiset<std::string> used;  // lower case
    std::mt19937 random(18);
    const auto firstFree = [&](const std::string& prefix) {
        int n = 1;
        while (used.count(prefix + std::to_string(n))) ++n;
        return n;
    };
    for (int step = 0; step < 3000; ++step) {
        const bool numbered = random() % 2;
        const std::string number = std::to_string(1 + random() % 30);
        const std::string lower = (numbered ? "sync" : "pxi1slot2_") + number;
        const std::string alias = (random() % 2 ? (numbered ? "SYNC" : "PXI1Slot2_") : (numbered ? "Sync" : "pxi1slot2_")) + number;
        if (random() % 3 == 0 && used.count(lower)) {
            devices.remove(alias);
            used.erase(used.find(lower));
        } else {
            devices.add(alias);
            used.insert(lower);
        }
        ASSERT_EQ(sync.createSimpleAlias(devices), "Sync" + std::to_string(firstFree("sync"))) << step;
        ASSERT_EQ(zrjsonconfig::firstFreeFrom("PXI1Slot2", devices), "PXI1Slot2_" + std::to_string(firstFree("pxi1slot2_")))
            << step;
    }
}

TEST(AliasText, CountsTrailingDigitsUpAsText) {
    using zrjsonconfig::countUp;
    EXPECT_EQ(countUp("Dev_1"), "Dev_2");
    EXPECT_EQ(countUp("Dev_9"), "Dev_10");
    EXPECT_EQ(countUp("Dev_09"), "Dev_10");
    EXPECT_EQ(countUp("Dev_199"), "Dev_200");
    EXPECT_EQ(countUp("Dev_999"), "Dev_1000");
    EXPECT_EQ(countUp("Dev_"), "Dev_1");
    EXPECT_EQ(countUp("Dev"), "Dev1");
    EXPECT_EQ(countUp(""), "1");
    EXPECT_EQ(countUp("9"), "10");
    EXPECT_EQ(countUp("a9b9"), "a9b10") << "only the trailing digits";
    EXPECT_EQ(countUp("99999999999999999999"), "100000000000000000000") << "beyond 64 bits";
}

TEST(AliasText, AFreeAliasStartsFromTheCandidateOrItsSuffixOne) {
    using zrjsonconfig::firstFreeFrom;
    EXPECT_EQ(firstFreeFrom("Dev", {}), "Dev");
    EXPECT_EQ(firstFreeFrom("Dev", {"Dev"}), "Dev_1");
    EXPECT_EQ(firstFreeFrom("Dev_3", {"Dev_3", "dev_4"}), "Dev_5") << "digits after _ count on";
    EXPECT_EQ(firstFreeFrom("Dev_", {"Dev_"}), "Dev_1");
    EXPECT_EQ(firstFreeFrom("Dev3", {"Dev3"}), "Dev3_1") << "digits not after _ get _1";
    EXPECT_EQ(firstFreeFrom("7", {"7"}), "7_1");
    EXPECT_EQ(firstFreeFrom("Dev_9", {"Dev_9", "DEV_10"}), "Dev_11");
}

}  // namespace
