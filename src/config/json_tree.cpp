#include "config/json_tree.h"

#include <new>

namespace zrjsonconfig {
namespace {

cJSON* checked(cJSON* item) {
    if (!item) throw std::bad_alloc();
    return item;
}

}  // namespace

JsonTree newObject() { return JsonTree(checked(cJSON_CreateObject())); }
JsonTree newArray() { return JsonTree(checked(cJSON_CreateArray())); }
JsonTree duplicate(const cJSON* item) { return JsonTree(item ? checked(cJSON_Duplicate(item, true)) : nullptr); }
JsonTree newString(const std::string& text) { return JsonTree(checked(cJSON_CreateString(text.c_str()))); }
JsonTree newNumber(double value) { return JsonTree(checked(cJSON_CreateNumber(value))); }
JsonTree newBool(bool value) { return JsonTree(checked(cJSON_CreateBool(value))); }
JsonTree objectView(const cJSON* object) { return JsonTree(checked(cJSON_CreateObjectReference(object->child))); }

void addMember(cJSON* object, const char* name, JsonTree value) {
    if (!cJSON_AddItemToObject(object, name, value.get())) throw std::bad_alloc();
    value.release();  // the object owns it now
}

void setMember(cJSON* object, const char* name, JsonTree value) {
    const bool replacing = cJSON_GetObjectItem(object, name) != nullptr;
    if (!(replacing ? cJSON_ReplaceItemInObject(object, name, value.get()) : cJSON_AddItemToObjectCS(object, name, value.get())))
        throw std::bad_alloc();
    value.release();
}

}  // namespace zrjsonconfig
