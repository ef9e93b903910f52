// The JSON texts of the stand-in: owned cJSON trees, members whose texts are always UTF-8, and
// texts handed to the caller.
#pragma once

#include <cjson/cJSON.h>

#include <cstdint>
#include <memory>
#include <optional>
#include <string>

namespace rocosim {

struct JsonDeleter {
    void operator()(cJSON* item) const { cJSON_Delete(item); }
};
using Json = std::unique_ptr<cJSON, JsonDeleter>;

// Adders that throw std::bad_alloc when cJSON runs out of memory, so that no text goes out with a
// member silently missing.
void addText(cJSON* object, const char* key, const std::string& text);
void addTextOrNull(cJSON* object, const char* key, const std::optional<std::string>& text);
void addNumber(cJSON* object, const char* key, double number);
void addBool(cJSON* object, const char* key, bool value);
void addItem(cJSON* object, const char* key, Json item);
Json newObject();

// The compact text of an item.
std::string print(const cJSON* item);

// A copy of `text` in memory from malloc, which zrrocoapi_destroyString frees.
char* handOut(const std::string& text);

}  // namespace rocosim
