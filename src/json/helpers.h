// One converted member of a JSON text, as the time-service client and session need it.
// Member names are matched ignoring case; each function parses its own copy of the text.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

namespace zrjson {

// What a null member gives: `out` left alone (and true returned), or, for a value the caller
// cannot do without, the failure of a value of another type.
enum class OnNull { keepOutput, fail };

// False when the member is absent; a null member as `onNull` says; a value of another type
// fails with -52004.
bool getStringMember(const std::string& jsonText, const char* name, std::string& out,
                     OnNull onNull = OnNull::keepOutput);
// As getStringMember, for a number (cut toward zero, overflow fails) or a Boolean.
bool getInt32NumberMember(const std::string& jsonText, const char* name, std::int32_t& out,
                          OnNull onNull = OnNull::keepOutput);
bool getBoolMember(const std::string& jsonText, const char* name, bool& out);
// False when absent; otherwise the member must be an object, printed unformatted. A number in it
// that is not finite (1e400 parses as infinity) would print as null: it fails with -52004.
bool getObjectMemberText(const std::string& jsonText, const char* name, std::string& out);
// False when absent; a null member leaves `out` alone; otherwise every element must be a text.
bool getStringArrayMember(const std::string& jsonText, const char* name, std::vector<std::string>& out);
// A number, or a text of decimal digits with an optional sign; anything else fails.
std::int32_t getInt32Member(const std::string& jsonText, const char* name);

}  // namespace zrjson
