#include "client/horlo_uri.h"

#include <algorithm>

#include "errors/zrerr.h"
#include "support/casefold.h"

namespace horloUtils {
namespace {

constexpr char kSchemeSeparator[] = "://";
constexpr char kPathSeparator[] = "/";
constexpr char kScheme[] = "sync";

// A host names a machine and, optionally, a port. Characters that would give it user information
// (credentials), a query, a fragment or a path in a URL have no place in it, nor have white space,
// control characters or malformed UTF-8.
bool isPlainHost(const std::string& host) {
    for (const unsigned char c : host)
        if (c <= 0x20 || c == 0x7F || c == '@' || c == '?' || c == '#' || c == '/' || c == '\\') return false;
    return support::isValidUtf8(host);
}

}  // namespace

HorloUri::HorloUri(const std::string& resourceName) {
    const std::size_t schemeEnd = resourceName.find(kSchemeSeparator);
    if (schemeEnd != std::string::npos) {
        _scheme = resourceName.substr(0, schemeEnd);
        const std::size_t hostStart = schemeEnd + 3;
        const std::size_t hostEnd = resourceName.find(kPathSeparator, hostStart);
        if (hostEnd != std::string::npos) {
            _host = resourceName.substr(hostStart, hostEnd - hostStart);
            if (resourceName.find(kPathSeparator, hostEnd + 1) == std::string::npos)
                _deviceName = resourceName.substr(hostEnd + 1);
        }
    }
    std::string scheme = _scheme;
    // Lower case of the classic locale, whatever locale the application has set.
    std::transform(scheme.begin(), scheme.end(), scheme.begin(), [](char c) { return c >= 'A' && c <= 'Z' ? c + 32 : c; });
    if (scheme != kScheme || _host.empty() || _deviceName.empty() || !isPlainHost(_host))
        throw ZRERR_RAISE(tiktalerr_invalidResourceNameFormat).debug("func", "horloUtils::HorloUri::HorloUri");
}

bool isHorloUri(const std::string& resourceName) {
    try {
        HorloUri uri(resourceName);
        return true;
    } catch (const zrerr::ExceptionBase& e) {
        if (e.code() != tiktalerr_invalidResourceNameFormat) throw;
        return false;
    }
}

}  // namespace horloUtils
