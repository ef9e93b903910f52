#include "frame.h"

#include "controls.h"

#include <string>

namespace rocosim {

Call::Call(const char* function) noexcept : _function(function), _entry(cJSON_CreateObject()) {
    if (!_entry) return;
    cJSON_AddStringToObject(_entry.get(), "call", function);
    _args = cJSON_AddObjectToObject(_entry.get(), "args");
}

Call& Call::arg(const char* key, const char* text) noexcept {
    try {
        if (_args) addTextOrNull(_args, key, textOf(text));
    } catch (const std::bad_alloc&) {  // the log then lacks the argument; the call goes on
    }
    return *this;
}

Call& Call::arg(const char* key, std::int64_t number) noexcept {
    if (_args) cJSON_AddNumberToObject(_args, key, static_cast<double>(number));
    return *this;
}

Call& Call::given(const char* key, const void* pointer) noexcept {
    if (_args) cJSON_AddBoolToObject(_args, key, pointer != nullptr);
    return *this;
}

std::int32_t Call::refuse(const Failure& failure, std::string& details) noexcept {
    try {
        details = rocosim::details((std::string("zrrocoapi_") + _function).c_str(), failure);
    } catch (const std::bad_alloc&) {
        details = "{}";
    }
    return failure.code;
}

void Call::logResult(std::int64_t result) noexcept {
    if (_entry) cJSON_AddNumberToObject(_entry.get(), "result", static_cast<double>(result));
}

void Call::record(std::int32_t status) noexcept {
    if (!_entry) return;
    cJSON_AddNumberToObject(_entry.get(), "code", status);
    char* printed = cJSON_PrintUnformatted(_entry.get());
    if (printed) appendToLog(printed);
    cJSON_free(printed);
}

}  // namespace rocosim
