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
// An object whose members are those of `object` itself, not copies: printing or comparing it
// reads them, deleting it leaves them alone. It holds only while `object` keeps its members.
JsonTree objectView(const cJSON* object);

// Adds `value` to `object` as member `name`, after its other members.
void addMember(cJSON* object, const char* name, JsonTree value);
// Puts `value` in the place of the member `name` (matched ignoring ASCII case, as readers match
// it), or adds it when there is none. `name` must live as long as the program (a literal): a new
// member refers to it rather than keeping a copy, as every device has the same few names.
void setMember(cJSON* object, const char* name, JsonTree value);

}  // namespace zrjsonconfig
