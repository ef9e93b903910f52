// The detail text of a status: a JSON object written in place, one member after another.
#include "errors/zrerr.h"

#include <cinttypes>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>

namespace zrerr {
namespace {

constexpr std::uint32_t kMinimumCapacity = 512;
constexpr std::uint32_t kMaximumCapacity = 0x7FFFFFFF;
constexpr char kComponent[] = "tiktal_impl";

// Appends `text` as a JSON string, quotation marks included.
void appendQuoted(std::string& out, const char* text) {
    static const char kHex[] = "0123456789abcdef";
    out += '"';
    for (const char* p = text ? text : ""; *p; ++p) {
        const unsigned char c = static_cast<unsigned char>(*p);
        switch (c) {
        case '"': out += "\\\""; break;
        case '\\': out += "\\\\"; break;
        case '\b': out += "\\b"; break;
        case '\t': out += "\\t"; break;
        case '\n': out += "\\n"; break;
        case '\f': out += "\\f"; break;
        case '\r': out += "\\r"; break;
        default:
            if (c < 32 || c == 127) {
                out += "\\u00";
                out += kHex[c >> 4];
                out += kHex[c & 15];
            } else {
                out += static_cast<char>(c);
            }
        }
    }
    out += '"';
}

}  // namespace

// Inserts members before the closing brace of the top-level or the nested object.
struct DetailWriter {
    static void add(ExceptionBase& e, bool nested, const char* key, const std::string& value) noexcept {
        if (!e._accepting || e._failed || !e._text) return;
        if (nested != e._debugOpen && !(nested && openDebug(e))) return;
        try {
            std::string member;
            appendQuoted(member, key);
            member += ':';
            member += value;
            insert(e, member);
        } catch (...) {
            e._failed = true;
        }
    }

private:
    static bool openDebug(ExceptionBase& e) {
        try {
            std::string member;
            appendQuoted(member, e._debugTag);
            member += ":{}";
            if (!insert(e, member)) return false;
        } catch (...) {
            e._failed = true;
            return false;
        }
        e._debugOpen = true;
        return true;
    }

    static bool insert(ExceptionBase& e, const std::string& member) {
        const std::size_t length = std::strlen(e._text);
        const std::size_t closing = e._debugOpen ? 2 : 1;  // braces after the insertion point
        const std::size_t at = length - closing;
        const bool first = e._text[at - 1] == '{';
        const std::size_t added = member.size() + (first ? 0 : 1);
        const std::size_t need = length + added + 1;
        if (need > kMaximumCapacity || (need > e._capacity && !e._grow(e, static_cast<std::uint32_t>(need)))) {
            e._failed = true;
            return false;
        }
        char* p = e._text + at;
        std::memmove(p + added, p, closing + 1);
        if (!first) *p++ = ',';
        std::memcpy(p, member.data(), member.size());
        return true;
    }
};

ExceptionBase::ExceptionBase(GrowRoutine grow) noexcept : _grow(grow) {}

ExceptionBase::ExceptionBase(const ExceptionBase& other) noexcept : _grow(other._grow) { copyFrom(other); }

ExceptionBase& ExceptionBase::operator=(const ExceptionBase& other) noexcept {
    if (this != &other) {
        _grow = other._grow;
        copyFrom(other);
    }
    return *this;
}

ExceptionBase::~ExceptionBase() {
    if (_text) _grow(*this, 0);
}

const char* ExceptionBase::what() const noexcept { return _text ? _text : ""; }

void ExceptionBase::copyFrom(const ExceptionBase& other) noexcept {
    if (_text) _grow(*this, 0);
    _code = other._code;
    _accepting = other._accepting;
    _debugOpen = other._debugOpen;
    _debugTag = other._debugTag;
    _failed = other._failed;
    if (other._text) {
        const std::size_t size = std::strlen(other._text) + 1;
        if (_grow(*this, static_cast<std::uint32_t>(size)))
            std::memcpy(_text, other._text, size);
        else
            _failed = true;
    }
}

bool ExceptionBase::defaultGrow(ExceptionBase& self, std::uint32_t size) noexcept {
    if (size == 0) {
        std::free(self._text);
        self._text = nullptr;
        self._capacity = 0;
        return true;
    }
    if (size > kMaximumCapacity) return false;
    std::uint32_t capacity = kMinimumCapacity;
    while (capacity < size) capacity <<= 1;
    char* text = static_cast<char*>(std::malloc(capacity));
    if (!text) return false;
    std::strcpy(text, self._text ? self._text : "{}");
    std::free(self._text);
    self._text = text;
    self._capacity = capacity;
    return true;
}

bool ExceptionBase::setCode(std::int32_t code) noexcept {
    const bool take = (_code == 0 && code != 0) || (_code > 0 && code < 0);
    _accepting = take;
    if (!take) return false;
    _code = code;
    _failed = false;
    _debugOpen = false;
    if (_text) {
        std::strcpy(_text, "{}");
    } else if (!_grow(*this, 3)) {
        _failed = true;
    }
    return true;
}

void ExceptionBase::merge(const ExceptionBase& other) noexcept {
    if (setCode(other._code)) copyFrom(other);
}

void ExceptionBase::addText(const char* key, const char* value, bool nested) noexcept {
    try {
        std::string quoted;
        appendQuoted(quoted, value);
        DetailWriter::add(*this, nested, key, quoted);
    } catch (...) {
        _failed = true;
    }
}

void ExceptionBase::addInteger(const char* key, std::int64_t value, bool nested) noexcept {
    char text[24];
    std::snprintf(text, sizeof text, "%" PRId64, value);
    DetailWriter::add(*this, nested, key, text);
}

void ExceptionBase::addUnsigned(const char* key, std::uint64_t value, bool nested) noexcept {
    char text[24];
    std::snprintf(text, sizeof text, "%" PRIu64, value);
    DetailWriter::add(*this, nested, key, text);
}

void ExceptionBase::addDetail(const char* key, const ExceptionBase& other, bool nested) noexcept {
    addJson(key, other._text, nested);
}

void ExceptionBase::addJson(const char* key, const char* jsonText, bool nested) noexcept {
    if (!jsonText) return;
    try {
        DetailWriter::add(*this, nested, key, jsonText);
    } catch (...) {
        _failed = true;
    }
}

bool ExceptionBase::adoptDetailText(const char* jsonObject) noexcept {
    const std::size_t size = std::strlen(jsonObject) + 1;
    if (!_accepting || !_text || size > kMaximumCapacity || (size > _capacity && !_grow(*this, static_cast<std::uint32_t>(size))))
        return false;
    std::memcpy(_text, jsonObject, size);
    _debugOpen = false;
    return true;
}

Exception raise(std::int32_t code, const char* constant, const char* file, int line, const char* debugTag) noexcept {
    Exception e;
    e.setDebugTag(debugTag);
    e.setCode(code);
    e.addText("error_constant", constant);
    e.addText("file", file);
    e.addInteger("line", line);
    e.addText("component", kComponent);
    return e;
}

}  // namespace zrerr
