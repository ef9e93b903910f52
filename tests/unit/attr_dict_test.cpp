// The time-service attribute dictionary and the enumeration mappings.
#include <gtest/gtest.h>

#include "errors/zrerr.h"
#include "tsession/attr_dict.h"
#include "tsession/enums.h"

namespace {

using namespace tiktal;

template <class F>
std::int32_t status(F&& f) {
    try {
        f();
    } catch (const zrerr::Exception& e) {
        return e.code();
    }
    return 0;
}

TEST(AttrDict, KeysDependOnTheTimeReferenceType) {
    const ApiAttrData& clockClass = getAttrData(TIKTAL_ATTR_1588_CLOCK_CLASS);
    EXPECT_EQ(clockClass.getMetaDataAttrKey("IEEE 1588-2008"), "localClass");
    EXPECT_EQ(clockClass.getMetaDataAttrKey("IEEE 1588-2008 BC"), "clockClass");
    EXPECT_EQ(status([&] { clockClass.getMetaDataAttrKey("ieee 1588-2008"); }), tiktalerr_trTypeMismatch);
    EXPECT_EQ(status([] { getAttrData(TIKTAL_ATTR_8021AS_LOG_SYNC_INTERVAL).verifyAttrValidForTimeRef("IEEE 802.1AS-2011 TAB"); }),
              tiktalerr_trTypeMismatch);
    EXPECT_EQ(getAttrData(TIKTAL_ATTR_TIME_REFERENCE_ENABLED).getMetaDataAttrKey("any type at all"), "isEnabled");
    EXPECT_EQ(getAttrData(TIKTAL_ATTR_SELECTED_TIME_REFERENCE).getMetaDataAttrKey(""), "");
    EXPECT_EQ(status([] { getAttrData(1150001); }), tiktalerr_nsupAttr);
    EXPECT_EQ(status([] { getAttrData(TIKTAL_ATTR_1588_GM_CLOCK_ID).verifyAttrValidForFunction(); }), tiktalerr_invalidType);
}

TEST(AttrDict, ActiveItemRules) {
    const ApiAttrData& priority = getAttrData(TIKTAL_ATTR_1588_PRIORITY1);
    EXPECT_TRUE(priority.verifyActiveItemProvided("PTP1"));
    EXPECT_EQ(status([&] { priority.verifyActiveItemProvided(nullptr); }), tiktalerr_terminalNotSpecified);
    EXPECT_EQ(status([&] { priority.verifyActiveItemProvided(""); }), tiktalerr_terminalNotSpecified);
    EXPECT_FALSE(getAttrData(TIKTAL_ATTR_SELECTED_TIME_REFERENCE_OFFSET).verifyActiveItemProvided(nullptr));
    EXPECT_TRUE(getAttrData(TIKTAL_ATTR_TIME_REFERENCE_SELECTED).activeItemRequired);
}

TEST(Enums, PortStatesAccuraciesAndBmcaModes) {
    EXPECT_EQ(getPtpPortStateEnumFromString("PTP_PASSIVE"), 6);
    EXPECT_EQ(get8021asPortStateEnumFromString("PTP_PASSIVE"), 3);
    EXPECT_EQ(getPtpPortStateEnumFromString("PTP_SLAVE"), 8);
    EXPECT_EQ(get8021asPortStateEnumFromString("PTP_SLAVE"), 9);
    EXPECT_EQ(get8021asPortStateEnumFromString("PTP_MASTER"), 6);
    EXPECT_EQ(status([] { getPtpPortStateEnumFromString("ptp_slave"); }), tiktalerr_internalSoftware);
    EXPECT_EQ(status([] { get8021asPortStateEnumFromString(""); }), tiktalerr_internalSoftware);
    EXPECT_EQ(getClockAccuracyCodeFromString("WITHIN_25NS"), 0x20);
    EXPECT_EQ(getClockAccuracyCodeFromString("GREATER_THAN_10S"), 0x31);
    EXPECT_EQ(getClockAccuracyCodeFromString("within_25ns"), 0xFE);
    EXPECT_EQ(getClockAccuracyCodeFromString("WITHIN_2.5US"), 0x24);
    EXPECT_EQ(getClockAccuracyCodeFromString("ACCURACY_UNKNOWN"), 0xFE);
    // The 1588 accuracies count the same names from 1; 0 is unknown.
    EXPECT_EQ(getPtpClockAccuracyFromString("WITHIN_25NS"), 1);
    EXPECT_EQ(getPtpClockAccuracyFromString("WITHIN_2.5US"), 5);
    EXPECT_EQ(getPtpClockAccuracyFromString("GREATER_THAN_10S"), 18);
    EXPECT_EQ(getPtpClockAccuracyFromString("ACCURACY_UNKNOWN"), 0);
    EXPECT_EQ(getPtpClockAccuracyFromString("WITHIN_3US"), 0);
    EXPECT_EQ(get8021asPortStateEnumFromString("PTP_INITIALIZING"), 3);
    EXPECT_EQ(getBmcaModeEnumFromString("masteronly"), 2);
    EXPECT_EQ(getBmcaModeStringFromEnum(1), "masterslave");
    EXPECT_EQ(getBmcaModeStringFromEnum(0), "slaveonly");
    EXPECT_EQ(status([] { getBmcaModeStringFromEnum(3); }), tiktalerr_invParameter);
    EXPECT_EQ(status([] { getBmcaModeStringFromEnum(-1); }), tiktalerr_invParameter);
    EXPECT_EQ(status([] { getBmcaModeEnumFromString("MasterSlave"); }), tiktalerr_internalSoftware);
}

}  // namespace
