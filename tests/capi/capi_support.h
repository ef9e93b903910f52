// Helpers of the C-interface tests: the exports of the table, capture of standard error, and
// call-tracing sessions.
#pragma once

#include <algorithm>
#include <cerrno>
#include <optional>
#include <regex>
#include <string>
#include <system_error>
#include <thread>
#include <vector>

#include <gtest/gtest.h>
#include <tiktal/tiktal.h>

#include "stderr_capture.h"

namespace capi {

using testsupport::QuietStderr;
using testsupport::StderrCapture;

inline constexpr char kTraceResource[] = "SyncTestInternal___";
inline const std::string kTraced = "tiktal::SessionDebugPrintOnly::";

// Calls `function` with `vi` and every other parameter null or zero.
template <class... Params>
ViStatus callWithZeros(ViStatus(_VI_FUNC* function)(ViSession, Params...), ViSession vi) {
    return function(vi, Params{}...);
}

// One row of src/tables/exports.tsv whose function takes the session first.
struct Export {
    const char* kind;
    const char* name;
    const char* operation;
    ViStatus (*callWithZeros)(ViSession vi);
};

inline std::vector<Export> exportsOfKind(const std::string& kind) {
#define TIKTAL_EXPORT_ROW(kind, name, op) {#kind, #name, op, [](ViSession vi) { return callWithZeros(&name, vi); }},
#define TIKTAL_EXPORT_manual(name, op)
#define TIKTAL_EXPORT_forward(name, op) TIKTAL_EXPORT_ROW(forward, name, op)
#define TIKTAL_EXPORT_text(name, op) TIKTAL_EXPORT_ROW(text, name, op)
#define TIKTAL_EXPORT_stub(name, op) TIKTAL_EXPORT_ROW(stub, name, op)
#define TIKTAL_EXPORT_zero(name, op) TIKTAL_EXPORT_ROW(zero, name, op)
    static const Export all[] = {
#include "export_calls.inc"
    };
    std::vector<Export> found;
    for (const Export& e : all)
        if (kind == e.kind) found.push_back(e);
    return found;
}

// The forwarding exports: those that run an operation of the session.
inline std::vector<Export> forwardingExports() {
    std::vector<Export> all = exportsOfKind("forward");
    for (const Export& e : exportsOfKind("text")) all.push_back(e);
    return all;
}

// The messages of trace lines; fails the test for a write that is not exactly one trace line:
// "[iktal_impl|" + source file right-aligned in 32 characters + "|" + 4-digit line + "] " + message.
inline std::vector<std::string> traceMessages(const std::vector<std::string>& writes) {
    static const std::regex kLine(R"(\[iktal_impl\|( *[^ |]+)\|[0-9]{4}\] ([^\n]*)\n)");
    std::vector<std::string> messages;
    for (const std::string& write : writes) {
        std::smatch match;
        if (std::regex_match(write, match, kLine) && match.length(1) == 32)
            messages.push_back(match[2]);
        else
            ADD_FAILURE() << "not one trace line: \"" << write << '"';
    }
    return messages;
}

// The trace messages written while `calls` runs.
template <class Calls>
std::vector<std::string> traceOf(Calls&& calls) {
    StderrCapture capture;
    calls();
    return traceMessages(capture.finish());
}

// Opens a call-tracing session without showing its trace.
inline ViSession openTraceSession() {
    QuietStderr quiet;
    ViSession vi = 0;
    EXPECT_EQ(tiktal_init(kTraceResource, VI_FALSE, VI_FALSE, &vi), VI_SUCCESS);
    return vi;
}

inline void closeQuietly(ViSession vi) {
    QuietStderr quiet;
    EXPECT_EQ(tiktal_close(vi), VI_SUCCESS);
}

}  // namespace capi
