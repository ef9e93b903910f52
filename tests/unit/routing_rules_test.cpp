// The timing module's own routing rules, which it applies before the routing service sees a
// request: qualified names, the route filter, and the status record of a service call.
#include <gtest/gtest.h>

#include <cstring>
#include <string>

#include "errors/zrerr.h"
#include "timing/call_status.h"
#include "timing/routing.h"

namespace {

using tiktal::isRoutable;

TEST(TerminalNames, QualifyWithTheAliasAndStripIt) {
    EXPECT_EQ(tiktal::qualifyTerminal("Dev1", "PFI0"), "/Dev1/PFI0");
    EXPECT_EQ(tiktal::qualifyTerminal("Dev1", ""), "/Dev1/");
    EXPECT_EQ(tiktal::qualifyTerminal("Dev1", "/Dev2/PFI0"), "/Dev2/PFI0");
    EXPECT_EQ(tiktal::qualifyTerminal("Dev1", "/"), "/");
    EXPECT_EQ(tiktal::stripTerminal("/Dev1/PFI0"), "PFI0");
    EXPECT_EQ(tiktal::stripTerminal("/Dev1/a/b"), "a/b");
    EXPECT_EQ(tiktal::stripTerminal("/Dev1"), "/Dev1");
    EXPECT_EQ(tiktal::stripTerminal("PFI0"), "PFI0");
    EXPECT_EQ(tiktal::stripTerminal(""), "");
}

TEST(RouteFilter, ClockPairsFirstThenRefusedSourcesDestinationsAndLvdsToClkOut) {
    // The two clock routes pass although their sources are refused otherwise, in any case.
    EXPECT_TRUE(isRoutable("ClkIn", "PXI_Clk10_In"));
    EXPECT_TRUE(isRoutable("clkin", "PXI_CLK10_IN"));
    EXPECT_TRUE(isRoutable("PXI_Clk10", "ClkOut"));
    EXPECT_TRUE(isRoutable("pxi_clk10", "clkout"));
    for (const char* source : {"GlobalSoftwareTrigger", "ClkIn", "PXI_Clk10", "PXIe_Clk100", "SyncClkFullSpeed",
                               "SyncClkDivided1", "SyncClkDivided2", "DDS", "dds", "PXIE_CLK100"}) {
        EXPECT_FALSE(isRoutable(source, "PXI_Trig0")) << source;
    }
    for (int line = 0; line <= 16; ++line) {
        const std::string star = "PXIe_DStarA" + std::to_string(line);
        EXPECT_FALSE(isRoutable("PFI0", star)) << star;
    }
    EXPECT_FALSE(isRoutable("PFI0", "PXIE_DSTARA3"));
    EXPECT_TRUE(isRoutable("PFI0", "PXIe_DStarA17"));  // no such line in the list
    EXPECT_TRUE(isRoutable("PFI0", "PXIe_DStarB3"));
    // Rule order: a refused source to a refused destination is refused either way; the clock pair
    // wins over a refused source.
    EXPECT_FALSE(isRoutable("DDS", "PXIe_DStarA0"));
    // LVDS terminals never drive ClkOut, written exactly so; other spellings pass the filter.
    EXPECT_FALSE(isRoutable("PFI_LVDS0", "ClkOut"));
    EXPECT_FALSE(isRoutable("xPFI_LVDS2y", "ClkOut"));
    EXPECT_TRUE(isRoutable("PFI_LVDS0", "CLKOUT"));
    EXPECT_TRUE(isRoutable("PFI_LVDS0", "PXI_Trig0"));
    EXPECT_TRUE(isRoutable("PFI0", "ClkOut"));
    EXPECT_TRUE(isRoutable("PXI_Trig0", "PFI0"));
    EXPECT_TRUE(isRoutable("", ""));
}

TEST(CallStatus, GrowsItsTextWithinBoundsAndRaisesOnlyErrorsWithCheckedDetails) {
    zrrocoapi::CallStatus status;
    zrrocoapi_Status* record = status.get();
    EXPECT_EQ(record->code, 0);
    EXPECT_EQ(record->json, nullptr);
    EXPECT_EQ(record->reallocate(record, 0x80000000u), 0);
    ASSERT_EQ(record->reallocate(record, 16), 1);
    std::strcpy(record->json, R"({"a":1})");
    ASSERT_EQ(record->reallocate(record, 4096), 1);  // the text is kept
    EXPECT_STREQ(record->json, R"({"a":1})");
    EXPECT_EQ(record->capacity, 4096u);

    record->code = 12;  // a warning passes
    EXPECT_NO_THROW(status.check());
    record->code = -89120;
    std::strcpy(record->json, R"({ "error_constant" : "rocoerr_invalidSource", "source" : "/Dev1/X" })");
    try {
        status.check();
        ADD_FAILURE() << "an error passed";
    } catch (const zrerr::Exception& e) {
        EXPECT_EQ(e.code(), -89120);
        EXPECT_STREQ(e.what(), R"({"error_constant":"rocoerr_invalidSource","source":"/Dev1/X"})");
    }
    // Details that are no JSON object, or not UTF-8, or not terminated within the capacity, are
    // not taken: the code still is.
    for (const char* hostile : {"not json", "[1,2]", "{\"a\":\"\xC0\xAF\"}", "{\"a\":1"}) {
        std::strcpy(record->json, hostile);
        try {
            status.check();
            ADD_FAILURE() << hostile;
        } catch (const zrerr::Exception& e) {
            EXPECT_EQ(e.code(), -89120);
            EXPECT_NE(std::string(e.what()).find("no readable details"), std::string::npos) << e.what();
        }
    }
    std::memset(record->json, 'x', record->capacity);  // no terminator at all
    EXPECT_THROW(status.check(), zrerr::Exception);
}

}  // namespace
