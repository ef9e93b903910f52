// The platform status record and its merge rule.
#include <gtest/gtest.h>

#include <cerrno>
#include <string>
#include <utility>

#include "errors/tstatus.h"
#include "platform/platform.h"

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

TEST(StatusRecord, AWholeRecordMergesWithWhereAndExtensionWordsByTheSameRule) {
    nZRAPALS100::tStatus failed;
    failed.merge(-52006, "tiktal_impl", "proxy.cpp", 77);
    failed.extension[0] = 11;
    failed.extension[1] = 0;
    nZRAPALS100::tStatus warned;
    warned.merge(52011, "w", "w.cpp", 1);
    warned.merge(failed);
    EXPECT_EQ(warned.code, -52006);
    EXPECT_STREQ(warned.file, "proxy.cpp");
    EXPECT_EQ(warned.line, 77u);
    EXPECT_EQ(warned.extension[0], 11u);
    nZRAPALS100::tStatus second;
    second.merge(-1, "x", "x.cpp", 2);
    warned.merge(second);  // the first error stays
    EXPECT_EQ(warned.code, -52006);

    nZRAPALS100::tStatus shortRecord;
    shortRecord.size = 8;
    shortRecord.code = -52003;
    nZRAPALS100::tStatus full;
    full.merge(shortRecord);
    EXPECT_EQ(full.code, -52003);
    EXPECT_STREQ(full.file, "");
}

TEST(OsErrors, MapOntoThePlatformStatusesOfTheirWindowsCounterparts) {
    const std::pair<int, std::int32_t> rows[] = {
        {0, 0},           {ENOENT, -52006}, {ENODEV, -52006},  {EACCES, -52009},    {EPERM, -52009},
        {ENOMEM, -52000}, {ETIMEDOUT, -52007}, {EAGAIN, 52011}, {EINPROGRESS, 52011}, {EINVAL, -52005},
        {EEXIST, -52013}, {EBUSY, -52031}, {ECONNRESET, -52003}, {EPIPE, -52003},   {EOPNOTSUPP, -52002},
        {ECONNREFUSED, -52006}, {EPROTO, -52008}, {EDOM, -52003} /* not in the table */};
    for (const auto& [error, status] : rows) EXPECT_EQ(platform::statusOfOsError(error), status) << error;
}

}  // namespace
