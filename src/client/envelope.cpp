#include "client/envelope.h"

#include <charconv>
#include <cmath>
#include <string>

namespace zr::vantle::shared::envelope {
namespace {

bool isSpace(char c) { return c == ' ' || c == '\t' || c == '\r' || c == '\n'; }
bool isDigit(char c) { return c >= '0' && c <= '9'; }
bool isHex(char c) { return isDigit(c) || (c >= 'a' && c <= 'f') || (c >= 'A' && c <= 'F'); }

// A recursive-descent walk over one value; remembers where the value ended.
class Scanner {
public:
    explicit Scanner(std::string_view text, std::size_t at = 0, Envelope* envelope = nullptr)
        : _text(text), _at(at), _envelope(envelope) {}

    void skipSpace() {
        while (_at < _text.size() && isSpace(_text[_at])) ++_at;
    }
    bool atEnd() const { return _at >= _text.size(); }
    char peek() const { return atEnd() ? '\0' : _text[_at]; }
    std::size_t position() const { return _at; }

    ScanError value() {
        skipSpace();
        switch (peek()) {
        case '{': return object();
        case '[': return array();
        case '"': return string(nullptr);
        case 't': return literal("true");
        case 'f': return literal("false");
        case 'n': return literal("null");
        default: return number();
        }
    }

    // A string; when `decoded` is given, its decoded characters (as UTF-8) are stored there.
    ScanError string(std::string* decoded) {
        if (peek() != '"') return kMalformedString;
        for (++_at; !atEnd(); ++_at) {
            const unsigned char c = static_cast<unsigned char>(_text[_at]);
            if (c == '"') {
                ++_at;
                return kOk;
            }
            if (c < 0x20) return kMalformedString;
            if (c != '\\') {
                if (decoded) decoded->push_back(static_cast<char>(c));
                continue;
            }
            if (++_at >= _text.size()) return kMalformedString;
            const ScanError escaped = escape(decoded);
            if (escaped != kOk) return escaped;
        }
        return kMalformedString;
    }

    ScanError object() {
        const Nesting nesting(_depth);
        if (_depth > kMaxDepth) return kTooDeep;
        ++_at;  // "{"
        skipSpace();
        if (peek() == '}') {
            ++_at;
            return kOk;
        }
        const bool envelope = _envelope && _depth == 1;  // the members of the top-level object
        std::string name;
        for (;;) {
            skipSpace();
            name.clear();
            if (ScanError e = string(envelope ? &name : nullptr); e != kOk) return e;
            skipSpace();
            if (peek() != ':') return atEnd() ? kObjectNotClosed : kMissingColon;
            ++_at;
            skipSpace();
            const std::size_t start = _at;
            if (ScanError e = value(); e != kOk) return e;
            if (envelope) note(name, _text.substr(start, _at - start));
            if (ScanError e = separator('}', kObjectNotClosed); e != kOk) return e == kClosed ? kOk : e;
        }
    }

    ScanError array() {
        const Nesting nesting(_depth);
        if (_depth > kMaxDepth) return kTooDeep;
        ++_at;  // "["
        skipSpace();
        if (peek() == ']') {
            ++_at;
            return kOk;
        }
        for (;;) {
            if (ScanError e = value(); e != kOk) return e;
            if (ScanError e = separator(']', kArrayNotClosed); e != kOk) return e == kClosed ? kOk : e;
        }
    }

private:
    static constexpr ScanError kClosed = static_cast<ScanError>(-1);

    // Counts one level of nesting while an object or array is walked.
    struct Nesting {
        explicit Nesting(int& depth) : _depth(++depth) {}
        ~Nesting() { --_depth; }
        int& _depth;
    };

    // Keeps the value of the first member of each name the envelope has.
    void note(const std::string& name, std::string_view value) {
        if (name == "error" && !_envelope->error) _envelope->error = value;
        if (name == "result" && !_envelope->result) _envelope->result = value;
    }

    // After an element: "," and another element, or the closing bracket.
    ScanError separator(char closing, ScanError notClosed) {
        skipSpace();
        if (atEnd()) return notClosed;
        if (peek() == closing) {
            ++_at;
            return kClosed;
        }
        if (peek() != ',') return kUnexpectedCharacter;
        ++_at;
        skipSpace();
        if (peek() == '}' || peek() == ']') return kTrailingComma;
        return atEnd() ? notClosed : kOk;
    }

    ScanError escape(std::string* decoded) {
        static constexpr std::string_view kSimple = "\"\\/bfnrt";
        static constexpr std::string_view kMeaning = "\"\\/\b\f\n\r\t";
        const char c = _text[_at];
        if (const std::size_t i = kSimple.find(c); i != std::string_view::npos) {
            if (decoded) decoded->push_back(kMeaning[i]);
            return kOk;
        }
        if (c != 'u' || _at + 4 >= _text.size()) return kInvalidEscape;
        for (std::size_t k = 1; k <= 4; ++k)
            if (!isHex(_text[_at + k])) return kInvalidEscape;
        if (decoded) appendUtf8(*decoded, std::stoul(std::string(_text.substr(_at + 1, 4)), nullptr, 16));
        _at += 4;
        return kOk;
    }

    static void appendUtf8(std::string& out, unsigned long code) {
        if (code < 0x80) {
            out.push_back(static_cast<char>(code));
        } else if (code < 0x800) {
            out.push_back(static_cast<char>(0xC0 | (code >> 6)));
            out.push_back(static_cast<char>(0x80 | (code & 0x3F)));
        } else {
            out.push_back(static_cast<char>(0xE0 | (code >> 12)));
            out.push_back(static_cast<char>(0x80 | ((code >> 6) & 0x3F)));
            out.push_back(static_cast<char>(0x80 | (code & 0x3F)));
        }
    }

    ScanError literal(std::string_view word) {
        if (_text.substr(_at, word.size()) != word) return kInvalidValue;
        _at += word.size();
        return kOk;
    }

    ScanError number() {
        const std::size_t start = _at;
        if (peek() == '-') ++_at;
        if (peek() == '0') {
            ++_at;
        } else if (isDigit(peek())) {
            while (isDigit(peek())) ++_at;
        } else {
            _at = start;
            return kInvalidValue;
        }
        if (peek() == '.') {
            ++_at;
            if (!isDigit(peek())) return kInvalidValue;
            while (isDigit(peek())) ++_at;
        }
        if (peek() == 'e' || peek() == 'E') {
            ++_at;
            if (peek() == '+' || peek() == '-') ++_at;
            if (!isDigit(peek())) return kInvalidValue;
            while (isDigit(peek())) ++_at;
        }
        return kOk;
    }

    std::string_view _text;
    std::size_t _at;
    Envelope* _envelope;  // null, or where the members of the top-level object are noted
    int _depth = 0;
};

}  // namespace

ScanError check(std::string_view text, Envelope& envelope) {
    envelope = Envelope();
    Scanner scanner(text, 0, &envelope);
    if (ScanError e = scanner.value(); e != kOk) return e;
    scanner.skipSpace();
    return scanner.atEnd() ? kOk : kTrailingCharacters;
}

ScanError check(std::string_view text) {
    Envelope unused;
    return check(text, unused);
}

std::optional<std::size_t> findMember(std::string_view text, std::string_view name) {
    Scanner scanner(text);
    scanner.skipSpace();
    if (scanner.peek() != '{') return std::nullopt;
    Scanner members(text, scanner.position() + 1);
    members.skipSpace();
    if (members.peek() == '}') return std::nullopt;
    for (;;) {
        members.skipSpace();
        std::string memberName;
        if (members.string(&memberName) != kOk) return std::nullopt;
        members.skipSpace();
        if (members.peek() != ':') return std::nullopt;
        Scanner value(text, members.position() + 1);
        value.skipSpace();
        if (memberName == name) return value.position();
        if (value.value() != kOk) return std::nullopt;
        value.skipSpace();
        if (value.peek() != ',') return std::nullopt;
        members = Scanner(text, value.position() + 1);
    }
}

bool readBool(std::string_view text, std::size_t at) { return text.substr(at, 4) == "true"; }

std::optional<double> readWholeNumber(std::string_view text, std::size_t at) {
    Scanner scanner(text, at);
    if (scanner.value() != kOk) return std::nullopt;
    const std::string_view number = text.substr(at, scanner.position() - at);
    if (number.empty() || (number[0] != '-' && !isDigit(number[0]))) return std::nullopt;
    double value = 0;
    const auto [end, error] = std::from_chars(number.data(), number.data() + number.size(), value);
    if (error != std::errc() || end != number.data() + number.size()) return std::nullopt;
    if (!std::isfinite(value) || value != std::trunc(value)) return std::nullopt;
    return value;
}

std::string_view readString(std::string_view text, std::size_t at) {
    Scanner scanner(text, at);
    if (scanner.peek() != '"' || scanner.string(nullptr) != kOk) return {};
    return text.substr(at + 1, scanner.position() - at - 2);
}

std::optional<std::string_view> valueText(std::string_view text, std::size_t at) {
    Scanner scanner(text, at);
    if (scanner.value() != kOk) return std::nullopt;
    return text.substr(at, scanner.position() - at);
}

}  // namespace zr::vantle::shared::envelope
