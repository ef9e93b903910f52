#include "config/attribute_provider.h"

namespace zrjsonconfig {

void CompositeAttributeProvider::add(std::unique_ptr<AttributeProviderInterface> provider) {
    _providers.push_back(std::move(provider));
}

void CompositeAttributeProvider::provide(DeviceIteratorInterface* device, ConfigurationData& data, cJSON* configured,
                                         cJSON* provided) {
    for (const auto& provider : _providers) provider->provide(device, data, configured, provided);
}

void AliasAttributeProvider::provide(DeviceIteratorInterface* device, ConfigurationData& data, cJSON* configured,
                                     cJSON*) {
    if (!device || cJSON_IsString(cJSON_GetObjectItem(configured, "alias"))) return;
    setMember(configured, "alias", newString(_factory.createAlias(*device, data.aliasesInUse())));
}

void SerialNumberAttributeProvider::provide(DeviceIteratorInterface* device, ConfigurationData&, cJSON* configured,
                                            cJSON*) {
    if (device)
        setMember(configured, "serial_number", newString(device->getDevicePropertyString("serialNumber")));
    else if (!cJSON_GetObjectItem(configured, "serial_number"))
        addMember(configured, "serial_number", newString(""));
}

void IsSimulatedAndIsPresentAttributeProvider::provide(DeviceIteratorInterface* device, ConfigurationData&,
                                                       cJSON* configured, cJSON* provided) {
    const cJSON* flag = cJSON_GetObjectItem(configured, _flag.c_str());
    if (!flag) addMember(configured, _flag.c_str(), newBool(_default));
    const bool flagSet = flag ? cJSON_IsTrue(flag) : _default;
    setMember(provided, "is_present", newBool(device != nullptr || flagSet));
}

void InterfacePathAttributeProvider::provide(DeviceIteratorInterface* device, ConfigurationData&, cJSON*,
                                             cJSON* provided) {
    setMember(provided, "interface_path", newString(device ? device->getInterfacePath() : std::string()));
}

}  // namespace zrjsonconfig
