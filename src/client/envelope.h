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
    kTooDeep = 10,            // objects and arrays nested deeper than kMaxDepth
};

// The deepest nesting of objects and arrays the scanner walks; the service's answers need a few
// levels, and a bound keeps a hostile answer from exhausting the caller's stack.
inline constexpr int kMaxDepth = 128;

ScanError check(std::string_view text);

// The values of the first top-level members named "error" and "result", each exactly as written;
// nothing for a member that is absent or when the text is no object.
struct Envelope {
    std::optional<std::string_view> error;
    std::optional<std::string_view> result;
};

// check(), which finds the members of the envelope in the same walk; they are valid only when
// the text passes.
ScanError check(std::string_view text, Envelope& envelope);

// Position of the value of the first member `name` of the top-level object; nothing when the
// text is no object, the member is absent, or the object is malformed before it.
std::optional<std::size_t> findMember(std::string_view text, std::string_view name);

// Readers of the value at `at`.
bool readBool(std::string_view text, std::size_t at);
// A number whose value is whole, however it is written ("-5", "-5.0", "-5e0"); nothing for
// anything else, a fraction, or a value beyond the range of a double.
std::optional<double> readWholeNumber(std::string_view text, std::size_t at);
// The undecoded characters between the quotes; empty for anything else.
std::string_view readString(std::string_view text, std::size_t at);
// The text of the value at `at` exactly as written: an object or array to its matching bracket,
// a string with its quotes, a number or literal as it stands; nothing when it is malformed.
std::optional<std::string_view> valueText(std::string_view text, std::size_t at);

}  // namespace zr::vantle::shared::envelope
