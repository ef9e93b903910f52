// Every export of the table called as a caller that knows it only by its ordinal does it:
// GetProcAddress(dll, MAKEINTRESOURCEA(ordinal)), then a __stdcall call with zero arguments of the
// sizes its prototype gives. The callee removes its own arguments: the stack pointer is the same
// before and after each call, over many calls in a row, and each returns what its kind returns
// for no session.
#ifndef WIN32_LEAN_AND_MEAN
#define WIN32_LEAN_AND_MEAN
#endif
#include <windows.h>

#include <gtest/gtest.h>
#include <tiktal/tiktal.h>

#include <cstdint>
#include <map>
#include <string>

namespace {

// An address in the frame of a call made from the caller's frame: it moves with the stack pointer.
__attribute__((noinline)) std::uintptr_t stackMark() {
    volatile char here = 0;
    return reinterpret_cast<std::uintptr_t>(&here);
}

struct Outcome {
    ViStatus status;
    bool balanced;
    const void* address;
};

// Calls the export of `ordinal` as if it had the type of `prototype`, with zero arguments.
template <class... Params>
Outcome callByOrdinal(HMODULE dll, unsigned ordinal, ViStatus(_VI_FUNC*)(Params...)) {
    using Function = ViStatus(_VI_FUNC*)(Params...);
    const auto function = reinterpret_cast<Function>(reinterpret_cast<void*>(GetProcAddress(dll, MAKEINTRESOURCEA(ordinal))));
    if (!function) return {0, false, nullptr};
    const std::uintptr_t before = stackMark();
    const ViStatus status = function(Params{}...);
    return {status, stackMark() == before, reinterpret_cast<const void*>(function)};
}

// What the functions written by hand return with every argument zero or null.
const std::map<std::string, ViStatus> kManual = {
    {"tiktal_init", tiktalerr_invParameter},        {"tiktal_initAdvanced", tiktalerr_invParameter},
    {"tiktal_GVInit", tiktalerr_invParameter},      {"tiktal_GVInitAdvanced", tiktalerr_invParameter},
    {"tiktal_close", VI_SUCCESS},                   {"tiktal_GVClose", VI_SUCCESS},
    {"tiktal_error_message", tiktalerr_invParameter},
};

ViStatus expectedFor(const std::string& name, const std::string& kind) {
    if (kind == "forward" || kind == "text") return tiktalerr_invalidObject;
    if (kind == "stub") return tiktalerr_featureNotSupported;
    if (kind == "zero") return VI_SUCCESS;
    return kManual.at(name);
}

TEST(Stdcall, EveryExportByItsOrdinalRemovesItsArgumentsAndAnswers) {
    const HMODULE dll = LoadLibraryA("tiktal.dll");
    ASSERT_NE(dll, nullptr);
    int exports = 0;
#define TIKTAL_EXPORT_ORDINAL(ordinal, name, kind)                                                              \
    {                                                                                                         \
        ++exports;                                                                                            \
        for (int round = 0; round < 100; ++round) {                                                           \
            const Outcome outcome = callByOrdinal(dll, ordinal, &name);                                       \
            ASSERT_NE(outcome.address, nullptr) << #name << " has no ordinal " << ordinal;                    \
            ASSERT_TRUE(outcome.balanced) << #name << " left the stack pointer moved";                        \
            ASSERT_EQ(outcome.status, expectedFor(#name, #kind)) << #name;                                    \
            ASSERT_EQ(outcome.address, reinterpret_cast<const void*>(GetProcAddress(dll, #name))) << #name; \
        }                                                                                                     \
    }
#include "export_ordinals.inc"
#undef TIKTAL_EXPORT_ORDINAL
    EXPECT_EQ(exports, 88);
}

}  // namespace
