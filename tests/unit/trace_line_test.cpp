// Trace lines: the prefix of component, file and line, cutting, and scope lines.
#include <gtest/gtest.h>

#include <stdexcept>
#include <string>
#include <vector>

#include "sessions/trace_line.h"
#include "stderr_capture.h"

namespace {

using testsupport::StderrCapture;

std::string traced(const char* component, const char* file, int line, const char* message) {
    StderrCapture capture;
    zrsdbg_VarLine(file, line, "", component).printf("%s", message);
    const auto writes = capture.finish();
    return writes.size() == 1 ? writes[0] : "<" + std::to_string(writes.size()) + " writes>";
}

TEST(TraceLine, PadsOrCutsComponentFileAndLine) {
    const std::string file32 = "0123456789abcdefghij0123456789AB";
    EXPECT_EQ(traced("tiktal_impl", "x.cpp", 7, "hello"),
              "[iktal_impl|                           x.cpp|0007] hello\n");
    EXPECT_EQ(traced("abc", file32.c_str(), 1234, "m"), "[       abc|" + file32 + "|1234] m\n");
    EXPECT_EQ(traced("0123456789", ("zz/" + file32).c_str(), 123456, "m"), "[0123456789|" + file32 + "|3456] m\n");
    EXPECT_EQ(traced("", "", 0, ""), "[          |                                |0000] \n");
}

TEST(TraceLine, LongMessagesAreCutToOneLineOf512Bytes) {
    const std::string longMessage(1000, 'q');
    const std::string line = traced("tiktal_impl", "f", 1, longMessage.c_str());
    EXPECT_EQ(line.size(), 511u);  // 512-byte buffer with its NUL
    EXPECT_EQ(line.back(), '\n');
    EXPECT_EQ(line.substr(51, 5), "qqqqq");
}

TEST(TraceLine, ScopeLinesOpenAndCloseAndTellAnUnwindingScope) {
    StderrCapture capture;
    { zrsdbg_ScopeLine scope("f.cpp", 10, "tiktal::X::op"); }
    try {
        zrsdbg_ScopeLine scope("f.cpp", 11, "tiktal::X::fails");
        throw std::runtime_error("boom");
    } catch (const std::exception&) {
    }
    const auto lines = capture.finish();
    ASSERT_EQ(lines.size(), 4u);
    EXPECT_EQ(lines[0].substr(51), "{ tiktal::X::op\n");
    EXPECT_EQ(lines[1].substr(51), "} tiktal::X::op\n");
    EXPECT_EQ(lines[2].substr(51), "{ tiktal::X::fails\n");
    EXPECT_EQ(lines[3].substr(51), "} (uncaught_exception) tiktal::X::fails\n");
}

}  // namespace
