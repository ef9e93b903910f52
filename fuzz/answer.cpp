// The checks of a time-service answer: the HTTP status code (classify), the JSON envelope
// (unwrap) and the scanner under it, on arbitrary bytes taken as an answer body.
//
// - unwrap returns or fails with an error status, also after the export boundary's mapping: an
//   answer whose "error" member does not say "success": true never reads as success or as a
//   warning. What it returns is one whole JSON value: the "result" member as written, or the body.
// - When the whole text passes the check, the value of every member found is a piece of the
//   text that passes the check too, and the readers agree with that piece; the check itself
//   notes the envelope's members where the lookup finds them.
// - Wrapping a checked text in one more array or object never breaks it, except by depth.
// - A body that starts with a number is also taken as an HTTP status code: classify lets every
//   2xx code pass but 202, which is its only warning; every other failure is an error.
//
// cJSON, a parser of its own, tells independently what the body says.
#include <cjson/cJSON.h>

#include <charconv>
#include <cstdlib>
#include <memory>
#include <string>

#include "client/answer.h"
#include "client/envelope.h"
#include "errors/zrerr.h"
#include "property.h"

namespace {

namespace shared = zr::vantle::shared;
namespace envelope = zr::vantle::shared::envelope;
using tiktalfuzz::require;

using Tree = std::unique_ptr<cJSON, decltype(&cJSON_Delete)>;

// The tree of a whole text, or null; text after a first value fails.
Tree parseWhole(std::string_view text) {
    const std::string terminated(text);  // cJSON needs the terminating NUL to see the end
    return Tree(cJSON_ParseWithLengthOpts(terminated.c_str(), terminated.size() + 1, nullptr, true), cJSON_Delete);
}

void checkStatusCode(std::string_view body) {
    long code = 0;
    const auto [end, error] = std::from_chars(body.data(), body.data() + body.size(), code);
    if (error != std::errc()) return;
    try {
        shared::classify(code);
        require(code != 202, "202 does not pass");
    } catch (const zrerr::ExceptionBase& e) {
        require(code < 200 || code >= 300 || code == 202, "every 2xx code but 202 passes");
        require(code == 202 ? e.code() > 0 : e.code() < 0, "only 202 is a warning; every other failure is an error");
    }
}

// What cJSON reads in the body: whether it is an error envelope (an "error" member without
// "success": true), and the "result" member. Bodies holding "\u0000" are left out: cJSON's names
// end at the first NUL, so it would see another name than the one written.
struct Reading {
    bool parsed = false;
    bool error = false;
    const cJSON* result = nullptr;
};

const cJSON* member(const cJSON* object, const char* name) {
    return cJSON_IsObject(object) ? cJSON_GetObjectItemCaseSensitive(object, name) : nullptr;
}

Reading read(const Tree& tree, std::string_view body) {
    Reading reading;
    if (!tree || body.find("\\u0000") != std::string_view::npos) return reading;
    reading.parsed = true;
    const cJSON* error = member(tree.get(), "error");
    reading.error = error && !cJSON_IsTrue(member(error, "success"));
    reading.result = member(tree.get(), "result");
    return reading;
}

// The unformatted print of a tree: the same for trees of the same members in the same order.
std::string printed(const cJSON* item) {
    const std::unique_ptr<char, decltype(&cJSON_free)> text(cJSON_PrintUnformatted(item), cJSON_free);
    return text ? text.get() : "";
}

void checkUnwrap(std::string_view body) {
    const Tree tree = parseWhole(body);
    const Reading reading = read(tree, body);
    try {
        const std::string text = shared::unwrap(std::string(body));
        require(!reading.error, "an error envelope never reads as success");
        require(envelope::check(text) == envelope::kOk, "unwrap returns one whole JSON value");
        if (reading.parsed && reading.result) {
            const Tree returned = parseWhole(text);
            require(returned && printed(returned.get()) == printed(reading.result), "unwrap returns the \"result\" member");
        }
    } catch (const zrerr::ExceptionBase& e) {
        require(e.code() < 0, "unwrap fails with an error, never a warning");
        require(zrerr::normalize(e.code()) < 0, "the export boundary keeps the failure an error");
    }
}

void checkMember(std::string_view text, std::string_view name) {
    const auto at = envelope::findMember(text, name);
    if (!at) return;
    require(*at <= text.size(), "a member's value lies within the text");
    const auto value = envelope::valueText(text, *at);
    require(value.has_value(), "the value of a member of a checked text is well formed");
    require(value->data() == text.data() + *at && *at + value->size() <= text.size(),
            "the value is a piece of the text at the member's position");
    require(envelope::check(*value) == envelope::kOk, "the value of a member passes the check by itself");
    if (envelope::readBool(text, *at)) require(*value == "true", "readBool is true for true only");
    if (const auto number = envelope::readWholeNumber(text, *at))
        require(std::strtod(std::string(*value).c_str(), nullptr) == *number, "readWholeNumber reads the value");
    const std::string_view string = envelope::readString(text, *at);
    if (!string.empty()) require(*value == "\"" + std::string(string) + "\"", "readString gives what stands between the quotes");
}

// The walk of the whole check notes the envelope's members where the lookup finds them.
void checkEnvelope(std::string_view text) {
    envelope::Envelope members;
    require(envelope::check(text, members) == envelope::kOk, "the check that notes members passes the same texts");
    for (const auto& [name, noted] : {std::pair{"error", members.error}, std::pair{"result", members.result}}) {
        const auto at = envelope::findMember(text, name);
        require(at.has_value() == noted.has_value(), "the check notes a member exactly when the lookup finds it");
        if (at) require(noted->data() == text.data() + *at && noted == envelope::valueText(text, *at), "the noted value is the member's");
    }
}

// Names to look up: those of the envelope, and the first quoted text of the input.
void checkMembers(std::string_view text) {
    for (const char* name : {"error", "result", "success", "errorCode", "errorText", "errorInfo"}) checkMember(text, name);
    const std::size_t open = text.find('"');
    if (open == std::string_view::npos) return;
    const std::size_t close = text.find('"', open + 1);
    if (close != std::string_view::npos) checkMember(text, text.substr(open + 1, close - open - 1));
}

// `text` passes the check.
void checkNesting(std::string_view text) {
    for (const std::string& wrapped : {"[" + std::string(text) + "]", "{\"k\":" + std::string(text) + "}"}) {
        const envelope::ScanError e = envelope::check(wrapped);
        require(e == envelope::kOk || e == envelope::kTooDeep, "a checked value stays valid inside an array or object");
    }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const std::string_view body = tiktalfuzz::bytes(data, size);
    checkStatusCode(body);
    checkUnwrap(body);
    if (envelope::check(body) == envelope::kOk) {
        checkNesting(body);
        checkEnvelope(body);
        checkMembers(body);
    } else {
        // Members of a text that fails the check: found or not, nothing may crash.
        for (const char* name : {"error", "result"})
            if (const auto at = envelope::findMember(body, name)) {
                envelope::valueText(body, *at);
                envelope::readWholeNumber(body, *at);
                envelope::readString(body, *at);
                envelope::readBool(body, *at);
            }
    }
    return 0;
}
