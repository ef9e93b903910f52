// Loading the configuration file's text and merging the devices that discovery finds into it. The
// input is the whole text of the file; its length picks which of three modules discovery finds and
// in which order (white space after the JSON changes the length and nothing else).
//
// Reading alone: only the status exception may leave it, with one of the statuses the rules name
// and details that name the file. A text that is read is empty, or well-formed UTF-8 holding one
// JSON object whose versions the software can use, with no string that the escape \u0000 would
// cut short; every device of the file is in the data with
// its members unchanged, none twice; and what would be written back reads back as the same data.
//
// Loading with the driver's providers (without a chassis library) and merging: the load fails
// exactly when a device's PXI location is not a number that fits in 32 bits, with the type
// mismatch naming the member. Otherwise no device is lost and each discovered one is there; a
// device keeps the members the providers do not fill, in place, and gains the missing ones after
// them; a discovered device is present at its interface path with its serial number, PCI identity
// and address, and an alias of its own; a device not discovered is present only when simulated;
// what would be written back reads back as the same data, and loading it and merging the same
// modules again writes nothing.
#include <cjson/cJSON.h>
#include <strings.h>

#include <algorithm>
#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "config/attribute_provider.h"
#include "config/loader.h"
#include "config/pxi_attribute_provider.h"
#include "errors/zrerr.h"
#include "property.h"
#include "support/casefold.h"

namespace {

using tiktalfuzz::require;
using zrjsonconfig::ConfigurationData;
using zrjsonconfig::LoadedConfiguration;

constexpr char kPath[] = "/fuzz/var/lib/Korvane/tiktal/tiktal.config";

bool isRuleStatus(std::int32_t code) {
    switch (static_cast<std::uint32_t>(code)) {
    case static_cast<std::uint32_t>(-52004):  // not an object, not a number, out of range
    case static_cast<std::uint32_t>(-52005):  // not JSON
    case static_cast<std::uint32_t>(-52006):  // no "version"
    case static_cast<std::uint32_t>(-52013):  // a token twice
    case 0xBFFA917D:                           // the file is too new
    case 0xBFFA917E:                           // the software is too new
        return true;
    default:
        return false;
    }
}

const char* textOf(const cJSON* object, const char* name) {
    const cJSON* item = cJSON_GetObjectItemCaseSensitive(object, name);
    return cJSON_IsString(item) ? item->valuestring : "";
}

// Whether the details are a JSON object with the translator block and a record of which `matches`
// holds.
template <class Match>
bool hasRecord(const char* details, Match matches) {
    cJSON* root = cJSON_Parse(details);
    bool found = false;
    const cJSON* info = cJSON_GetObjectItemCaseSensitive(root, "translator_info");
    const cJSON* records = cJSON_GetObjectItemCaseSensitive(info, "ordered_data");
    if (std::strcmp(textOf(root, "translator"), "vllator_tiktal") == 0 && cJSON_IsArray(records))
        for (const cJSON* record = records->child; record; record = record->next) found = found || matches(record);
    cJSON_Delete(root);
    return found;
}

bool namesTheFile(const char* details) {
    return hasRecord(details, [](const cJSON* record) {
        return std::strcmp(textOf(record, "usage"), "kUsageTypeFilePath") == 0 &&
               std::strcmp(textOf(record, "value"), kPath) == 0;
    });
}

// Whether a comment of the details names the member `name` (quoted).
bool namesMember(const char* details, const std::string& name) {
    const std::string quoted = "\"" + name + "\"";
    return hasRecord(details,
                     [&](const cJSON* record) { return std::strstr(textOf(record, "comment"), quoted.c_str()); });
}

// Compared as printed: cJSON_Compare looks members up by name, so an object that has a name twice
// (which the file may, and which is kept as it is) would not equal its own copy.
std::string printed(const cJSON* item) {
    char* text = cJSON_PrintUnformatted(item);
    std::string copy = text ? text : "";
    cJSON_free(text);
    return copy;
}

double versionOf(const cJSON* root, const char* name, double otherwise) {
    const cJSON* item = cJSON_GetObjectItem(root, name);
    return item ? item->valuedouble : otherwise;
}

// Whether a string of the JSON text holds the escape \u0000 (decoded, a NUL that would cut the
// string short), found by walking the strings and their escapes one by one.
bool holdsEscapedNul(std::string_view text) {
    bool inString = false;
    for (std::size_t at = 0; at < text.size(); ++at) {
        if (!inString) {
            inString = text[at] == '"';
        } else if (text[at] == '"') {
            inString = false;
        } else if (text[at] == '\\') {
            if (text.substr(at + 1, 5) == "u0000") return true;
            ++at;  // the escaped character
        }
    }
    return false;
}

void checkRead(std::string_view text, const LoadedConfiguration& loaded) {
    const cJSON* snapshot = loaded.snapshot.get();
    if (text.empty()) {
        require(!snapshot && loaded.data.entries().empty(), "an empty file is a fresh configuration");
        return;
    }
    require(tiktalfuzz::isWellFormed(text) && text.find('\0') == std::string_view::npos,
            "a text that is read is UTF-8 without NUL bytes");
    require(cJSON_IsObject(snapshot), "a text that is read is an object");
    require(!holdsEscapedNul(text), "a text that is read has no string that an escaped NUL cuts short");
    const double version = versionOf(snapshot, "version", -1);
    const double oldest = versionOf(snapshot, "oldest_compatible_version", version);
    require(version >= 1 && version <= 4294967295.0 && version == std::trunc(version) && oldest >= 0 && oldest <= 1 &&
                oldest == std::trunc(oldest),
            "a file that is read has versions the software can use");

    const cJSON* devices = cJSON_GetObjectItem(snapshot, "devices");
    require(cJSON_GetArraySize(devices) == static_cast<int>(loaded.data.entries().size()),
            "every device of the file is in the data, none twice");
    for (const cJSON* device = devices ? devices->child : nullptr; device; device = device->next) {
        const auto entry = loaded.data.find(device->string);
        require(entry && printed(entry->configured()) == printed(device) && cJSON_GetArraySize(entry->provided()) == 0,
                "a device keeps its members and starts with no provided attributes");
    }

    // What a save would write reads back as the same data.
    const std::string written = loaded.data.configuredText();
    const LoadedConfiguration again = zrjsonconfig::parseConfiguration(written, kPath);
    require(printed(again.data.configuredJson().get()) == printed(loaded.data.configuredJson().get()),
            "the written text reads back as the same data");
}

// A timing module as discovery reports it.
struct Module {
    std::uint32_t vendor, deviceId, subsystemVendor, subsystemId, revision;
    std::uint32_t bus, deviceNumber, function, linkWidth, maxLinkWidth;
    const char* slotPath;
    const char* serial;
    const char* interfacePath;
};

// Two modules of one model, which only their place tells apart, and one of another model behind a
// bridge, which reports an empty serial number.
const Module kModules[] = {
    {0x1093, 0x7A21, 0x1093, 0x7A21, 0x02, 3, 0, 0, 4, 4, "0000:00:E0:00", "01A2B3C4", "/fuzz/dev/tiktal0"},
    {0x1093, 0x7A21, 0x1093, 0x7A21, 0x02, 4, 0, 0, 1, 4, "0000:00:E1:00", "01A2B3C5", "/fuzz/dev/tiktal1"},
    {0x1093, 0x7A44, 0x1093, 0x7B44, 0x01, 7, 0x0D, 1, 8, 8, "0000:00:E2:69", "", "/fuzz/dev/tiktal2"},
};

class Discovery final : public zrjsonconfig::DeviceIteratorInterface {
public:
    explicit Discovery(std::vector<const Module*> modules) : _modules(std::move(modules)) {}

    std::uint32_t getBusPropertyU32(const std::string& name) override {
        const Module& m = current();
        const std::pair<const char*, std::uint32_t> properties[] = {
            {"pciVendorID", m.vendor},
            {"pciDeviceID", m.deviceId},
            {"pciSubsystemVendorID", m.subsystemVendor},
            {"pciSubsystemID", m.subsystemId},
            {"pciRevision", m.revision},
            {"pciBusNumber", m.bus},
            {"pciDeviceNumber", m.deviceNumber},
            {"pciFunctionNumber", m.function},
            {"pcieLinkWidth", m.linkWidth},
            {"pcieMaxLinkWidth", m.maxLinkWidth},
        };
        for (const auto& [property, value] : properties)
            if (name == property) return value;
        require(false, "a provider asks only for properties a module has");
        return 0;
    }
    std::string getBusPropertyString(const std::string& name) override {
        require(name == "pciSlotPath", "a provider asks only for properties a module has");
        return current().slotPath;
    }
    std::uint32_t getDevicePropertyU32(const std::string&) override {
        require(false, "a provider asks only for properties a module has");
        return 0;
    }
    std::string getDevicePropertyString(const std::string& name) override {
        require(name == "serialNumber", "a provider asks only for properties a module has");
        return current().serial;
    }
    std::string getInterfacePath() override { return current().interfacePath; }
    std::string getToken() override { return zrjsonconfig::deviceToken(*this); }
    std::string getInstanceId() override { return std::string("PCI\\") + current().slotPath; }
    void next() override { ++_at; }
    bool isEnd() override { return _at >= _modules.size(); }

private:
    const Module& current() {
        require(!isEnd(), "nothing is asked of discovery past its end");
        return *_modules[_at];
    }

    std::vector<const Module*> _modules;
    std::size_t _at = 0;
};

std::string tokenOf(const Module& module) { return Discovery({&module}).getToken(); }

// The providers of a real device, without the chassis library.
struct Providers {
    zrjsonconfig::SimpleAliasFactory aliases{"Sync"};
    zrjsonconfig::CompositeAttributeProvider all;

    Providers() {
        using namespace zrjsonconfig;
        all.add(std::make_unique<AliasAttributeProvider>(aliases));
        all.add(std::make_unique<SerialNumberAttributeProvider>());
        all.add(std::make_unique<IsSimulatedAndIsPresentAttributeProvider>());
        all.add(std::make_unique<InterfacePathAttributeProvider>());
        all.add(std::make_unique<PXIAttributeProvider>(nullptr));
    }
};

// Members are looked up as the providers and other readers do: the first whose name matches
// ignoring ASCII case.
const cJSON* member(const cJSON* object, const char* name) { return cJSON_GetObjectItem(object, name); }

const char* textAlias(const cJSON* configured) {
    const cJSON* alias = member(configured, "alias");
    return cJSON_IsString(alias) ? alias->valuestring : nullptr;
}

bool isNumber(const cJSON* object, const char* name) { return cJSON_IsNumber(member(object, name)); }

bool hasNumber(const cJSON* object, const char* name, double value) {
    const cJSON* item = member(object, name);
    return cJSON_IsNumber(item) && item->valuedouble == value;
}

constexpr const char* kLocations[] = {"pxi_chassis_number", "pxi_slot_number"};

// A location is any number whose whole part fits in 32 bits signed.
bool isLocation(const cJSON* item) {
    return cJSON_IsNumber(item) && item->valuedouble > -2147483649.0 && item->valuedouble < 2147483648.0;
}

// The first member, in file order, that a load with the providers cannot take as a location.
const char* firstMistypedLocation(const cJSON* snapshot) {
    const cJSON* devices = cJSON_GetObjectItem(snapshot, "devices");
    for (const cJSON* device = devices ? devices->child : nullptr; device; device = device->next)
        for (const char* name : kLocations)
            if (member(device, name) && !isLocation(member(device, name))) return name;
    return nullptr;
}

// The file's identifiers stand only for a device not discovered: a discovered one is the module
// its token names.
bool keepsIdentifiers(const cJSON* before, const Module* module) {
    return !module && isNumber(before, "device_id") && isNumber(before, "subsystem_id");
}

// Each member of the file's object `before` that no provider fills is in `after` at the same
// place, unchanged; after them come the members it lacked, and no other.
void checkMembersKept(const cJSON* before, const cJSON* after, const Module* module) {
    std::vector<const char*> filled;  // which the providers may replace: the first of each name
    if (module && !textAlias(before)) filled.push_back("alias");
    if (module) filled.push_back("serial_number");
    if (!keepsIdentifiers(before, module)) filled.insert(filled.end(), {"device_id", "subsystem_id"});
    for (const char* name : kLocations) filled.push_back(name);

    const cJSON* kept = after->child;
    for (const cJSON* item = before->child; item; item = item->next, kept = kept->next) {
        require(kept != nullptr, "a device keeps all its members");
        bool replaced = false;
        for (const char*& name : filled)
            if (name && strcasecmp(name, item->string) == 0) {
                replaced = true;
                name = nullptr;  // later members of the same name are not the ones read
                break;
            }
        if (!replaced)
            require(std::strcmp(kept->string, item->string) == 0 && printed(kept) == printed(item),
                    "a member that no provider fills stays, unchanged and in its place");
    }

    std::vector<std::string> lacked, added;
    for (const char* name :
         {"alias", "serial_number", "simulated", "device_id", "subsystem_id", kLocations[0], kLocations[1]})
        if (!member(before, name) && (module || std::strcmp(name, "alias") != 0)) lacked.push_back(name);
    for (; kept; kept = kept->next) added.push_back(kept->string);
    std::sort(lacked.begin(), lacked.end());
    std::sort(added.begin(), added.end());
    require(added == lacked, "a device gains the members it lacked, after its own, and no other");
}

void checkDevice(const cJSON* before, const zrjsonconfig::DeviceEntry& entry, const Module* module) {
    const cJSON* configured = entry.configured();
    checkMembersKept(before, configured, module);

    const cJSON* serial = member(configured, "serial_number");
    if (module)
        require(cJSON_IsString(serial) && std::strcmp(serial->valuestring, module->serial) == 0,
                "a discovered device has the module's serial number");
    else if (!member(before, "serial_number"))
        require(cJSON_IsString(serial) && serial->valuestring[0] == '\0', "a device with no serial number gets \"\"");
    if (!member(before, "simulated"))
        require(cJSON_IsFalse(member(configured, "simulated")), "a device is not simulated unless it says so");

    if (!keepsIdentifiers(before, module))
        require(hasNumber(configured, "device_id", module ? module->deviceId : 0) &&
                    hasNumber(configured, "subsystem_id", module ? module->subsystemId : 0),
                "a discovered device has the module's identifiers; another the file's numbers, or 0");
    for (const char* name : kLocations) {
        const cJSON* location = member(before, name);
        require(hasNumber(configured, name, location ? std::trunc(location->valuedouble) : -1),
                "a device's PXI location is the file's (its whole part), -1 when missing");
    }

    const bool present = module || cJSON_IsTrue(member(configured, "simulated"));
    char provided[512];
    if (module)
        std::snprintf(provided, sizeof provided,
                      R"({"is_present":true,"interface_path":"%s","pci_bus":%u,"pci_device":%u,"pci_function":%u,)"
                      R"("pci_link_width":%u,"pci_max_link_width":%u})",
                      module->interfacePath, module->bus, module->deviceNumber, module->function, module->linkWidth,
                      module->maxLinkWidth);
    else
        std::snprintf(provided, sizeof provided,
                      R"({"is_present":%s,"interface_path":"","pci_bus":0,"pci_device":0,"pci_function":0,)"
                      R"("pci_link_width":-1,"pci_max_link_width":-1})",
                      present ? "true" : "false");
    require(printed(entry.provided()) == provided,
            "a discovered device is present at its interface path and PCI address; another only when simulated");
}

bool aliasInUse(const ConfigurationData& data, const std::string& alias, const std::string& except) {
    for (const auto& [token, entry] : data.entries()) {
        const char* other = textAlias(entry->configured());
        if (token != except && other && support::equalsIgnoringCase(other, alias)) return true;
    }
    return false;
}

// A new alias is "Sync" and the first number from 1 that no other device uses.
void checkNewAlias(const ConfigurationData& data, const std::string& token) {
    const char* alias = textAlias(data.find(token)->configured());
    require(alias && std::strncmp(alias, "Sync", 4) == 0 && alias[4] >= '1' && alias[4] <= '9' &&
                std::strspn(alias + 4, "0123456789") == std::strlen(alias + 4),
            "a discovered device without an alias gets \"Sync\" and a number");
    require(!aliasInUse(data, alias, token), "a new alias is one that no other device uses");
    const unsigned long number = std::strtoul(alias + 4, nullptr, 10);
    for (unsigned long smaller = 1; smaller < number; ++smaller)
        require(aliasInUse(data, "Sync" + std::to_string(smaller), token), "a new alias has the first free number");
}

bool aliasesDistinct(const ConfigurationData& data) {
    for (const auto& [token, entry] : data.entries())
        if (const char* alias = textAlias(entry->configured()); alias && aliasInUse(data, alias, token)) return false;
    return true;
}

void checkMerged(const LoadedConfiguration& file, const ConfigurationData& merged,
                 const std::vector<const Module*>& modules) {
    std::vector<std::string> discovered;
    for (const Module* module : modules) discovered.push_back(tokenOf(*module));
    const auto moduleOf = [&](const std::string& token) -> const Module* {
        const auto at = std::find(discovered.begin(), discovered.end(), token);
        return at == discovered.end() ? nullptr : modules[at - discovered.begin()];
    };

    std::vector<std::string> order;  // the file's devices not discovered, then the discovered ones
    const cJSON* devices = cJSON_GetObjectItem(file.snapshot.get(), "devices");
    for (const cJSON* device = devices ? devices->child : nullptr; device; device = device->next)
        if (!moduleOf(device->string)) order.push_back(device->string);
    order.insert(order.end(), discovered.begin(), discovered.end());
    std::vector<std::string> tokens;
    const zrjsonconfig::JsonTree written = merged.configuredJson();
    for (const cJSON* device = cJSON_GetObjectItem(written.get(), "devices")->child; device; device = device->next)
        tokens.push_back(device->string);
    require(tokens == order && merged.entries().size() == order.size(),
            "no device is lost: the file's devices not discovered, then the discovered ones in their order");

    const zrjsonconfig::JsonTree none = zrjsonconfig::newObject();
    for (const std::string& token : order) {
        const auto before = file.data.find(token);
        const cJSON* configured = before ? before->configured() : none.get();
        checkDevice(configured, *merged.find(token), moduleOf(token));
        if (moduleOf(token) && !textAlias(configured)) checkNewAlias(merged, token);
    }
    if (aliasesDistinct(file.data))
        require(aliasesDistinct(merged), "no two devices share an alias unless the file had them share");
}

// The modules discovery finds for a text of `size` bytes: any of the three, in either order.
std::vector<const Module*> discoveredModules(std::size_t size) {
    std::vector<const Module*> modules;
    for (unsigned at = 0; at < 3; ++at)
        if (size & (1u << at)) modules.push_back(&kModules[at]);
    if (size & 8) std::reverse(modules.begin(), modules.end());
    return modules;
}

void checkLoadAndMerge(const std::string& text, const LoadedConfiguration& file) {
    const std::vector<const Module*> modules = discoveredModules(text.size());
    const char* mistyped = firstMistypedLocation(file.snapshot.get());
    Providers providers;
    LoadedConfiguration loaded;
    try {
        loaded = zrjsonconfig::parseConfiguration(text, kPath, &providers.all);
    } catch (const zrerr::ExceptionBase& failure) {
        require(mistyped && failure.code() == -52004 && namesMember(failure.what(), mistyped),
                "loading with the providers fails only on a PXI location that is not a 32-bit number, and names it");
        return;
    }
    require(!mistyped, "a PXI location that is not a 32-bit number fails the load");
    require(printed(loaded.snapshot.get()) == printed(file.snapshot.get()),
            "the providers leave the file as read alone");

    Discovery discovery(modules);
    zrjsonconfig::mergeDiscovered(loaded.data, discovery, providers.all);
    checkMerged(file, loaded.data, modules);

    const std::string written = loaded.data.configuredText();
    const LoadedConfiguration reread = zrjsonconfig::parseConfiguration(written, kPath);
    require(printed(reread.data.configuredJson().get()) == printed(loaded.data.configuredJson().get()),
            "the merged data, written, reads back as the same data");

    LoadedConfiguration again = zrjsonconfig::parseConfiguration(written, kPath, &providers.all);
    Discovery rediscovery(modules);
    zrjsonconfig::mergeDiscovered(again.data, rediscovery, providers.all);
    require(printed(again.data.configuredJson().get()) == printed(again.snapshot.get()),
            "loading the written file and merging the same modules again changes nothing that would be saved");
    require(printed(again.data.providedJson().get()) == printed(loaded.data.providedJson().get()),
            "loading the written file and merging the same modules again provides the same attributes");
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const std::string text(reinterpret_cast<const char*>(data), size);
    LoadedConfiguration file;
    try {
        file = zrjsonconfig::parseConfiguration(text, kPath);
    } catch (const zrerr::ExceptionBase& failure) {
        require(isRuleStatus(failure.code()), "a failure has one of the statuses of the rules");
        require(namesTheFile(failure.what()), "a failure's details carry the translator block and name the file");
        return 0;
    }
    checkRead(text, file);
    checkLoadAndMerge(text, file);
    return 0;
}
