#include <cinttypes>
#include <cstdio>
#include <iterator>

#include "config/device_iterator.h"
#include "config/failure.h"
#include "support/casefold.h"

namespace zrjsonconfig {
namespace {

constexpr Status kNotFound{-52006, "zrapalerr"};
constexpr Status kInvalidValue{-52005, "zrapalerr"};

// A failure that names the file (or the property) and says what was wrong with it.
[[noreturn]] void fail(Status status, const std::string& path, const std::string& what, platform::OsError error = {}) {
    ZRJSONCONFIG_FAILURE(status).usage(kUsageTypeFilePath, path).comment(what).osError(error).raise();
}

[[noreturn]] void failOs(const platform::OsError& error, const std::string& path, const std::string& what) {
    fail({platform::statusOfOsError(error.code), "zrapalerr"}, path, what, error);
}

// Where each bus property lives: a file of the PCI device's folder, its text hexadecimal ("0x1093"),
// decimal ("4") or a link speed ("2.5 GT/s PCIe").
enum class Form { Hex, Decimal, LinkSpeed };
struct BusFile {
    const char* property;
    const char* file;
    Form form;
};
constexpr BusFile kBusFiles[] = {
    {"pciVendorID", "vendor", Form::Hex},
    {"pciDeviceID", "device", Form::Hex},
    {"pciSubsystemVendorID", "subsystem_vendor", Form::Hex},
    {"pciSubsystemID", "subsystem_device", Form::Hex},
    {"pciRevision", "revision", Form::Hex},
    {"pcieLinkWidth", "current_link_width", Form::Decimal},
    {"pcieMaxLinkWidth", "max_link_width", Form::Decimal},
    {"pcieTransferRate", "current_link_speed", Form::LinkSpeed},
    {"pcieMaxTransferRate", "max_link_speed", Form::LinkSpeed},
};

// A whole number in `text`, checked: digits only, within 32 bits.
std::uint32_t parseNumber(const std::string& text, int base, const std::string& path) {
    const char* what = base == 16 ? "The file holds no hexadecimal number of 32 bits" : "The file holds no decimal number of 32 bits";
    std::size_t at = base == 16 && text.compare(0, 2, "0x") == 0 ? 2 : 0;
    if (at >= text.size() || text.size() - at > (base == 16 ? 8u : 10u)) fail(kInvalidValue, path, what);
    std::uint64_t value = 0;
    for (; at < text.size(); ++at) {
        const char c = text[at];
        const int digit = c >= '0' && c <= '9' ? c - '0' : base == 16 && c >= 'a' && c <= 'f' ? c - 'a' + 10
                        : base == 16 && c >= 'A' && c <= 'F' ? c - 'A' + 10 : -1;
        if (digit < 0) fail(kInvalidValue, path, what);
        value = value * static_cast<unsigned>(base) + static_cast<unsigned>(digit);
    }
    if (value > 0xFFFFFFFFu) fail(kInvalidValue, path, what);
    return static_cast<std::uint32_t>(value);
}

// The transfer-rate code of a link speed: 1 for 2.5 GT/s up to 5 for 32.0 GT/s, 0 when unknown.
std::uint32_t linkSpeedCode(const std::string& text) {
    const char* const kSpeeds[] = {"2.5 GT/s", "5.0 GT/s", "8.0 GT/s", "16.0 GT/s", "32.0 GT/s"};
    for (std::uint32_t code = 0; code < 5; ++code)
        if (text.compare(0, std::string(kSpeeds[code]).size(), kSpeeds[code]) == 0) return code + 1;
    return 0;
}


// Bus, device and function of a PCI folder name "DDDD:BB:DD.F".
std::uint32_t addressPart(const std::string& folder, int part, const std::string& path) {
    if (folder.size() != 12 || folder[4] != ':' || folder[7] != ':' || folder[10] != '.')
        fail(kInvalidValue, path, "The PCI folder's name is not DDDD:BB:DD.F");
    const std::string piece = part == 0 ? folder.substr(5, 2) : part == 1 ? folder.substr(8, 2) : folder.substr(11, 1);
    return parseNumber(piece, 16, path);
}

}  // namespace

APALDeviceIterator::APALDeviceIterator() {
    std::string path;
    if (const platform::OsError error = platform::enumerateDeviceInterfaces(_entries, path))
        failOs(error, path, "Failed to list the timing modules");
    settle();
}

void APALDeviceIterator::settle() {
    while (_index < _entries.size() && !readCurrent()) ++_index;
}

bool APALDeviceIterator::readCurrent() {
    const platform::DeviceInterfaceEntry& device = _entries[_index];
    _files.clear();
    for (const BusFile& bus : kBusFiles) _files.push_back({device.pciFolder + "/" + bus.file, {}, 0});
    _files.push_back({device.classFolder + "/serial_number", {}, 0});
    bool failed = false;
    for (FileRead& file : _files) {
        file.error = platform::readAttributeFile(file.path, file.text);
        failed = failed || file.error != 0;
    }
    return !failed || platform::exists(device.classFolder);
}

const std::string& APALDeviceIterator::fileText(std::size_t at) {
    current();
    const FileRead& file = _files[at];
    if (file.error) failOs({"open", file.error}, file.path, "Failed to read file");
    return file.text;
}

const platform::DeviceInterfaceEntry& APALDeviceIterator::current() const {
    if (_index >= _entries.size()) fail(kNotFound, "sys/class/tiktal", "No current device");
    return _entries[_index];
}

std::uint32_t APALDeviceIterator::getBusPropertyU32(const std::string& name) {
    const platform::DeviceInterfaceEntry& device = current();
    static const char* const kAddress[] = {"pciBusNumber", "pciDeviceNumber", "pciFunctionNumber"};
    for (int part = 0; part < 3; ++part)
        if (name == kAddress[part]) return addressPart(device.pciPath.back(), part, device.pciFolder);
    for (std::size_t at = 0; at < std::size(kBusFiles); ++at) {
        if (name != kBusFiles[at].property) continue;
        const std::string& text = fileText(at);
        const Form form = kBusFiles[at].form;
        return form == Form::LinkSpeed ? linkSpeedCode(text) : parseNumber(text, form == Form::Hex ? 16 : 10, _files[at].path);
    }
    fail(kNotFound, device.pciFolder, "No property " + name);
}

// The slot path: the root element, then one element of (device << 3 | function) per PCI function
// on the way down, the device's own last.
std::string APALDeviceIterator::getBusPropertyString(const std::string& name) {
    if (name != "pciSlotPath") return std::to_string(getBusPropertyU32(name));
    const platform::DeviceInterfaceEntry& device = current();
    char element[16];
    std::snprintf(element, sizeof element, "0000:%02X", static_cast<unsigned>(device.rootIndex));
    std::string path = element;
    for (const std::string& function : device.pciPath) {
        const std::uint32_t slot = (addressPart(function, 1, device.pciFolder) & 0x1F) << 3 |
                                   (addressPart(function, 2, device.pciFolder) & 7);
        std::snprintf(element, sizeof element, ":%02X", static_cast<unsigned>(slot));
        path += element;
    }
    return path;
}

std::uint32_t APALDeviceIterator::getDevicePropertyU32(const std::string& name) {
    return parseNumber(getDevicePropertyString(name), 16, _files.back().path);
}

// Text from the machine goes into the configuration file, which is UTF-8.
std::string APALDeviceIterator::getDevicePropertyString(const std::string& name) {
    if (name != "serialNumber") fail(kNotFound, current().classFolder, "No property " + name);
    const std::string& text = fileText(std::size(kBusFiles));
    if (!support::isValidUtf8(text)) fail(kInvalidValue, _files.back().path, "The file is not valid UTF-8");
    return text;
}

std::string APALDeviceIterator::getInterfacePath() { return current().interfacePath; }

std::string APALDeviceIterator::getToken() { return deviceToken(*this); }

std::string APALDeviceIterator::getInstanceId() { return "PCI\\" + current().pciPath.back(); }

void APALDeviceIterator::next() {
    if (_index >= _entries.size()) return;
    ++_index;
    settle();
}

bool APALDeviceIterator::isEnd() { return _index >= _entries.size(); }

std::string deviceToken(DeviceIteratorInterface& device) {
    // Read one after the other, so that the first unreadable property is the one reported.
    const std::uint32_t vendor = device.getBusPropertyU32("pciVendorID");
    const std::uint32_t id = device.getBusPropertyU32("pciDeviceID");
    const std::uint32_t subsystemVendor = device.getBusPropertyU32("pciSubsystemVendorID");
    const std::uint32_t subsystem = device.getBusPropertyU32("pciSubsystemID");
    const std::uint32_t revision = device.getBusPropertyU32("pciRevision");
    char identity[64];
    std::snprintf(identity, sizeof identity, "PCI:VEN_%04X&DEV_%04X&SUBSYS_%04X%04X&REV_%02X/", vendor, id,
                  subsystemVendor, subsystem, revision);
    return identity + device.getBusPropertyString("pciSlotPath");
}

CompositeDeviceIterator::CompositeDeviceIterator(std::vector<std::unique_ptr<DeviceIteratorInterface>> iterators)
    : _iterators(std::move(iterators)) {
    skipEnded();
}

DeviceIteratorInterface& CompositeDeviceIterator::current() {
    if (isEnd()) fail(kNotFound, "sys/class/tiktal", "No current device");
    return *_iterators[_position];
}

void CompositeDeviceIterator::next() {
    if (isEnd()) return;
    _iterators[_position]->next();
    skipEnded();
}

void CompositeDeviceIterator::skipEnded() {
    while (_position < _iterators.size() && (!_iterators[_position] || _iterators[_position]->isEnd())) ++_position;
}

}  // namespace zrjsonconfig
