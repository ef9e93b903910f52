// An in-place scanner for the JSON envelope of time-service answers: it checks a text, finds
// members and reads values without building a tree, so a member's text comes back byte for byte.
#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string_view>

namespace zr::vantle::shared::envelope {

// Error codes of a whole-text check (0: the text is one JSON value).
enum ScanError : int {
    kOk = 0,
    kInvalidValue = 1,        // no value where one belongs (also an empty text)
    kMalformedString = 2,     // no opening quote, a control character, or no closing quote
    kObjectNotClosed = 3,
    kArrayNotClosed = 4,
    kMissingColon = 5,
    kUnexpectedCharacter = 6, // where "," or the closing bracket belongs
    kInvalidEscape = 7,
    kTrailingComma = 8,       // "," directly before "}" or "]"
    kTrailingCharacters = 9,  // characters after the value
};

ScanError check(std::string_view text);

// Position of the value of the first member `name` of the top-level object; nothing when the
// text is no object, the member is absent, or the object is malformed before it.
std::optional<std::size_t> findMember(std::string_view text, std::string_view name);

// Readers of the value at `at`.
bool readBool(std::string_view text, std::size_t at);
// Integers convert directly, fractions and exponents truncate toward zero; 0 for anything else.
std::int32_t readNumber(std::string_view text, std::size_t at);
// The undecoded characters between the quotes; empty for anything else.
std::string_view readString(std::string_view text, std::size_t at);
// The text of the value at `at` exactly as written: an object or array to its matching bracket,
// a string with its quotes, a number or literal as it stands; nothing when it is malformed.
std::optional<std::string_view> valueText(std::string_view text, std::size_t at);

}  // namespace zr::vantle::shared::envelope
