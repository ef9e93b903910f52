// Functions of the graphical environment Graviton's run time, which the library does not link
// against: the run-time module of the calling process is found when a function is first needed,
// the function is resolved by name, and its address is cached per run-time module, so that
// several instances of the run time can live in one process.
#pragma once

#include <atomic>
#include <cstdint>

namespace tiktal::graviton {

// What the environment told the library (SetGVRTModule, SetGVRTTLSIndex).
void setRuntimeModule(void* module) noexcept;
void setThreadIndex(std::uint32_t index) noexcept;

// The run-time module of the calling thread, first match wins: the module in the thread's slot,
// the module set by the environment, the main program when it is the environment (it defines
// "gGVRTVersion" or "AZNewHandle"), then the library grrt or grffrt (libgrrt.so, grrt.dll) when
// loaded. Null when none.
void* findRuntimeModule() noexcept;

// One imported function with its cache: eight entries, one per run-time module, claimed with a
// compare-and-swap, so that threads resolve at once without a lock.
class RuntimeImport {
public:
    static constexpr int kEntries = 8;

    explicit constexpr RuntimeImport(const char* name) noexcept : _name(name) {}

    // The function's address in the calling thread's run time. Without a run time, or without
    // a place for it (eight other run times are loaded, or the run time lacks the function), the
    // process ends with the fatal message and exit status 1.
    void* resolve() noexcept;

private:
    struct Entry {
        std::atomic<void*> module{nullptr};
        std::atomic<std::uint32_t> stamp{0};  // 0: free
        std::atomic<void*> address{nullptr};
    };

    void* lookUp(void* module, std::uint32_t stamp) noexcept;
    void* fill(Entry& entry, void* module) noexcept;
    bool reclaimStale(void* module, std::uint32_t stamp) noexcept;

    const char* _name;
    Entry _entries[kEntries];
};

}  // namespace tiktal::graviton
