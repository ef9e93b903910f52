// Modules of the graphical environment's run time, found through the dynamic loader.
#include "platform/platform.h"
#include "platform/unix/unix.h"

#include <dlfcn.h>
#include <link.h>
#include <pthread.h>
#include <sys/stat.h>

#include <new>

namespace platform {

namespace {

link_map* linkMapOf(void* module) {
    link_map* map = nullptr;
    return module && dlinfo(module, RTLD_DI_LINKMAP, &map) == 0 ? map : nullptr;
}

// The main program's handle; the program stays loaded, so the reference is given back at once.
void* mainProgram() noexcept {
    void* program = dlopen(nullptr, RTLD_NOW);
    if (program) dlclose(program);
    return program;
}

// The loaded object that defines the address `symbol`.
link_map* definingObject(const void* symbol) {
    Dl_info info{};
    link_map* map = nullptr;
    return dladdr1(symbol, &info, reinterpret_cast<void**>(&map), RTLD_DL_LINKMAP) ? map : nullptr;
}

}  // namespace

void* threadModule(std::uint32_t index) noexcept {
    if (index == 0xFFFFFFFFu) return nullptr;
    return pthread_getspecific(static_cast<pthread_key_t>(index));
}

void* mainProgramDefining(std::initializer_list<const char*> names) noexcept {
    void* program = mainProgram();
    for (const char* name : names)
        if (moduleSymbol(program, name)) return program;
    return nullptr;
}

void* loadedLibrary(const char* name) noexcept {
    void* library = dlopen(name, RTLD_NOW | RTLD_NOLOAD);
    if (library) dlclose(library);  // the handle stays valid: the object was loaded before
    return library;
}

void* moduleSymbol(void* module, const char* name) noexcept {
    void* symbol = module ? dlsym(module, name) : nullptr;
    // dlsym also searches what the module loaded, and for the main program every global object.
    return symbol && definingObject(symbol) == linkMapOf(module) ? symbol : nullptr;
}

// A module's file has no version stamp of its own here: its stamp is an FNV-1a hash of the
// device, inode and modification time of the file, which every load of the same file shares.
std::uint32_t moduleStamp(void* module) noexcept {
    const link_map* map = linkMapOf(module);
    const char* path = map && map->l_name && *map->l_name ? map->l_name : "/proc/self/exe";
    struct stat file {};
    if (::stat(path, &file) != 0) return 1;
    const std::uint64_t fields[] = {file.st_dev, file.st_ino, static_cast<std::uint64_t>(file.st_mtim.tv_sec),
                                    static_cast<std::uint64_t>(file.st_mtim.tv_nsec)};
    std::uint32_t hash = 2166136261u;
    for (std::uint64_t field : fields)
        for (int byte = 0; byte < 8; ++byte) hash = (hash ^ ((field >> (8 * byte)) & 0xFF)) * 16777619u;
    return hash != 0 ? hash : 1;  // 0 marks a free cache entry
}

bool isModuleLoaded(void* module) noexcept {
    if (module == mainProgram()) return true;
    std::vector<std::string> names;
    try {
        dl_iterate_phdr(
            [](dl_phdr_info* info, std::size_t, void* list) {
                if (info->dlpi_name && *info->dlpi_name) static_cast<std::vector<std::string>*>(list)->push_back(info->dlpi_name);
                return 0;
            },
            &names);
    } catch (const std::bad_alloc&) {
        return true;  // not known to be gone
    }
    for (const std::string& name : names)
        if (loadedLibrary(name.c_str()) == module) return true;
    return false;
}

}  // namespace platform
