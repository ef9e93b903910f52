// Requests to a timing module's kernel driver: not reached on Windows yet. Enumeration finds no
// module, so no session asks for a channel; a caller that does gets "not supported".
#include "platform/platform.h"
#include "platform/windows/windows.h"

namespace platform {

struct DeviceChannel::State {
    std::string path;
};

DeviceChannel::DeviceChannel() : _state(std::make_unique<State>()) {}
DeviceChannel::~DeviceChannel() = default;

int DeviceChannel::open(const std::string& path) noexcept {
    _state->path = path;
    return error::kNotSupported;
}

void DeviceChannel::close() noexcept {}
bool DeviceChannel::isOpen() const noexcept { return false; }
const std::string& DeviceChannel::path() const noexcept { return _state->path; }

int DeviceChannel::control(std::uint32_t, const void*, std::uint32_t, void*, std::uint32_t,
                           std::uint32_t& returned) noexcept {
    returned = 0;
    return error::kNotSupported;
}

DeviceWait::~DeviceWait() = default;

int DeviceWait::arm(const std::string&, std::uint32_t, const void*, std::uint32_t, std::uint64_t& identifier) noexcept {
    identifier = 0;
    return error::kNotSupported;
}

int DeviceWait::awaitEnd() noexcept { return error::kNotSupported; }
void DeviceWait::abandon() noexcept {}

}  // namespace platform
