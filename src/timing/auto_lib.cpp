#include "timing/auto_lib.h"

#include "errors/zrerr.h"
#include "platform/platform.h"

namespace zrdynlib {
namespace {

constexpr std::int32_t zrapalerr_invalidParameter = -52005;

// A failure of the loader: -52005 with what the loader said, under "zrdynlib_debug".
zrerr::Exception loaderFailure(int line, const char* what, const char* key, const std::string& value, const char* api,
                               const std::string& loaderText) {
    zrerr::Exception internal;
    internal.setCode(zrapalerr_invalidParameter);
    internal.addText("api", api);
    internal.addText("string", loaderText.c_str());
    zrerr::Exception failure =
        zrerr::raise(zrapalerr_invalidParameter, "zrapalerr_invalidParameter", ZRERR_FILE, line, "zrdynlib_debug")
            .debug("debug", what)
            .debug(key, value);
    failure.addDetail("internal_error", internal, true);
    return failure;
}

}  // namespace

AutoLib::~AutoLib() { platform::unloadLibrary(_module); }

void AutoLib::load(const std::string& fileName) {
    zrerr::Exception status;
    if (!load(fileName, status)) throw status;
}

bool AutoLib::load(const std::string& fileName, zrerr::ExceptionBase& status) {
    std::string error;
    _module = platform::loadLibrary(fileName, error);
    if (!_module)
        status.merge(loaderFailure(__LINE__, "failed to zrdynlib_load library", "path", fileName,
                                   platform::kLoadLibraryApi, error));
    return _module != nullptr;
}

bool AutoLib::resolveInOrder(const char* const* names, void** slots, std::size_t count,
                             zrerr::ExceptionBase& status) {
    for (std::size_t i = 0; i < count; ++i) {
        std::string error;
        slots[i] = platform::findSymbol(_module, names[i], error);
        if (!slots[i]) {
            status.merge(loaderFailure(__LINE__, "failed to get symbol", "zrdynlib_symbol", names[i],
                                       platform::kFindSymbolApi, error));
            return false;
        }
    }
    return true;
}

void AutoLib::resolve(const char* const* names, void** slots, std::size_t count) {
    zrerr::Exception overall;
    for (std::size_t i = 0; i < count; ++i) {
        std::string error;
        slots[i] = platform::findSymbol(_module, names[i], error);
        if (!slots[i])
            overall.merge(loaderFailure(__LINE__, "failed to get symbol", "zrdynlib_symbol", names[i],
                                        platform::kFindSymbolApi, error));
    }
    if (overall.code() < 0) throw overall;
}

}  // namespace zrdynlib
