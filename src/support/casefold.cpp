#include "support/casefold.h"

#include <optional>
#include <vector>

namespace support {
namespace {

// Decodes UTF-8; nothing for malformed input: a stray or missing continuation byte, an overlong
// form, a surrogate or a code point above U+10FFFF.
std::optional<std::vector<char32_t>> decode(std::string_view text) {
    static constexpr char32_t kSmallest[] = {0, 0x80, 0x800, 0x10000};  // by the number of extra bytes
    std::vector<char32_t> out;
    for (std::size_t i = 0; i < text.size();) {
        const unsigned char lead = static_cast<unsigned char>(text[i]);
        const int extra = lead < 0x80 ? 0 : (lead >> 5) == 6 ? 1 : (lead >> 4) == 14 ? 2 : (lead >> 3) == 30 ? 3 : -1;
        if (extra < 0 || i + extra >= text.size()) return std::nullopt;
        char32_t c = extra == 0 ? lead : lead & (0x3F >> extra);
        for (int k = 1; k <= extra; ++k) {
            const unsigned char next = static_cast<unsigned char>(text[i + k]);
            if ((next >> 6) != 2) return std::nullopt;
            c = (c << 6) | (next & 0x3F);
        }
        if (c < kSmallest[extra] || (c >= 0xD800 && c <= 0xDFFF) || c > 0x10FFFF) return std::nullopt;
        out.push_back(c);
        i += static_cast<std::size_t>(extra) + 1;
    }
    return out;
}

// Upper-case letters that alternate with their lower-case partner (upper even or odd).
bool pairedUpper(char32_t c, char32_t first, char32_t last) { return c >= first && c <= last && (c - first) % 2 == 0; }

void fold(char32_t c, std::vector<char32_t>& out) {
    switch (c) {
    case 0x0178: out.push_back(0x00FF); return;
    case 0x017F: out.push_back(U's'); return;
    case 0x1E9E: out.push_back(0x00DF); return;
    case 0xFB00: out.insert(out.end(), {U'f', U'f'}); return;
    case 0xFB01: out.insert(out.end(), {U'f', U'i'}); return;
    case 0xFB02: out.insert(out.end(), {U'f', U'l'}); return;
    case 0xFB05:
    case 0xFB06: out.insert(out.end(), {U's', U't'}); return;
    }
    if ((c >= U'A' && c <= U'Z') || (c >= 0xC0 && c <= 0xDE && c != 0xD7) || (c >= 0xFF21 && c <= 0xFF3A))
        c += 0x20;
    else if (pairedUpper(c, 0x0100, 0x012E) || pairedUpper(c, 0x0132, 0x0136) || pairedUpper(c, 0x0139, 0x0147) ||
             pairedUpper(c, 0x014A, 0x0176) || pairedUpper(c, 0x0179, 0x017D) || pairedUpper(c, 0x1E00, 0x1E94) ||
             pairedUpper(c, 0x1EA0, 0x1EFE))
        c += 1;
    else if (c >= 0x2160 && c <= 0x216F)
        c += 0x10;
    else if (c >= 0x24B6 && c <= 0x24CF)
        c += 0x1A;
    out.push_back(c);
}

std::optional<std::vector<char32_t>> folded(std::string_view text) {
    auto decoded = decode(text);
    if (!decoded) return std::nullopt;
    std::vector<char32_t> out;
    for (char32_t c : *decoded) fold(c, out);
    return out;
}

}  // namespace

std::string caseFoldKey(std::string_view text) {
    // Malformed texts equal only themselves: their bytes, marked apart from every folded text.
    const auto folds = folded(text);
    if (!folds) return std::string(1, '\0').append(text);
    std::string key(1, '\1');
    for (char32_t c : *folds)
        for (int shift = 24; shift >= 0; shift -= 8) key.push_back(static_cast<char>((c >> shift) & 0xFF));
    return key;
}

bool isValidUtf8(std::string_view text) { return decode(text).has_value(); }

bool equalsIgnoringCase(std::string_view a, std::string_view b) {
    if (a == b) return true;
    const auto fa = folded(a);
    const auto fb = folded(b);
    return fa && fb && *fa == *fb;
}

}  // namespace support
