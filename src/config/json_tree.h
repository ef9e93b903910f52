// Owned cJSON trees for the configuration: a tree belongs to exactly one owner, which deletes it.
#pragma once

#include <cjson/cJSON.h>

#include <memory>
#include <string>

namespace zrjsonconfig {

struct JsonDeleter {
    void operator()(cJSON* item) const noexcept { cJSON_Delete(item); }
};
using JsonTree = std::unique_ptr<cJSON, JsonDeleter>;

// A new empty object or array; std::bad_alloc when there is no memory.
JsonTree newObject();
JsonTree newArray();
// A deep copy of `item` (a null item gives a null tree); std::bad_alloc when there is no memory.
JsonTree duplicate(const cJSON* item);
JsonTree newString(const std::string& text);
JsonTree newNumber(double value);
JsonTree newBool(bool value);

// Adds `value` to `object` as member `name`, after its other members.
void addMember(cJSON* object, const char* name, JsonTree value);
// Puts `value` in the place of the member `name` (matched ignoring ASCII case, as readers match
// it), or adds it when there is none.
void setMember(cJSON* object, const char* name, JsonTree value);

}  // namespace zrjsonconfig
