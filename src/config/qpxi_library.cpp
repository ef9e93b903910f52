#include "config/qpxi_library.h"

#include "platform/platform.h"

namespace zrqpxi {

namespace {
constexpr std::int32_t zrapalerr_invalidParameter = -52005;
}  // namespace

// A function that failed to load fails as its loading did.
void notLoaded(const char* name) {
    throw zrerr::raise(zrapalerr_invalidParameter, "zrapalerr_invalidParameter", ZRERR_FILE, __LINE__)
        .debug("func", name)
        .debug("msg", "The PXI chassis query library does not offer this function.");
}

DynamicQPXILibrary::DynamicQPXILibrary(zrerr::ExceptionBase& status) {
    if (status.code() < 0) return;
    if (load(platform::libraryFileName("zrqpxi"), _status))
        resolveInOrder(kFunctionNames, _functions, kFunctionCount, _status);
    status.merge(_status);
}

}  // namespace zrqpxi
