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
    EXPECT_FALSE(equalsIgnoringCase("\xC1\x81", "a"));                                // overlong "A"
    EXPECT_FALSE(equalsIgnoringCase("\xF0\x80\x81\x81", "A"));
}

TEST(CaseFold, OnlyWellFormedUtf8IsValid) {
    for (const char* good : {"", "abc", "\xC2\x80", "\xDF\xBF", "\xE0\xA0\x80", "\xED\x9F\xBF", "\xEE\x80\x80",
                             "\xEF\xBF\xBF", "\xF0\x90\x80\x80", "\xF4\x8F\xBF\xBF"})
        EXPECT_TRUE(support::isValidUtf8(good)) << good;
    for (const char* bad : {"\x80", "\xC0\x80", "\xC1\xBF", "\xE0\x9F\xBF", "\xF0\x8F\xBF\xBF",  // stray, overlong
                            "\xED\xA0\x80", "\xED\xBF\xBF",                                  // surrogates
                            "\xF4\x90\x80\x80", "\xF7\xBF\xBF\xBF", "\xF8\x88\x80\x80\x80",       // beyond U+10FFFF
                            "\xC3", "a\xE2\x82", "\xE2\x28\xA1"})                             // cut short
        EXPECT_FALSE(support::isValidUtf8(bad)) << testing::PrintToString(std::string(bad));
}

}  // namespace
