#include "config/loader.h"

#include <set>

#include "config/checked_json.h"
#include "config/failure.h"

namespace zrjsonconfig {
namespace {

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
    const std::uint32_t fileVersion = wholeNumber(version, "version", path);
    const cJSON* oldest = cJSON_GetObjectItem(root, "oldest_compatible_version");
    const std::uint32_t fileOldest = oldest ? wholeNumber(oldest, "oldest_compatible_version", path) : fileVersion;
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
    JsonTree root = parseObjectText(text, path);
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
