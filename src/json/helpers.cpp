#include "json/helpers.h"

#include <boost/lexical_cast.hpp>
#include <cmath>

#include "errors/zrerr.h"
#include "json/zrjsonlh.h"

namespace zrjson {
namespace {

// The member, or null when it is absent (also when the text is no object).
cJSON* findMember(const zrjsonlh::CppJson& json, const char* name) { return cJSON_GetObjectItem(json.get(), name); }

zrerr::Exception typeMismatch(const std::string& jsonText, const char* name, const char* message) {
    return zrerr::raise(zrjsonlh::jsonErrorsTypeMismatch, "errCode", ZRERR_FILE, __LINE__)
        .debug("message", message)
        .debug("JSON", jsonText.c_str())
        .debug("key", name);
}

// The member readers: false when absent, a null member as `onNull` says; a value of another type
// fails with -52004 naming the text and the key.
template <class Value>
bool readMember(const std::string& jsonText, const char* name, Value& out, cJSON_bool (*hasType)(const cJSON*),
                Value (*convert)(const cJSON*), OnNull onNull) {
    const zrjsonlh::CppJson json(jsonText.c_str());
    const cJSON* member = findMember(json, name);
    if (!member) return false;
    if (cJSON_IsNull(member) && onNull == OnNull::keepOutput) return true;
    if (!hasType(member))
        throw typeMismatch(jsonText, name, "Error parsing: expected data type does not match the parsed value.");
    out = convert(member);
    return true;
}

// Whether every number in `item` is finite. cJSON bounds the nesting of what it parses.
bool allFinite(const cJSON* item) {
    if (cJSON_IsNumber(item)) return std::isfinite(item->valuedouble);
    for (const cJSON* child = item->child; child; child = child->next)
        if (!allFinite(child)) return false;
    return true;
}

bool toBool(const cJSON* item) { return cJSON_IsTrue(item); }

}  // namespace

bool getStringMember(const std::string& jsonText, const char* name, std::string& out, OnNull onNull) {
    return readMember(jsonText, name, out, cJSON_IsString, zrjsonlh::getString, onNull);
}

bool getInt32NumberMember(const std::string& jsonText, const char* name, std::int32_t& out, OnNull onNull) {
    return readMember(jsonText, name, out, cJSON_IsNumber, zrjsonlh::getInt32, onNull);
}

bool getBoolMember(const std::string& jsonText, const char* name, bool& out) {
    return readMember(jsonText, name, out, cJSON_IsBool, toBool, OnNull::keepOutput);
}

bool getObjectMemberText(const std::string& jsonText, const char* name, std::string& out) {
    const zrjsonlh::CppJson json(jsonText.c_str());
    const cJSON* member = findMember(json, name);
    if (!member) return false;
    zrjsonlh::checkObject(member);
    if (!allFinite(member)) throw typeMismatch(jsonText, name, "A number is beyond the range of a double.");
    out = zrjsonlh::printUnformatted(member);
    return true;
}

bool getStringArrayMember(const std::string& jsonText, const char* name, std::vector<std::string>& out) {
    const zrjsonlh::CppJson json(jsonText.c_str());
    const cJSON* member = findMember(json, name);
    if (!member) return false;
    if (cJSON_IsNull(member)) return true;
    std::vector<std::string> texts;
    for (auto it = zrjsonlh::ArrayIterator::begin(member); it != zrjsonlh::ArrayIterator::end(); ++it)
        texts.push_back(zrjsonlh::getString(*it));
    out = std::move(texts);
    return true;
}

std::int32_t getInt32Member(const std::string& jsonText, const char* name) {
    const zrjsonlh::CppJson json(jsonText.c_str());
    const cJSON* member = findMember(json, name);
    if (cJSON_IsString(member)) return boost::lexical_cast<std::int32_t>(member->valuestring);
    if (cJSON_IsNumber(member)) return zrjsonlh::getInt32(member);
    throw ZRERR_RAISE(tiktalerr_internalSoftware)
        .debug("message", "Could not cast JSON value to int32 or an JSON object was invalid")
        .debug("key", name)
        .debug("JSON", jsonText.c_str());
}

}  // namespace zrjson
