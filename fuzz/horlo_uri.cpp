// Resource names of the time service, "sync://HOST/DEVICE", from arbitrary bytes.
//
// A name is accepted exactly when it is "sync://" in any case, a host that is not empty and holds
// no "/", "@", "?", "#", "\", white space, control character or malformed UTF-8, then "/" and a
// device name that is not empty and holds no "/". An accepted name gives back its host and
// device name so that "sync://" + host + "/" + device is the name byte for byte. A refused name
// fails with tiktalerr_invalidResourceNameFormat only, and isHorloUri agrees with the constructor.
#include <string>

#include "client/horlo_uri.h"
#include "errors/zrerr.h"
#include "property.h"

namespace {

using tiktalfuzz::require;

char lower(char c) { return c >= 'A' && c <= 'Z' ? static_cast<char>(c + 32) : c; }

bool isPlainHost(std::string_view host) {
    for (const unsigned char c : host)
        if (c <= 0x20 || c == 0x7F || std::string_view("/@?#\\").find(static_cast<char>(c)) != std::string_view::npos)
            return false;
    return !host.empty() && tiktalfuzz::isWellFormed(host);
}

bool isResourceName(std::string_view name) {
    if (name.size() < 7 || name.substr(4, 3) != "://") return false;
    for (std::size_t i = 0; i < 4; ++i)
        if (lower(name[i]) != "sync"[i]) return false;
    const std::size_t slash = name.find('/', 7);
    if (slash == std::string_view::npos) return false;
    const std::string_view device = name.substr(slash + 1);
    return isPlainHost(name.substr(7, slash - 7)) && !device.empty() && device.find('/') == std::string_view::npos;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const std::string name(tiktalfuzz::bytes(data, size));
    bool accepted = false;
    try {
        const horloUtils::HorloUri uri(name);
        accepted = true;
        const std::string host = uri.getHost();
        require(!host.empty() && host.find('/') == std::string::npos && !uri.getDeviceName().empty(),
                "an accepted name has a host up to the first \"/\" and a device name");
        require(name.substr(4) == "://" + host + "/" + uri.getDeviceName(), "host and device name give back the name");
    } catch (const zrerr::ExceptionBase& e) {
        require(e.code() == tiktalerr_invalidResourceNameFormat, "a refused name fails as a malformed resource name");
    }
    require(accepted == isResourceName(name), "exactly the well-formed names are accepted");
    require(horloUtils::isHorloUri(name) == accepted, "isHorloUri agrees with the constructor");
    return 0;
}
