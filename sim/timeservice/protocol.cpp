#include "protocol.h"

#include <cctype>
#include <chrono>
#include <cmath>
#include <cstdlib>
#include <regex>
#include <vector>

namespace timeservice {
namespace {

Answer dataAnswer(Json members) {
    Json body(cJSON_CreateObject());
    cJSON_AddItemToObject(body.get(), "data", members.release());
    return {200, std::move(body)};
}

Answer dataAnswer(const std::string& key, const cJSON* value) {
    Json members(cJSON_CreateObject());
    cJSON_AddItemToObject(members.get(), key.c_str(), cJSON_Duplicate(value, true));
    return dataAnswer(std::move(members));
}

// The error envelope; its error code is the negated HTTP status.
Answer failure(int status, const std::string& text, const std::string& info) {
    Json body(cJSON_CreateObject());
    cJSON* error = cJSON_AddObjectToObject(body.get(), "error");
    cJSON_AddFalseToObject(error, "success");
    cJSON_AddNumberToObject(error, "errorCode", -status);
    cJSON_AddStringToObject(error, "errorText", text.c_str());
    cJSON_AddStringToObject(error, "errorInfo", info.c_str());
    return {status, std::move(body)};
}

std::vector<std::string> split(const std::string& text, char separator) {
    std::vector<std::string> pieces;
    std::size_t start = 0;
    for (std::size_t end; (end = text.find(separator, start)) != std::string::npos; start = end + 1)
        pieces.push_back(text.substr(start, end - start));
    pieces.push_back(text.substr(start));
    return pieces;
}

// Decodes every "%XX"; any byte may arrive encoded. False for a "%" without two hex digits.
bool percentDecode(const std::string& text, std::string& out) {
    out.clear();
    for (std::size_t i = 0; i < text.size(); ++i) {
        if (text[i] != '%') {
            out += text[i];
            continue;
        }
        if (i + 2 >= text.size() || !std::isxdigit(static_cast<unsigned char>(text[i + 1])) ||
            !std::isxdigit(static_cast<unsigned char>(text[i + 2])))
            return false;
        out += static_cast<char>(std::stoi(text.substr(i + 1, 2), nullptr, 16));
        i += 2;
    }
    return true;
}

// A written value arrives as text; the stored member's JSON type decides how it is read: a number
// from decimal text, a Boolean from "1", "0", "true" or "false", a text (or a null member) as it is.
// Null when the text does not fit.
Json convertText(const cJSON* stored, const std::string& text) {
    if (cJSON_IsNumber(stored)) {
        static const std::regex decimal(R"([+-]?(\d+\.?\d*|\.\d+)([eE][+-]?\d+)?)");
        if (!std::regex_match(text, decimal)) return nullptr;
        const double value = std::strtod(text.c_str(), nullptr);
        return std::isfinite(value) ? Json(cJSON_CreateNumber(value)) : nullptr;
    }
    if (cJSON_IsBool(stored)) {
        if (text == "1" || text == "true") return Json(cJSON_CreateTrue());
        if (text == "0" || text == "false") return Json(cJSON_CreateFalse());
        return nullptr;
    }
    if (cJSON_IsString(stored) || cJSON_IsNull(stored)) return Json(cJSON_CreateString(text.c_str()));
    return nullptr;
}

const char* text(const cJSON* state, const char* name) { return cJSON_GetObjectItemCaseSensitive(state, name)->valuestring; }

cJSON* references(const cJSON* state) { return cJSON_GetObjectItemCaseSensitive(state, "timeReferences"); }

Answer deviceList(const cJSON* state) {
    const std::string entry = std::string(text(state, "deviceListPrefix")) + text(state, "device");
    Json body(cJSON_CreateObject());
    cJSON_AddItemToArray(cJSON_AddArrayToObject(body.get(), "devices"), cJSON_CreateString(entry.c_str()));
    return {200, std::move(body)};
}

// Every service attribute: the names of the time references, the epoch offset (the state's text,
// else the real clock in nanoseconds since the Unix epoch) and the members the state has.
Json serviceAttributes(const cJSON* state) {
    Json all(cJSON_CreateObject());
    cJSON* names = cJSON_AddArrayToObject(all.get(), "allTimeReferences");
    for (const cJSON* reference = references(state)->child; reference; reference = reference->next)
        cJSON_AddItemToArray(names, cJSON_CreateString(reference->string));
    if (const cJSON* epoch = cJSON_GetObjectItemCaseSensitive(state, "epochOffsetInNsec")) {
        cJSON_AddItemToObject(all.get(), "epochOffsetInNsec", cJSON_Duplicate(epoch, true));
    } else {
        const auto now = std::chrono::system_clock::now().time_since_epoch();
        const long long nanos = std::chrono::duration_cast<std::chrono::nanoseconds>(now).count();
        cJSON_AddStringToObject(all.get(), "epochOffsetInNsec", std::to_string(nanos).c_str());
    }
    for (const char* name : {"apiVersion", "selectedTrId", "selectedTrOffsetNanos"}) {
        const cJSON* value = cJSON_GetObjectItemCaseSensitive(state, name);
        if (value) cJSON_AddItemToObject(all.get(), name, cJSON_Duplicate(value, true));
    }
    return all;
}

// GET D answers every service attribute, GET D?attribute=A the one named (the last such parameter).
Answer serviceAttributes(const cJSON* state, const std::string& query) {
    bool one = false;
    std::string attribute;
    for (const std::string& parameter : split(query, '&')) {
        const std::size_t equals = parameter.find('=');
        std::string key;
        if (equals == std::string::npos || !percentDecode(parameter.substr(0, equals), key) || key != "attribute")
            continue;
        if (!percentDecode(parameter.substr(equals + 1), attribute))
            return failure(400, "Malformed percent-encoding", parameter);
        one = true;
    }
    Json all = serviceAttributes(state);
    if (!one) return dataAnswer(std::move(all));
    const cJSON* value = cJSON_GetObjectItemCaseSensitive(all.get(), attribute.c_str());
    if (!value) return failure(404, "Unknown service attribute", attribute);
    return dataAnswer(attribute, value);
}

Answer timeReference(const cJSON* state, const std::string& name) {
    const cJSON* reference = cJSON_GetObjectItemCaseSensitive(references(state), name.c_str());
    if (!reference) return failure(404, "Unknown time reference", name);
    return dataAnswer(Json(cJSON_Duplicate(reference, true)));
}

Answer member(const cJSON* state, const std::string& name, const std::string& key) {
    const cJSON* reference = cJSON_GetObjectItemCaseSensitive(references(state), name.c_str());
    if (!reference) return failure(404, "Unknown time reference", name);
    const cJSON* value = cJSON_GetObjectItemCaseSensitive(reference, key.c_str());
    if (!value) return failure(404, "Unknown attribute", name + "/" + key);
    return dataAnswer(key, value);
}

bool readOnly(const cJSON* state, const std::string& key) {
    const cJSON* keys = cJSON_GetObjectItemCaseSensitive(state, "readOnlyKeys");
    for (const cJSON* entry = keys ? keys->child : nullptr; entry; entry = entry->next)
        if (key == entry->valuestring) return true;
    return false;
}

// A PUT body has the shape {"version":1,"data":{...}}.
bool wellFormed(const cJSON* request) {
    const cJSON* version = cJSON_GetObjectItemCaseSensitive(request, "version");
    return cJSON_IsObject(request) && cJSON_IsNumber(version) && version->valuedouble == 1 &&
           cJSON_IsObject(cJSON_GetObjectItemCaseSensitive(request, "data"));
}

// PUT D/T/A: stores the text converted to the stored member's JSON type.
Answer write(cJSON* state, const std::string& name, const std::string& key, const std::string& body) {
    cJSON* reference = cJSON_GetObjectItemCaseSensitive(references(state), name.c_str());
    if (!reference) return failure(404, "Unknown time reference", name);
    const cJSON* stored = cJSON_GetObjectItemCaseSensitive(reference, key.c_str());
    if (!stored) return failure(404, "Unknown attribute", name + "/" + key);
    const Json request = parseJson(body);
    if (!wellFormed(request.get())) return failure(400, "Malformed request body", body);
    const cJSON* value = cJSON_GetObjectItemCaseSensitive(cJSON_GetObjectItemCaseSensitive(request.get(), "data"), key.c_str());
    if (!cJSON_IsString(value)) return failure(400, "The body holds no text for the attribute", body);
    if (readOnly(state, key)) return failure(400, "Read-only attribute", key);
    Json converted = convertText(stored, value->valuestring);
    if (!converted) return failure(400, "Value does not fit the attribute", key + " = " + value->valuestring);
    cJSON_ReplaceItemInObjectCaseSensitive(reference, key.c_str(), converted.release());
    return dataAnswer(key, cJSON_GetObjectItemCaseSensitive(reference, key.c_str()));
}

Answer persist(const cJSON* state, const std::string& statePath) {
    try {
        saveState(statePath, state);
    } catch (const std::exception& e) {
        return failure(500, "Could not write the state file", e.what());
    }
    return dataAnswer(Json(cJSON_CreateObject()));
}

// The decoded path segments after "/tiktalwebs/"; false with a failure when one is malformed.
bool pathNames(const std::string& path, std::vector<std::string>& names, Answer& fault) {
    for (const std::string& raw : split(path.substr(kServicePrefix.size() + 1), '/')) {
        names.emplace_back();
        if (!percentDecode(raw, names.back())) {
            fault = failure(400, "Malformed percent-encoding", raw);
            return false;
        }
    }
    return true;
}

}  // namespace

Answer answer(cJSON* state, const std::string& statePath, const ServiceRequest& request) {
    const std::string& path = request.path;
    if (path.compare(0, kServicePrefix.size() + 1, kServicePrefix + "/") != 0 || path.size() == kServicePrefix.size() + 1)
        return failure(404, "Unknown resource", path);
    std::vector<std::string> names;
    Answer fault;
    if (!pathNames(path, names, fault)) return fault;
    const bool get = request.method == "GET", put = request.method == "PUT";
    if (names.size() == 1 && names[0] == "devices" && get) return deviceList(state);
    if (names[0] != text(state, "device")) return failure(404, "Unknown device", names[0]);
    if (names.size() > 3) return failure(404, "Unknown resource", path);
    if (names.size() == 1 && get) return serviceAttributes(state, request.query);
    if (names.size() == 2 && put && names[1] == "persist") return persist(state, statePath);
    if (names.size() == 2 && get) return timeReference(state, names[1]);
    if (names.size() == 3 && get) return member(state, names[1], names[2]);
    if (names.size() == 3 && put) return write(state, names[1], names[2], request.body);
    return failure(405, "Method not allowed", request.method + " " + path);
}

}  // namespace timeservice
