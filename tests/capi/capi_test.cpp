// The C interface of libtiktal.so as an application sees it: opening and closing, the exports
// of every kind, text outputs, status messages and the trace of the call-tracing session.
#include <climits>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <initializer_list>
#include <tuple>
#include <utility>

#include "capi_support.h"

namespace {

using namespace capi;

using Opener = ViStatus (*)(ViRsrc resourceName, ViBoolean reset, ViSession* vi);
const std::pair<const char*, Opener> kOpeners[] = {
    {"tiktal_init", [](ViRsrc r, ViBoolean reset, ViSession* vi) { return tiktal_init(r, VI_TRUE, reset, vi); }},
    {"tiktal_initAdvanced",
     [](ViRsrc r, ViBoolean reset, ViSession* vi) { return tiktal_initAdvanced(r, 0, 0, reset, vi); }},
    {"tiktal_GVInit", [](ViRsrc r, ViBoolean reset, ViSession* vi) { return tiktal_GVInit(r, VI_FALSE, reset, vi); }},
    {"tiktal_GVInitAdvanced",
     [](ViRsrc r, ViBoolean reset, ViSession* vi) { return tiktal_GVInitAdvanced(r, -1, 7, reset, vi); }},
};

TEST(Open, OnlyTheTraceResourceOpensAndItsNameIgnoresCase) {
    QuietStderr quiet;
    for (const auto& [function, open] : kOpeners) {
        for (const char* name : {"SyncTestInternal___", "synctestinternal___", "SYNCTESTINTERNAL___", "sYNCtESTiNTERNAL___"}) {
            ViSession vi = 0;
            EXPECT_EQ(open(name, VI_FALSE, &vi), VI_SUCCESS) << function << ' ' << name;
            EXPECT_EQ(tiktal_reset(vi), VI_SUCCESS) << function << ' ' << name;
            EXPECT_EQ(tiktal_close(vi), VI_SUCCESS);
        }
        for (const char* name : {"", "SyncTestInternal__", "SyncTestInternal____", " SyncTestInternal___",
                                 "SyncTestInternal___ ", "SyncTestInternal", "sync://localhost/Dev1", "PXI1Slot2",
                                 // Byte sequences that are not UTF-8 for "S": two- to four-byte overlong
                                 // forms, and a code point beyond U+10FFFF whose low bits are those of "S".
                                 "\xC1\x93yncTestInternal___", "\xE0\x81\x93yncTestInternal___",
                                 "\xF0\x80\x81\x93yncTestInternal___", "\xF4\x90\x81\x93yncTestInternal___",
                                 "SyncTestInternal\xC1\x9F__"}) {
            ViSession vi = 0xDEADBEEF;
            EXPECT_EQ(open(name, VI_FALSE, &vi), tiktalerr_deviceNotFound) << function << " '" << name << "'";
            EXPECT_EQ(vi, 0u) << function << " '" << name << "'";
        }
    }
}

TEST(Open, HandlesCountUpAndOnlySuccessfulOpensTakeOne) {
    QuietStderr quiet;
    ViSession previous = openTraceSession();
    std::vector<ViSession> opened{previous};
    for (const auto& [function, open] : kOpeners) {
        SCOPED_TRACE(function);
        EXPECT_EQ(open(kTraceResource, VI_FALSE, nullptr), tiktalerr_invParameter);
        ViSession vi = 0xDEADBEEF;
        EXPECT_EQ(open(nullptr, VI_FALSE, &vi), tiktalerr_invParameter);
        EXPECT_EQ(vi, 0u);
        EXPECT_EQ(open("Dev1", VI_TRUE, &vi), tiktalerr_deviceNotFound);
        for (ViBoolean reset : {VI_FALSE, VI_TRUE}) {
            ASSERT_EQ(open(kTraceResource, reset, &vi), VI_SUCCESS);
            EXPECT_EQ(vi, previous + 1);
            previous = vi;
            opened.push_back(vi);
        }
    }
    for (ViSession vi : opened) EXPECT_EQ(tiktal_close(vi), VI_SUCCESS);
}

TEST(Close, SucceedsForAnyHandleAndEndsOnlyThatSession) {
    QuietStderr quiet;
    EXPECT_EQ(tiktal_close(VI_NULL), VI_SUCCESS);
    EXPECT_EQ(tiktal_close(0x1234), VI_SUCCESS);
    EXPECT_EQ(tiktal_GVClose(VI_NULL), VI_SUCCESS);
    for (auto close : {&tiktal_close, &tiktal_GVClose}) {
        const ViSession vi = openTraceSession();
        const ViSession other = openTraceSession();
        EXPECT_EQ(tiktal_PersistConfig(vi), VI_SUCCESS);
        EXPECT_EQ(close(vi), VI_SUCCESS);
        EXPECT_EQ(close(vi), VI_SUCCESS);
        for (const Export& e : forwardingExports()) EXPECT_EQ(e.callWithZeros(vi), tiktalerr_invalidObject) << e.name;
        EXPECT_EQ(tiktal_PersistConfig(other), VI_SUCCESS);
        EXPECT_EQ(tiktal_close(other), VI_SUCCESS);
    }
}

TEST(Forwarding, EveryForwardingExportRejectsAHandleThatIsNotOpen) {
    ASSERT_EQ(exportsOfKind("forward").size(), 28u);
    ASSERT_EQ(exportsOfKind("text").size(), 2u);
    StderrCapture capture;
    for (ViSession vi : {0x0u, 0x1234u, 0x7FFFFFFEu, 0xFFFFFFFFu})
        for (const Export& e : forwardingExports())
            EXPECT_EQ(e.callWithZeros(vi), tiktalerr_invalidObject) << e.name << " on 0x" << std::hex << vi;
    EXPECT_TRUE(capture.finish().empty());
}

TEST(Forwarding, EveryForwardingExportRunsItsOperationOnTheTracingSession) {
    const ViSession vi = openTraceSession();
    for (const Export& e : forwardingExports()) {
        SCOPED_TRACE(e.name);
        ViStatus status = -1;
        const std::vector<std::string> trace = traceOf([&] { status = e.callWithZeros(vi); });
        if (std::string(e.operation) == "selfTest") {  // shared by all sessions, not traced; null outputs
            EXPECT_EQ(status, tiktalerr_invParameter);
            EXPECT_TRUE(trace.empty());
            continue;
        }
        EXPECT_EQ(status, std::string(e.kind) == "text" ? 1 : VI_SUCCESS);  // text: size query of ""
        ASSERT_GE(trace.size(), 2u);
        EXPECT_EQ(trace.front(), "{ " + kTraced + e.operation);
        EXPECT_EQ(trace.back(), "} " + kTraced + e.operation);
    }
    closeQuietly(vi);
}

TEST(Forwarding, TheTracingSessionLeavesOutputsUntouched) {
    QuietStderr quiet;
    const ViSession vi = openTraceSession();
    ViUInt32 seconds = 11, nanoseconds = 22;
    ViUInt16 fraction = 33;
    ViInt32 edge = 44, i32 = 55;
    ViReal64 r64 = 6.5;
    ViBoolean boolean = 7;
    EXPECT_EQ(tiktal_GetTime(vi, &seconds, &nanoseconds, &fraction), VI_SUCCESS);
    EXPECT_EQ(tiktal_ReadTriggerTimeStamp(vi, "PFI0", 1.0, &seconds, &nanoseconds, &fraction, &edge), VI_SUCCESS);
    EXPECT_EQ(tiktal_GetAttributeViInt32(vi, "", TIKTAL_ATTR_SERIAL_NUMBER, &i32), VI_SUCCESS);
    EXPECT_EQ(tiktal_GetAttributeViReal64(vi, "", TIKTAL_ATTR_TERMINAL_58_VALUE, &r64), VI_SUCCESS);
    EXPECT_EQ(tiktal_GetAttributeViBoolean(vi, "GPS", TIKTAL_ATTR_TIME_REFERENCE_ENABLED, &boolean), VI_SUCCESS);
    EXPECT_EQ(std::make_tuple(seconds, nanoseconds, fraction, edge, i32, r64, boolean),
              std::make_tuple(11u, 22u, ViUInt16{33}, 44, 55, 6.5, ViBoolean{7}));
    EXPECT_EQ(tiktal_close(vi), VI_SUCCESS);
}

TEST(SelfTest, PassesWritesItsMessageAndChecksItsOutputs) {
    const ViSession vi = openTraceSession();
    ViInt16 result = -7;
    std::string message(300, 'x');
    ViStatus status = -1;
    EXPECT_TRUE(traceOf([&] { status = tiktal_self_test(vi, &result, message.data()); }).empty());
    EXPECT_EQ(status, VI_SUCCESS);
    EXPECT_EQ(result, 0);
    EXPECT_EQ(message, "Self test passed" + std::string(256 - 16, '\0') + std::string(44, 'x'));

    message.assign(300, 'x');
    result = -7;
    EXPECT_EQ(tiktal_self_test(vi, &result, nullptr), tiktalerr_invParameter);
    EXPECT_EQ(tiktal_self_test(vi, nullptr, message.data()), tiktalerr_invParameter);
    closeQuietly(vi);
    EXPECT_EQ(tiktal_self_test(vi, &result, message.data()), tiktalerr_invalidObject);
    EXPECT_EQ(result, -7);
    EXPECT_EQ(message, std::string(300, 'x'));
}

TEST(Stubs, EveryStubFailsWithFeatureNotSupportedForAnyHandle) {
    const std::vector<Export> stubs = exportsOfKind("stub");
    ASSERT_EQ(stubs.size(), 48u);
    const ViSession open = openTraceSession();
    const ViSession closed = openTraceSession();
    closeQuietly(closed);
    StderrCapture capture;
    for (ViSession vi : {open, closed, ViSession{0}, ViSession{0x1234}})
        for (const Export& e : stubs)
            EXPECT_EQ(e.callWithZeros(vi), tiktalerr_featureNotSupported) << e.name << " on 0x" << std::hex << vi;
    EXPECT_TRUE(capture.finish().empty());  // the session is not reached
    closeQuietly(open);
}

TEST(ZeroExports, SucceedForAnyHandleAndTouchNothing) {
    const std::vector<Export> zeros = exportsOfKind("zero");
    ASSERT_EQ(zeros.size(), 3u);
    const ViSession open = openTraceSession();
    StderrCapture capture;
    for (ViSession vi : {open, ViSession{0}, ViSession{0x1234}}) {
        for (const Export& e : zeros) EXPECT_EQ(e.callWithZeros(vi), VI_SUCCESS) << e.name;
        ViStatus code = 0x1234;
        std::string description(64, 'x');
        EXPECT_EQ(tiktal_GetErrorInfo(vi, &code, 64, description.data()), VI_SUCCESS);
        EXPECT_EQ(code, 0x1234);
        EXPECT_EQ(description, std::string(64, 'x'));
        ViSession value = 0xABCD;
        EXPECT_EQ(tiktal_GetAttributeViSession(vi, "", TIKTAL_ATTR_DEVICE_ID, &value), VI_SUCCESS);
        EXPECT_EQ(value, 0xABCDu);
        EXPECT_EQ(tiktal_SetAttributeViSession(vi, "", TIKTAL_ATTR_DEVICE_ID, 42), VI_SUCCESS);
    }
    EXPECT_TRUE(capture.finish().empty());
    closeQuietly(open);
}

using TextFunction = ViStatus (*)(ViSession vi, ViInt32 bufferSize, ViChar* buffer);
const std::pair<const char*, TextFunction> kTextFunctions[] = {
    {"tiktal_GetAttributeViString",
     [](ViSession vi, ViInt32 size, ViChar* buffer) {
         return tiktal_GetAttributeViString(vi, "", TIKTAL_ATTR_1588_CLOCK_ID, size, buffer);
     }},
    {"tiktal_GetTimeReferenceNames",
     [](ViSession vi, ViInt32 size, ViChar* buffer) { return tiktal_GetTimeReferenceNames(vi, size, buffer); }},
};

TEST(TextOutputs, SizeQueryAndBufferRulesOnTheEmptyText) {
    QuietStderr quiet;
    const ViSession vi = openTraceSession();
    for (const auto& [function, get] : kTextFunctions) {
        SCOPED_TRACE(function);
        EXPECT_EQ(get(vi, 0, nullptr), 1);
        for (ViInt32 size : {1, 2, 64}) {  // "" and NULs up to bufferSize, nothing beyond
            std::string buffer(80, 'x');
            EXPECT_EQ(get(vi, size, buffer.data()), VI_SUCCESS) << size;
            EXPECT_EQ(buffer, std::string(size, '\0') + std::string(80 - size, 'x')) << size;
        }
        const std::string text = "abc" + std::string(13, 'x');
        std::string buffer = text;
        for (ViInt32 size : {-1, INT32_MIN}) {
            EXPECT_EQ(get(vi, size, buffer.data()), tiktalerr_invParameter) << size;
            EXPECT_EQ(get(vi, size, nullptr), tiktalerr_invParameter) << size;
        }
        EXPECT_EQ(get(vi, 16, nullptr), tiktalerr_invParameter);
        EXPECT_EQ(get(vi, 0, buffer.data()), tiktalerr_invParameter);  // no room, and no size query
        EXPECT_EQ(buffer, text);
    }
    // bufferSize 0 with an empty buffer: a size query only for the time reference names.
    const std::string empty = std::string(1, '\0') + std::string(15, 'x');
    std::string buffer = empty;
    EXPECT_EQ(tiktal_GetTimeReferenceNames(vi, 0, buffer.data()), 1);
    EXPECT_EQ(tiktal_GetAttributeViString(vi, "", TIKTAL_ATTR_1588_CLOCK_ID, 0, buffer.data()), tiktalerr_invParameter);
    EXPECT_EQ(buffer, empty);
    EXPECT_EQ(tiktal_close(vi), VI_SUCCESS);
}

TEST(TextOutputs, AHandleThatIsNotOpenFailsBeforeAnyBufferCheck) {
    const ViSession closed = openTraceSession();
    closeQuietly(closed);
    for (ViSession vi : {closed, ViSession{0}, ViSession{0x1234}}) {
        for (const auto& [function, get] : kTextFunctions) {
            std::string buffer(16, 'x');
            for (ViInt32 size : {0, -1, 16}) {
                EXPECT_EQ(get(vi, size, nullptr), tiktalerr_invalidObject) << function << ' ' << size;
                EXPECT_EQ(get(vi, size, buffer.data()), tiktalerr_invalidObject) << function << ' ' << size;
            }
            EXPECT_EQ(buffer, std::string(16, 'x'));
        }
    }
}

struct StatusRow {
    ViStatus code;
    std::string message;
};

// src/tables/statuses.tsv: code, constant, message.
std::vector<StatusRow> readStatusTable() {
    std::ifstream in(TIKTAL_STATUSES_TSV);
    EXPECT_TRUE(in.good()) << "cannot read " << TIKTAL_STATUSES_TSV;
    std::vector<StatusRow> rows;
    for (std::string line; std::getline(in, line);) {
        if (line.empty() || line[0] == '#') continue;
        const std::size_t first = line.find('\t'), second = line.find('\t', first + 1);
        EXPECT_NE(second, std::string::npos) << line;
        if (second == std::string::npos) continue;
        rows.push_back({static_cast<ViStatus>(std::strtoul(line.c_str(), nullptr, 16)), line.substr(second + 1)});
    }
    return rows;
}

TEST(ErrorMessage, EveryRowOfTheStatusTableForAnySession) {
    const std::vector<StatusRow> rows = readStatusTable();
    ASSERT_EQ(rows.size(), 97u);
    const ViSession open = openTraceSession();
    const ViSession sessions[] = {VI_NULL, open, 0x1234};
    for (std::size_t i = 0; i < rows.size(); ++i) {
        const StatusRow& row = rows[i];
        ASSERT_LE(row.message.size(), 255u) << row.message;
        std::string buffer(300, 'x');
        EXPECT_EQ(tiktal_error_message(sessions[i % 3], row.code, buffer.data()), VI_SUCCESS) << row.message;
        EXPECT_EQ(buffer, row.message + std::string(256 - row.message.size(), '\0') + std::string(44, 'x'));
    }
    closeQuietly(open);
}

TEST(ErrorMessage, KnownTextsUnknownCodesAndNullBuffer) {
    char buffer[TIKTAL_ERROR_MESSAGE_SIZE];
    EXPECT_EQ(tiktal_error_message(VI_NULL, tiktalerr_featureNotSupported, buffer), VI_SUCCESS);
    EXPECT_STREQ(buffer, "This operation requires a feature that is not supported.");
    EXPECT_EQ(tiktal_error_message(VI_NULL, tiktalerr_warn_unknownStatus, buffer), VI_SUCCESS);
    EXPECT_STREQ(buffer, "The status code passed to the operation could not be interpreted.");

    // The longest message takes the whole buffer with its NUL.
    std::string longest(300, 'x');
    EXPECT_EQ(tiktal_error_message(VI_NULL, tiktalerr_1588SyncIntervalMismatch, longest.data()), VI_SUCCESS);
    EXPECT_EQ(std::string(longest.c_str()).size(), 255u);
    EXPECT_EQ(longest.find("sync interval for this 1588 clock"), 14u);
    EXPECT_EQ(longest.substr(237, 19), std::string("to the same value.") + '\0');
    EXPECT_EQ(longest[256], 'x');

    for (const auto& [code, text] : std::initializer_list<std::pair<ViStatus, const char*>>{
             {0, "Unknown status value 0x00000000"},
             {-1, "Unknown status value 0xFFFFFFFF"},
             {INT32_MIN, "Unknown status value 0x80000000"},
             {static_cast<ViStatus>(0xBFFA4000), "Unknown status value 0xBFFA4000"}}) {
        EXPECT_EQ(tiktal_error_message(0x1234, code, buffer), tiktalerr_warn_unknownStatus) << text;
        EXPECT_STREQ(buffer, text);
    }
    EXPECT_EQ(tiktal_error_message(VI_NULL, tiktalerr_featureNotSupported, nullptr), tiktalerr_invParameter);
    EXPECT_EQ(tiktal_error_message(VI_NULL, 0, nullptr), tiktalerr_invParameter);
}

// The trace of one operation: its opening line, one line per parameter, its closing line.
std::vector<std::string> scope(const std::string& operation, std::vector<std::string> parameters = {}) {
    parameters.insert(parameters.begin(), "{ " + kTraced + operation);
    parameters.push_back("} " + kTraced + operation);
    return parameters;
}

std::string address(const void* p) {
    char text[32];
    std::snprintf(text, sizeof text, "%p", p);
    return text;
}

TEST(Trace, EveryParameterInTheFormatOfItsType) {
    const ViSession vi = openTraceSession();
    const auto expectTrace = [](auto call, const std::vector<std::string>& expected) {
        ViStatus status = -1;
        EXPECT_EQ(traceOf([&] { status = call(); }), expected);
        EXPECT_EQ(status, VI_SUCCESS) << expected.front();
    };
    expectTrace([&] { return tiktal_ConnectTrigTerminals(vi, "PXI_Trig0", "PFI0", nullptr, -1, 2); },
                scope("connectTrigTerminals", {"srcTerminal: PXI_Trig0", "destTerminal: PFI0", "syncClock: (null)",
                                               "invert: -1", "updateEdge: 2"}));
    expectTrace([&] { return tiktal_reset(vi); }, scope("reset"));
    expectTrace([&] { return tiktal_PersistConfig(vi); }, scope("persistConfig"));
    ViUInt32 seconds = 0, nanoseconds = 0;
    ViUInt16 fraction = 0;
    expectTrace([&] { return tiktal_GetTime(vi, &seconds, &nanoseconds, &fraction); },
                scope("getTime", {"timeSeconds: " + address(&seconds), "timeNanoseconds: " + address(&nanoseconds),
                                  "timeFractionalNanoseconds: " + address(&fraction)}));
    expectTrace([&] { return tiktal_AdjustTime_beta(vi, UINT64_MAX, 0); },
                scope("adjustTimeBeta", {"timeReferenceNanos: 18446744073709551615", "timeKeeperNanos: 0"}));
    expectTrace([&] { return tiktal_CreateFutureTimeEvent(vi, "PFI1", INT32_MIN, UINT32_MAX, 0, 65535); },
                scope("createFutureTimeEvent", {"terminal: PFI1", "outputLevel: -2147483648",
                                                "timeSeconds: 4294967295", "timeNanoseconds: 0",
                                                "timeFractionalNanoseconds: 65535"}));
    expectTrace([&] { return tiktal_SetAttributeViReal64(vi, "", TIKTAL_ATTR_TERMINAL_58_VALUE, -0.25); },
                scope("setAttributeViReal64", {"terminalName: ", "attribute: 1150100", "value: -0.25"}));
    expectTrace([&] { return tiktal_SetAttributeViBoolean(vi, "GPS", TIKTAL_ATTR_TIME_REFERENCE_ENABLED, VI_TRUE); },
                scope("setAttributeViBoolean", {"terminalName: GPS", "attribute: 1150812", "value: 1"}));
    expectTrace([&] { return tiktal_SetAttributeViString(vi, nullptr, 4294967295u, "a|b] c"); },
                scope("setAttributeViString", {"terminalName: (null)", "attribute: 4294967295", "value: a|b] c"}));
    closeQuietly(vi);
}

TEST(Trace, ALongTextIsCutToOneWholeLine) {
    const ViSession vi = openTraceSession();
    const std::string terminal(5000, 'A');
    StderrCapture capture;
    EXPECT_EQ(tiktal_ClearClock(vi, terminal.c_str()), VI_SUCCESS);
    const std::vector<std::string> writes = capture.finish();
    const std::vector<std::string> trace = traceMessages(writes);
    ASSERT_EQ(trace.size(), 3u);
    EXPECT_LE(writes[1].size(), testsupport::kWholeWriteLimit);  // written whole even to a shared pipe
    EXPECT_EQ(trace[1].rfind("terminal: AAAA", 0), 0u);
    EXPECT_EQ(trace[2], "} " + kTraced + "clearClock");
    closeQuietly(vi);
}

TEST(Trace, OpeningResettingAndClosing) {
    ViSession vi = 0;
    EXPECT_EQ(traceOf([&] { EXPECT_EQ(tiktal_init(kTraceResource, VI_FALSE, VI_TRUE, &vi), VI_SUCCESS); }),
              [] {
                  std::vector<std::string> lines = scope("SessionDebugPrintOnly");
                  for (const std::string& line : scope("reset")) lines.push_back(line);
                  return lines;
              }());
    EXPECT_EQ(traceOf([&] { EXPECT_EQ(tiktal_close(vi), VI_SUCCESS); }), scope("~SessionDebugPrintOnly"));
    EXPECT_EQ(traceOf([&] { EXPECT_EQ(tiktal_close(vi), VI_SUCCESS); }), std::vector<std::string>{});
    EXPECT_EQ(traceOf([&] { EXPECT_EQ(tiktal_initAdvanced(kTraceResource, 0, 0, VI_FALSE, &vi), VI_SUCCESS); }),
              scope("SessionDebugPrintOnly"));
    EXPECT_EQ(traceOf([&] { EXPECT_EQ(tiktal_GVClose(vi), VI_SUCCESS); }), scope("~SessionDebugPrintOnly"));
    EXPECT_EQ(traceOf([&] { EXPECT_EQ(tiktal_init("Dev1", VI_FALSE, VI_TRUE, &vi), tiktalerr_deviceNotFound); }),
              std::vector<std::string>{});
}

}  // namespace
