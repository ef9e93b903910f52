// The timing modules present in the machine, one at a time, with the properties that describe
// them and the token that names each in the configuration file.
#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include "platform/platform.h"

namespace zrjsonconfig {

class DeviceIteratorInterface {
public:
    virtual ~DeviceIteratorInterface() = default;
    // Bus properties ("pciVendorID", "pciBusNumber", "pcieLinkWidth", "pciSlotPath", ...) and
    // device properties ("serialNumber") of the current device; a missing one fails with -52006.
    virtual std::uint32_t getBusPropertyU32(const std::string& name) = 0;
    virtual std::string getBusPropertyString(const std::string& name) = 0;
    virtual std::uint32_t getDevicePropertyU32(const std::string& name) = 0;
    virtual std::string getDevicePropertyString(const std::string& name) = 0;
    virtual std::string getInterfacePath() = 0;
    virtual std::string getToken() = 0;
    virtual std::string getInstanceId() = 0;
    virtual void next() = 0;
    virtual bool isEnd() = 0;
};

// The devices of the timing module's driver class that the platform enumerates. Each device's
// property files are read when the iterator reaches it (a file that cannot be read fails when
// its property is asked for); a device that goes away before that (a module removed while the
// machine runs) is passed over, as it is no longer present.
class APALDeviceIterator final : public DeviceIteratorInterface {
public:
    APALDeviceIterator();

    std::uint32_t getBusPropertyU32(const std::string& name) override;
    std::string getBusPropertyString(const std::string& name) override;
    std::uint32_t getDevicePropertyU32(const std::string& name) override;
    std::string getDevicePropertyString(const std::string& name) override;
    std::string getInterfacePath() override;
    std::string getToken() override;
    std::string getInstanceId() override;
    void next() override;
    bool isEnd() override;

private:
    const platform::DeviceInterfaceEntry& current() const;
    // Reads the properties of the device at the index, passing over devices that went away.
    void settle();
    bool readCurrent();
    // The text of property file `at`; fails with the error of reading it.
    const std::string& fileText(std::size_t at);

    std::vector<platform::DeviceInterfaceEntry> _entries;
    std::size_t _index = 0;
    // The current device's property files, in the order of the property table, the serial
    // number last: each file's text, or the error number of reading it.
    struct FileRead {
        std::string path;
        std::string text;
        int error = 0;
    };
    std::vector<FileRead> _files;
};

// Iterators one after the other, those already at their end left out.
class CompositeDeviceIterator final : public DeviceIteratorInterface {
public:
    explicit CompositeDeviceIterator(std::vector<std::unique_ptr<DeviceIteratorInterface>> iterators);

    std::uint32_t getBusPropertyU32(const std::string& name) override { return current().getBusPropertyU32(name); }
    std::string getBusPropertyString(const std::string& name) override { return current().getBusPropertyString(name); }
    std::uint32_t getDevicePropertyU32(const std::string& name) override { return current().getDevicePropertyU32(name); }
    std::string getDevicePropertyString(const std::string& name) override {
        return current().getDevicePropertyString(name);
    }
    std::string getInterfacePath() override { return current().getInterfacePath(); }
    std::string getToken() override { return current().getToken(); }
    std::string getInstanceId() override { return current().getInstanceId(); }
    void next() override;
    bool isEnd() override { return _position >= _iterators.size(); }

private:
    DeviceIteratorInterface& current();
    void skipEnded();

    std::vector<std::unique_ptr<DeviceIteratorInterface>> _iterators;
    std::size_t _position = 0;
};

// The token of a device: its PCI identity and its slot path.
std::string deviceToken(DeviceIteratorInterface& device);

}  // namespace zrjsonconfig
