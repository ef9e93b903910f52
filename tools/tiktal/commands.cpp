#include "commands.h"

#include <algorithm>
#include <cerrno>
#include <cstdint>
#include <cstdlib>
#include <iostream>
#include <optional>
#include <vector>

#include "attributes.h"
#include "enumerations.h"
#include "errors.h"
#include "output.h"
#include "session.h"

namespace cli {
namespace {

// --- Attribute access through the accessor of the attribute's type ---------------------------

// A text output: the size query, then a buffer of that size.
template <class Call>
std::string fetchText(const char* function, Call call) {
    const ViInt32 size = checkSize(function, call(0, nullptr));
    std::string text(static_cast<std::size_t>(size), '\0');
    if (size > 0) check(function, call(size, text.data()));
    text.resize(std::min(text.find('\0'), text.size()));
    return text;
}

std::string readString(ViSession vi, const char* item, ViAttr id) {
    return fetchText("tiktal_GetAttributeViString", [&](ViInt32 size, ViChar* buffer) {
        return tiktal_GetAttributeViString(vi, item, id, size, buffer);
    });
}

Value read(ViSession vi, const char* item, ViAttr id, AttributeType type) {
    switch (type) {
    case AttributeType::String: return readString(vi, item, id);
    case AttributeType::Int32: {
        ViInt32 value = 0;
        check("tiktal_GetAttributeViInt32", tiktal_GetAttributeViInt32(vi, item, id, &value));
        return value;
    }
    case AttributeType::Real64: {
        ViReal64 value = 0;
        check("tiktal_GetAttributeViReal64", tiktal_GetAttributeViReal64(vi, item, id, &value));
        return value;
    }
    case AttributeType::Boolean: {
        ViBoolean value = VI_FALSE;
        check("tiktal_GetAttributeViBoolean", tiktal_GetAttributeViBoolean(vi, item, id, &value));
        return value != VI_FALSE;
    }
    }
    return {};
}

void write(ViSession vi, const char* item, ViAttr id, const Value& value) {
    if (const auto* text = std::get_if<std::string>(&value))
        check("tiktal_SetAttributeViString", tiktal_SetAttributeViString(vi, item, id, text->c_str()));
    else if (const auto* number = std::get_if<ViInt32>(&value))
        check("tiktal_SetAttributeViInt32", tiktal_SetAttributeViInt32(vi, item, id, *number));
    else if (const auto* real = std::get_if<ViReal64>(&value))
        check("tiktal_SetAttributeViReal64", tiktal_SetAttributeViReal64(vi, item, id, *real));
    else
        check("tiktal_SetAttributeViBoolean",
              tiktal_SetAttributeViBoolean(vi, item, id, std::get<bool>(value) ? VI_TRUE : VI_FALSE));
}

// The attribute line of get and set: "NAME[ITEM] = VALUE", or the same facts as a JSON object.
void printAttribute(const Options& options, const Attribute& attribute, const Value& value) {
    if (!options.json) {
        const std::string item = options.hasItem ? "[" + options.item + "]" : "";
        std::cout << attribute.name << item << " = " << formatValue(value) << '\n';
        return;
    }
    Json json(cJSON_CreateObject());
    cJSON_AddStringToObject(json.get(), "attribute", attribute.name.c_str());
    cJSON_AddNumberToObject(json.get(), "id", attribute.id);
    cJSON_AddItemToObject(json.get(), "item", jsonText(options.hasItem ? &options.item : nullptr));
    cJSON_AddStringToObject(json.get(), "type", typeName(attribute.type));
    cJSON_AddItemToObject(json.get(), "value", jsonValue(value));
    printJson(json.get());
}

Attribute resolveForItem(const Options& options) {
    Attribute attribute = resolveAttribute(options.attribute, options.type);
    if (attribute.needsItem && !options.hasItem)
        throw UsageError(attribute.name + " belongs to a time reference: name it with --item NAME");
    return attribute;
}

// --- Time references -------------------------------------------------------------------------

std::vector<std::string> referenceNames(ViSession vi) {
    const std::string text = fetchText("tiktal_GetTimeReferenceNames", [&](ViInt32 size, ViChar* buffer) {
        return tiktal_GetTimeReferenceNames(vi, size, buffer);
    });
    std::vector<std::string> names;
    for (std::size_t start = 0; !text.empty();) {
        const std::size_t comma = text.find(',', start);
        names.push_back(text.substr(start, comma - start));
        if (comma == std::string::npos) break;
        start = comma + 1;
    }
    return names;
}

// The attributes of one family of time-reference types.
struct Family {
    ViAttr portState, clockId, gmClockId;
    std::string (*stateName)(ViInt32);
};

// The name of a port state's member in its enumeration (enumerations.h), or UNKNOWN.
template <std::size_t N>
std::string memberName(const tiktal::EnumerationMember (&members)[N], ViInt32 value) {
    for (const tiktal::EnumerationMember& member : members)
        if (member.value == value) return member.name;
    return "UNKNOWN";
}

std::string ieee1588StateName(ViInt32 state) { return memberName(tiktal::kPtpPortState, state); }

// The service reports 802.1AS port states as master, slave, or 3 for any other state.
std::string ieee8021asStateName(ViInt32 state) { return memberName(tiktal::kGptpPortState, state); }

const Family k1588{TIKTAL_ATTR_1588_PORT_STATE, TIKTAL_ATTR_1588_CLOCK_ID, TIKTAL_ATTR_1588_GM_CLOCK_ID,
                   ieee1588StateName};
const Family k8021AS{TIKTAL_ATTR_8021AS_PORT_STATE, TIKTAL_ATTR_8021AS_CLOCK_ID, TIKTAL_ATTR_8021AS_GM_CLOCK_ID,
                     ieee8021asStateName};

const Family* familyOf(const std::string& type) {
    if (type.rfind("IEEE 1588", 0) == 0) return &k1588;
    if (type.rfind("IEEE 802.1AS", 0) == 0) return &k8021AS;
    return nullptr;
}

// An attribute that some types of the family lack: absent when the session says so.
template <class Fetch>
auto unlessTypeLacks(Fetch fetch) -> std::optional<decltype(fetch())> {
    try {
        return fetch();
    } catch (const StatusError& error) {
        if (error.status != tiktalerr_trTypeMismatch) throw;
        return std::nullopt;
    }
}

struct Reference {
    std::string name, type;
    bool enabled = false, selected = false;
    std::optional<ViInt32> portState;
    std::string portStateName;
    std::optional<std::string> clockId, gmClockId;
};

Reference readReference(ViSession vi, const std::string& name) {
    const char* item = name.c_str();
    const auto flag = [&](ViAttr id) { return std::get<bool>(read(vi, item, id, AttributeType::Boolean)); };
    Reference reference;
    reference.name = name;
    reference.type = readString(vi, item, TIKTAL_ATTR_TIME_REFERENCE_TYPE);
    reference.enabled = flag(TIKTAL_ATTR_TIME_REFERENCE_ENABLED);
    reference.selected = flag(TIKTAL_ATTR_TIME_REFERENCE_SELECTED);
    if (const Family* family = familyOf(reference.type)) {
        reference.portState = unlessTypeLacks([&] {
            return std::get<ViInt32>(read(vi, item, family->portState, AttributeType::Int32));
        });
        if (reference.portState) reference.portStateName = family->stateName(*reference.portState);
        reference.clockId = unlessTypeLacks([&] { return readString(vi, item, family->clockId); });
        reference.gmClockId = unlessTypeLacks([&] { return readString(vi, item, family->gmClockId); });
    }
    return reference;
}

void printReferences(const std::vector<Reference>& references, bool json) {
    if (json) {
        Json array(cJSON_CreateArray());
        for (const Reference& r : references) {
            cJSON* object = cJSON_CreateObject();
            cJSON_AddItemToArray(array.get(), object);
            cJSON_AddStringToObject(object, "name", r.name.c_str());
            cJSON_AddStringToObject(object, "type", r.type.c_str());
            cJSON_AddBoolToObject(object, "enabled", r.enabled);
            cJSON_AddBoolToObject(object, "selected", r.selected);
            cJSON_AddItemToObject(object, "portState", r.portState ? cJSON_CreateNumber(*r.portState) : cJSON_CreateNull());
            cJSON_AddItemToObject(object, "portStateName", jsonText(r.portState ? &r.portStateName : nullptr));
            cJSON_AddItemToObject(object, "clockId", jsonText(r.clockId ? &*r.clockId : nullptr));
            cJSON_AddItemToObject(object, "gmClockId", jsonText(r.gmClockId ? &*r.gmClockId : nullptr));
        }
        printJson(array.get());
        return;
    }
    std::vector<Row> rows{{"NAME", "TYPE", "ENABLED", "SELECTED", "PORT STATE", "CLOCK ID", "GM CLOCK ID"}};
    for (const Reference& r : references)
        rows.push_back({r.name, r.type, r.enabled ? "yes" : "no", r.selected ? "yes" : "no",
                        r.portState ? std::to_string(*r.portState) + " " + r.portStateName : "-",
                        r.clockId.value_or("-"), r.gmClockId.value_or("-")});
    printTable(rows);
}

// A status given as 0x-hexadecimal, signed decimal or unsigned decimal.
ViStatus parseStatus(const std::string& text) {
    const bool hex = text.size() > 2 && text[0] == '0' && (text[1] == 'x' || text[1] == 'X');
    const bool digits = !text.empty() && text.find_first_not_of(hex ? "0123456789abcdefABCDEF" : "0123456789",
                                                                  hex ? 2 : text[0] == '-' ? 1 : 0) == std::string::npos;
    char* end = nullptr;
    errno = 0;
    const long long value = digits ? std::strtoll(text.c_str(), &end, hex ? 16 : 10) : 0;
    if (!digits || text == "-" || errno != 0 || value < INT32_MIN || value > UINT32_MAX)
        throw UsageError("bad status code \"" + text + "\": expected 0x and up to 8 hex digits, or a decimal number");
    return static_cast<ViStatus>(static_cast<ViUInt32>(value));
}

}  // namespace

void openCommand(const Options& options) {
    Session session(options.resource, options.reset);
    ViInt16 result = 0;
    ViChar message[256] = "";  // the size the self test writes into
    check("tiktal_self_test", tiktal_self_test(session.vi(), &result, message));
    session.close();
    if (!options.json) {
        printTable({{"resource", options.resource},
                    {"handle", std::to_string(session.vi())},
                    {"reset", options.reset ? "yes" : "no"},
                    {"self test", std::to_string(result) + " " + message}});
        return;
    }
    Json json(cJSON_CreateObject());
    cJSON_AddStringToObject(json.get(), "resource", options.resource.c_str());
    cJSON_AddNumberToObject(json.get(), "handle", session.vi());
    cJSON_AddBoolToObject(json.get(), "reset", options.reset);
    cJSON_AddNumberToObject(json.get(), "selfTestResult", result);
    cJSON_AddStringToObject(json.get(), "selfTestMessage", message);
    printJson(json.get());
}

void getCommand(const Options& options) {
    const Attribute attribute = resolveForItem(options);
    Session session(options.resource, false);
    const Value value = read(session.vi(), options.hasItem ? options.item.c_str() : VI_NULL, attribute.id, attribute.type);
    session.close();
    printAttribute(options, attribute, value);
}

void setCommand(const Options& options) {
    const Attribute attribute = resolveForItem(options);
    const Value value = parseValue(attribute.type, options.value);
    Session session(options.resource, false);
    write(session.vi(), options.hasItem ? options.item.c_str() : VI_NULL, attribute.id, value);
    session.close();
    printAttribute(options, attribute, value);
}

void refsCommand(const Options& options) {
    Session session(options.resource, false);
    std::vector<Reference> references;
    for (const std::string& name : referenceNames(session.vi())) references.push_back(readReference(session.vi(), name));
    session.close();
    printReferences(references, options.json);
}

void timeCommand(const Options& options) {
    Session session(options.resource, false);
    ViUInt32 seconds = 0, nanoseconds = 0;
    ViUInt16 fraction = 0;
    check("tiktal_GetTime", tiktal_GetTime(session.vi(), &seconds, &nanoseconds, &fraction));
    session.close();
    const std::string utc = isoUtc(seconds, nanoseconds);
    if (!options.json) {
        printTable({{"seconds", std::to_string(seconds)}, {"nanoseconds", std::to_string(nanoseconds)}, {"utc", utc}});
        return;
    }
    Json json(cJSON_CreateObject());
    cJSON_AddNumberToObject(json.get(), "seconds", seconds);
    cJSON_AddNumberToObject(json.get(), "nanoseconds", nanoseconds);
    cJSON_AddStringToObject(json.get(), "utc", utc.c_str());
    printJson(json.get());
}

void persistCommand(const Options& options) {
    Session session(options.resource, false);
    check("tiktal_PersistConfig", tiktal_PersistConfig(session.vi()));
    session.close();
    if (!options.json) {
        std::cout << "configuration stored: " << options.resource << '\n';
        return;
    }
    Json json(cJSON_CreateObject());
    cJSON_AddStringToObject(json.get(), "resource", options.resource.c_str());
    cJSON_AddBoolToObject(json.get(), "persisted", true);
    printJson(json.get());
}

// An unknown code is not a failure of the command: the library's text says it is unknown.
void statusCommand(const Options& options) {
    const ViStatus status = parseStatus(options.code);
    ViStatus result = VI_SUCCESS;
    const std::string message = statusMessage(status, &result);
    if (result != VI_SUCCESS && result != tiktalerr_warn_unknownStatus) throw StatusError{"tiktal_error_message", result};
    if (!options.json) {
        std::cout << statusHex(status) << ' ' << message << '\n';
        return;
    }
    Json json = statusJson(status);
    cJSON_AddBoolToObject(json.get(), "known", result == VI_SUCCESS);
    printJson(json.get());
}

}  // namespace cli
