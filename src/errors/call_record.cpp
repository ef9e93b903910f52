#include "errors/call_record.h"

#include <cjson/cJSON.h>

#include <cstdlib>
#include <cstring>
#include <string>

#include "errors/zrerr.h"
#include "support/casefold.h"

namespace zrerr::record {
namespace {

// The library's text as a compact JSON object, or nothing when it is none (or not UTF-8): it
// comes from outside and is checked before it becomes the details of a status.
std::string checkedObject(const char* json, std::uint32_t capacity) {
    if (!json) return {};
    const std::string text(json, strnlen(json, capacity));
    cJSON* parsed = cJSON_ParseWithLength(text.data(), text.size());
    std::string compact;
    if (cJSON_IsObject(parsed)) {
        char* printed = cJSON_PrintUnformatted(parsed);
        if (printed) compact = printed;
        cJSON_free(printed);
    }
    cJSON_Delete(parsed);
    return support::isValidUtf8(compact) ? compact : std::string();
}

}  // namespace

std::int32_t reallocate(char*& json, std::uint32_t& capacity, std::uint32_t wanted) noexcept {
    if (wanted == 0) {
        std::free(json);
        json = nullptr;
        capacity = 0;
        return 1;
    }
    if (wanted > 0x7FFFFFFFu) return 0;
    char* text = static_cast<char*>(std::realloc(json, wanted));
    if (!text) return 0;
    if (!json) text[0] = '\0';
    json = text;
    capacity = wanted;
    return 1;
}

void raise(std::int32_t code, const char* json, std::uint32_t capacity, const char* component,
           const char* library) {
    zrerr::Exception failure;
    failure.setCode(code);
    const std::string details = checkedObject(json, capacity);
    if (details.empty() || !failure.adoptDetailText(details.c_str()))
        throw zrerr::raise(code, component, ZRERR_FILE, __LINE__)
            .debug("message", std::string(library) + " gave no readable details.");
    throw failure;
}

}  // namespace zrerr::record
