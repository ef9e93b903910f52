// The routing rules the timing module applies to a caller's terminal names, and the status record
// in which the routing service reports a failure. The input is "SOURCE\nDESTINATION\nDETAILS".
//
// Qualified names always start with "/" and strip back to the name as given (for names without a
// "/"); the route filter is a function of the names ignoring ASCII case, except for "ClkOut" after
// an LVDS source; a failure in the record is raised with its code, and its details are either a
// compact JSON object in well-formed UTF-8 or none of the service's text at all.
#include <cjson/cJSON.h>

#include <cstring>
#include <string>

#include "errors/zrerr.h"
#include "property.h"
#include "timing/call_status.h"
#include "timing/routing.h"

namespace {

using tiktalfuzz::require;

std::string lower(std::string text) {
    for (char& c : text)
        if (c >= 'A' && c <= 'Z') c = static_cast<char>(c + 32);
    return text;
}

void checkNames(const std::string& source, const std::string& destination) {
    const std::string qualified = tiktal::qualifyTerminal("Dev1", source);
    require(!qualified.empty() && qualified[0] == '/', "a qualified name starts with /");
    if (source.find('/') == std::string::npos)
        require(tiktal::stripTerminal(qualified) == source, "stripping undoes qualifying");
    const bool routable = tiktal::isRoutable(source, destination);
    if (lower(destination) != "clkout")  // the one name the filter compares exactly
        require(tiktal::isRoutable(lower(source), lower(destination)) == routable, "the filter ignores case");
}

void checkDetails(const std::string& details) {
    zrrocoapi::CallStatus status;
    zrrocoapi_Status* record = status.get();
    require(record->reallocate(record, static_cast<std::uint32_t>(details.size() + 1)) == 1, "room for the details");
    std::memcpy(record->json, details.c_str(), details.size() + 1);
    record->code = -89120;
    try {
        status.check();
        require(false, "an error is raised");
    } catch (const zrerr::Exception& e) {
        require(e.code() == -89120, "the service's code is kept");
        cJSON* parsed = cJSON_Parse(e.what());
        require(cJSON_IsObject(parsed), "the details are a JSON object");
        cJSON_Delete(parsed);
        require(tiktalfuzz::isWellFormed(e.what()), "the details are well-formed UTF-8");
    }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const auto [source, rest] = tiktalfuzz::splitAt(tiktalfuzz::bytes(data, size), '\n');
    const auto [destination, details] = tiktalfuzz::splitAt(rest, '\n');
    checkNames(std::string(source), std::string(destination));
    checkDetails(std::string(details));
    return 0;
}
