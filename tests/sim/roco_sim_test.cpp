// The routing-service stand-in as the driver uses it: libzrrocoapi.so opened by bare file name
// (this program's RUNPATH names the build folder), every call made through dlsym.
#include "roco_support.h"

#include <fstream>
#include <set>
#include <thread>
#include <vector>

using namespace roco_test;

namespace {

constexpr std::int32_t kSourceInvalid = -89120, kDestinationInvalid = -89121, kDestinationInUse = -89123,
                       kNoSuchRoute = -89124, kResetInProgress = -89125, kNoResetInProgress = -89126,
                       kDestinationInverted = -89127, kDeviceNotFound = -89130, kRoutedBySession = -89132,
                       kAcrossDevices = -89139, kDeviceResetting = -89140, kSourceNeedsChassis = -89141,
                       kDestinationNeedsChassis = -89142, kSourceCannotDrive = -89150, kInvalidArgument = -89168;

class RocoSim : public ::testing::Test {
protected:
    void SetUp() override {
        ASSERT_NE(library(), nullptr) << dlerror();
        unsetenv("ZRROCOAPI_SIM_DEVICES");
        unsetenv("ZRROCOAPI_SIM_UNIDENTIFIED");
        unsetenv("ZRROCOAPI_SIM_LOG");
        roco.sim_reset();
        Status st;
        session = roco.createImmediateSession(st.get());
        ASSERT_EQ(st.code(), 0);
    }

    // The (source, destination) pairs of the routes in effect on the device.
    std::set<std::pair<std::string, std::string>> routesOn(const char* device) const {
        std::set<std::pair<std::string, std::string>> pairs;
        Json list = roco.routes(device);
        const cJSON* route;
        cJSON_ArrayForEach(route, list.get()) pairs.insert({textOf(route, "source"), textOf(route, "destination")});
        return pairs;
    }

    Roco roco;
    std::uint32_t session = 0;
};

using Pairs = std::set<std::pair<std::string, std::string>>;

TEST(RocoLibrary, ExportsTheTableAndTheTestEntriesOnly) {
    ASSERT_NE(library(), nullptr) << dlerror();
    Dl_info info{};
    ASSERT_NE(dladdr(dlsym(library(), "zrrocoapi_createSession"), &info), 0);
    EXPECT_EQ(std::string(info.dli_fname), ROCO_LIBRARY) << "the bare name found another file";

    std::set<std::string> expected = {"zrrocoapi_sim_log", "zrrocoapi_sim_routes", "zrrocoapi_sim_reset"};
    for (const char* name : zrrocoapi::dynlib::kFunctionNames) {
        EXPECT_NE(dlsym(library(), name), nullptr) << name;
        expected.insert(name);
    }
    const std::string command = std::string(ROCO_NM) + " -D --defined-only --format=posix " + ROCO_LIBRARY;
    FILE* pipe = popen(command.c_str(), "r");
    ASSERT_NE(pipe, nullptr);
    std::set<std::string> exported;
    char name[512];
    char type;
    while (std::fscanf(pipe, "%511s %c %*[^\n]", name, &type) == 2)
        if (type == 'T' || type == 'W' || type == 'D' || type == 'B') exported.insert(name);
    EXPECT_EQ(pclose(pipe), 0);
    EXPECT_EQ(exported, expected);
}

TEST(RocoLibrary, BrokenCopyLacksShowRouteAndCompleteDeviceReset) {
    // Opened first, the broken copy would be what every later dlopen of the bare name returns:
    // both carry the same SONAME.
    ASSERT_NE(library(), nullptr) << dlerror();
    void* broken = dlopen(ROCO_BROKEN_DIR "/missing-symbols/libzrrocoapi.so", RTLD_NOW | RTLD_LOCAL);
    ASSERT_NE(broken, nullptr) << dlerror();
    std::vector<std::string> missing;
    for (const char* name : zrrocoapi::dynlib::kFunctionNames)
        if (!dlsym(broken, name)) missing.push_back(name);
    EXPECT_EQ(missing, (std::vector<std::string>{"zrrocoapi_showRoute", "zrrocoapi_completeDeviceReset"}));
    EXPECT_NE(broken, library()) << "the broken copy is another file";
}

TEST_F(RocoSim, SessionsAreDistinctAndRemoteOnesRefused) {
    Status st;
    const std::uint32_t other = roco.createImmediateSession(st.get());
    const std::uint32_t planned = roco.createSession(st.get());
    EXPECT_EQ(st.code(), 0);
    EXPECT_EQ((std::set<std::uint32_t>{0, session, other, planned}.size()), 4u);

    Status remote;
    EXPECT_EQ(roco.createRemoteSession("target.example", remote.get()), 0u);
    EXPECT_EQ(remote.code(), kDeviceNotFound);
    EXPECT_EQ(textOf(remote.details().get(), "host"), "target.example");

    // Ending a session ends its routes; an unknown session is no failure.
    roco.connect(other, "/Dev1/PFI0", "/Dev1/PXI_Trig0");
    roco.destroySession(other);
    roco.destroySession(0);
    roco.destroySession(0xFFFFFFFFu);
    EXPECT_EQ(routesOn("Dev1"), Pairs{});
}

TEST_F(RocoSim, ConnectRecordsLifetimeAndInversion) {
    const std::uint32_t inverted = roco.connect(session, "/Dev1/PFI0", "/Dev1/PXI_Trig0", true);
    const std::uint32_t plain = roco.connect(session, "/dev1/pfi1", "/DEV1/pxi_trig1", false);
    EXPECT_NE(inverted, 0u);
    EXPECT_NE(plain, inverted);

    Json routes = roco.routes("dev1");
    ASSERT_EQ(cJSON_GetArraySize(routes.get()), 2);
    const cJSON* first = cJSON_GetArrayItem(routes.get(), 0);
    EXPECT_EQ(textOf(first, "source"), "/Dev1/PFI0");
    EXPECT_EQ(textOf(first, "destination"), "/Dev1/PXI_Trig0");
    EXPECT_EQ(numberOf(first, "session"), session);
    EXPECT_EQ(numberOf(first, "lifetime"), 1);
    EXPECT_TRUE(isTrue(first, "inversionNeeded"));
    const cJSON* second = cJSON_GetArrayItem(routes.get(), 1);
    EXPECT_EQ(textOf(second, "source"), "/dev1/PFI1") << "the terminal as the service spells it";
    EXPECT_EQ(textOf(second, "destination"), "/dev1/PXI_Trig1") << "the device as the source names it";
    EXPECT_FALSE(isTrue(second, "inversionNeeded"));
    EXPECT_EQ(roco.routes("Dev2").get()->child, nullptr);
}

TEST_F(RocoSim, AttributesOfEveryKindTravelWithTheRoute) {
    Status st;
    const std::uint32_t attributes = roco.RouteAttributes_new(st.get());
    roco.RouteAttributes_setOwnerName(attributes, "bench", st.get());
    roco.RouteConstraints_setStringConstraint(roco.RouteAttributes_getConstraints(attributes), "via", "PXI_Trig3",
                                              st.get());
    roco.RouteModifiers_setBoolModifier(roco.RouteAttributes_getRequiredModifiers(attributes), "fast", 1, st.get());
    const std::uint32_t route = roco.calculateRoute(session, "/Dev1/ClkIn", "/Dev1/PXI_Clk10_In", attributes, st.get());
    roco.RouteAttributes_destroy(attributes);
    ASSERT_EQ(st.code(), 0) << st.text();

    Json info = roco.take(roco.getRouteInfo(session, route, st.get()));
    EXPECT_EQ(textOf(info.get(), "owner"), "bench");
    EXPECT_EQ(numberOf(info.get(), "lifetime"), 0) << "no lifetime set";
    EXPECT_EQ(textOf(cJSON_GetObjectItem(info.get(), "constraints"), "via"), "PXI_Trig3");
    EXPECT_TRUE(isTrue(cJSON_GetObjectItem(info.get(), "requiredModifiers"), "fast"));
    EXPECT_FALSE(isTrue(info.get(), "inversionNeeded")) << "a text constraint is no inversion";

    // The attributes and their parts are gone with them.
    EXPECT_EQ(roco.RouteAttributes_getConstraints(attributes), 0u);
    Status gone;
    roco.RouteAttributes_setLifetime(attributes, 1, gone.get());
    EXPECT_EQ(gone.code(), kInvalidArgument);
    roco.RouteConstraints_setBoolConstraint(attributes + 1, "inversionNeeded", 1, gone.get());
    EXPECT_EQ(gone.code(), kInvalidArgument);
}

TEST_F(RocoSim, ShowRouteAndRouteInfoDescribeTheRoute) {
    const std::uint32_t route = roco.connect(session, "/Dev1/PFI2", "/Dev1/PXI_Star3", true);
    Status st;
    Json shown = roco.take(roco.showRoute(session, "/dev1/pfi2", "/dev1/pxi_star3", st.get()));
    Json info = roco.take(roco.getRouteInfo(session, route, st.get()));
    ASSERT_EQ(st.code(), 0);
    ASSERT_TRUE(cJSON_IsObject(shown.get()));
    EXPECT_TRUE(cJSON_Compare(shown.get(), info.get(), true));
    EXPECT_EQ(numberOf(shown.get(), "route"), route);
    EXPECT_EQ(textOf(shown.get(), "state"), "programmed");
    EXPECT_TRUE(isTrue(shown.get(), "inversionNeeded"));

    Status missing;
    EXPECT_EQ(roco.showRoute(session, "/Dev1/PFI3", "/Dev1/PXI_Star3", missing.get()), nullptr);
    EXPECT_EQ(missing.code(), kNoSuchRoute);
    Status otherSession;
    const std::uint32_t other = roco.createImmediateSession(otherSession.get());
    EXPECT_EQ(roco.getRouteInfo(other, route, otherSession.get()), nullptr) << "a route of another session";
    EXPECT_EQ(otherSession.code(), kInvalidArgument);
}

struct Refusal {
    const char* source;
    const char* destination;
    std::int32_t code;
};

TEST_F(RocoSim, ImpossibleRoutesAreRefusedWithTheirCodeAndNamedTerminals) {
    setenv("ZRROCOAPI_SIM_DEVICES", "Dev1, Dev2,Dev3", 1);
    setenv("ZRROCOAPI_SIM_UNIDENTIFIED", "Dev3", 1);
    const Refusal refusals[] = {
        {"/Dev1/NoSuchTerminal", "/Dev1/PXI_Trig0", kSourceInvalid},
        {"/Dev1/ClkOut", "/Dev1/PFI0", kSourceCannotDrive},
        {"/Dev1/PXIe_DStarA0", "/Dev1/PFI0", kSourceCannotDrive},
        {"/Dev1/PFI0", "/Dev1/PXI_Trig8", kDestinationInvalid},
        {"/Dev1/PFI0", "/Dev1/GlobalSoftwareTrigger", kDestinationInvalid},
        {"/Dev1/PFI0", "/Dev1/pfi0", kDestinationInvalid},
        {"/Dev9/PFI0", "/Dev9/PFI1", kDeviceNotFound},
        {"/Dev1/PFI0", "/Dev9/PFI1", kDeviceNotFound},
        {"/Dev3/PXI_Trig0", "/Dev3/PFI0", kSourceNeedsChassis},
        {"/Dev3/PXIe_DStarC4", "/Dev3/PFI0", kSourceNeedsChassis},
        {"/Dev3/PFI0", "/Dev3/PXI_Star16", kDestinationNeedsChassis},
        {"/Dev1/PFI0", "/Dev2/PFI0", kAcrossDevices},
        {nullptr, "/Dev1/PFI0", kSourceInvalid},
        {"/Dev1/PFI0", nullptr, kDestinationInvalid},
        {"", "/Dev1/PFI0", kSourceInvalid},
        {"PFI0", "/Dev1/PFI1", kSourceInvalid},
        {"/Dev1", "/Dev1/PFI1", kSourceInvalid},
        {"//PFI0", "/Dev1/PFI1", kSourceInvalid},
        {"/Dev1/PFI0", "/Dev1/", kDestinationInvalid},
        {"/Dev1/PFI0", "/Dev1/PFI1/", kDestinationInvalid},
        {"/Dev1/PFI0", "/Dev1/a/PFI1", kDestinationInvalid},
    };
    for (const Refusal& refusal : refusals) {
        SCOPED_TRACE(std::string(refusal.source ? refusal.source : "(null)") + " -> " +
                     (refusal.destination ? refusal.destination : "(null)"));
        Status st;
        EXPECT_EQ(roco.connect(session, refusal.source, refusal.destination, false, st), 0u);
        EXPECT_EQ(st.code(), refusal.code);
        Json details = st.details();
        ASSERT_NE(details, nullptr) << "the details are a JSON object";
        EXPECT_EQ(numberOf(details.get(), "code"), refusal.code);
        EXPECT_EQ(textOf(details.get(), "func"), "zrrocoapi_calculateRoute");
        const cJSON* source = cJSON_GetObjectItem(details.get(), "source");
        const cJSON* destination = cJSON_GetObjectItem(details.get(), "destination");
        EXPECT_TRUE(refusal.source ? cJSON_IsString(source) && source->valuestring == std::string(refusal.source)
                                   : cJSON_IsNull(source));
        EXPECT_TRUE(refusal.destination
                        ? cJSON_IsString(destination) && destination->valuestring == std::string(refusal.destination)
                        : cJSON_IsNull(destination));
    }
    EXPECT_EQ(roco.routes(nullptr).get()->child, nullptr) << "no refused route was made";
    // The same names route once the chassis is identified and the device is listed.
    unsetenv("ZRROCOAPI_SIM_UNIDENTIFIED");
    setenv("ZRROCOAPI_SIM_DEVICES", "Dev3,Dev9", 1);
    roco.connect(session, "/Dev3/PXI_Trig0", "/Dev3/PFI0");
    roco.connect(session, "/Dev9/PFI0", "/Dev9/PFI1");
}

TEST_F(RocoSim, DestinationDrivenAlreadyIsRefusedUnlessItIsTheSameRoute) {
    const std::uint32_t route = roco.connect(session, "/Dev1/PFI0", "/Dev1/PXI_Trig0", true);
    EXPECT_EQ(roco.connect(session, "/Dev1/pfi0", "/Dev1/PXI_TRIG0", true), route) << "the same route again";

    Status other, inverted, foreign;
    roco.connect(session, "/Dev1/PFI1", "/Dev1/PXI_Trig0", true, other);
    EXPECT_EQ(other.code(), kDestinationInUse);
    EXPECT_EQ(textOf(other.details().get(), "drivenBy"), "/Dev1/PFI0");
    roco.connect(session, "/Dev1/PFI0", "/Dev1/PXI_Trig0", false, inverted);
    EXPECT_EQ(inverted.code(), kDestinationInverted);
    const std::uint32_t second = roco.createImmediateSession(foreign.get());
    roco.connect(second, "/Dev1/PFI0", "/Dev1/PXI_Trig0", true, foreign);
    EXPECT_EQ(foreign.code(), kRoutedBySession);

    // The same destination on another device is another terminal; one source may drive many.
    roco.connect(second, "/Dev2/PFI1", "/Dev2/PXI_Trig0");
    roco.connect(session, "/Dev1/PFI0", "/Dev1/PXI_Trig1");
    EXPECT_EQ(routesOn("Dev1"), (Pairs{{"/Dev1/PFI0", "/Dev1/PXI_Trig0"}, {"/Dev1/PFI0", "/Dev1/PXI_Trig1"}}));
}

TEST_F(RocoSim, PlannedSessionRoutesTakeEffectWhenProgrammed) {
    Status st;
    const std::uint32_t planned = roco.createSession(st.get());
    const std::uint32_t route = roco.calculateRoute(planned, "/Dev1/PFI0", "/Dev1/PXI_Trig0", 0, st.get());
    ASSERT_EQ(st.code(), 0);
    EXPECT_EQ(routesOn("Dev1"), Pairs{}) << "calculated, not in effect";
    roco.reserveRoute(planned, route, st.get());
    roco.programRoute(planned, route, st.get());
    EXPECT_EQ(routesOn("Dev1"), (Pairs{{"/Dev1/PFI0", "/Dev1/PXI_Trig0"}}));
    Status busy;
    roco.connect(session, "/Dev1/PFI1", "/Dev1/PXI_Trig0", false, busy);
    EXPECT_EQ(busy.code(), kDestinationInUse);
    roco.unprogramRoute(planned, route, st.get());
    EXPECT_EQ(routesOn("Dev1"), Pairs{});
    roco.destroyRoute(planned, route, st.get());
    EXPECT_EQ(st.code(), 0);
    roco.programRoute(planned, route, st.get());
    EXPECT_EQ(st.code(), kInvalidArgument) << "the route is gone";
}

TEST_F(RocoSim, DestroyingOneRouteAndRoutesInBulk) {
    const auto connectAll = [&] {
        roco.sim_reset();
        Status st;
        session = roco.createImmediateSession(st.get());
        roco.connect(session, "/Dev1/PFI0", "/Dev1/PXI_Trig0");
        roco.connect(session, "/Dev1/PFI0", "/Dev1/PXI_Trig1");
        roco.connect(session, "/Dev1/PFI1", "/Dev1/PXI_Trig2");
        roco.connect(session, "/Dev2/PFI0", "/Dev2/PXI_Trig0");
    };
    Status st;
    connectAll();
    roco.destroyImmediateRoute(session, "/DEV1/PFI0", "/Dev1/pxi_trig1", st.get());
    EXPECT_EQ(st.code(), 0);
    EXPECT_EQ(routesOn("Dev1"), (Pairs{{"/Dev1/PFI0", "/Dev1/PXI_Trig0"}, {"/Dev1/PFI1", "/Dev1/PXI_Trig2"}}));
    Status again;
    roco.destroyImmediateRoute(session, "/Dev1/PFI0", "/Dev1/PXI_Trig1", again.get());
    EXPECT_EQ(again.code(), kNoSuchRoute);
    EXPECT_EQ(textOf(again.details().get(), "destination"), "/Dev1/PXI_Trig1");

    roco.destroyImmediateRoutesFromSource(session, "/Dev1/PFI0", st.get());
    EXPECT_EQ(routesOn("Dev1"), (Pairs{{"/Dev1/PFI1", "/Dev1/PXI_Trig2"}}));
    EXPECT_EQ(routesOn("Dev2").size(), 1u) << "the same terminal on another device stays";

    connectAll();
    roco.destroyImmediateRoutesToDest(session, "/Dev1/PXI_Trig2", st.get());
    EXPECT_EQ(routesOn("Dev1"), (Pairs{{"/Dev1/PFI0", "/Dev1/PXI_Trig0"}, {"/Dev1/PFI0", "/Dev1/PXI_Trig1"}}));

    connectAll();
    roco.destroyImmediateRoutesOnDevice(session, "dev1", st.get());
    EXPECT_EQ(routesOn("Dev1"), Pairs{});
    EXPECT_EQ(routesOn("Dev2").size(), 1u);
    EXPECT_EQ(st.code(), 0);
    Status qualified;
    roco.destroyImmediateRoutesOnDevice(session, "/Dev2", qualified.get());
    EXPECT_EQ(qualified.code(), kDeviceNotFound) << "the device alias is unqualified";

    connectAll();
    roco.destroyAllImmediateRoutes(session, st.get());
    EXPECT_EQ(roco.routes(nullptr).get()->child, nullptr);
    EXPECT_EQ(st.code(), 0);
    roco.destroyImmediateRoutesFromSource(session, "/Dev1/PFI5", st.get());
    EXPECT_EQ(st.code(), 0) << "nothing to remove is no failure";
}

TEST_F(RocoSim, DeviceResetRemovesRoutesAndIsMarkedUntilCompleted) {
    roco.connect(session, "/Dev1/PFI0", "/Dev1/PXI_Trig0");
    roco.connect(session, "/Dev2/PFI0", "/Dev2/PXI_Trig0");
    Status st;
    const std::uint32_t resetting = roco.createSession(st.get());
    roco.initiateDeviceReset(resetting, "Dev1", st.get());
    ASSERT_EQ(st.code(), 0);
    EXPECT_EQ(routesOn("Dev1"), Pairs{});
    EXPECT_EQ(routesOn("Dev2").size(), 1u);

    Status during, twice;
    roco.connect(session, "/Dev1/PFI0", "/Dev1/PXI_Trig0", false, during);
    EXPECT_EQ(during.code(), kDeviceResetting);
    roco.initiateDeviceReset(resetting, "DEV1", twice.get());
    EXPECT_EQ(twice.code(), kResetInProgress);
    EXPECT_EQ(textOf(twice.details().get(), "device"), "DEV1");

    roco.completeDeviceReset(resetting, "Dev1", st.get());
    EXPECT_EQ(st.code(), 0);
    roco.connect(session, "/Dev1/PFI0", "/Dev1/PXI_Trig0");
    Status notStarted, unknown;
    roco.completeDeviceReset(resetting, "Dev1", notStarted.get());
    EXPECT_EQ(notStarted.code(), kNoResetInProgress);
    roco.initiateDeviceReset(0, "Dev1", unknown.get());
    EXPECT_EQ(unknown.code(), kInvalidArgument);
    setenv("ZRROCOAPI_SIM_DEVICES", "Dev1", 1);
    roco.initiateDeviceReset(resetting, "Dev2", unknown.get());
    EXPECT_EQ(unknown.code(), kDeviceNotFound);
}

TEST_F(RocoSim, LogRecordsEveryCallInOrderAndTheLogFileOneLineEach) {
    const std::string path = ::testing::TempDir() + "roco_sim_log_" + std::to_string(getpid()) + ".jsonl";
    std::remove(path.c_str());
    setenv("ZRROCOAPI_SIM_LOG", path.c_str(), 1);
    roco.sim_reset();
    Status st;
    roco.calculateRoute(7777, "/Dev1/PFI0", nullptr, 0, st.get());
    roco.destroySession(7777);
    unsetenv("ZRROCOAPI_SIM_LOG");

    Json log = roco.log();
    ASSERT_EQ(cJSON_GetArraySize(log.get()), 2);
    const cJSON* first = cJSON_GetArrayItem(log.get(), 0);
    EXPECT_EQ(textOf(first, "call"), "calculateRoute");
    EXPECT_EQ(numberOf(first, "code"), kInvalidArgument);
    const cJSON* args = cJSON_GetObjectItem(first, "args");
    EXPECT_EQ(numberOf(args, "session"), 7777);
    EXPECT_EQ(textOf(args, "source"), "/Dev1/PFI0");
    EXPECT_TRUE(cJSON_IsNull(cJSON_GetObjectItem(args, "destination")));
    EXPECT_EQ(textOf(cJSON_GetArrayItem(log.get(), 1), "call"), "destroySession");

    std::ifstream file(path);
    std::vector<std::string> lines;
    for (std::string line; std::getline(file, line);) lines.push_back(line);
    ASSERT_EQ(lines.size(), 2u);
    EXPECT_TRUE(cJSON_Compare(parse(lines[0].c_str()).get(), first, true));
    std::remove(path.c_str());
}

TEST_F(RocoSim, NullAndUnknownArgumentsGetDefinedAnswers) {
    // No status record: the call still runs and refuses without writing anywhere.
    EXPECT_EQ(roco.calculateRoute(session, nullptr, nullptr, 0, nullptr), 0u);
    EXPECT_NE(roco.calculateRoute(session, "/Dev1/PFI0", "/Dev1/PFI1", 0, nullptr), 0u);

    Status st;
    uint32_t count = 99;
    EXPECT_EQ(roco.getTerminalNamesAndAttributesForDevice("Dev1", nullptr, st.get()), nullptr);
    EXPECT_EQ(st.code(), kInvalidArgument);
    Status noDevice;
    EXPECT_EQ(roco.getTerminalNamesAndAttributesForDevice(nullptr, &count, noDevice.get()), nullptr);
    EXPECT_EQ(noDevice.code(), kDeviceNotFound);
    EXPECT_EQ(count, 0u);
    Status nullName;
    roco.RouteConstraints_setBoolConstraint(roco.RouteAttributes_getConstraints(roco.RouteAttributes_new(nullptr)),
                                            nullptr, 1, nullName.get());
    EXPECT_EQ(nullName.code(), kInvalidArgument);
    Status unknownSession;
    roco.destroyImmediateRoutesToDest(123456, "/Dev1/PFI0", unknownSession.get());
    EXPECT_EQ(unknownSession.code(), kInvalidArgument);
    roco.destroyString(nullptr);
    roco.destroyStringArray(nullptr, 5);
    roco.RouteAttributes_destroy(0);
    EXPECT_EQ(roco.validateTerminalURI(nullptr, nullptr), 0);
    EXPECT_EQ(roco.areTerminalURIsEqual(nullptr, "/Dev1/PFI0", nullptr), 0);
    EXPECT_EQ(routesOn(nullptr), (Pairs{{"/Dev1/PFI0", "/Dev1/PFI1"}})) << "the route made without a record";
}

TEST_F(RocoSim, MegabyteNamesAreRefusedWithTheWholeNameInTheDetails) {
    const std::string device(1 << 20, 'D');
    const std::string huge = "/" + device + "/PFI0";
    const std::string terminal = "/Dev1/" + std::string(1 << 20, 'T');
    Status unknownTerminal, unknownDevice, noRoom;
    roco.connect(session, terminal.c_str(), "/Dev1/PFI0", false, unknownTerminal);
    EXPECT_EQ(unknownTerminal.code(), kSourceInvalid);
    EXPECT_EQ(textOf(unknownTerminal.details().get(), "source"), terminal);
    setenv("ZRROCOAPI_SIM_DEVICES", "Dev1", 1);
    roco.destroyImmediateRoutesFromSource(session, huge.c_str(), unknownDevice.get());
    EXPECT_EQ(unknownDevice.code(), kDeviceNotFound);
    EXPECT_EQ(textOf(unknownDevice.details().get(), "device"), device);
    EXPECT_EQ(roco.validateTerminalURI(terminal.c_str(), noRoom.get()), 0);
    EXPECT_EQ(roco.areTerminalURIsEqual(terminal.c_str(), terminal.c_str(), noRoom.get()), 1);
}

TEST_F(RocoSim, NamesThatAreNotUtf8GiveUtf8Details) {
    Status st;
    roco.connect(session, "/Dev1/PF\xC3I0", "/Dev1/\xED\xA0\x80PFI1", false, st);
    EXPECT_EQ(st.code(), kSourceInvalid);
    Json details = st.details();
    ASSERT_NE(details, nullptr) << st.text();
    EXPECT_EQ(textOf(details.get(), "source"), "/Dev1/PF\xEF\xBF\xBDI0");
    EXPECT_EQ(textOf(details.get(), "destination"), "/Dev1/\xEF\xBF\xBD\xEF\xBF\xBD\xEF\xBF\xBDPFI1")
        << "a surrogate's three bytes are three faults";
}

TEST_F(RocoSim, AReallocateThatFailsLeavesTheCodeWithoutText) {
    Status refusing(true);
    roco.connect(session, "/Dev1/Nope", "/Dev1/PFI0", false, refusing);
    EXPECT_EQ(refusing.code(), kSourceInvalid);
    EXPECT_EQ(refusing.text(), nullptr);

    zrrocoapi_Status without{0, 0, nullptr, nullptr};
    roco.calculateRoute(session, "/Dev1/Nope", "/Dev1/PFI0", 0, &without);
    EXPECT_EQ(without.code, kSourceInvalid);
    EXPECT_EQ(without.json, nullptr);

    // A record that already has room is written without a reallocation, NUL-terminated.
    char room[4096];
    zrrocoapi_Status roomy{0, sizeof room, nullptr, room};
    roco.calculateRoute(session, "/Dev1/Nope", "/Dev1/PFI0", 0, &roomy);
    EXPECT_EQ(roomy.code, kSourceInvalid);
    EXPECT_TRUE(cJSON_IsObject(parse(room).get())) << room;
}

TEST_F(RocoSim, TerminalVocabularyAndNames) {
    const char* names[] = {"PXI_Trig0",
                           "pxi_trig7",
                           "PXI_Star16",
                           "PXIe_DStarA16",
                           "PXIe_DStarB0",
                           "PXIE_DSTARC9",
                           "PFI5",
                           "PFI_LVDS2",
                           "ClkIn",
                           "ClkOut",
                           "PXI_Clk10",
                           "PXI_Clk10_In",
                           "PXIe_Clk100",
                           "SyncClkFullSpeed",
                           "SyncClkDivided1",
                           "SyncClkDivided2",
                           "DDS",
                           "GlobalSoftwareTrigger"};
    for (const char* name : names)
        EXPECT_EQ(roco.validateTerminalURI(("/Dev1/" + std::string(name)).c_str(), nullptr), 1) << name;
    for (const char* name : {"/Dev1/PXI_Trig8", "/Dev1/PFI6", "/Dev1/PFI_LVDS3", "/Dev1/PXI_Star17", "Dev1/PFI0"})
        EXPECT_EQ(roco.validateTerminalURI(name, nullptr), 0) << name;
    EXPECT_EQ(roco.areTerminalURIsEqual("/Dev1/PFI0", "/dev1/pfi0", nullptr), 1);
    EXPECT_EQ(roco.areTerminalURIsEqual("/Dev1/PFI0", "/Dev2/PFI0", nullptr), 0);

    setenv("ZRROCOAPI_SIM_UNIDENTIFIED", "Dev2", 1);
    EXPECT_EQ(roco.validateTerminalURI("/Dev2/PXI_Trig0", nullptr), 0) << "trigger lines need the chassis";
    for (const auto& [device, expected] : {std::pair<const char*, uint32_t>{"Dev1", 95}, {"Dev2", 19}}) {
        uint32_t count = 0;
        Status st;
        char** list = roco.getTerminalNamesAndAttributesForDevice(device, &count, st.get());
        ASSERT_NE(list, nullptr);
        EXPECT_EQ(count, expected) << device;
        Json first = parse(list[0]);
        EXPECT_TRUE(cJSON_IsString(cJSON_GetObjectItem(first.get(), "name")));
        roco.destroyStringArray(list, count);
    }
}

TEST_F(RocoSim, ContainersAreEmptyAndTheChangeNumberStays) {
    Status st;
    const std::uint32_t container = roco.getRoutableDevices(st.get());
    const std::uint32_t iterator = roco.DeviceContainer_begin(container, st.get());
    ASSERT_EQ(st.code(), 0);
    EXPECT_EQ(roco.DeviceIterator_isEnd(iterator), 1);
    Status atEnd, unknown, terminal;
    EXPECT_EQ(roco.DeviceIterator_getDeviceName(iterator, atEnd.get()), nullptr);
    EXPECT_EQ(atEnd.code(), kInvalidArgument);
    roco.DeviceContainer_destroy(container);
    EXPECT_EQ(roco.DeviceContainer_begin(container, unknown.get()), 0u);
    EXPECT_EQ(unknown.code(), kInvalidArgument);
    EXPECT_EQ(roco.TerminalContainer_begin(1, terminal.get()), 0u);
    EXPECT_EQ(terminal.code(), kInvalidArgument);
    EXPECT_EQ(roco.TerminalIterator_getBoolAttribute(1, nullptr, nullptr), 0);

    const std::uint32_t change = roco.getSystemChangeNumber(st.get());
    EXPECT_EQ(roco.hasTerminalInformationChanged(change, st.get()), 0);
    EXPECT_EQ(roco.hasTerminalInformationChanged(change + 1, st.get()), 1);
}

TEST_F(RocoSim, ResetTerminalRemovesTheRoutesAtIt) {
    roco.connect(session, "/Dev1/PFI0", "/Dev1/PXI_Trig0");
    roco.connect(session, "/Dev1/PXI_Trig1", "/Dev1/PFI0");
    roco.connect(session, "/Dev1/PFI1", "/Dev1/PXI_Trig2");
    Status st;
    roco.resetTerminal(session, "/Dev1/PFI0", st.get());
    EXPECT_EQ(st.code(), 0);
    EXPECT_EQ(routesOn("Dev1"), (Pairs{{"/Dev1/PFI1", "/Dev1/PXI_Trig2"}}));
}

// Every thread routes through a session of its own: a destination of its own device, and one
// destination all threads contend for. Afterwards the service holds exactly the routes that
// succeeded, and the log every call.
TEST_F(RocoSim, ConcurrentRoutingAccountsForEveryRoute) {
    constexpr int kThreads = 8, kRounds = 50;
    std::vector<std::uint32_t> sessions(kThreads);
    std::vector<int> wins(kThreads, 0);
    std::vector<std::thread> threads;
    roco.sim_reset();
    for (int t = 0; t < kThreads; ++t)
        threads.emplace_back([&, t] {
            Status st;
            sessions[t] = roco.createImmediateSession(st.get());
            const std::string own = "/Own" + std::to_string(t) + "/";
            for (int round = 0; round < kRounds; ++round) {
                const std::string destination = own + "PXI_Trig" + std::to_string(round % 8);
                Status made, contended, removed;
                roco.connect(sessions[t], (own + "PFI0").c_str(), destination.c_str(), false, made);
                EXPECT_EQ(made.code(), 0);
                const std::string source = "/Shared/PFI" + std::to_string(t % 6);
                if (roco.connect(sessions[t], source.c_str(), "/Shared/PXI_Trig0", false, contended)) ++wins[t];
                if (round % 8 == 7 && round + 1 < kRounds)
                    roco.destroyImmediateRoutesOnDevice(sessions[t], ("Own" + std::to_string(t)).c_str(),
                                                        removed.get());
            }
        });
    for (std::thread& thread : threads) thread.join();

    Json log = roco.log();
    const int removals = kThreads * (kRounds / 8 - (kRounds % 8 == 0 ? 1 : 0));
    EXPECT_EQ(cJSON_GetArraySize(log.get()), kThreads * (1 + kRounds * 2 * 6) + removals);
    for (int t = 0; t < kThreads; ++t) {
        const std::string device = "Own" + std::to_string(t);
        EXPECT_EQ(routesOn(device.c_str()).size(), static_cast<std::size_t>((kRounds - 1) % 8 + 1)) << device;
    }
    const Pairs shared = routesOn("Shared");
    ASSERT_EQ(shared.size(), 1u) << "one source drives the contended destination";
    int winners = 0;
    for (int t = 0; t < kThreads; ++t)
        if (wins[t]) {
            ++winners;
            EXPECT_EQ(shared.begin()->first, "/Shared/PFI" + std::to_string(t % 6));
        }
    EXPECT_EQ(winners, 1) << "sessions that share a source do not share its route";
}

}  // namespace
