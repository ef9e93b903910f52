#include "api/cjson_exports.h"

#include <cstdlib>
#include <string>

#include "platform/platform.h"

namespace tiktal {

void* cjsonEntry(const char* name) noexcept {
    if (void* entry = platform::findDefinitionBeyond(name)) return entry;
    const std::string line = std::string("tiktal: the cJSON library does not define ") + name + "\n";
    platform::writeDebugOutput(line.c_str(), line.size());
    std::abort();
}

}  // namespace tiktal
