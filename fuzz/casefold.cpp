// Checks and case-insensitive comparison of UTF-8 texts. The input is "FIRST\nSECOND": two texts.
//
// isValidUtf8 agrees with a strict validator of the target's own. The comparison is symmetric
// and reflexive; equal bytes compare equal; a text and its ASCII upper case compare as the text
// does with anything; and when either text is not well-formed UTF-8 the result is plain byte
// equality, so that no malformed name can stand for a well-formed one.
#include <string>

#include "property.h"
#include "support/casefold.h"

namespace {

using support::equalsIgnoringCase;
using tiktalfuzz::isWellFormed;
using tiktalfuzz::require;

std::string asciiUpper(std::string_view text) {
    std::string upper(text);
    for (char& c : upper)
        if (c >= 'a' && c <= 'z') c = static_cast<char>(c - 32);
    return upper;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const auto [a, b] = tiktalfuzz::splitAt(tiktalfuzz::bytes(data, size), '\n');
    require(support::isValidUtf8(a) == isWellFormed(a) && support::isValidUtf8(b) == isWellFormed(b),
            "isValidUtf8 accepts exactly well-formed UTF-8");
    const bool equal = equalsIgnoringCase(a, b);
    require(equal == equalsIgnoringCase(b, a), "the comparison is symmetric");
    require(equalsIgnoringCase(a, std::string(a)) && equalsIgnoringCase(b, std::string(b)), "equal bytes compare equal");
    if (!isWellFormed(a) || !isWellFormed(b))
        require(equal == (a == b), "a malformed text equals only the same bytes");
    else
        require(equalsIgnoringCase(asciiUpper(a), b) == equal, "the ASCII case of a text does not matter");
    return 0;
}
