#include "status.h"

#include <cjson/cJSON.h>

#include <new>

namespace qpxisim {
namespace {

std::string ascii(std::string text) {
    for (char& c : text)
        if (static_cast<unsigned char>(c) >= 0x80) c = '?';
    return text;
}

}  // namespace

void fail(std::int32_t code, std::string msg) { throw Failure{code, std::move(msg), {}, {}}; }

void failUnknownHandle(const char* kind, std::uint32_t handle) {
    throw Failure{code::kUnknownHandle, std::string("no such ") + kind + " handle", {}, {{kind, handle}}};
}

std::string details(const char* function, const Failure& failure) {
    cJSON* object = cJSON_CreateObject();
    bool complete = object && cJSON_AddNumberToObject(object, "code", failure.code) &&
                    cJSON_AddStringToObject(object, "component", "zrqpxi") &&
                    cJSON_AddStringToObject(object, "func", function) &&
                    cJSON_AddStringToObject(object, "msg", ascii(failure.msg).c_str());
    for (const auto& [key, text] : failure.texts)
        complete = complete && cJSON_AddStringToObject(object, key.c_str(), ascii(text).c_str());
    for (const auto& [key, number] : failure.numbers)
        complete = complete && cJSON_AddNumberToObject(object, key.c_str(), number);
    char* printed = complete ? cJSON_PrintUnformatted(object) : nullptr;
    cJSON_Delete(object);
    if (!printed) throw std::bad_alloc();
    std::string text(printed);
    cJSON_free(printed);
    return text;
}

}  // namespace qpxisim
