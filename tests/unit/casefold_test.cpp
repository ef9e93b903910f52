// Comparison of resource names ignoring case.
#include <gtest/gtest.h>

#include "support/casefold.h"

namespace {

using support::equalsIgnoringCase;

TEST(CaseFold, FoldsTheLatinRangesAndComparesWholeTexts) {
    EXPECT_TRUE(equalsIgnoringCase("synctestinternal___", "SyncTestInternal___"));
    EXPECT_FALSE(equalsIgnoringCase("SyncTestInternal___x", "SyncTestInternal___"));
    EXPECT_FALSE(equalsIgnoringCase("SyncTestInternal__", "SyncTestInternal___"));
    EXPECT_TRUE(equalsIgnoringCase("\xc3\x89TALON", "\xc3\xa9talon"));               // É é
    EXPECT_TRUE(equalsIgnoringCase("\xc5\x81\xc3\x93" "D\xc5\xb9", "\xc5\x82\xc3\xb3" "d\xc5\xba"));  // ŁÓDŹ
    EXPECT_TRUE(equalsIgnoringCase("\xe1\xba\xa0", "\xe1\xba\xa1"));                 // Ạ ạ
    EXPECT_TRUE(equalsIgnoringCase("\xe2\x85\xa0", "\xe2\x85\xb0"));                 // Roman numeral one
    EXPECT_TRUE(equalsIgnoringCase("\xe2\x92\xb6", "\xe2\x93\x90"));                 // circled A
    EXPECT_TRUE(equalsIgnoringCase("\xef\xbc\xa1", "\xef\xbd\x81"));                 // fullwidth A
    EXPECT_TRUE(equalsIgnoringCase("\xef\xac\x81le", "FILE"));                       // fi ligature
    EXPECT_FALSE(equalsIgnoringCase("\xc3\x97", "\xc3\xb7"));                         // × is no letter
    EXPECT_FALSE(equalsIgnoringCase("\xc3", "\xc3\xa3"));                             // malformed
    EXPECT_TRUE(equalsIgnoringCase("\xff", "\xff"));                                  // equal bytes
}

}  // namespace
