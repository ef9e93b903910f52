// The platform status record and its merge rule.
#include <gtest/gtest.h>

#include <string>

#include "errors/tstatus.h"

namespace {

TEST(StatusRecord, KeepsTheFirstErrorWithWhereItWasSet) {
    nZRAPALS100::tStatus status;
    EXPECT_EQ(status.size, 164u);
    status.merge(5, "warner", "warn.cpp", 1);
    EXPECT_EQ(status.code, 5);
    status.merge(-52000, "tiktal_impl", "src/api/globals.cpp", 42);
    EXPECT_EQ(status.code, -52000);
    EXPECT_STREQ(status.component, "tiktal_im");  // cut to 9 characters
    EXPECT_STREQ(status.file, "src/api/globals.cpp");
    EXPECT_EQ(status.line, 42u);
    status.merge(-1, "other", "other.cpp", 7);
    EXPECT_EQ(status.code, -52000);
    EXPECT_STREQ(status.file, "src/api/globals.cpp");
}

TEST(StatusRecord, LongFileNamesAreShortenedInTheMiddle) {
    const std::string exact(100, 'a');
    nZRAPALS100::tStatus fits;
    fits.merge(-1, "c", exact.c_str(), 1);
    EXPECT_EQ(fits.file, exact);

    const std::string longer = std::string(60, 'b') + std::string(60, 'e');
    nZRAPALS100::tStatus cut;
    cut.merge(-1, "c", longer.c_str(), 1);
    EXPECT_EQ(cut.file, std::string(49, 'b') + ".." + std::string(49, 'e'));

    nZRAPALS100::tStatus small;
    small.size = 8;  // a short record carries only the code
    small.merge(-3, "c", "f.cpp", 9);
    EXPECT_EQ(small.code, -3);
    EXPECT_STREQ(small.file, "");
}

}  // namespace
