#include "config/loader.h"

#include <cmath>
#include <cstring>
#include <set>

#include "config/failure.h"
#include "support/casefold.h"

namespace zrjsonconfig {
namespace {

bool isJsonWhiteSpace(char c) { return c == ' ' || c == '\t' || c == '\n' || c == '\r'; }

// cJSON reads a number beyond the range of a double as infinity, which it prints as null.
bool allNumbersFinite(const cJSON* item) {
    if (cJSON_IsNumber(item) && !std::isfinite(item->valuedouble)) return false;
    for (const cJSON* child = item->child; child; child = child->next)
        if (!allNumbersFinite(child)) return false;
    return true;
}

JsonTree parseText(const std::string& text, const std::string& path) {
    if (!support::isValidUtf8(text))
        ZRJSONCONFIG_FAILURE(kInvalidJson).usage(kUsageTypeFilePath, path).comment("The file is not valid UTF-8").raise();
    // cJSON would end a text at a NUL byte, in a string too.
    if (std::memchr(text.data(), '\0', text.size()))
        ZRJSONCONFIG_FAILURE(kInvalidJson).usage(kUsageTypeFilePath, path).comment("The file holds a NUL byte").raise();
    const char* end = nullptr;
    JsonTree root(cJSON_ParseWithLengthOpts(text.data(), text.size(), &end, false));
    if (!root)
        ZRJSONCONFIG_FAILURE(kInvalidJson).usage(kUsageTypeFilePath, path).comment("The file is not JSON").raise();
    for (const char* rest = end; rest < text.data() + text.size(); ++rest)
        if (!isJsonWhiteSpace(*rest))
            ZRJSONCONFIG_FAILURE(kInvalidJson)
                .usage(kUsageTypeFilePath, path)
                .comment("The file holds more after its JSON value")
                .raise();
    if (!allNumbersFinite(root.get()))
        ZRJSONCONFIG_FAILURE(kInvalidJson)
            .usage(kUsageTypeFilePath, path)
            .comment("A number is beyond the range of a double")
            .raise();
    if (!cJSON_IsObject(root.get()))
        ZRJSONCONFIG_FAILURE(kNotAnObject).usage(kUsageTypeFilePath, path).comment("The file is not a JSON object").raise();
    return root;
}

// The member `name` as an unsigned 32-bit whole number.
std::uint32_t versionNumber(const cJSON* item, const char* name, const std::string& path) {
    if (!cJSON_IsNumber(item))
        ZRJSONCONFIG_FAILURE(kTypeMismatch)
            .usage(kUsageTypeFilePath, path)
            .comment(std::string("\"") + name + "\" is not a number")
            .raise();
    const double value = item->valuedouble;
    if (!(value >= 0 && value <= 4294967295.0) || value != std::trunc(value))
        ZRJSONCONFIG_FAILURE(kTypeMismatch)
            .usage(kUsageTypeFilePath, path)
            .comment(std::string("\"") + name + "\" is not a whole number from 0 to 4294967295")
            .raise();
    return static_cast<std::uint32_t>(value);
}

[[noreturn]] void versionFailure(Status status, std::uint32_t fileVersion, const std::string& path) {
    ZRJSONCONFIG_FAILURE(status)
        .usage(kUsageTypeFileVersion, fileVersion)
        .usage(kUsageTypeSupportedVersion, kSupportedVersion)
        .usage(kUsageTypeOldestCompatibleVersion, kOldestSupportedVersion)
        .usage(kUsageTypeFilePath, path)
        .raise();
}

void checkVersion(const cJSON* root, const std::string& path) {
    const cJSON* version = cJSON_GetObjectItem(root, "version");
    if (!version)
        ZRJSONCONFIG_FAILURE(kObjectItemNotFound).usage(kUsageTypeFilePath, path).comment("No member \"version\"").raise();
    const std::uint32_t fileVersion = versionNumber(version, "version", path);
    const cJSON* oldest = cJSON_GetObjectItem(root, "oldest_compatible_version");
    const std::uint32_t fileOldest = oldest ? versionNumber(oldest, "oldest_compatible_version", path) : fileVersion;
    if (kOldestSupportedVersion > fileVersion) versionFailure(kErrorSoftwareTooNewForFile, fileVersion, path);
    if (fileOldest > kSupportedVersion) versionFailure(kErrorFileTooNewForSoftware, fileVersion, path);
}

void addDevices(const cJSON* root, ConfigurationData& data, const std::string& path,
                AttributeProviderInterface* provider) {
    const cJSON* devices = cJSON_GetObjectItem(root, "devices");
    if (!devices) return;
    if (!cJSON_IsObject(devices))
        ZRJSONCONFIG_FAILURE(kNotAnObject).usage(kUsageTypeFilePath, path).comment("\"devices\" is not an object").raise();
    for (const cJSON* device = devices->child; device; device = device->next) {
        const std::string token = device->string;
        if (!cJSON_IsObject(device))
            ZRJSONCONFIG_FAILURE(kNotAnObject)
                .usage(kUsageTypeToken, token)
                .usage(kUsageTypeFilePath, path)
                .comment("A device is not an object")
                .raise();
        // The same failure as the data's own, with the file named: the file must be mended.
        if (data.find(token))
            ZRJSONCONFIG_FAILURE(kObjectNameCollision).usage(kUsageTypeToken, token).usage(kUsageTypeFilePath, path).raise();
        JsonTree configured = duplicate(device);
        JsonTree provided = newObject();
        if (provider) provider->provide(nullptr, data, configured.get(), provided.get());
        data.add(token, std::move(configured), std::move(provided));
    }
}

}  // namespace

LoadedConfiguration parseConfiguration(const std::string& text, const std::string& path,
                                       AttributeProviderInterface* provider) {
    LoadedConfiguration loaded;
    if (text.empty()) return loaded;  // a new file: the fresh configuration
    JsonTree root = parseText(text, path);
    checkVersion(root.get(), path);
    addDevices(root.get(), loaded.data, path, provider);
    loaded.snapshot = std::move(root);
    return loaded;
}

void mergeDiscovered(ConfigurationData& data, DeviceIteratorInterface& devices, AttributeProviderInterface& provider) {
    std::set<std::string> discovered;
    for (; !devices.isEnd(); devices.next()) {
        const std::string token = devices.getToken();
        if (!discovered.insert(token).second)
            ZRJSONCONFIG_FAILURE(kObjectNameCollision)
                .usage(kUsageTypeToken, token)
                .comment("Two devices have the same token")
                .raise();
        const std::shared_ptr<DeviceEntry> known = data.find(token);
        JsonTree configured = known ? duplicate(known->configured()) : newObject();
        JsonTree provided = newObject();
        provider.provide(&devices, data, configured.get(), provided.get());
        if (known) data.remove(token);
        data.add(token, std::move(configured), std::move(provided));
    }
}

}  // namespace zrjsonconfig
