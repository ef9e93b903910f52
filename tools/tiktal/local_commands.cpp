// The commands of local devices: the device list, routes between a module's terminals, and reset.
#include <iostream>
#include <string>

#include "commands.h"
#include "config/device_list.h"
#include "errors.h"
#include "errors/zrerr.h"
#include "output.h"
#include "session.h"

namespace cli {
namespace {

// The list as the library builds it when a local device is opened; its failure is reported as
// the library would return it.
zrjsonconfig::ConfigurationData deviceList() {
    try {
        return tiktalsae::loadDeviceList();
    } catch (const zrerr::ExceptionBase& failure) {
        throw StatusError{"loading the device list", zrerr::normalize(failure.code())};
    }
}

std::string text(const cJSON* object, const char* name) {
    const cJSON* item = cJSON_GetObjectItem(object, name);
    return cJSON_IsString(item) ? item->valuestring : "";
}

std::string number(const cJSON* object, const char* name) {
    const cJSON* item = cJSON_GetObjectItem(object, name);
    return cJSON_IsNumber(item) ? std::to_string(static_cast<long long>(item->valuedouble)) : "";
}

std::string yesNo(const cJSON* object, const char* name) { return cJSON_IsTrue(cJSON_GetObjectItem(object, name)) ? "yes" : "no"; }

std::string hex(const cJSON* object, const char* name) {
    const cJSON* item = cJSON_GetObjectItem(object, name);
    if (!cJSON_IsNumber(item)) return "";
    char buffer[16];
    std::snprintf(buffer, sizeof buffer, "0x%04llX", static_cast<long long>(item->valuedouble));
    return buffer;
}

Row deviceRow(const zrjsonconfig::DeviceEntry& device) {
    const cJSON* configured = device.configured();
    const cJSON* provided = device.provided();
    const std::string pxi = number(configured, "pxi_chassis_number") == "-1"
                                ? "-"
                                : number(configured, "pxi_chassis_number") + "/" + number(configured, "pxi_slot_number");
    return {text(configured, "alias"),
            yesNo(provided, "is_present"),
            yesNo(configured, "simulated"),
            number(provided, "pci_bus") + ":" + number(provided, "pci_device") + "." + number(provided, "pci_function"),
            pxi,
            hex(configured, "device_id"),
            text(configured, "serial_number"),
            device.token()};
}

// Each device as one object: its token, its configured and then its provided attributes.
cJSON* deviceJson(const zrjsonconfig::DeviceEntry& device) {
    cJSON* json = cJSON_CreateObject();
    cJSON_AddStringToObject(json, "token", device.token().c_str());
    for (const cJSON* attributes : {device.configured(), device.provided()})
        for (const cJSON* item = attributes->child; item; item = item->next)
            cJSON_AddItemToObject(json, item->string, cJSON_Duplicate(item, true));
    return json;
}

void printRouting(const Options& options, const char* action) {
    if (!options.json) {
        std::cout << action << ' ' << options.source << " -> " << options.destination << " on " << options.resource
                  << (options.clock ? " (clock)" : "") << '\n';
        return;
    }
    Json json(cJSON_CreateObject());
    cJSON_AddStringToObject(json.get(), "resource", options.resource.c_str());
    cJSON_AddStringToObject(json.get(), action, (options.source + " -> " + options.destination).c_str());
    cJSON_AddBoolToObject(json.get(), "clock", options.clock);
    printJson(json.get());
}

}  // namespace

void devicesCommand(const Options& options) {
    const zrjsonconfig::ConfigurationData list = deviceList();
    if (options.json) {
        Json json(cJSON_CreateArray());
        for (const auto& [token, device] : list.entries()) cJSON_AddItemToArray(json.get(), deviceJson(*device));
        printJson(json.get());
        return;
    }
    std::vector<Row> rows = {{"ALIAS", "PRESENT", "SIMULATED", "PCI", "PXI", "DEVICE", "SERIAL", "TOKEN"}};
    for (const auto& [token, device] : list.entries()) rows.push_back(deviceRow(*device));
    printTable(rows);
}

// The route lasts as long as the session: the command shows that the module makes it.
void routeCommand(const Options& options) {
    Session session(options.resource, false);
    if (options.clock)
        check("tiktal_ConnectClkTerminals",
              tiktal_ConnectClkTerminals(session.vi(), options.source.c_str(), options.destination.c_str()));
    else
        check("tiktal_ConnectTrigTerminals",
              tiktal_ConnectTrigTerminals(session.vi(), options.source.c_str(), options.destination.c_str(),
                                          options.syncClock.c_str(), options.invert ? 1 : 0, 0));
    session.close();
    printRouting(options, "routed");
}

void unrouteCommand(const Options& options) {
    Session session(options.resource, false);
    if (options.clock)
        check("tiktal_DisconnectClkTerminals",
              tiktal_DisconnectClkTerminals(session.vi(), options.source.c_str(), options.destination.c_str()));
    else
        check("tiktal_DisconnectTrigTerminals",
              tiktal_DisconnectTrigTerminals(session.vi(), options.source.c_str(), options.destination.c_str()));
    session.close();
    printRouting(options, "unrouted");
}

void resetCommand(const Options& options) {
    Session session(options.resource, false);
    check("tiktal_reset", tiktal_reset(session.vi()));
    session.close();
    if (!options.json) {
        std::cout << "reset: " << options.resource << '\n';
        return;
    }
    Json json(cJSON_CreateObject());
    cJSON_AddStringToObject(json.get(), "resource", options.resource.c_str());
    cJSON_AddBoolToObject(json.get(), "reset", true);
    printJson(json.get());
}

}  // namespace cli
