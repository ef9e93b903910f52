#include "state.h"

#include "status.h"

namespace rocosim {
namespace {

std::string lowerCase(std::string text) {
    for (char& c : text)
        if (c >= 'A' && c <= 'Z') c = static_cast<char>(c - 'A' + 'a');
    return text;
}

}  // namespace

bool RouteAttributes::inversionNeeded() const {
    const auto found = parts[kConstraints].find("inversionNeeded");
    return found != parts[kConstraints].end() && !found->second.isText && found->second.flag;
}

std::uint32_t Service::nextHandle() {
    if (++_lastHandle == 0) ++_lastHandle;
    return _lastHandle;
}

std::uint32_t Service::createSession(bool immediate) {
    const std::uint32_t handle = nextHandle();
    _sessions[handle] = immediate;
    return handle;
}

void Service::destroySession(std::uint32_t session) {
    for (auto it = _routes.begin(); it != _routes.end();)
        it = it->second.session == session ? _routes.erase(it) : std::next(it);
    _sessions.erase(session);
}

bool Service::isImmediate(std::uint32_t session) const {
    const auto found = _sessions.find(session);
    if (found == _sessions.end()) failUnknownHandle("session", session);
    return found->second;
}

std::uint32_t Service::newAttributes() {
    const std::uint32_t handle = nextHandle();
    RouteAttributes& made = _attributes[handle];
    for (int part = 0; part < kParts; ++part) {
        made.partHandles[part] = nextHandle();
        _parts[made.partHandles[part]] = {handle, static_cast<Part>(part)};
    }
    return handle;
}

void Service::destroyAttributes(std::uint32_t attributes) {
    const auto found = _attributes.find(attributes);
    if (found == _attributes.end()) return;
    for (std::uint32_t part : found->second.partHandles) _parts.erase(part);
    _attributes.erase(found);
}

std::uint32_t Service::partOf(std::uint32_t attributes, Part part) const {
    const auto found = _attributes.find(attributes);
    return found == _attributes.end() ? 0 : found->second.partHandles[part];
}

RouteAttributes& Service::attributes(std::uint32_t handle) {
    const auto found = _attributes.find(handle);
    if (found == _attributes.end()) failUnknownHandle("attributes", handle);
    return found->second;
}

Settings& Service::settings(std::uint32_t part, bool modifiers) {
    const auto found = _parts.find(part);
    const bool isModifiers = found != _parts.end() && found->second.second >= kOptionalModifiers;
    if (found == _parts.end() || isModifiers != modifiers)
        failUnknownHandle(modifiers ? "modifiers" : "constraints", part);
    return _attributes.at(found->second.first).parts[found->second.second];
}

void Service::checkResetting(const std::string& device) const {
    if (_resetting.count(lowerCase(device)))
        fail(code::kDeviceResetting, "the device is being reset", {{"device", device}});
}

void Service::initiateDeviceReset(std::uint32_t session, const char* device) {
    isImmediate(session);
    const std::string name = knownDevice(device);
    if (!_resetting.insert(lowerCase(name)).second)
        fail(code::kResetInProgress, "a reset of the device is already in progress", {{"device", name}});
    removeRoutes([&](const Route& route) { return equalIgnoringCase(route.device, name); });
}

void Service::completeDeviceReset(std::uint32_t session, const char* device) {
    isImmediate(session);
    const std::string name = knownDevice(device);
    if (!_resetting.erase(lowerCase(name)))
        fail(code::kNoResetInProgress, "no reset of the device is in progress", {{"device", name}});
}

std::uint32_t Service::newDeviceContainer() {
    const std::uint32_t handle = nextHandle();
    _deviceContainers.insert(handle);
    return handle;
}

std::uint32_t Service::beginDevices(std::uint32_t container) {
    if (!_deviceContainers.count(container)) failUnknownHandle("container", container);
    const std::uint32_t iterator = nextHandle();
    _deviceIterators[iterator] = container;
    return iterator;
}

void Service::refuseAtEnd(std::uint32_t iterator) const {
    if (!_deviceIterators.count(iterator)) failUnknownHandle("iterator", iterator);
    fail(code::kInvalidArgument, "the iterator is at its end", {{"iterator", std::to_string(iterator)}});
}

void Service::destroyDeviceContainer(std::uint32_t container) {
    for (auto it = _deviceIterators.begin(); it != _deviceIterators.end();)
        it = it->second == container ? _deviceIterators.erase(it) : std::next(it);
    _deviceContainers.erase(container);
}

void Service::clear() {
    const std::uint32_t last = _lastHandle;
    *this = Service();
    _lastHandle = last;
}

Service& service() {
    static Service* instance = new Service();  // never destroyed: calls may come during exit
    return *instance;
}

std::mutex& serviceLock() {
    static std::mutex* lock = new std::mutex();
    return *lock;
}

}  // namespace rocosim
