// State of the time-service stand-in: one JSON document that lives in memory and in a state file.
#pragma once

#include <cjson/cJSON.h>

#include <memory>
#include <string>

namespace timeservice {

struct JsonDeleter {
    void operator()(cJSON* item) const { cJSON_Delete(item); }
};
using Json = std::unique_ptr<cJSON, JsonDeleter>;

// Parses a whole text; null when it is not one JSON value.
Json parseJson(const std::string& text);
// cJSON's formatted or compact print of an item.
std::string printJson(const cJSON* item, bool formatted = true);

// The state that a new state file gets: device "sync_1" with one time reference of each type.
Json defaultState();

// Empty when `state` has the shape the server relies on, otherwise what is wrong with it.
std::string checkState(const cJSON* state);

// Reads and checks the state file; writes the default state there first when the file does not
// exist. Throws std::runtime_error naming the file and the fault.
Json loadState(const std::string& path);

// Writes the state to a temporary file beside `path`, flushes it to disk and renames it over
// `path`, so a reader sees either the old or the new file. Throws std::runtime_error.
void saveState(const std::string& path, const cJSON* state);

}  // namespace timeservice
