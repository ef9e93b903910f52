#include "config/sync_fake_device_iterator.h"

#include <new>

#include "config/checked_json.h"
#include "config/failure.h"
#include "support/casefold.h"

namespace tiktalsae {
namespace {

using zrjsonconfig::kUsageTypeFilePath;

constexpr char kExtension[] = ".fake";
constexpr char kNamePrefix[] = "FAKE:TIKTAL:";

[[noreturn]] void failToRead(const std::string& path, const platform::OsError& error) {
    if (error.code == platform::error::kFileTooLarge)
        ZRJSONCONFIG_FAILURE(zrjsonconfig::kInvalidJson)
            .usage(kUsageTypeFilePath, path)
            .comment("The file is larger than 1 MiB")
            .raise();
    const bool opening = std::string(error.api) == "open";
    ZRJSONCONFIG_FAILURE(opening ? zrjsonconfig::kResourceNotFound : zrjsonconfig::kEndOfData)
        .usage(kUsageTypeFilePath, path)
        .comment(opening ? "Failed to open file" : "Failed to read file")
        .osError(error)
        .raise();
}

}  // namespace

std::string fakeDeviceName(const std::string& fileName) {
    const std::size_t dot = fileName.rfind('.');
    if (dot == std::string::npos || dot == 0 || fileName.compare(dot, std::string::npos, kExtension) != 0) return "";
    const std::string name = fileName.substr(0, dot);
    return support::isValidUtf8(name) ? kNamePrefix + name : "";
}

bool isSimulatedDevice(const std::string& token) {
    return token.compare(0, sizeof kNamePrefix - 1, kNamePrefix) == 0;
}

std::string simulatedDeviceFile(const std::string& token) {
    return platform::dataDirectory() + "/" + token.substr(sizeof kNamePrefix - 1) + kExtension;
}

SyncFakeDeviceIterator::SyncFakeDeviceIterator() : _folder(platform::dataDirectory()) {
    if (platform::listDirectory(_folder, _entries) == platform::error::kNoMemory) throw std::bad_alloc();
    advance();
}

void SyncFakeDeviceIterator::next() {
    if (!_atEnd) advance();
}

void SyncFakeDeviceIterator::advance() {
    _device.reset();
    while (_next < _entries.size()) {
        const platform::DirectoryEntry& entry = _entries[_next++];
        std::string name = entry.regularFile ? fakeDeviceName(entry.name) : "";
        if (name.empty()) continue;
        const std::string path = _folder + "/" + entry.name;
        std::string text;
        if (const platform::OsError error = platform::readRegularFile(path, kMaxFileSize, text)) {
            if (error.code == platform::error::kNotFound) continue;  // gone, or no longer a file, since the listing
            failToRead(path, error);
        }
        _device = zrjsonconfig::parseObjectText(text, path);
        _path = path;
        _name = std::move(name);
        return;
    }
    _atEnd = true;
}

const std::string& SyncFakeDeviceIterator::name() const {
    if (_atEnd) ZRJSONCONFIG_FAILURE(zrjsonconfig::kResourceNotFound).comment("No current simulated device").raise();
    return _name;
}

const cJSON* SyncFakeDeviceIterator::member(const std::string& property) const {
    name();
    const cJSON* item = cJSON_GetObjectItem(_device.get(), property.c_str());
    if (!item)
        ZRJSONCONFIG_FAILURE(zrjsonconfig::kObjectItemNotFound)
            .usage(kUsageTypeFilePath, _path)
            .comment("No member \"" + property + "\"")
            .raise();
    return item;
}

std::uint32_t SyncFakeDeviceIterator::number(const std::string& property) const {
    return zrjsonconfig::wholeNumber(member(property), property.c_str(), _path);
}

std::string SyncFakeDeviceIterator::text(const std::string& property) const {
    return zrjsonconfig::textValue(member(property), property.c_str(), _path);
}

}  // namespace tiktalsae
