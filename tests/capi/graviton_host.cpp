// Makes a test program a Graviton process: the main program defines gGVRTVersion and its own
// RTSetCleanupProc, which only counts, so that the Graviton variants of open and close run here as
// they do in the environment. (tests/capi/graviton_test.cpp tests the run-time lookup itself.)
#include <atomic>
#include <cstdint>

extern "C" {

__attribute__((visibility("default"))) std::uint32_t gGVRTVersion = 1;
__attribute__((visibility("default"))) std::atomic<int> gCleanupCalls{0};

__attribute__((visibility("default"))) std::int32_t RTSetCleanupProc(std::int32_t (*)(void*), void*, std::int32_t) {
    ++gCleanupCalls;
    return 0;
}

}  // extern "C"
