#include "terminals.h"

#include "status.h"

#include <cstdlib>
#include <cstring>

namespace rocosim {
namespace {

void addLines(std::vector<Terminal>& list, const std::string& prefix, int count, Terminal kind) {
    for (int i = 0; i < count; ++i) {
        kind.name = prefix + std::to_string(i);
        list.push_back(kind);
    }
}

std::vector<Terminal> makeTerminals() {
    const Terminal line{"", true, true, true}, frontPanel{"", true, true, false};
    std::vector<Terminal> list;
    addLines(list, "PXI_Trig", 8, line);
    addLines(list, "PXI_Star", 17, line);
    // The differential star lines A and B carry signals from the timing slot to the other slots,
    // C from the other slots back to the timing slot.
    addLines(list, "PXIe_DStarA", 17, {"", false, true, true});
    addLines(list, "PXIe_DStarB", 17, {"", false, true, true});
    addLines(list, "PXIe_DStarC", 17, {"", true, false, true});
    addLines(list, "PFI", 6, frontPanel);
    addLines(list, "PFI_LVDS", 3, frontPanel);
    for (const char* name : {"ClkIn", "PXI_Clk10", "PXIe_Clk100", "SyncClkFullSpeed", "SyncClkDivided1",
                             "SyncClkDivided2", "DDS", "GlobalSoftwareTrigger"})
        list.push_back({name, true, false, false});
    for (const char* name : {"ClkOut", "PXI_Clk10_In"}) list.push_back({name, false, true, false});
    return list;
}

char lower(char c) { return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c; }

// Whether the comma-separated list in the environment variable names the device.
bool listed(const char* list, const std::string& device) {
    for (const char* at = list;; ++at) {
        const char* end = std::strchr(at, ',');
        std::string item(at, end ? end : at + std::strlen(at));
        const auto first = item.find_first_not_of(" \t");
        const auto last = item.find_last_not_of(" \t");
        if (first != std::string::npos && equalIgnoringCase(item.substr(first, last - first + 1), device)) return true;
        if (!end) return false;
        at = end;
    }
}

}  // namespace

const std::vector<Terminal>& terminals() {
    static const std::vector<Terminal> list = makeTerminals();
    return list;
}

const Terminal* findTerminal(const std::string& name) {
    for (const Terminal& terminal : terminals())
        if (equalIgnoringCase(terminal.name, name)) return &terminal;
    return nullptr;
}

bool equalIgnoringCase(const std::string& a, const std::string& b) {
    if (a.size() != b.size()) return false;
    for (std::size_t i = 0; i < a.size(); ++i)
        if (lower(a[i]) != lower(b[i])) return false;
    return true;
}

std::string parseQualified(const char* text, QualifiedName& name) {
    if (!text) return "no terminal name (null)";
    const std::string whole(text);
    if (whole.empty() || whole[0] != '/') return "a terminal name starts with \"/\": /DEVICE/TERMINAL";
    const auto second = whole.find('/', 1);
    if (second == std::string::npos) return "a terminal name has a device and a terminal: /DEVICE/TERMINAL";
    if (whole.find('/', second + 1) != std::string::npos) return "a terminal name has two parts: /DEVICE/TERMINAL";
    name.device = whole.substr(1, second - 1);
    name.terminal = whole.substr(second + 1);
    if (name.device.empty()) return "the device part of the terminal name is empty";
    if (name.terminal.empty()) return "the terminal part of the terminal name is empty";
    return {};
}

bool deviceExists(const std::string& device) {
    const char* list = std::getenv("ZRROCOAPI_SIM_DEVICES");
    return !device.empty() && device.find('/') == std::string::npos && (!list || listed(list, device));
}

std::string knownDevice(const char* device) {
    if (!device || !deviceExists(device)) fail(code::kDeviceNotFound, "no such device", {{"device", textOf(device)}});
    return device;
}

bool chassisIdentified(const std::string& device) {
    const char* list = std::getenv("ZRROCOAPI_SIM_UNIDENTIFIED");
    return !list || !listed(list, device);
}

Endpoint resolve(const char* text, bool source, const Args& context) {
    const std::int32_t invalid = source ? code::kSourceInvalid : code::kDestinationInvalid;
    const char* role = source ? "source" : "destination";
    QualifiedName name;
    const std::string malformed = parseQualified(text, name);
    if (!malformed.empty()) fail(invalid, std::string("malformed ") + role + " terminal: " + malformed, context);
    Args withDevice = context;
    withDevice.push_back({"device", name.device});
    if (!deviceExists(name.device))
        fail(code::kDeviceNotFound, std::string("no such device in the ") + role, withDevice);
    const Terminal* terminal = findTerminal(name.terminal);
    if (!terminal) fail(invalid, std::string("no such ") + role + " terminal", context);
    if (terminal->backplane && !chassisIdentified(name.device))
        fail(source ? code::kSourceNeedsChassis : code::kDestinationNeedsChassis,
             std::string("the ") + role + " terminal exists only when the chassis is identified", withDevice);
    return {name.device, terminal};
}

RouteEnds resolveRoute(const char* source, const char* destination) {
    const Args context = {{"source", textOf(source)}, {"destination", textOf(destination)}};
    const Endpoint from = resolve(source, true, context);
    return {context, from, resolve(destination, false, context)};
}

}  // namespace rocosim
