// What the command prints: aligned text for people, JSON (cJSON) with --json.
#pragma once

#include <cjson/cJSON.h>

#include <memory>
#include <string>
#include <vector>

#include <tiktal/tiktal.h>

#include "attributes.h"

namespace cli {

struct JsonDeleter {
    void operator()(cJSON* json) const { cJSON_Delete(json); }
};
using Json = std::unique_ptr<cJSON, JsonDeleter>;

using Row = std::vector<std::string>;

// Rows in columns two spaces apart, each as wide as its widest cell; the last column is not padded.
void printTable(const std::vector<Row>& rows);
// The JSON text on standard output, formatted.
void printJson(const cJSON* json);

cJSON* jsonValue(const Value& value);
// A text member, or null for an absent one.
cJSON* jsonText(const std::string* text);

std::string statusHex(ViStatus status);
// The message of tiktal_error_message; `result`, if given, receives that call's own status.
std::string statusMessage(ViStatus status, ViStatus* result = nullptr);
// The status as an object {["function",] "status", "statusHex", "message"}.
Json statusJson(ViStatus status, const std::string* function = nullptr);

// The failure of a call on standard error: one line of text, or one JSON object with --json.
void reportStatusError(const std::string& function, ViStatus status, bool json);

// seconds and nanoseconds after the Unix epoch as ISO 8601 UTC text with nanoseconds.
std::string isoUtc(ViUInt32 seconds, ViUInt32 nanoseconds);

}  // namespace cli
