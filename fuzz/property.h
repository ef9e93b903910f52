// What the fuzz targets share: a property that does not hold stops the run as a crash, so that
// libFuzzer keeps the input that broke it; inputs split into two texts; a strict UTF-8 validator,
// written apart from the library's decoder so that the two can be checked against each other.
#pragma once

#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <string_view>
#include <utility>

namespace tiktalfuzz {

// Stops the run, naming the property, when it does not hold.
inline void require(bool holds, const char* property) {
    if (holds) return;
    std::fprintf(stderr, "property does not hold: %s\n", property);
    std::abort();
}

inline std::string_view bytes(const std::uint8_t* data, std::size_t size) {
    return {reinterpret_cast<const char*>(data), size};
}

// The text before the first `separator` and the text after it; without one, the whole and "".
// Seeds stay easy to write by hand: "first\nsecond".
inline std::pair<std::string_view, std::string_view> splitAt(std::string_view input, char separator) {
    const std::size_t at = input.find(separator);
    if (at == std::string_view::npos) return {input, {}};
    return {input.substr(0, at), input.substr(at + 1)};
}

// Well-formed UTF-8: the shortest form of every code point, no surrogates (U+D800..U+DFFF),
// nothing above U+10FFFF, no truncated sequence and no stray continuation byte.
inline bool isWellFormed(std::string_view text) {
    for (std::size_t i = 0; i < text.size();) {
        const unsigned char lead = static_cast<unsigned char>(text[i]);
        std::size_t length = 0;
        unsigned char low = 0x80, high = 0xBF;  // the range of the second byte
        if (lead < 0x80) {
            length = 1;
        } else if (lead >= 0xC2 && lead <= 0xDF) {
            length = 2;
        } else if (lead >= 0xE0 && lead <= 0xEF) {
            length = 3;
            if (lead == 0xE0) low = 0xA0;   // below: overlong
            if (lead == 0xED) high = 0x9F;  // above: surrogates
        } else if (lead >= 0xF0 && lead <= 0xF4) {
            length = 4;
            if (lead == 0xF0) low = 0x90;   // below: overlong
            if (lead == 0xF4) high = 0x8F;  // above: beyond U+10FFFF
        } else {
            return false;  // a continuation byte, C0, C1 or F5..FF
        }
        if (text.size() - i < length) return false;
        for (std::size_t k = 1; k < length; ++k) {
            const unsigned char next = static_cast<unsigned char>(text[i + k]);
            if (next < (k == 1 ? low : 0x80) || next > (k == 1 ? high : 0xBF)) return false;
        }
        i += length;
    }
    return true;
}

}  // namespace tiktalfuzz
