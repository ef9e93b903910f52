#include "status.h"

#include "json.h"
#include "status_record.h"

namespace rocosim {
namespace {

// The length of the well-formed UTF-8 sequence at `at`, 0 when there is none.
std::size_t sequenceAt(const std::string& text, std::size_t at) {
    const auto byte = [&](std::size_t i) { return static_cast<unsigned char>(text[i]); };
    const unsigned char lead = byte(at);
    if (lead < 0x80) return 1;
    std::size_t length = lead >= 0xF0 ? 4 : lead >= 0xE0 ? 3 : lead >= 0xC2 ? 2 : 0;
    if (lead > 0xF4 || length == 0 || at + length > text.size()) return 0;
    // The second byte's range excludes overlong forms, surrogates and code points above U+10FFFF.
    const unsigned char low = lead == 0xE0 ? 0xA0 : lead == 0xF0 ? 0x90 : 0x80;
    const unsigned char high = lead == 0xED ? 0x9F : lead == 0xF4 ? 0x8F : 0xBF;
    if (byte(at + 1) < low || byte(at + 1) > high) return 0;
    for (std::size_t i = 2; i < length; ++i)
        if ((byte(at + i) & 0xC0) != 0x80) return 0;
    return length;
}

}  // namespace

std::optional<std::string> textOf(const char* text) { return text ? std::optional<std::string>(text) : std::nullopt; }

void fail(std::int32_t code, std::string msg, Args args) { throw Failure{code, std::move(msg), std::move(args)}; }

void failUnknownHandle(const char* kind, std::uint32_t handle) {
    fail(code::kInvalidArgument, std::string("no such ") + kind + " handle", {{kind, std::to_string(handle)}});
}

std::string utf8(const std::string& text) {
    std::string out;
    out.reserve(text.size());
    for (std::size_t at = 0; at < text.size();) {
        const std::size_t length = sequenceAt(text, at);
        out.append(length ? text.substr(at, length) : "\xEF\xBF\xBD");
        at += length ? length : 1;
    }
    return out;
}

std::string details(const char* function, const Failure& failure) {
    Json object(cJSON_CreateObject());
    addNumber(object.get(), "code", failure.code);
    addText(object.get(), "component", "zrrocoapi");
    addText(object.get(), "func", function);
    addText(object.get(), "msg", failure.msg);
    for (const auto& [key, value] : failure.args) addTextOrNull(object.get(), key.c_str(), value);
    return print(object.get());
}

void report(zrrocoapi_Status* st, std::int32_t code, const std::string& json) { simcommon::writeStatus(st, code, json); }

}  // namespace rocosim
