// One load of the device configuration: read the shared file, check it, merge it with the
// devices found now, and write it back when anything changed, all under the file's lock.
#pragma once

#include <functional>

#include "config/attribute_provider.h"
#include "config/configuration_data.h"
#include "config/device_iterator.h"
#include "config/lockable_file.h"

namespace zrjsonconfig {

class Configuration {
public:
    // Called after each save with the data that was saved.
    using SaveCallback = std::function<void(const ConfigurationData&)>;

    // Takes the file's lock (waiting for other threads and processes, at most
    // LockableFile::kLockWait), which it holds until it is destroyed: reading, merging and
    // writing are one step for every process.
    explicit Configuration(LockableFile& file, SaveCallback onSave = {});
    ~Configuration();
    Configuration(const Configuration&) = delete;
    Configuration& operator=(const Configuration&) = delete;

    // Reads the file (an empty one is a fresh configuration), merges the devices of `devices`
    // (null: none) with the attributes that `provider` gives, and writes the file unless its
    // JSON is already exactly the result. A failure leaves the file as it was; a failure of the
    // standard exception kind also goes to the debug output.
    void load(DeviceIteratorInterface* devices, AttributeProviderInterface& provider);

    const ConfigurationData& data() const noexcept { return _data; }
    ConfigurationData takeData() noexcept { return std::move(_data); }

private:
    void loadLocked(DeviceIteratorInterface* devices, AttributeProviderInterface& provider);
    void saveIfChanged();

    LockableFile& _file;
    SaveCallback _onSave;
    ConfigurationData _data;
    JsonTree _snapshot;  // the file's JSON as last read or written; null for an empty file
};

}  // namespace zrjsonconfig
