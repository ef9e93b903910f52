// The simulated devices: the regular files with the extension "fake" (compared with case) in the
// driver's data directory. Each holds one JSON object whose members are the device's properties
// as the platform would report them; its device name is "FAKE:TIKTAL:" and the file's name up to
// its last ".", and that name is also its token, interface path and instance id.
#pragma once

#include <cstddef>
#include <string>
#include <vector>

#include "config/device_iterator.h"
#include "config/json_tree.h"
#include "platform/platform.h"

namespace tiktalsae {

class SyncFakeDeviceIterator final : public zrjsonconfig::DeviceIteratorInterface {
public:
    // A larger file is refused as no device file: the properties of a device take a few hundred bytes.
    static constexpr std::size_t kMaxFileSize = 1 << 20;

    // Lists the data directory and reads the first simulated device. A directory that cannot be
    // listed (a missing one among them) holds no simulated devices.
    SyncFakeDeviceIterator();

    // Bus and device properties alike are members of the current device's object, matched
    // ignoring ASCII case as the JSON access layer matches them: numbers as whole numbers from 0
    // to 4294967295, texts as texts. A missing member fails with -52006, a member of another kind
    // with -52004; the failure names the file.
    std::uint32_t getBusPropertyU32(const std::string& name) override { return number(name); }
    std::string getBusPropertyString(const std::string& name) override { return text(name); }
    std::uint32_t getDevicePropertyU32(const std::string& name) override { return number(name); }
    std::string getDevicePropertyString(const std::string& name) override { return text(name); }
    std::string getInterfacePath() override { return name(); }
    std::string getToken() override { return name(); }
    std::string getInstanceId() override { return name(); }
    void next() override;
    bool isEnd() override { return _atEnd; }

private:
    // Reads the next simulated-device file of the listing; at end when none is left.
    void advance();
    const std::string& name() const;
    const cJSON* member(const std::string& property) const;
    std::uint32_t number(const std::string& property) const;
    std::string text(const std::string& property) const;

    std::string _folder;
    std::vector<platform::DirectoryEntry> _entries;
    std::size_t _next = 0;
    std::string _path;  // the current device's file
    std::string _name;  // and its device name
    zrjsonconfig::JsonTree _device;
    bool _atEnd = false;
};

// The device name of a simulated-device file named `fileName`, or "" when a file of that name
// is no simulated device: another extension, no name before it (".fake"), or a name that is not
// UTF-8 (the configuration file, which holds the name, is UTF-8).
std::string fakeDeviceName(const std::string& fileName);
// Whether `token` names a simulated device ("FAKE:TIKTAL:" and a name).
bool isSimulatedDevice(const std::string& token);
// The file of the simulated device `token` names.
std::string simulatedDeviceFile(const std::string& token);

}  // namespace tiktalsae
