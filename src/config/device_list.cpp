#include "config/device_list.h"

#include <memory>
#include <vector>

#include "config/configuration.h"
#include "config/sync_attribute_provider.h"
#include "config/sync_fake_device_iterator.h"

namespace tiktalsae {

zrjsonconfig::ConfigurationData loadDeviceList() {
    using namespace zrjsonconfig;
    SyncAttributeProvider provider;
    LockableFile file(configFilePath(), true);
    std::vector<std::unique_ptr<DeviceIteratorInterface>> iterators;
    iterators.push_back(std::make_unique<APALDeviceIterator>());
    iterators.push_back(std::make_unique<SyncFakeDeviceIterator>());
    CompositeDeviceIterator devices(std::move(iterators));
    Configuration configuration(file);
    configuration.load(&devices, provider);
    return configuration.data();
}

}  // namespace tiktalsae
