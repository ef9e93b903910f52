// Checks and comparison of UTF-8 texts.
#pragma once

#include <string>
#include <string_view>

namespace support {

// Equal bytes, or equal after simple case folding of the Latin, Latin Extended Additional,
// Roman numeral, circled letter, fullwidth Latin and ligature code points. Malformed UTF-8
// compares unequal unless the bytes are equal.
bool equalsIgnoringCase(std::string_view a, std::string_view b);

// A key for sets and maps of texts compared as equalsIgnoringCase compares them: two texts have
// the same key exactly when they compare equal.
std::string caseFoldKey(std::string_view text);

// Well-formed UTF-8: no overlong forms, surrogates or code points above U+10FFFF.
bool isValidUtf8(std::string_view text);

}  // namespace support
