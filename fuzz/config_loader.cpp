// Reading the configuration file's text: JSON, the version rules and the file's devices. The
// input is the whole text of the file.
//
// Only the status exception may leave the reading, with one of the statuses the rules name and
// details that name the file. A text that is read is empty, or well-formed UTF-8 holding one JSON
// object whose versions the software can use; every device of the file is in the data with its
// members unchanged, none twice; and what would be written back reads back as the same data.
#include <cjson/cJSON.h>

#include <cmath>
#include <cstring>
#include <string>

#include "config/loader.h"
#include "errors/zrerr.h"
#include "property.h"

namespace {

using tiktalfuzz::require;

constexpr char kPath[] = "/fuzz/var/lib/Korvane/tiktal/tiktal.config";

bool isRuleStatus(std::int32_t code) {
    switch (static_cast<std::uint32_t>(code)) {
    case static_cast<std::uint32_t>(-52004):  // not an object, not a number, out of range
    case static_cast<std::uint32_t>(-52005):  // not JSON
    case static_cast<std::uint32_t>(-52006):  // no "version"
    case static_cast<std::uint32_t>(-52013):  // a token twice
    case 0xBFFA917D:                           // the file is too new
    case 0xBFFA917E:                           // the software is too new
        return true;
    default:
        return false;
    }
}

// Whether the details are a JSON object with the translator block and a record naming the file.
bool namesTheFile(const char* details) {
    cJSON* root = cJSON_Parse(details);
    bool named = false;
    const cJSON* translator = cJSON_GetObjectItemCaseSensitive(root, "translator");
    const cJSON* info = cJSON_GetObjectItemCaseSensitive(root, "translator_info");
    const cJSON* records = cJSON_GetObjectItemCaseSensitive(info, "ordered_data");
    if (cJSON_IsString(translator) && std::strcmp(translator->valuestring, "vllator_tiktal") == 0 && cJSON_IsArray(records))
        for (const cJSON* record = records->child; record; record = record->next) {
            const cJSON* usage = cJSON_GetObjectItemCaseSensitive(record, "usage");
            const cJSON* value = cJSON_GetObjectItemCaseSensitive(record, "value");
            if (cJSON_IsString(usage) && std::strcmp(usage->valuestring, "kUsageTypeFilePath") == 0 &&
                cJSON_IsString(value) && std::strcmp(value->valuestring, kPath) == 0)
                named = true;
        }
    cJSON_Delete(root);
    return named;
}

// Compared as printed: cJSON_Compare looks members up by name, so an object that has a name twice
// (which the file may, and which is kept as it is) would not equal its own copy.
std::string printed(const cJSON* item) {
    char* text = cJSON_PrintUnformatted(item);
    std::string copy = text ? text : "";
    cJSON_free(text);
    return copy;
}

double versionOf(const cJSON* root, const char* name, double otherwise) {
    const cJSON* item = cJSON_GetObjectItem(root, name);
    return item ? item->valuedouble : otherwise;
}

void checkRead(std::string_view text, const zrjsonconfig::LoadedConfiguration& loaded) {
    const cJSON* snapshot = loaded.snapshot.get();
    if (text.empty()) {
        require(!snapshot && loaded.data.entries().empty(), "an empty file is a fresh configuration");
        return;
    }
    require(tiktalfuzz::isWellFormed(text) && text.find('\0') == std::string_view::npos,
            "a text that is read is UTF-8 without NUL bytes");
    require(cJSON_IsObject(snapshot), "a text that is read is an object");
    const double version = versionOf(snapshot, "version", -1);
    const double oldest = versionOf(snapshot, "oldest_compatible_version", version);
    require(version >= 1 && version <= 4294967295.0 && version == std::trunc(version) && oldest >= 0 && oldest <= 1 &&
                oldest == std::trunc(oldest),
            "a file that is read has versions the software can use");

    const cJSON* devices = cJSON_GetObjectItem(snapshot, "devices");
    require(cJSON_GetArraySize(devices) == static_cast<int>(loaded.data.entries().size()),
            "every device of the file is in the data, none twice");
    for (const cJSON* device = devices ? devices->child : nullptr; device; device = device->next) {
        const auto entry = loaded.data.find(device->string);
        require(entry && printed(entry->configured()) == printed(device) && cJSON_GetArraySize(entry->provided()) == 0,
                "a device keeps its members and starts with no provided attributes");
    }

    // What a save would write reads back as the same data.
    const std::string written = loaded.data.configuredText();
    const zrjsonconfig::LoadedConfiguration again = zrjsonconfig::parseConfiguration(written, kPath);
    require(printed(again.data.configuredJson().get()) == printed(loaded.data.configuredJson().get()),
            "the written text reads back as the same data");
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const std::string text(reinterpret_cast<const char*>(data), size);
    try {
        checkRead(text, zrjsonconfig::parseConfiguration(text, kPath));
    } catch (const zrerr::ExceptionBase& failure) {
        require(isRuleStatus(failure.code()), "a failure has one of the statuses of the rules");
        require(namesTheFile(failure.what()), "a failure's details carry the translator block and name the file");
    }
    return 0;
}
