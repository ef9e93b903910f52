// Attribute providers: they turn a device of a discovery (or a device that only the configuration
// file knows) into its configured attributes, which the file keeps, and its provided attributes,
// which hold for this run only.
#pragma once

#include <memory>
#include <string>
#include <vector>

#include <cjson/cJSON.h>

#include "config/alias_factory.h"
#include "config/configuration_data.h"
#include "config/device_iterator.h"

namespace zrjsonconfig {

class AttributeProviderInterface {
public:
    virtual ~AttributeProviderInterface() = default;
    // Fills the attributes of one device. `device` is the current device of the discovery, or
    // null for a device that only the file knows; `data` is the configuration being built, which
    // does not hold this device's new objects yet.
    virtual void provide(DeviceIteratorInterface* device, ConfigurationData& data, cJSON* configured,
                         cJSON* provided) = 0;
};

// Its members, in the order they were added.
class CompositeAttributeProvider final : public AttributeProviderInterface {
public:
    void add(std::unique_ptr<AttributeProviderInterface> provider);
    void provide(DeviceIteratorInterface* device, ConfigurationData& data, cJSON* configured,
                 cJSON* provided) override;

private:
    std::vector<std::unique_ptr<AttributeProviderInterface>> _providers;
};

// "alias": a new one from the factory for a discovered device that has none (a member "alias"
// that is not text is none: no one could open the device by it); an alias that is there is never
// changed.
class AliasAttributeProvider final : public AttributeProviderInterface {
public:
    // `factory` must outlive the provider.
    explicit AliasAttributeProvider(AliasFactoryInterface& factory) noexcept : _factory(factory) {}
    void provide(DeviceIteratorInterface* device, ConfigurationData& data, cJSON* configured,
                 cJSON* provided) override;

private:
    AliasFactoryInterface& _factory;
};

// "serial_number": the device's "serialNumber" for a discovered device, "" for another that has
// none.
class SerialNumberAttributeProvider final : public AttributeProviderInterface {
public:
    void provide(DeviceIteratorInterface* device, ConfigurationData& data, cJSON* configured,
                 cJSON* provided) override;
};

// The configured flag (the default when missing) and "is_present": a discovered device is
// present, another only when its flag is true (a simulated device needs no hardware).
class IsSimulatedAndIsPresentAttributeProvider final : public AttributeProviderInterface {
public:
    explicit IsSimulatedAndIsPresentAttributeProvider(std::string flag = "simulated", bool flagDefault = false)
        : _flag(std::move(flag)), _default(flagDefault) {}
    void provide(DeviceIteratorInterface* device, ConfigurationData& data, cJSON* configured,
                 cJSON* provided) override;

private:
    std::string _flag;
    bool _default;
};

// "interface_path": where the device's driver is opened, "" for a device not discovered.
class InterfacePathAttributeProvider final : public AttributeProviderInterface {
public:
    void provide(DeviceIteratorInterface* device, ConfigurationData& data, cJSON* configured,
                 cJSON* provided) override;
};

}  // namespace zrjsonconfig
