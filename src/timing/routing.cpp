#include "timing/routing.h"

#include <algorithm>
#include <iterator>

#include "errors/zrerr.h"
#include "platform/platform.h"
#include "timing/call_status.h"

namespace tiktal {
namespace {

using zrrocoapi::call;

constexpr char kAllConnected[] = "AllConnected";
constexpr char kClk10[] = "PXI_Clk10";
constexpr char kClk10In[] = "PXI_Clk10_In";
constexpr char kClkOut[] = "ClkOut";
constexpr char kLvds[] = "PFI_LVDS";
constexpr char kSyncClkAsync[] = "SyncClkAsync";

// Sources the module never routes, and destinations it never drives.
const char* const kRefusedSources[] = {"GlobalSoftwareTrigger", "ClkIn",           "PXI_Clk10",       "PXIe_Clk100",
                                       "SyncClkFullSpeed",      "SyncClkDivided1", "SyncClkDivided2", "DDS"};
const char* const kRefusedDestinations[] = {
    "PXIe_DStarA0", "PXIe_DStarA1",  "PXIe_DStarA2",  "PXIe_DStarA3",  "PXIe_DStarA4",  "PXIe_DStarA5",
    "PXIe_DStarA6", "PXIe_DStarA7",  "PXIe_DStarA8",  "PXIe_DStarA9",  "PXIe_DStarA10", "PXIe_DStarA11",
    "PXIe_DStarA12", "PXIe_DStarA13", "PXIe_DStarA14", "PXIe_DStarA15", "PXIe_DStarA16"};
// The clock routes the module makes although their source is refused otherwise.
const std::pair<const char*, const char*> kClockPairs[] = {{"ClkIn", kClk10In}, {kClk10, kClkOut}};

char upper(char c) { return c >= 'a' && c <= 'z' ? static_cast<char>(c - 32) : c; }

// Terminal names compare ignoring ASCII case, whatever locale the application has set.
bool sameName(const std::string& a, const char* b) {
    const std::string other = b;
    return a.size() == other.size() && std::equal(a.begin(), a.end(), other.begin(), [](char x, char y) { return upper(x) == upper(y); });
}

bool containsName(const std::string& text, const char* part) {
    std::string upperText(text), upperPart(part);
    std::transform(upperText.begin(), upperText.end(), upperText.begin(), upper);
    std::transform(upperPart.begin(), upperPart.end(), upperPart.begin(), upper);
    return upperText.find(upperPart) != std::string::npos;
}

template <std::size_t N>
bool inList(const std::string& name, const char* const (&list)[N]) {
    return std::any_of(std::begin(list), std::end(list), [&](const char* entry) { return sameName(name, entry); });
}

std::string required(ViConstString terminal, const char* func) {
    if (!terminal) throw ZRERR_RAISE(tiktalerr_invParameter).debug("func", func).debug("msg", "terminal name is NULL");
    return terminal;
}

// The clock operations name PXI_Clk10's input by the clock's own name.
std::string clockDestination(const std::string& destination) { return sameName(destination, kClk10) ? kClk10In : destination; }

}  // namespace

std::unique_ptr<RoutingLibrary> loadRoutingLibrary() {
    return std::make_unique<RoutingLibrary>(platform::libraryFileName("zrrocoapi"));
}

std::string qualifyTerminal(const std::string& alias, const std::string& name) {
    return !name.empty() && name[0] == '/' ? name : "/" + alias + "/" + name;
}

std::string stripTerminal(const std::string& name) {
    if (name.empty() || name[0] != '/') return name;
    const std::size_t second = name.find('/', 1);
    return second == std::string::npos ? name : name.substr(second + 1);
}

bool isRoutable(const std::string& source, const std::string& destination) {
    for (const auto& [pairSource, pairDestination] : kClockPairs)
        if (sameName(source, pairSource) && sameName(destination, pairDestination)) return true;
    if (inList(source, kRefusedSources) || inList(destination, kRefusedDestinations)) return false;
    return !(containsName(source, kLvds) && destination == kClkOut);
}

Routing::Routing(std::string alias, std::unique_ptr<RoutingLibrary> library)
    : _alias(std::move(alias)), _library(std::move(library)), _immediate(_library->get()) {}

void Routing::connectTrigTerminals(ViConstString srcTerminal, ViConstString destTerminal, ViConstString syncClock,
                                   ViInt32 invert, ViInt32) {
    constexpr char kFunc[] = "tiktal::PxieQ300tSession::connectTrigTerminals";
    const std::string source = required(srcTerminal, kFunc), destination = required(destTerminal, kFunc);
    const std::string qualifiedSource = qualifyTerminal(_alias, source);
    const std::string qualifiedDestination = qualifyTerminal(_alias, destination);
    if (qualifiedSource == qualifiedDestination) throw ZRERR_RAISE(tiktalerr_invParameter).debug("func", kFunc);
    if (!isRoutable(stripTerminal(source), stripTerminal(destination)))
        throw ZRERR_RAISE(tiktalerr_featureNotSupported).debug("func", kFunc);
    if (syncClock && *syncClock && !sameName(syncClock, kSyncClkAsync))
        throw ZRERR_RAISE(tiktalerr_syncClkInvalid).debug("func", kFunc);
    const int inversionNeeded = invert != 0 ? 1 : 0;
    connect(qualifiedSource, qualifiedDestination, &inversionNeeded);
}

void Routing::connectClkTerminals(ViConstString srcTerminal, ViConstString destTerminal) {
    constexpr char kFunc[] = "tiktal::PxieQ300tSession::connectClkTerminals";
    const std::string source = required(srcTerminal, kFunc);
    const std::string destination = clockDestination(required(destTerminal, kFunc));
    const std::string qualifiedSource = qualifyTerminal(_alias, source);
    const std::string qualifiedDestination = qualifyTerminal(_alias, destination);
    if (qualifiedSource == qualifiedDestination) throw ZRERR_RAISE(tiktalerr_invParameter).debug("func", kFunc);
    if (!isRoutable(stripTerminal(source), stripTerminal(destination)))
        throw ZRERR_RAISE(tiktalerr_featureNotSupported).debug("func", kFunc);
    connect(qualifiedSource, qualifiedDestination, nullptr);
}

void Routing::disconnectTrigTerminals(ViConstString srcTerminal, ViConstString destTerminal) {
    constexpr char kFunc[] = "tiktal::PxieQ300tSession::disconnectTrigTerminals";
    disconnect(required(srcTerminal, kFunc), required(destTerminal, kFunc));
}

void Routing::disconnectClkTerminals(ViConstString srcTerminal, ViConstString destTerminal) {
    constexpr char kFunc[] = "tiktal::PxieQ300tSession::disconnectClkTerminals";
    disconnect(required(srcTerminal, kFunc), clockDestination(required(destTerminal, kFunc)));
}

// Route attributes with lifetime 1 (and, for a trigger route, whether to invert), the route
// calculated on the immediate session; the attributes are destroyed whichever way it ends.
void Routing::connect(const std::string& source, const std::string& destination, const int* inversionNeeded) {
    auto& lib = _library->get();
    const roco::RouteAttributes attributes(lib);
    call([&](zrrocoapi_Status* st) { lib.RouteAttributes_setLifetime(attributes.handle(), 1, st); });
    if (inversionNeeded) {
        const std::uint32_t constraints = lib.RouteAttributes_getConstraints(attributes.handle());
        call([&](zrrocoapi_Status* st) {
            lib.RouteConstraints_setBoolConstraint(constraints, "inversionNeeded", *inversionNeeded, st);
        });
    }
    call([&](zrrocoapi_Status* st) {
        return lib.calculateRoute(_immediate.handle(), source.c_str(), destination.c_str(), attributes.handle(), st);
    });
}

// "AllConnected" at either end removes routes in bulk; otherwise the one route goes.
void Routing::disconnect(const std::string& source, const std::string& destination) {
    auto& lib = _library->get();
    const std::uint32_t session = _immediate.handle();
    const bool allSources = sameName(source, kAllConnected), allDestinations = sameName(destination, kAllConnected);
    const std::string qualifiedSource = qualifyTerminal(_alias, source);
    const std::string qualifiedDestination = qualifyTerminal(_alias, destination);
    call([&](zrrocoapi_Status* st) {
        if (allSources && allDestinations)
            lib.destroyImmediateRoutesOnDevice(session, _alias.c_str(), st);
        else if (allDestinations)
            lib.destroyImmediateRoutesFromSource(session, qualifiedSource.c_str(), st);
        else if (allSources)
            lib.destroyImmediateRoutesToDest(session, qualifiedDestination.c_str(), st);
        else
            lib.destroyImmediateRoute(session, qualifiedSource.c_str(), qualifiedDestination.c_str(), st);
    });
}

}  // namespace tiktal
