// Resource names of the time service: "sync://HOST/DEVICE".
#pragma once

#include <string>

namespace horloUtils {

class HorloUri {
public:
    // Fails with tiktalerr_invalidResourceNameFormat unless the scheme is "sync" in any case and
    // the host and the device name are not empty; the device name holds no further "/", the host
    // no "@", "?", "#", "\\", white space, control character or malformed UTF-8.
    explicit HorloUri(const std::string& resourceName);

    std::string getHost() const { return _host; }
    std::string getDeviceName() const { return _deviceName; }

private:
    std::string _scheme;
    std::string _host;  // as written: a ":port" stays part of it
    std::string _deviceName;
};

// True for a time-service resource name; other failures than a malformed name pass through.
bool isHorloUri(const std::string& resourceName);

}  // namespace horloUtils
