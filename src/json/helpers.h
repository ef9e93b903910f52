// One converted member of a JSON text, as the time-service client and session need it.
// Member names are matched ignoring case. Each function parses its own copy of the text; the
// readers also take an object already parsed, whose unformatted print failures then show.
#pragma once

#include <cjson/cJSON.h>

#include <cstdint>
#include <string>
#include <vector>

namespace zrjsonlh {
class CppJson;
}

namespace zrjson {

// What a null member gives: `out` left alone (and true returned), or, for a value the caller
// cannot do without, the failure of a value of another type.
enum class OnNull { keepOutput, fail };

// False when the member is absent; a null member as `onNull` says; a value of another type
// fails with -52004.
bool getStringMember(const std::string& jsonText, const char* name, std::string& out,
                     OnNull onNull = OnNull::keepOutput);
bool getStringMember(const cJSON* object, const char* name, std::string& out, OnNull onNull = OnNull::keepOutput);
// As getStringMember, for a number (cut toward zero, overflow fails) or a Boolean.
bool getInt32NumberMember(const std::string& jsonText, const char* name, std::int32_t& out,
                          OnNull onNull = OnNull::keepOutput);
bool getInt32NumberMember(const cJSON* object, const char* name, std::int32_t& out, OnNull onNull = OnNull::keepOutput);
bool getBoolMember(const std::string& jsonText, const char* name, bool& out);
bool getBoolMember(const cJSON* object, const char* name, bool& out);
// False when absent; otherwise the member must be an object, and every number in it finite
// (1e400 parses as infinity, which would print as null): else it fails with -52004. `out` then
// owns the member, taken out of the parsed text.
bool getObjectMember(const std::string& jsonText, const char* name, zrjsonlh::CppJson& out);
// As getObjectMember, the member printed unformatted.
bool getObjectMemberText(const std::string& jsonText, const char* name, std::string& out);
// False when absent; a null member leaves `out` alone; otherwise every element must be a text.
bool getStringArrayMember(const std::string& jsonText, const char* name, std::vector<std::string>& out);
// A number, or a text of decimal digits with an optional sign; anything else fails.
std::int32_t getInt32Member(const std::string& jsonText, const char* name);
std::int32_t getInt32Member(const cJSON* object, const char* name);

}  // namespace zrjson
