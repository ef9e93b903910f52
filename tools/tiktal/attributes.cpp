#include "attributes.h"

#include <cctype>
#include <cerrno>
#include <cmath>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <vector>

#include "errors.h"

namespace cli {
namespace {

#include "commandAttributes.inc"

constexpr const char* kPrefix = "TIKTAL_ATTR_";

std::string upper(std::string text) {
    for (char& c : text) c = static_cast<char>(std::toupper(static_cast<unsigned char>(c)));
    return text;
}

bool endsWith(const std::string& text, const std::string& end) {
    return text.size() >= end.size() && text.compare(text.size() - end.size(), end.size(), end) == 0;
}

// A whole decimal or 0x-hexadecimal number that fits in 32 bits.
bool parseNumber(const std::string& text, ViAttr& id) {
    const bool hex = text.size() > 2 && text[0] == '0' && (text[1] == 'x' || text[1] == 'X');
    if (text.empty() || !std::isdigit(static_cast<unsigned char>(text[hex ? 2 : 0]))) return false;
    char* end = nullptr;
    errno = 0;
    const unsigned long long value = std::strtoull(text.c_str(), &end, hex ? 16 : 10);
    if (errno != 0 || *end != '\0' || value > 0xFFFFFFFFull) return false;
    id = static_cast<ViAttr>(value);
    return true;
}

Attribute fromRow(const AttributeInfo& row) { return {row.name, row.id, row.type, row.needsItem}; }

// The row whose constant name is `text` with or without its prefix, else the one row that ends with
// "_" + `text`; case does not matter.
const AttributeInfo& findByName(const std::string& text) {
    const std::string wanted = upper(text);
    for (const AttributeInfo& row : kAttributes)
        if (wanted == row.name || kPrefix + wanted == row.name) return row;
    std::vector<const AttributeInfo*> matches;
    for (const AttributeInfo& row : kAttributes)
        if (!wanted.empty() && endsWith(row.name, "_" + wanted)) matches.push_back(&row);
    if (matches.size() == 1) return *matches.front();
    if (matches.empty()) throw UsageError("unknown attribute \"" + text + "\"");
    std::string names;
    for (const AttributeInfo* row : matches) names += std::string(names.empty() ? "" : ", ") + row->name;
    throw UsageError("ambiguous attribute \"" + text + "\": it may be " + names);
}

AttributeType parseTypeName(const std::string& name) {
    for (AttributeType type : {AttributeType::String, AttributeType::Int32, AttributeType::Real64, AttributeType::Boolean})
        if (upper(name) == upper(typeName(type))) return type;
    throw UsageError("unknown type \"" + name + "\" (string, int32, real64 or boolean)");
}

}  // namespace

const char* typeName(AttributeType type) {
    switch (type) {
    case AttributeType::String: return "string";
    case AttributeType::Int32: return "int32";
    case AttributeType::Real64: return "real64";
    case AttributeType::Boolean: return "boolean";
    }
    return "?";
}

Attribute resolveAttribute(const std::string& text, const std::string& type) {
    ViAttr id = 0;
    Attribute attribute{};
    if (!parseNumber(text, id)) {
        attribute = fromRow(findByName(text));
    } else {
        const AttributeInfo* row = nullptr;
        for (const AttributeInfo& candidate : kAttributes)
            if (candidate.id == id) row = &candidate;
        if (!row && type.empty())
            throw UsageError("attribute " + text + " is not one the command knows: give its type with --type");
        attribute = row ? fromRow(*row) : Attribute{std::to_string(id), id, AttributeType::Int32, false};
    }
    if (!type.empty()) attribute.type = parseTypeName(type);
    return attribute;
}

Value parseValue(AttributeType type, const std::string& text) {
    const auto bad = [&](const char* expected) {
        return UsageError("bad value \"" + text + "\": expected " + expected);
    };
    // strtoll and strtod skip leading blanks and take partial text; the checks refuse both.
    const bool blank = text.empty() || std::isspace(static_cast<unsigned char>(text[0]));
    char* end = nullptr;
    errno = 0;
    switch (type) {
    case AttributeType::String: return text;
    case AttributeType::Int32: {
        const long long value = blank ? 0 : std::strtoll(text.c_str(), &end, 10);
        if (blank || *end != '\0' || errno != 0 || value < INT32_MIN || value > INT32_MAX)
            throw bad("a decimal integer from -2147483648 to 2147483647");
        return static_cast<ViInt32>(value);
    }
    case AttributeType::Real64: {
        const double value = blank ? 0 : std::strtod(text.c_str(), &end);
        if (blank || *end != '\0' || !std::isfinite(value)) throw bad("a finite real number");
        return value;
    }
    case AttributeType::Boolean:
        for (const char* word : {"true", "1", "yes", "on"})
            if (upper(text) == upper(word)) return true;
        for (const char* word : {"false", "0", "no", "off"})
            if (upper(text) == upper(word)) return false;
        throw bad("true, false, 1, 0, yes, no, on or off");
    }
    return text;
}

std::string formatValue(const Value& value) {
    if (const auto* text = std::get_if<std::string>(&value)) return *text;
    if (const auto* number = std::get_if<ViInt32>(&value)) return std::to_string(*number);
    if (const auto* flag = std::get_if<bool>(&value)) return *flag ? "true" : "false";
    // The shortest of 15 or 17 significant digits that reads back as the same number.
    char text[32];
    const double real = std::get<ViReal64>(value);
    std::snprintf(text, sizeof text, "%.15g", real);
    if (std::strtod(text, nullptr) != real) std::snprintf(text, sizeof text, "%.17g", real);
    return text;
}

}  // namespace cli
