// Owned cJSON trees for the configuration: a tree belongs to exactly one owner, which deletes it.
#pragma once

#include <cjson/cJSON.h>

#include <memory>

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

}  // namespace zrjsonconfig
