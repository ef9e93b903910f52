#include "timing/call_status.h"

#include <cjson/cJSON.h>

#include <cstdlib>
#include <cstring>
#include <string>

#include "errors/zrerr.h"
#include "support/casefold.h"

namespace zrrocoapi {
namespace {

// The service's text as a compact JSON object, or nothing when it is none (or not UTF-8): it
// comes from outside and is checked before it becomes the details of a status.
std::string checkedObject(const zrrocoapi_Status& record) {
    if (!record.json) return {};
    const std::string text(record.json, strnlen(record.json, record.capacity));
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

CallStatus::CallStatus() noexcept : _record{0, 0, &CallStatus::reallocate, nullptr} {}

CallStatus::~CallStatus() { reallocate(&_record, 0); }

std::int32_t CallStatus::reallocate(zrrocoapi_Status* status, std::uint32_t capacity) noexcept {
    if (!status) return 0;
    if (capacity == 0) {
        std::free(status->json);
        status->json = nullptr;
        status->capacity = 0;
        return 1;
    }
    if (capacity > 0x7FFFFFFFu) return 0;
    char* text = static_cast<char*>(std::realloc(status->json, capacity));
    if (!text) return 0;
    if (!status->json) text[0] = '\0';
    status->json = text;
    status->capacity = capacity;
    return 1;
}

void CallStatus::check() const {
    if (_record.code >= 0) return;
    zrerr::Exception failure;
    failure.setCode(_record.code);
    const std::string details = checkedObject(_record);
    if (details.empty() || !failure.adoptDetailText(details.c_str()))
        throw zrerr::raise(_record.code, "zrrocoapi", ZRERR_FILE, __LINE__)
            .debug("message", "The routing service gave no readable details.");
    throw failure;
}

}  // namespace zrrocoapi
