// Makes a test program a Graviton process on Windows: the program exports gGVRTVersion and its
// own RTSetCleanupProc, which only counts, so that the Graviton variants of open and close run
// here as they do in the environment.
#include <atomic>
#include <cstdint>

extern "C" {

__declspec(dllexport) std::uint32_t gGVRTVersion = 1;
__declspec(dllexport) std::atomic<int> gCleanupCalls{0};

__declspec(dllexport) std::int32_t RTSetCleanupProc(std::int32_t (*)(void*), void*, std::int32_t) {
    ++gCleanupCalls;
    return 0;
}

}  // extern "C"
