// The device configuration as one load builds it: the configured attributes, which the file
// keeps, and the provided attributes, which hold for this run only, of every known device.
#pragma once

#include <cstdint>
#include <map>
#include <memory>
#include <string>
#include <vector>

#include "config/aliases_in_use.h"
#include "config/json_tree.h"

namespace zrjsonconfig {

// The format version this software writes and reads, and the oldest it can still read.
inline constexpr std::uint32_t kSupportedVersion = 1;
inline constexpr std::uint32_t kOldestSupportedVersion = 1;

// One device: its token (the matching token of enumeration) and its two attribute objects.
class DeviceEntry {
public:
    DeviceEntry(std::string token, JsonTree configured, JsonTree provided);
    DeviceEntry(const DeviceEntry& other);

    const std::string& token() const noexcept { return _token; }
    // The objects themselves, which the attribute providers fill.
    cJSON* configured() const noexcept { return _configured.get(); }
    cJSON* provided() const noexcept { return _provided.get(); }

private:
    friend class ConfigurationData;
    std::string _token;
    JsonTree _configured;
    JsonTree _provided;
    std::size_t _position = 0;  // in the order of the data that holds it
};

// The devices by token, ordered and compared byte by byte (case-sensitive). Entries are shared:
// whoever holds one sees what the providers write into it. A copy is deep: it shares nothing
// with the original.
class ConfigurationData {
public:
    using Entries = std::map<std::string, std::shared_ptr<DeviceEntry>>;

    ConfigurationData() = default;
    ConfigurationData(const ConfigurationData& other);
    ConfigurationData& operator=(const ConfigurationData& other);
    ConfigurationData(ConfigurationData&&) noexcept = default;
    ConfigurationData& operator=(ConfigurationData&&) noexcept = default;

    // Adds a device; `configured` and `provided` must be objects (-52004). A token already
    // known fails with -52013 ("zrapalerr_objectNameCollision") and leaves the data as it was.
    void add(const std::string& token, JsonTree configured, JsonTree provided);
    // Removes a device; an unknown token fails with 0xBFFA917F
    // ("zrvll::kErrorDeviceEntryNotFound").
    void remove(const std::string& token);
    // The device of `token`, or null.
    std::shared_ptr<DeviceEntry> find(const std::string& token) const;
    const Entries& entries() const noexcept { return _entries; }
    // The aliases of the devices as they were added: the text member "alias" (its name matched
    // ignoring ASCII case) of each device's configured attributes that has one.
    const AliasesInUse& aliasesInUse() const noexcept { return _aliases; }

    // The file form: {"version": 1, "oldest_compatible_version": 1, "devices": {token:
    // configured attributes, ...}} with the devices in the order they were added (for a loaded
    // file: the file's order, then devices added since). The devices' objects in it are the
    // entries' own, not copies: the tree is a view that holds while the data keeps its entries
    // unchanged (deleting it leaves them alone); duplicate() it to keep it beyond.
    JsonTree configuredJson() const;
    // {token: provided attributes, ...} in the same order, a view as well.
    JsonTree providedJson() const;
    // The file form as the file holds it: indented JSON text.
    std::string configuredText() const;

private:
    template <class Visit>
    void forEachInOrder(Visit visit) const {
        for (const std::shared_ptr<DeviceEntry>& entry : _order)
            if (entry) visit(*entry);
    }
    void pack() noexcept;

    Entries _entries;
    // The same entries in the order added. A removed entry leaves a hole (null) at its position
    // until the holes are as many as the entries; then the order is packed.
    std::vector<std::shared_ptr<DeviceEntry>> _order;
    std::size_t _holes = 0;
    AliasesInUse _aliases;
};

}  // namespace zrjsonconfig
