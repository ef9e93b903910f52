#include "config/checked_json.h"

#include <cmath>
#include <cstring>

#include "config/failure.h"
#include "support/casefold.h"

namespace zrjsonconfig {
namespace {

bool isJsonWhiteSpace(char c) { return c == ' ' || c == '\t' || c == '\n' || c == '\r'; }

// cJSON reads a number beyond the range of a double as infinity, which it prints as null.
bool allNumbersFinite(const cJSON* item) {
    if (cJSON_IsNumber(item) && !std::isfinite(item->valuedouble)) return false;
    for (const cJSON* child = item->child; child; child = child->next)
        if (!allNumbersFinite(child)) return false;
    return true;
}

// Whether a string of the JSON text holds the escape \u0000, which cJSON decodes into a NUL that
// ends the string there: "Dev\u0000One" would read as "Dev". In JSON a backslash appears only in
// strings, and each escapes the character after it (so "\\u0000" is a backslash and "u0000").
bool holdsEscapedNul(const std::string& text) {
    for (std::size_t at = text.find('\\'); at != std::string::npos; at = text.find('\\', at + 2))
        if (text.compare(at + 1, 5, "u0000") == 0) return true;
    return false;
}

}  // namespace

JsonTree parseObjectText(const std::string& text, const std::string& path) {
    if (!support::isValidUtf8(text))
        ZRJSONCONFIG_FAILURE(kInvalidJson).usage(kUsageTypeFilePath, path).comment("The file is not valid UTF-8").raise();
    // cJSON would end a text at a NUL byte, in a string too.
    if (std::memchr(text.data(), '\0', text.size()))
        ZRJSONCONFIG_FAILURE(kInvalidJson).usage(kUsageTypeFilePath, path).comment("The file holds a NUL byte").raise();
    const char* end = nullptr;
    JsonTree root(cJSON_ParseWithLengthOpts(text.data(), text.size(), &end, false));
    if (!root)
        ZRJSONCONFIG_FAILURE(kInvalidJson).usage(kUsageTypeFilePath, path).comment("The file is not JSON").raise();
    for (const char* rest = end; rest < text.data() + text.size(); ++rest)
        if (!isJsonWhiteSpace(*rest))
            ZRJSONCONFIG_FAILURE(kInvalidJson)
                .usage(kUsageTypeFilePath, path)
                .comment("The file holds more after its JSON value")
                .raise();
    if (!allNumbersFinite(root.get()))
        ZRJSONCONFIG_FAILURE(kInvalidJson)
            .usage(kUsageTypeFilePath, path)
            .comment("A number is beyond the range of a double")
            .raise();
    if (holdsEscapedNul(text))
        ZRJSONCONFIG_FAILURE(kInvalidJson)
            .usage(kUsageTypeFilePath, path)
            .comment("A string holds the escape \\u0000 (NUL), which would end it there")
            .raise();
    if (!cJSON_IsObject(root.get()))
        ZRJSONCONFIG_FAILURE(kNotAnObject).usage(kUsageTypeFilePath, path).comment("The file is not a JSON object").raise();
    return root;
}

std::uint32_t wholeNumber(const cJSON* item, const char* name, const std::string& path) {
    if (!cJSON_IsNumber(item))
        ZRJSONCONFIG_FAILURE(kTypeMismatch)
            .usage(kUsageTypeFilePath, path)
            .comment(std::string("\"") + name + "\" is not a number")
            .raise();
    const double value = item->valuedouble;
    if (!(value >= 0 && value <= 4294967295.0) || value != std::trunc(value))
        ZRJSONCONFIG_FAILURE(kTypeMismatch)
            .usage(kUsageTypeFilePath, path)
            .comment(std::string("\"") + name + "\" is not a whole number from 0 to 4294967295")
            .raise();
    return static_cast<std::uint32_t>(value);
}

std::string textValue(const cJSON* item, const char* name, const std::string& path) {
    if (!cJSON_IsString(item))
        ZRJSONCONFIG_FAILURE(kTypeMismatch)
            .usage(kUsageTypeFilePath, path)
            .comment(std::string("\"") + name + "\" is not text")
            .raise();
    return item->valuestring;
}

}  // namespace zrjsonconfig
