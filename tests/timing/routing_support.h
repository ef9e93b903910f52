// Helpers of the routing tests: the routing service stand-in that the library loaded, its log and
// its routes, and statuses as the export layer reports them.
#pragma once

#include <cjson/cJSON.h>
#include <dlfcn.h>
#include <gtest/gtest.h>

#include <memory>
#include <string>
#include <vector>

#include "api/frame.h"
#include "errors/status_table.h"
#include "timing/routing.h"
#include "zrrocoapi_sim.h"

namespace routing_test {

using Json = std::unique_ptr<cJSON, decltype(&cJSON_Delete)>;

// The stand-in instance the library loaded: a bare-name dlopen returns the same one.
class Service {
public:
    Service() : _library(dlopen("libzrrocoapi.so", RTLD_NOW | RTLD_LOCAL)) {
        if (!_library) throw std::runtime_error(dlerror());
        _log = reinterpret_cast<zrrocoapi_sim_log_fn>(dlsym(_library, "zrrocoapi_sim_log"));
        _routes = reinterpret_cast<zrrocoapi_sim_routes_fn>(dlsym(_library, "zrrocoapi_sim_routes"));
        _reset = reinterpret_cast<zrrocoapi_sim_reset_fn>(dlsym(_library, "zrrocoapi_sim_reset"));
        _free = reinterpret_cast<zrrocoapi_destroyString_fn>(dlsym(_library, "zrrocoapi_destroyString"));
    }
    ~Service() { dlclose(_library); }

    void reset() const { _reset(); }
    // The calls so far, each its name and its arguments: calculateRoute{"session":7,...}.
    std::vector<std::string> calls() const {
        std::vector<std::string> lines;
        const Json log = take(_log());
        const cJSON* call = nullptr;
        cJSON_ArrayForEach(call, log.get()) {
            std::string line = cJSON_GetObjectItemCaseSensitive(call, "call")->valuestring;
            if (line == "destroyString") continue;  // the tests' own, freeing what they read
            char* args = cJSON_PrintUnformatted(cJSON_GetObjectItemCaseSensitive(call, "args"));
            line += args;
            cJSON_free(args);
            lines.push_back(line);
        }
        return lines;
    }
    // Just the names of the calls after the first `skip`.
    std::vector<std::string> callNames(std::size_t skip = 0) const {
        std::vector<std::string> names;
        for (const std::string& line : calls()) names.push_back(line.substr(0, line.find('{')));
        names.erase(names.begin(), names.begin() + static_cast<std::ptrdiff_t>(std::min(skip, names.size())));
        return names;
    }
    // "SOURCE->DESTINATION" of each route in effect on `device`, with "!" for an inverting one.
    std::vector<std::string> routes(const char* device) const {
        std::vector<std::string> found;
        const Json all = take(_routes(device));
        const cJSON* route = nullptr;
        cJSON_ArrayForEach(route, all.get()) {
            const bool inverting = cJSON_IsTrue(cJSON_GetObjectItemCaseSensitive(route, "inversionNeeded"));
            found.push_back(std::string(inverting ? "!" : "") +
                            cJSON_GetObjectItemCaseSensitive(route, "source")->valuestring + "->" +
                            cJSON_GetObjectItemCaseSensitive(route, "destination")->valuestring);
        }
        std::sort(found.begin(), found.end());
        return found;
    }

private:
    Json take(char* text) const {
        Json parsed(cJSON_Parse(text), cJSON_Delete);
        _free(text);
        return parsed;
    }

    void* _library;
    zrrocoapi_sim_log_fn _log;
    zrrocoapi_sim_routes_fn _routes;
    zrrocoapi_sim_reset_fn _reset;
    zrrocoapi_destroyString_fn _free;
};

// The status the export layer reports for what `body` raises, with its message.
template <class Body>
std::pair<ViStatus, std::string> reported(Body&& body) {
    const ViStatus status = tiktal::guard([&] {
        body();
        return VI_SUCCESS;
    });
    const zrerr::StatusRow* row = zrerr::findStatus(status);
    return {status, row ? row->message : ""};
}

}  // namespace routing_test
