// Comparison of UTF-8 texts ignoring case.
#pragma once

#include <string_view>

namespace support {

// Equal bytes, or equal after simple case folding of the Latin, Latin Extended Additional,
// Roman numeral, circled letter, fullwidth Latin and ligature code points. Malformed UTF-8
// compares unequal unless the bytes are equal.
bool equalsIgnoringCase(std::string_view a, std::string_view b);

}  // namespace support
