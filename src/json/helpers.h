// One converted member of a JSON text, as the time-service client and session need it.
// Member names are matched ignoring case; each function parses its own copy of the text.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

namespace zrjson {

// False when the member is absent; a null member leaves `out` alone; a value of another type
// fails with -52004.
bool getStringMember(const std::string& jsonText, const char* name, std::string& out);
// As getStringMember, for a number (cut toward zero, overflow fails) or a Boolean.
bool getInt32NumberMember(const std::string& jsonText, const char* name, std::int32_t& out);
bool getBoolMember(const std::string& jsonText, const char* name, bool& out);
// False when absent; otherwise the member must be an object, printed unformatted.
bool getObjectMemberText(const std::string& jsonText, const char* name, std::string& out);
// False when absent; a null member leaves `out` alone; otherwise every element must be a text.
bool getStringArrayMember(const std::string& jsonText, const char* name, std::vector<std::string>& out);
// A number, or a text of decimal digits with an optional sign; anything else fails.
std::int32_t getInt32Member(const std::string& jsonText, const char* name);

}  // namespace zrjson
