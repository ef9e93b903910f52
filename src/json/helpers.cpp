#include "json/helpers.h"

#include <boost/lexical_cast.hpp>
#include <cmath>

#include "errors/zrerr.h"
#include "json/zrjsonlh.h"

namespace zrjson {
namespace {

// A parsed object and the text it came from, which failures show; without the text (an object
// parsed before) they show its unformatted print.
struct Source {
    const cJSON* object;
    const std::string* text;

    std::string shown() const { return text ? *text : zrjsonlh::printUnformatted(object); }
};

// The member, or null when it is absent (also when the object is none).
const cJSON* findMember(const Source& source, const char* name) { return cJSON_GetObjectItem(source.object, name); }

zrerr::Exception typeMismatch(const Source& source, const char* name, const char* message) {
    return zrerr::raise(zrjsonlh::jsonErrorsTypeMismatch, "errCode", ZRERR_FILE, __LINE__)
        .debug("message", message)
        .debug("JSON", source.shown())
        .debug("key", name);
}

// The member readers: false when absent, a null member as `onNull` says; a value of another type
// fails with -52004 naming the text and the key.
// (cJSON's own functions have cJSON's calling convention, which is not the default on every system.)
template <class Value, class HasType>
bool readMember(const Source& source, const char* name, Value& out, HasType hasType, Value (*convert)(const cJSON*),
                OnNull onNull) {
    const cJSON* member = findMember(source, name);
    if (!member) return false;
    if (cJSON_IsNull(member) && onNull == OnNull::keepOutput) return true;
    if (!hasType(member))
        throw typeMismatch(source, name, "Error parsing: expected data type does not match the parsed value.");
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

bool readString(const Source& source, const char* name, std::string& out, OnNull onNull) {
    return readMember(source, name, out, cJSON_IsString, zrjsonlh::getString, onNull);
}

bool readInt32Number(const Source& source, const char* name, std::int32_t& out, OnNull onNull) {
    return readMember(source, name, out, cJSON_IsNumber, zrjsonlh::getInt32, onNull);
}

bool readBool(const Source& source, const char* name, bool& out) {
    return readMember(source, name, out, cJSON_IsBool, toBool, OnNull::keepOutput);
}

std::int32_t readInt32(const Source& source, const char* name) {
    const cJSON* member = findMember(source, name);
    if (cJSON_IsString(member)) return boost::lexical_cast<std::int32_t>(member->valuestring);
    if (cJSON_IsNumber(member)) return zrjsonlh::getInt32(member);
    throw ZRERR_RAISE(tiktalerr_internalSoftware)
        .debug("message", "Could not cast JSON value to int32 or an JSON object was invalid")
        .debug("key", name)
        .debug("JSON", source.shown());
}

}  // namespace

bool getStringMember(const std::string& jsonText, const char* name, std::string& out, OnNull onNull) {
    const zrjsonlh::CppJson json(jsonText.c_str());
    return readString({json.get(), &jsonText}, name, out, onNull);
}

bool getStringMember(const cJSON* object, const char* name, std::string& out, OnNull onNull) {
    return readString({object, nullptr}, name, out, onNull);
}

bool getInt32NumberMember(const std::string& jsonText, const char* name, std::int32_t& out, OnNull onNull) {
    const zrjsonlh::CppJson json(jsonText.c_str());
    return readInt32Number({json.get(), &jsonText}, name, out, onNull);
}

bool getInt32NumberMember(const cJSON* object, const char* name, std::int32_t& out, OnNull onNull) {
    return readInt32Number({object, nullptr}, name, out, onNull);
}

bool getBoolMember(const std::string& jsonText, const char* name, bool& out) {
    const zrjsonlh::CppJson json(jsonText.c_str());
    return readBool({json.get(), &jsonText}, name, out);
}

bool getBoolMember(const cJSON* object, const char* name, bool& out) { return readBool({object, nullptr}, name, out); }

bool getObjectMember(const std::string& jsonText, const char* name, zrjsonlh::CppJson& out) {
    const zrjsonlh::CppJson json(jsonText.c_str());
    cJSON* member = cJSON_GetObjectItem(json.get(), name);
    if (!member) return false;
    zrjsonlh::checkObject(member);
    if (!allFinite(member)) throw typeMismatch({json.get(), &jsonText}, name, "A number is beyond the range of a double.");
    out.reset(cJSON_DetachItemViaPointer(json.get(), member));
    return true;
}

bool getObjectMemberText(const std::string& jsonText, const char* name, std::string& out) {
    zrjsonlh::CppJson member;
    if (!getObjectMember(jsonText, name, member)) return false;
    out = zrjsonlh::printUnformatted(member.get());
    return true;
}

bool getStringArrayMember(const std::string& jsonText, const char* name, std::vector<std::string>& out) {
    const zrjsonlh::CppJson json(jsonText.c_str());
    const cJSON* member = cJSON_GetObjectItem(json.get(), name);
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
    return readInt32({json.get(), &jsonText}, name);
}

std::int32_t getInt32Member(const cJSON* object, const char* name) { return readInt32({object, nullptr}, name); }

}  // namespace zrjson
