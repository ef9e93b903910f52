#include "directive.h"

#include <cmath>
#include <functional>
#include <map>

namespace timeservice {
namespace {

// A repeated body is at most 2^53 bytes, so that the streamed byte count stays exact as a JSON number.
constexpr double kLargestStream = 9007199254740992.0;

bool wholeNumber(const cJSON* item, double min, double max, long long& out) {
    if (!cJSON_IsNumber(item) || item->valuedouble != std::floor(item->valuedouble) || item->valuedouble < min ||
        item->valuedouble > max)
        return false;
    out = static_cast<long long>(item->valuedouble);
    return true;
}

// Reads one member into the directive; empty when it fits, otherwise what is wrong with it.
using MemberReader = std::function<std::string(const cJSON* member, Directive& directive)>;

MemberReader number(long long Directive::*field, double min, double max, const std::string& fault) {
    return [=](const cJSON* member, Directive& directive) {
        return wholeNumber(member, min, max, directive.*field) ? std::string() : fault;
    };
}

MemberReader boolean(bool Directive::*field, const std::string& fault) {
    return [=](const cJSON* member, Directive& directive) {
        if (!cJSON_IsBool(member)) return fault;
        directive.*field = cJSON_IsTrue(member);
        return std::string();
    };
}

std::string readBody(const cJSON* member, Directive& directive) {
    if (!cJSON_IsString(member)) return "\"body\" must be a text";
    directive.replaceBody = true;
    directive.body = member->valuestring;
    return {};
}

std::string readError(const cJSON* member, Directive& directive) {
    if (!cJSON_IsObject(member)) return "\"error\" must be an object";
    directive.error = printJson(member, false);
    return {};
}

const std::map<std::string, MemberReader>& memberReaders() {
    static const std::map<std::string, MemberReader> readers = {
        {"count", number(&Directive::count, 1, 1e9, "\"count\" must be a whole number from 1")},
        {"status", number(&Directive::status, 200, 999, "\"status\" must be a final HTTP status, 200 to 999")},
        {"delayMs", number(&Directive::delayMs, 0, 3.6e6, "\"delayMs\" must be a whole number of ms")},
        {"body", readBody},
        {"error", readError},
        {"wrapResult", boolean(&Directive::wrapResult, "\"wrapResult\" must be a Boolean")},
        {"repeat", number(&Directive::repeat, 1, std::ldexp(1.0, 40), "\"repeat\" must be a whole number, 1 to 2^40")},
        {"chunked", boolean(&Directive::chunked, "\"chunked\" must be a Boolean")},
    };
    return readers;
}

// What is wrong with the members taken together; empty when nothing.
std::string checkTogether(const Directive& directive) {
    if (directive.repeat == 0) return {};
    if (!directive.replaceBody || directive.body.empty()) return "\"repeat\" needs a \"body\" that is not empty";
    if (static_cast<double>(directive.body.size()) * static_cast<double>(directive.repeat) > kLargestStream)
        return "the repeated body must stay within 2^53 bytes";
    return {};
}

}  // namespace

std::string parseDirective(const std::string& text, Directive& directive) {
    const Json json = parseJson(text);
    if (!cJSON_IsObject(json.get())) return "a directive is a JSON object";
    for (const cJSON* member = json->child; member; member = member->next) {
        const std::string name = member->string;
        const auto reader = memberReaders().find(name);
        if (reader == memberReaders().end()) return "unknown directive member \"" + name + "\"";
        const std::string fault = reader->second(member, directive);
        if (!fault.empty()) return fault;
    }
    return checkTogether(directive);
}

std::string render(Answer& normal, const Directive& directive) {
    if (directive.replaceBody) return directive.body;
    Json error = directive.error.empty() ? nullptr : parseJson(directive.error);
    if (directive.wrapResult) {
        std::string text = "{\"result\":" + printJson(normal.body.get());
        if (error) text += ",\"error\":" + printJson(error.get(), false);
        return text + "}";
    }
    if (error) {
        cJSON_DeleteItemFromObjectCaseSensitive(normal.body.get(), "error");
        cJSON_AddItemToObject(normal.body.get(), "error", error.release());
    }
    return printJson(normal.body.get());
}

}  // namespace timeservice
