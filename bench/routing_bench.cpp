// One trigger route connected and disconnected through the timing module's routing operations,
// against the same calls of the routing service stand-in made directly in the same order.
#include <benchmark/benchmark.h>
#include <dlfcn.h>

#include <cstdlib>
#include <stdexcept>
#include <string>

#include "timing/call_status.h"
#include "timing/routing.h"

namespace {

void RoutingConnectDisconnect(benchmark::State& state) {
    tiktal::Routing routing("Dev1", tiktal::loadRoutingLibrary());
    for (auto _ : state) {
        routing.connectTrigTerminals("PFI0", "PXI_Trig0", nullptr, 1, 0);
        routing.disconnectTrigTerminals("PFI0", "PXI_Trig0");
    }
}

// The service's functions by name, from the same library.
template <class Function>
Function find(void* library, const char* name) {
    void* symbol = dlsym(library, name);
    if (!symbol) throw std::runtime_error(std::string("missing ") + name);
    return reinterpret_cast<Function>(symbol);
}

std::int32_t reallocate(zrrocoapi_Status* status, std::uint32_t capacity) {
    void* text = capacity ? std::realloc(status->json, capacity) : (std::free(status->json), nullptr);
    if (capacity && !text) return 0;
    status->json = static_cast<char*>(text);
    status->capacity = capacity;
    return 1;
}

void DirectServiceCalls(benchmark::State& state) {
    void* library = dlopen("libzrrocoapi.so", RTLD_NOW | RTLD_LOCAL);
    if (!library) {
        state.SkipWithError(dlerror());
        return;
    }
    const auto createImmediateSession = find<zrrocoapi_createImmediateSession_fn>(library, "zrrocoapi_createImmediateSession");
    const auto destroySession = find<zrrocoapi_destroySession_fn>(library, "zrrocoapi_destroySession");
    const auto attributesNew = find<zrrocoapi_RouteAttributes_new_fn>(library, "zrrocoapi_RouteAttributes_new");
    const auto setLifetime = find<zrrocoapi_RouteAttributes_setLifetime_fn>(library, "zrrocoapi_RouteAttributes_setLifetime");
    const auto getConstraints =
        find<zrrocoapi_RouteAttributes_getConstraints_fn>(library, "zrrocoapi_RouteAttributes_getConstraints");
    const auto setBool = find<zrrocoapi_RouteConstraints_setBoolConstraint_fn>(library, "zrrocoapi_RouteConstraints_setBoolConstraint");
    const auto calculate = find<zrrocoapi_calculateRoute_fn>(library, "zrrocoapi_calculateRoute");
    const auto attributesDestroy = find<zrrocoapi_RouteAttributes_destroy_fn>(library, "zrrocoapi_RouteAttributes_destroy");
    const auto destroyRoute = find<zrrocoapi_destroyImmediateRoute_fn>(library, "zrrocoapi_destroyImmediateRoute");
    zrrocoapi_Status st{0, 0, reallocate, nullptr};
    const std::uint32_t session = createImmediateSession(&st);
    for (auto _ : state) {
        const std::uint32_t attributes = attributesNew(&st);
        setLifetime(attributes, 1, &st);
        setBool(getConstraints(attributes), "inversionNeeded", 1, &st);
        calculate(session, "/Dev1/PFI0", "/Dev1/PXI_Trig0", attributes, &st);
        attributesDestroy(attributes);
        destroyRoute(session, "/Dev1/PFI0", "/Dev1/PXI_Trig0", &st);
        if (st.code != 0) {
            state.SkipWithError("the service refused the route");
            break;
        }
    }
    destroySession(session);
    reallocate(&st, 0);
    dlclose(library);
}

BENCHMARK(RoutingConnectDisconnect);
BENCHMARK(DirectServiceCalls);

}  // namespace

BENCHMARK_MAIN();
