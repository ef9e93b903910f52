#include "graviton/runtime_import.h"

#include <string>

#include "platform/platform.h"

namespace tiktal::graviton {
namespace {

std::atomic<void*> gModule{nullptr};
std::atomic<std::uint32_t> gThreadIndex{0xFFFFFFFFu};

}  // namespace

void setRuntimeModule(void* module) noexcept { gModule.store(module); }
void setThreadIndex(std::uint32_t index) noexcept { gThreadIndex.store(index); }

void* findRuntimeModule() noexcept {
    if (void* module = platform::threadModule(gThreadIndex.load())) return module;
    if (void* module = gModule.load()) return module;
    if (void* program = platform::mainProgramDefining({"gGVRTVersion", "AZNewHandle"})) return program;
    static const std::string grrt = platform::libraryFileName("grrt"), grffrt = platform::libraryFileName("grffrt");
    if (void* library = platform::loadedLibrary(grrt.c_str())) return library;
    return platform::loadedLibrary(grffrt.c_str());
}

void* RuntimeImport::resolve() noexcept {
    void* module = findRuntimeModule();
    if (!module) platform::fatalError("gravitonv.lib was not called from a Graviton process.");
    const std::uint32_t stamp = platform::moduleStamp(module);
    void* address = lookUp(module, stamp);
    if (!address && reclaimStale(module, stamp)) address = lookUp(module, stamp);
    if (!address)
        platform::fatalError(std::string("gravitonv.lib was unable to locate a suitable location to resolve \"") + _name +
                             "\". This may happen when too many instances of Graviton have been loaded into the same "
                             "process.");
    return address;
}

// Resolves the name in `module` into `entry`. Threads that fill one entry for one module store
// the same values.
void* RuntimeImport::fill(Entry& entry, void* module) noexcept {
    void* address = platform::moduleSymbol(module, _name);
    entry.address.store(address);
    entry.module.store(module);
    return address;
}

void* RuntimeImport::lookUp(void* module, std::uint32_t stamp) noexcept {
    for (Entry& entry : _entries) {
        std::uint32_t held = entry.stamp.load();
        if (held == 0 && entry.stamp.compare_exchange_strong(held, stamp)) return fill(entry, module);
        if (held == stamp) {
            void* address = entry.address.load();
            return entry.module.load() == module && address ? address : fill(entry, module);
        }
        if (entry.module.load() == module) {  // the same module, another file since
            void* address = fill(entry, module);
            entry.stamp.store(stamp);
            return address;
        }
    }
    return nullptr;
}

// Gives the first entry whose module is no longer loaded to `module`; false when none is.
bool RuntimeImport::reclaimStale(void* module, std::uint32_t stamp) noexcept {
    for (Entry& entry : _entries) {
        void* held = entry.module.load();
        if (!held || platform::isModuleLoaded(held) || !entry.module.compare_exchange_strong(held, module)) continue;
        entry.address.store(platform::moduleSymbol(module, _name));
        entry.stamp.store(stamp);
        return true;
    }
    return false;
}

}  // namespace tiktal::graviton
