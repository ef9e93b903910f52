#include "json.h"

#include "status.h"

#include <cstdlib>
#include <cstring>
#include <new>

namespace rocosim {
namespace {

cJSON* checked(cJSON* item) {
    if (!item) throw std::bad_alloc();
    return item;
}

}  // namespace

void addText(cJSON* object, const char* key, const std::string& text) {
    checked(cJSON_AddStringToObject(object, key, utf8(text).c_str()));
}

void addTextOrNull(cJSON* object, const char* key, const std::optional<std::string>& text) {
    if (text) return addText(object, key, *text);
    checked(cJSON_AddNullToObject(object, key));
}

void addNumber(cJSON* object, const char* key, double number) { checked(cJSON_AddNumberToObject(object, key, number)); }

void addBool(cJSON* object, const char* key, bool value) { checked(cJSON_AddBoolToObject(object, key, value)); }

void addItem(cJSON* object, const char* key, Json item) {
    if (!item || !cJSON_AddItemToObject(object, key, item.get())) throw std::bad_alloc();
    item.release();
}

Json newObject() { return Json(checked(cJSON_CreateObject())); }

std::string print(const cJSON* item) {
    char* printed = cJSON_PrintUnformatted(item);
    if (!printed) throw std::bad_alloc();
    std::string text(printed);
    cJSON_free(printed);
    return text;
}

char* handOut(const std::string& text) {
    char* copy = static_cast<char*>(std::malloc(text.size() + 1));
    if (!copy) throw std::bad_alloc();
    std::memcpy(copy, text.c_str(), text.size() + 1);
    return copy;
}

}  // namespace rocosim
