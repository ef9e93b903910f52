#include "config/configuration_data.h"

#include "config/failure.h"
#include "json/zrjsonlh.h"

namespace zrjsonconfig {
namespace {

// The device's alias, or null when it has none.
const char* aliasOf(const cJSON* configured) {
    const cJSON* alias = cJSON_GetObjectItem(configured, "alias");
    return cJSON_IsString(alias) ? alias->valuestring : nullptr;
}

}  // namespace

DeviceEntry::DeviceEntry(std::string token, JsonTree configured, JsonTree provided)
    : _token(std::move(token)), _configured(std::move(configured)), _provided(std::move(provided)) {}

DeviceEntry::DeviceEntry(const DeviceEntry& other)
    : _token(other._token), _configured(duplicate(other.configured())), _provided(duplicate(other.provided())) {}

ConfigurationData::ConfigurationData(const ConfigurationData& other) : _aliases(other._aliases) {
    _order.reserve(other._entries.size());
    other.forEachInOrder([&](const DeviceEntry& entry) {
        auto copy = std::make_shared<DeviceEntry>(entry);
        copy->_position = _order.size();
        _entries.emplace(copy->token(), copy);
        _order.push_back(std::move(copy));
    });
}

ConfigurationData& ConfigurationData::operator=(const ConfigurationData& other) {
    if (this != &other) *this = ConfigurationData(other);
    return *this;
}

void ConfigurationData::add(const std::string& token, JsonTree configured, JsonTree provided) {
    zrjsonlh::checkObject(configured.get());
    zrjsonlh::checkObject(provided.get());
    if (_entries.count(token))
        ZRJSONCONFIG_FAILURE(kObjectNameCollision).usage(kUsageTypeToken, token).raise();
    const char* alias = aliasOf(configured.get());
    auto entry = std::make_shared<DeviceEntry>(token, std::move(configured), std::move(provided));
    entry->_position = _order.size();
    // Room ahead, growing by half, so that nothing below can fail once the map holds it.
    if (_order.size() == _order.capacity()) _order.reserve(_order.size() + _order.size() / 2 + 16);
    if (alias) _aliases.add(alias);
    _entries.emplace(token, entry);
    _order.push_back(std::move(entry));
}

void ConfigurationData::remove(const std::string& token) {
    const auto found = _entries.find(token);
    if (found == _entries.end())
        ZRJSONCONFIG_FAILURE(kErrorDeviceEntryNotFound).usage(kUsageTypeToken, token).raise();
    if (const char* alias = aliasOf(found->second->configured())) _aliases.remove(alias);
    _order[found->second->_position].reset();
    _entries.erase(found);
    if (++_holes >= _entries.size()) pack();
}

void ConfigurationData::pack() noexcept {
    std::size_t kept = 0;
    for (std::shared_ptr<DeviceEntry>& entry : _order)
        if (entry) {
            entry->_position = kept;
            _order[kept++] = std::move(entry);
        }
    _order.resize(kept);
    _holes = 0;
}

std::shared_ptr<DeviceEntry> ConfigurationData::find(const std::string& token) const {
    const auto found = _entries.find(token);
    return found == _entries.end() ? nullptr : found->second;
}

JsonTree ConfigurationData::configuredJson() const {
    JsonTree root = newObject();
    addMember(root.get(), "version", newNumber(kSupportedVersion));
    addMember(root.get(), "oldest_compatible_version", newNumber(kOldestSupportedVersion));
    JsonTree devices = newObject();
    forEachInOrder([&](const DeviceEntry& entry) { addMember(devices.get(), entry.token().c_str(), objectView(entry.configured())); });
    addMember(root.get(), "devices", std::move(devices));
    return root;
}

JsonTree ConfigurationData::providedJson() const {
    JsonTree root = newObject();
    forEachInOrder([&](const DeviceEntry& entry) { addMember(root.get(), entry.token().c_str(), objectView(entry.provided())); });
    return root;
}

std::string ConfigurationData::configuredText() const { return zrjsonlh::print(configuredJson().get()); }

}  // namespace zrjsonconfig
