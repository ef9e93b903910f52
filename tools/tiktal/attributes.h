// Attributes by name, and values parsed by attribute type.
#pragma once

#include <string>
#include <variant>

#include <tiktal/tiktal.h>

namespace cli {

// The value type of an attribute, which picks the accessor of the C interface.
enum class AttributeType { String, Int32, Real64, Boolean };

// One row of the generated attribute table (commandAttributes.inc).
struct AttributeInfo {
    const char* name;
    ViAttr id;
    AttributeType type;
    bool needsItem;  // the attribute needs a time-reference name as terminalName
};

// The attribute a command works on: a row of the table, or a bare number with a type given by the user.
struct Attribute {
    std::string name;  // the constant name, or the number in decimal when the table lacks it
    ViAttr id;
    AttributeType type;
    bool needsItem;
};

// Alternatives in the order of AttributeType.
using Value = std::variant<std::string, ViInt32, ViReal64, bool>;

// Finds `text` (constant name, name without TIKTAL_ATTR_, unique short form, or number); `typeName`
// ("" or one of string, int32, real64, boolean) overrides the table's type and is needed for a
// number that the table lacks. Throws UsageError.
Attribute resolveAttribute(const std::string& text, const std::string& typeName);

// Parses a value given on the command line as `type`. Throws UsageError.
Value parseValue(AttributeType type, const std::string& text);

const char* typeName(AttributeType type);
std::string formatValue(const Value& value);

}  // namespace cli
