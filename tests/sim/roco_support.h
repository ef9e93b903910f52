// Helpers of the routing-service stand-in's tests: the library opened the way the driver opens
// it, its entry points found with dlsym, status records, and the JSON texts it answers.
#pragma once

#include "RoCoLib.h"
#include "zrrocoapi_sim.h"

#include <cjson/cJSON.h>
#include <dlfcn.h>
#include <gtest/gtest.h>

#include <cstdlib>
#include <memory>
#include <string>

namespace roco_test {

struct JsonDeleter {
    void operator()(cJSON* item) const { cJSON_Delete(item); }
};
using Json = std::unique_ptr<cJSON, JsonDeleter>;

inline Json parse(const char* text) { return Json(text ? cJSON_Parse(text) : nullptr); }

inline std::string textOf(const cJSON* object, const char* key) {
    const cJSON* item = cJSON_GetObjectItemCaseSensitive(object, key);
    return cJSON_IsString(item) ? item->valuestring : "<missing " + std::string(key) + ">";
}

inline double numberOf(const cJSON* object, const char* key) {
    const cJSON* item = cJSON_GetObjectItemCaseSensitive(object, key);
    return cJSON_IsNumber(item) ? item->valuedouble : -1e9;
}

inline bool isTrue(const cJSON* object, const char* key) {
    return cJSON_IsTrue(cJSON_GetObjectItemCaseSensitive(object, key));
}

// A fresh status record per call, with a reallocate that works as the driver's does; `refusing`
// makes every reallocation fail.
class Status {
public:
    explicit Status(bool refusing = false) : _record{0, 0, refusing ? &refuse : &grow, nullptr} {}
    ~Status() { std::free(_record.json); }
    Status(const Status&) = delete;
    Status& operator=(const Status&) = delete;

    zrrocoapi_Status* get() { return &_record; }
    std::int32_t code() const { return _record.code; }
    const char* text() const { return _record.json; }
    // The details, or null when they are not a JSON object.
    Json details() const {
        Json parsed = parse(_record.json);
        return cJSON_IsObject(parsed.get()) ? std::move(parsed) : nullptr;
    }

private:
    static std::int32_t grow(zrrocoapi_Status* st, std::uint32_t capacity) {
        if (capacity > 0x7FFFFFFFu) return 0;
        char* text = static_cast<char*>(std::realloc(st->json, capacity ? capacity : 1));
        if (!text) return 0;
        st->json = text;
        st->capacity = capacity;
        return 1;
    }
    static std::int32_t refuse(zrrocoapi_Status*, std::uint32_t) { return 0; }

    zrrocoapi_Status _record;
};

// The library opened by bare file name, as the driver opens it; never closed, as the driver keeps it.
inline void* library() {
    static void* handle = dlopen("libzrrocoapi.so", RTLD_NOW | RTLD_LOCAL);
    return handle;
}

template <class Pointer>
Pointer find(void* lib, const char* name) {
    Pointer found = lib ? reinterpret_cast<Pointer>(dlsym(lib, name)) : nullptr;
    if (!found) ADD_FAILURE() << "not exported: " << name;
    return found;
}

// The entry points the tests call.
struct Roco {
#define ROCO_ENTRY(name) zrrocoapi_##name##_fn name = find<zrrocoapi_##name##_fn>(library(), "zrrocoapi_" #name)
    ROCO_ENTRY(createSession);
    ROCO_ENTRY(createRemoteSession);
    ROCO_ENTRY(createImmediateSession);
    ROCO_ENTRY(destroySession);
    ROCO_ENTRY(calculateRoute);
    ROCO_ENTRY(reserveRoute);
    ROCO_ENTRY(programRoute);
    ROCO_ENTRY(unprogramRoute);
    ROCO_ENTRY(destroyRoute);
    ROCO_ENTRY(destroyImmediateRoute);
    ROCO_ENTRY(destroyAllImmediateRoutes);
    ROCO_ENTRY(destroyImmediateRoutesOnDevice);
    ROCO_ENTRY(destroyImmediateRoutesFromSource);
    ROCO_ENTRY(destroyImmediateRoutesToDest);
    ROCO_ENTRY(showRoute);
    ROCO_ENTRY(getRouteInfo);
    ROCO_ENTRY(getRoutableDevices);
    ROCO_ENTRY(DeviceContainer_begin);
    ROCO_ENTRY(DeviceIterator_isEnd);
    ROCO_ENTRY(DeviceIterator_getDeviceName);
    ROCO_ENTRY(DeviceContainer_destroy);
    ROCO_ENTRY(TerminalContainer_begin);
    ROCO_ENTRY(TerminalIterator_getBoolAttribute);
    ROCO_ENTRY(getSystemChangeNumber);
    ROCO_ENTRY(hasTerminalInformationChanged);
    ROCO_ENTRY(getTerminalNamesAndAttributesForDevice);
    ROCO_ENTRY(destroyStringArray);
    ROCO_ENTRY(destroyString);
    ROCO_ENTRY(resetTerminal);
    ROCO_ENTRY(validateTerminalURI);
    ROCO_ENTRY(areTerminalURIsEqual);
    ROCO_ENTRY(RouteAttributes_new);
    ROCO_ENTRY(RouteAttributes_destroy);
    ROCO_ENTRY(RouteAttributes_getConstraints);
    ROCO_ENTRY(RouteAttributes_getRequiredModifiers);
    ROCO_ENTRY(RouteAttributes_setLifetime);
    ROCO_ENTRY(RouteAttributes_setOwnerName);
    ROCO_ENTRY(RouteConstraints_setBoolConstraint);
    ROCO_ENTRY(RouteConstraints_setStringConstraint);
    ROCO_ENTRY(RouteModifiers_setBoolModifier);
    ROCO_ENTRY(initiateDeviceReset);
    ROCO_ENTRY(completeDeviceReset);
    ROCO_ENTRY(sim_log);
    ROCO_ENTRY(sim_routes);
    ROCO_ENTRY(sim_reset);
#undef ROCO_ENTRY

    // A text the library handed out, parsed and freed.
    Json take(char* text) const {
        Json parsed = parse(text);
        destroyString(text);
        return parsed;
    }
    Json routes(const char* device) const { return take(sim_routes(device)); }
    Json log() const { return take(sim_log()); }

    // A route made as the driver connects terminals: attributes with lifetime 1 and the constraint
    // "inversionNeeded", the route calculated, the attributes destroyed. Returns the route handle.
    std::uint32_t connect(std::uint32_t session, const char* source, const char* destination, bool invert,
                          Status& st) const {
        Status step;
        const std::uint32_t attributes = RouteAttributes_new(step.get());
        RouteAttributes_setLifetime(attributes, 1, step.get());
        RouteConstraints_setBoolConstraint(RouteAttributes_getConstraints(attributes), "inversionNeeded", invert,
                                           step.get());
        EXPECT_EQ(step.code(), 0) << step.text();
        const std::uint32_t route = calculateRoute(session, source, destination, attributes, st.get());
        RouteAttributes_destroy(attributes);
        return route;
    }
    std::uint32_t connect(std::uint32_t session, const char* source, const char* destination,
                          bool invert = false) const {
        Status st;
        const std::uint32_t route = connect(session, source, destination, invert, st);
        EXPECT_EQ(st.code(), 0) << source << " -> " << destination << ": " << (st.text() ? st.text() : "");
        return route;
    }
};

}  // namespace roco_test
