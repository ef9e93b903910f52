// Time-service sessions ("sync://HOST/DEVICE") through the C interface of libtiktal.so, against the
// time-service simulator running as a separate process on 127.0.0.2.
#include <fstream>
#include <functional>
#include <sstream>

#include "timeservice_support.h"

namespace {

using namespace ts;

constexpr char kMediaType[] = "vnd.zr.tiktal.v1/json; charset=utf-8";

TEST_F(TimeService, OpensOnlyTheServicesOneDeviceOrItsAliasSystem) {
    {
        Session system(sim->resource("system"));
        ASSERT_STATUS(system.status(), VI_SUCCESS);
        EXPECT_EQ(lastRequest(*sim).path, "/tiktalwebs/devices");
        EXPECT_EQ(int32Of(system.vi(), "PTP1", TIKTAL_ATTR_1588_PRIORITY1), ok(128));
        EXPECT_EQ(lastRequest(*sim).path, "/tiktalwebs/sync_1/PTP1/priority1");
        EXPECT_EQ(namesOf(system.vi()), ok("PTP1,BC1,AS1,TAB1"));
        EXPECT_EQ(lastRequest(*sim).path, "/tiktalwebs/sync_1");
        EXPECT_STATUS(tiktal_SetAttributeViInt32(system.vi(), "PTP1", TIKTAL_ATTR_1588_PRIORITY2, 5), VI_SUCCESS);
        EXPECT_EQ(lastRequest(*sim).path, "/tiktalwebs/sync_1/PTP1/priority2");
    }
    EXPECT_STATUS(Session("SYNC://" + sim->host() + "/sync_1").status(), VI_SUCCESS);  // the scheme ignores case

    Session wrongCase(sim->resource("Sync_1"));
    EXPECT_STATUS(wrongCase.status(), tiktalerr_remoteDeviceResourceNotFound);
    EXPECT_EQ(wrongCase.vi(), 0u);

    const std::pair<const char*, ViStatus> lists[] = {
        {R"({"devices":["/tiktal/sync_1","/tiktal/sync_2"]})", tiktalerr_featureNotSupported},
        {R"({"devices":[]})", tiktalerr_rsrcUnavailable},
        {R"({"devices":null})", tiktalerr_rsrcUnavailable},
    };
    for (const auto& [list, expected] : lists) {
        answerWith(list);
        EXPECT_STATUS(Session(sim->resource()).status(), expected) << list;
    }
    sim->next(R"({"status":404})");
    EXPECT_STATUS(Session(sim->resource()).status(), tiktalerr_remoteDeviceResourceNotFound);
}

TEST(TimeServiceNames, LocalHostsAndMalformedNamesAreNotOpened) {
    for (const char* name : {"sync://localhost/sync_1", "sync://127.0.0.1/sync_1", "sync://h", "sync://h/a/b",
                             "sync:///sync_1", "sync://h/", "sync:/h/sync_1"}) {
        ViSession vi = 99;
        EXPECT_STATUS(tiktal_init(name, VI_FALSE, VI_FALSE, &vi), tiktalerr_deviceNotFound) << name;
        EXPECT_EQ(vi, 0u) << name;
    }
    TimeServiceSim gone;
    const std::string resource = gone.resource();
    gone.stop();
    EXPECT_STATUS(Session(resource).status(), tiktalerr_remoteDeviceCommunicationFailure);
}

TEST_F(TimeService, ReadsEachAttributeTypeThroughItsAccessor) {
    EXPECT_EQ(stringOf(vi, "PTP1", TIKTAL_ATTR_1588_CLOCK_ID), ok("00:80:2F:FF:FE:12:34:56"));
    EXPECT_STATUS(tiktal_GetAttributeViString(vi, "PTP1", TIKTAL_ATTR_1588_CLOCK_ID, 0, nullptr), 24);
    std::string tooShort(23, '#');
    EXPECT_STATUS(tiktal_GetAttributeViString(vi, "PTP1", TIKTAL_ATTR_1588_CLOCK_ID, 23, tooShort.data()),
                  tiktalerr_invParameter);
    EXPECT_EQ(stringOf(vi, "BC1", TIKTAL_ATTR_TIME_REFERENCE_TYPE), ok("IEEE 1588-2008 BC"));
    EXPECT_EQ(stringOf(vi, "AS1", TIKTAL_ATTR_8021AS_INTERFACE), ok("eth1"));

    EXPECT_EQ(int32Of(vi, "PTP1", TIKTAL_ATTR_1588_PRIORITY1), ok(128));
    const Request read = lastRequest(*sim);
    EXPECT_EQ(read.method, "GET");
    EXPECT_EQ(read.path, "/tiktalwebs/sync_1/PTP1/priority1");
    EXPECT_EQ(read.accept, kMediaType);
    EXPECT_EQ(read.contentType, kMediaType);
    EXPECT_EQ(int32Of(vi, "PTP1", TIKTAL_ATTR_1588_LOG_SYNC_INTERVAL), ok(-3));
    EXPECT_EQ(int32Of(vi, "AS1", TIKTAL_ATTR_8021AS_PRIORITY1), ok(246));

    EXPECT_EQ(real64Of(vi, "PTP1", TIKTAL_ATTR_1588_MEAN_PATH_DELAY), ok(1234.5));

    EXPECT_EQ(booleanOf(vi, "PTP1", TIKTAL_ATTR_TIME_REFERENCE_ENABLED), ok(VI_TRUE));
    EXPECT_EQ(booleanOf(vi, "TAB1", TIKTAL_ATTR_TIME_REFERENCE_ENABLED), ok(VI_FALSE));
    EXPECT_EQ(booleanOf(vi, "AS1", TIKTAL_ATTR_8021AS_AS_CAPABLE), ok(VI_TRUE));
}

TEST_F(TimeService, ReadsTheGrandmasterAndPeerMembersOfEachClockType) {
    setMember("PTP1", "gmPriority1", "11");
    setMember("PTP1", "gmPriority2", "12");
    setMember("BC1", "gmPriority1", "21");
    setMember("BC1", "gmPriority2", "22");
    setMember("AS1", "priority2", "31");
    setMember("AS1", "clockClass", "32");
    setMember("AS1", "localClockId", R"("AS1-LOCAL")");
    setMember("AS1", "gmClockClass", "33");
    setMember("AS1", "gmClockId", R"("AS1-GM")");
    setMember("AS1", "gmPriority1", "34");
    setMember("AS1", "gmPriority2", "35");
    setMember("TAB1", "clockClass", "41");
    setMember("TAB1", "localClockId", R"("TAB1-LOCAL")");
    setMember("TAB1", "gmPriority2", "42");

    const struct {
        const char* tr;
        ViAttr attribute;
        ViInt32 value;
        const char* path;
    } numbers[] = {
        {"PTP1", TIKTAL_ATTR_1588_GM_PRIORITY1, 11, "/tiktalwebs/sync_1/PTP1/gmPriority1"},
        {"PTP1", TIKTAL_ATTR_1588_GM_PRIORITY2, 12, "/tiktalwebs/sync_1/PTP1/gmPriority2"},
        {"BC1", TIKTAL_ATTR_1588_GM_PRIORITY1, 21, "/tiktalwebs/sync_1/BC1/gmPriority1"},
        {"BC1", TIKTAL_ATTR_1588_GM_PRIORITY2, 22, "/tiktalwebs/sync_1/BC1/gmPriority2"},
        {"AS1", TIKTAL_ATTR_8021AS_PRIORITY2, 31, "/tiktalwebs/sync_1/AS1/priority2"},
        {"AS1", TIKTAL_ATTR_8021AS_CLOCK_CLASS, 32, "/tiktalwebs/sync_1/AS1/clockClass"},
        {"AS1", TIKTAL_ATTR_8021AS_GM_CLOCK_CLASS, 33, "/tiktalwebs/sync_1/AS1/gmClockClass"},
        {"AS1", TIKTAL_ATTR_8021AS_GM_PRIORITY1, 34, "/tiktalwebs/sync_1/AS1/gmPriority1"},
        {"AS1", TIKTAL_ATTR_8021AS_GM_PRIORITY2, 35, "/tiktalwebs/sync_1/AS1/gmPriority2"},
        {"TAB1", TIKTAL_ATTR_8021AS_CLOCK_CLASS, 41, "/tiktalwebs/sync_1/TAB1/clockClass"},
        {"TAB1", TIKTAL_ATTR_8021AS_GM_PRIORITY2, 42, "/tiktalwebs/sync_1/TAB1/gmPriority2"},
    };
    for (const auto& n : numbers) {
        EXPECT_EQ(int32Of(vi, n.tr, n.attribute), ok(n.value)) << n.path;
        EXPECT_EQ(lastRequest(*sim).path, n.path);
    }
    const struct {
        const char* tr;
        ViAttr attribute;
        const char* value;
        const char* path;
    } texts[] = {
        {"AS1", TIKTAL_ATTR_8021AS_CLOCK_ID, "AS1-LOCAL", "/tiktalwebs/sync_1/AS1/localClockId"},
        {"AS1", TIKTAL_ATTR_8021AS_GM_CLOCK_ID, "AS1-GM", "/tiktalwebs/sync_1/AS1/gmClockId"},
        {"TAB1", TIKTAL_ATTR_8021AS_CLOCK_ID, "TAB1-LOCAL", "/tiktalwebs/sync_1/TAB1/localClockId"},
    };
    for (const auto& t : texts) {
        EXPECT_EQ(stringOf(vi, t.tr, t.attribute), ok(t.value)) << t.path;
        EXPECT_EQ(lastRequest(*sim).path, t.path);
    }

    // Each belongs to its own kind of clock only.
    EXPECT_STATUS(int32Of(vi, "AS1", TIKTAL_ATTR_1588_GM_PRIORITY1).status, tiktalerr_trTypeMismatch);
    EXPECT_STATUS(int32Of(vi, "PTP1", TIKTAL_ATTR_8021AS_GM_PRIORITY2).status, tiktalerr_trTypeMismatch);
    EXPECT_STATUS(stringOf(vi, "BC1", TIKTAL_ATTR_8021AS_CLOCK_ID).status, tiktalerr_trTypeMismatch);
}

TEST_F(TimeService, ChecksIdentifierNameAndAccessorTypeInThatOrder) {
    // A wrong accessor with a name costs the type request, then fails.
    EXPECT_EQ(servedDuring([&] {
                  EXPECT_EQ(int32Of(vi, "PTP1", TIKTAL_ATTR_1588_GM_CLOCK_ID), Read<ViInt32>({tiktalerr_invalidType, kUnsetInt32}));
              }), 1);
    EXPECT_EQ(lastRequest(*sim).path, "/tiktalwebs/sync_1/PTP1/type");
    EXPECT_STATUS(stringOf(vi, "PTP1", TIKTAL_ATTR_1588_PRIORITY1).status, tiktalerr_invalidType);
    EXPECT_STATUS(real64Of(vi, "AS1", TIKTAL_ATTR_8021AS_AS_CAPABLE).status, tiktalerr_invalidType);
    EXPECT_STATUS(booleanOf(vi, "PTP1", TIKTAL_ATTR_1588_MEAN_PATH_DELAY).status, tiktalerr_invalidType);
    EXPECT_STATUS(tiktal_SetAttributeViString(vi, "PTP1", TIKTAL_ATTR_1588_PRIORITY1, "5"), tiktalerr_invalidType);

    // Everything below is decided before any request.
    EXPECT_EQ(servedDuring([&] {
                  for (ViAttr unknown : {1150001u, 1150100u, 42u, 1150800u}) {
                      EXPECT_STATUS(int32Of(vi, "PTP1", unknown).status, tiktalerr_nsupAttr) << unknown;
                      EXPECT_STATUS(real64Of(vi, "PTP1", unknown).status, tiktalerr_nsupAttr) << unknown;
                      EXPECT_STATUS(booleanOf(vi, "PTP1", unknown).status, tiktalerr_nsupAttr) << unknown;
                      EXPECT_STATUS(stringOf(vi, "PTP1", unknown).status, tiktalerr_nsupAttr) << unknown;
                      EXPECT_STATUS(tiktal_SetAttributeViInt32(vi, "PTP1", unknown, 1), tiktalerr_nsupAttr) << unknown;
                  }
                  for (const char* missing : {static_cast<const char*>(nullptr), ""}) {
                      EXPECT_STATUS(int32Of(vi, missing, TIKTAL_ATTR_1588_PRIORITY1).status, tiktalerr_terminalNotSpecified);
                      EXPECT_STATUS(stringOf(vi, missing, TIKTAL_ATTR_1588_PRIORITY1).status, tiktalerr_terminalNotSpecified);
                      EXPECT_STATUS(booleanOf(vi, missing, TIKTAL_ATTR_TIME_REFERENCE_SELECTED).status,
                                    tiktalerr_terminalNotSpecified);
                      EXPECT_STATUS(tiktal_SetAttributeViInt32(vi, missing, TIKTAL_ATTR_1588_PRIORITY1, 1),
                                    tiktalerr_terminalNotSpecified);
                  }
                  for (ViAttr any : {TIKTAL_ATTR_1588_MEAN_PATH_DELAY, TIKTAL_ATTR_SELECTED_TIME_REFERENCE_OFFSET,
                                     TIKTAL_ATTR_1588_PRIORITY1, 42ul})
                      EXPECT_STATUS(tiktal_SetAttributeViReal64(vi, "PTP1", any, 1.0), tiktalerr_nsupAttr) << any;
                  EXPECT_STATUS(tiktal_GetAttributeViInt32(vi, "PTP1", TIKTAL_ATTR_1588_PRIORITY1, nullptr),
                                tiktalerr_invParameter);
              }), 0);
}

TEST_F(TimeService, WritesSendTheValueAsOneJsonText) {
    EXPECT_STATUS(tiktal_SetAttributeViInt32(vi, "PTP1", TIKTAL_ATTR_1588_PRIORITY1, -3), VI_SUCCESS);
    Request write = lastRequest(*sim);
    EXPECT_EQ(write.method, "PUT");
    EXPECT_EQ(write.path, "/tiktalwebs/sync_1/PTP1/priority1");
    EXPECT_EQ(write.body, R"({"version":1,"data":{"priority1":"-3"}})");
    EXPECT_EQ(write.contentType, kMediaType);
    EXPECT_EQ(int32Of(vi, "PTP1", TIKTAL_ATTR_1588_PRIORITY1), ok(-3));

    EXPECT_STATUS(tiktal_SetAttributeViInt32(vi, "PTP1", TIKTAL_ATTR_1588_BMCA_MODE, 1), VI_SUCCESS);
    EXPECT_EQ(lastRequest(*sim).body, R"({"version":1,"data":{"bmcaMode":"masterslave"}})");
    EXPECT_STATUS(tiktal_SetAttributeViInt32(vi, "PTP1", TIKTAL_ATTR_1588_BMCA_MODE, 0), VI_SUCCESS);
    EXPECT_EQ(int32Of(vi, "PTP1", TIKTAL_ATTR_1588_BMCA_MODE), ok(0));
    for (ViInt32 bad : {3, -1}) {
        EXPECT_EQ(servedDuring([&] {
                      EXPECT_STATUS(tiktal_SetAttributeViInt32(vi, "PTP1", TIKTAL_ATTR_1588_BMCA_MODE, bad),
                                    tiktalerr_invParameter);
                  }), 1) << "the type request only, no write of " << bad;
        EXPECT_EQ(lastRequest(*sim).path, "/tiktalwebs/sync_1/PTP1/type");
    }

    // The service refuses to write a port state; the value still went out as decimal text.
    EXPECT_STATUS(tiktal_SetAttributeViInt32(vi, "PTP1", TIKTAL_ATTR_1588_PORT_STATE, 8),
                  tiktalerr_remoteDeviceCommunicationFailure);
    EXPECT_EQ(lastRequest(*sim).body, R"({"version":1,"data":{"portState":"8"}})");

    for (const char* tr : {"PTP1", "BC1", "AS1", "TAB1"}) {
        EXPECT_STATUS(tiktal_SetAttributeViBoolean(vi, tr, TIKTAL_ATTR_TIME_REFERENCE_ENABLED, VI_TRUE), VI_SUCCESS) << tr;
        write = lastRequest(*sim);
        EXPECT_EQ(write.method + " " + write.path, "PUT /tiktalwebs/sync_1/" + std::string(tr) + "/isEnabled");
        EXPECT_EQ(write.body, R"({"version":1,"data":{"isEnabled":"1"}})") << tr;
        EXPECT_EQ(booleanOf(vi, tr, TIKTAL_ATTR_TIME_REFERENCE_ENABLED), ok(VI_TRUE)) << tr;
    }
    EXPECT_STATUS(tiktal_SetAttributeViBoolean(vi, "TAB1", TIKTAL_ATTR_TIME_REFERENCE_ENABLED, VI_FALSE), VI_SUCCESS);
    EXPECT_EQ(lastRequest(*sim).body, R"({"version":1,"data":{"isEnabled":"0"}})");
    setMember("GPS1", "type", R"("GPS receiver")");
    setMember("GPS1", "isEnabled", "false");
    EXPECT_STATUS(tiktal_SetAttributeViBoolean(vi, "GPS1", TIKTAL_ATTR_TIME_REFERENCE_ENABLED, VI_TRUE),
                  tiktalerr_attrReadonly);
    EXPECT_EQ(lastRequest(*sim).path, "/tiktalwebs/sync_1/GPS1/type") << "refused after the type, before any write";
    EXPECT_EQ(booleanOf(vi, "GPS1", TIKTAL_ATTR_TIME_REFERENCE_ENABLED), ok(VI_FALSE));  // its "all" entry

    // Key and value are escaped as JSON strings, so any text arrives as it was given.
    const std::string awkward = "a\"b\\c";
    EXPECT_STATUS(tiktal_SetAttributeViString(vi, "PTP1", TIKTAL_ATTR_1588_INTERFACE, awkward.c_str()), VI_SUCCESS);
    EXPECT_EQ(lastRequest(*sim).body, R"({"version":1,"data":{"interface":"a\"b\\c"}})");
    EXPECT_EQ(stringOf(vi, "PTP1", TIKTAL_ATTR_1588_INTERFACE), ok(awkward.c_str()));

    EXPECT_EQ(servedDuring([&] {
                  EXPECT_STATUS(tiktal_SetAttributeViString(vi, "PTP1", TIKTAL_ATTR_1588_INTERFACE, nullptr),
                                tiktalerr_invParameter);
                  EXPECT_STATUS(tiktal_SetAttributeViString(vi, nullptr, TIKTAL_ATTR_SELECTED_TIME_REFERENCE, "PTP1"),
                                tiktalerr_terminalNotSpecified);
              }), 0);
}

TEST_F(TimeService, PicksTheKeyOfTheTimeReferencesType) {
    setMember("PTP1", "localClass", "13");
    setMember("PTP1", "clockClass", "14");
    setMember("BC1", "localClass", "8");
    setMember("BC1", "clockClass", "7");
    EXPECT_EQ(int32Of(vi, "PTP1", TIKTAL_ATTR_1588_CLOCK_CLASS), ok(13));
    EXPECT_EQ(lastRequest(*sim).path, "/tiktalwebs/sync_1/PTP1/localClass");
    EXPECT_EQ(int32Of(vi, "BC1", TIKTAL_ATTR_1588_CLOCK_CLASS), ok(7));
    EXPECT_EQ(lastRequest(*sim).path, "/tiktalwebs/sync_1/BC1/clockClass");
    EXPECT_EQ(int32Of(vi, "BC1", TIKTAL_ATTR_1588_GM_CLOCK_CLASS), ok(6));

    for (ViAttr only8021as : {TIKTAL_ATTR_8021AS_LOG_SYNC_INTERVAL, TIKTAL_ATTR_8021AS_LOG_ANNOUNCE_INTERVAL,
                              TIKTAL_ATTR_8021AS_NEIGHBOR_PROP_DELAY_THRESHOLD, TIKTAL_ATTR_8021AS_PORT_STATE})
        EXPECT_STATUS(int32Of(vi, "TAB1", only8021as).status, tiktalerr_trTypeMismatch) << only8021as;
    EXPECT_STATUS(stringOf(vi, "TAB1", TIKTAL_ATTR_8021AS_INTERFACE).status, tiktalerr_trTypeMismatch);
    for (ViAttr onlyPtp : {TIKTAL_ATTR_1588_PORT_STATE, TIKTAL_ATTR_1588_STEPS_REMOVED, TIKTAL_ATTR_1588_LOG_SYNC_INTERVAL,
                           TIKTAL_ATTR_1588_BMCA_MODE})
        EXPECT_STATUS(int32Of(vi, "BC1", onlyPtp).status, tiktalerr_trTypeMismatch) << onlyPtp;
    EXPECT_STATUS(real64Of(vi, "BC1", TIKTAL_ATTR_1588_MEAN_PATH_DELAY).status, tiktalerr_trTypeMismatch);
    EXPECT_STATUS(stringOf(vi, "BC1", TIKTAL_ATTR_1588_GM_IP_ADDRESS).status, tiktalerr_trTypeMismatch);
    EXPECT_STATUS(stringOf(vi, "BC1", TIKTAL_ATTR_1588_INTERFACE).status, tiktalerr_trTypeMismatch);
    EXPECT_STATUS(int32Of(vi, "AS1", TIKTAL_ATTR_1588_PRIORITY1).status, tiktalerr_trTypeMismatch);
    EXPECT_STATUS(int32Of(vi, "PTP1", TIKTAL_ATTR_8021AS_PRIORITY1).status, tiktalerr_trTypeMismatch);
    EXPECT_STATUS(tiktal_SetAttributeViInt32(vi, "TAB1", TIKTAL_ATTR_8021AS_LOG_SYNC_INTERVAL, 1), tiktalerr_trTypeMismatch);
    EXPECT_EQ(lastRequest(*sim).method, "GET");

    EXPECT_EQ(booleanOf(vi, "BC1", TIKTAL_ATTR_TIME_REFERENCE_ENABLED), ok(VI_TRUE));
    EXPECT_EQ(booleanOf(vi, "AS1", TIKTAL_ATTR_TIME_REFERENCE_ENABLED), ok(VI_TRUE));
    setMember("ODD", "type", R"("ieee 1588-2008")");  // type texts compare exactly
    setMember("ODD", "isEnabled", "true");
    setMember("ODD", "priority1", "1");
    EXPECT_EQ(booleanOf(vi, "ODD", TIKTAL_ATTR_TIME_REFERENCE_ENABLED), ok(VI_TRUE));
    EXPECT_STATUS(int32Of(vi, "ODD", TIKTAL_ATTR_1588_PRIORITY1).status, tiktalerr_trTypeMismatch);
}

TEST_F(TimeService, MapsPortStatesAndAccuraciesPerFamily) {
    const struct {
        const char* text;
        ViInt32 ptp, as;
    } states[] = {{"PTP_PASSIVE", 6, 3}, {"PTP_SLAVE", 8, 9}, {"PTP_MASTER", 5, 6}, {"PTP_INITIALIZING", 0, 3}};
    for (const auto& state : states) {
        setMember("PTP1", "portState", quoted(state.text));
        setMember("AS1", "portState", quoted(state.text));
        EXPECT_EQ(int32Of(vi, "PTP1", TIKTAL_ATTR_1588_PORT_STATE), ok(state.ptp)) << state.text;
        EXPECT_EQ(int32Of(vi, "AS1", TIKTAL_ATTR_8021AS_PORT_STATE), ok(state.as)) << state.text;
    }
    setMember("PTP1", "portState", R"("ptp_slave")");
    setMember("AS1", "portState", R"("ptp_slave")");
    EXPECT_STATUS(int32Of(vi, "PTP1", TIKTAL_ATTR_1588_PORT_STATE).status, tiktalerr_internalSoftware);
    EXPECT_STATUS(int32Of(vi, "AS1", TIKTAL_ATTR_8021AS_PORT_STATE).status, tiktalerr_internalSoftware);
    setMember("PTP1", "bmcaMode", R"("MasterSlave")");
    EXPECT_STATUS(int32Of(vi, "PTP1", TIKTAL_ATTR_1588_BMCA_MODE).status, tiktalerr_internalSoftware);

    const std::pair<const char*, ViInt32> ptpAccuracies[] = {
        {R"("GREATER_THAN_10S")", 18}, {R"("WITHIN_2.5MS")", 11}, {R"("WITHIN_25NS")", 1},
        {R"("ACCURACY_UNKNOWN")", 0},  {R"("WITHIN_3US")", 0},    {R"("within_1us")", 0}};
    for (const auto& [accuracy, expected] : ptpAccuracies) {
        setMember("PTP1", "localAccuracy", accuracy);
        EXPECT_EQ(int32Of(vi, "PTP1", TIKTAL_ATTR_1588_CLOCK_ACCURACY), ok(expected)) << accuracy;
    }
    EXPECT_EQ(int32Of(vi, "PTP1", TIKTAL_ATTR_1588_GM_CLOCK_ACCURACY), ok(2));  // "WITHIN_100NS"
    EXPECT_EQ(int32Of(vi, "BC1", TIKTAL_ATTR_1588_CLOCK_ACCURACY), ok(3));      // "WITHIN_250NS"

    const std::pair<const char*, ViInt32> asAccuracies[] = {
        {R"("WITHIN_100NS")", 33}, {"33", 33}, {R"("GREATER_THAN_10S")", 49}, {R"("ACCURACY_UNKNOWN")", 254},
        {R"("WITHIN_3US")", 254}, {"7", 7}};
    for (const auto& [accuracy, expected] : asAccuracies) {
        setMember("AS1", "clockAccuracy", accuracy);
        EXPECT_EQ(int32Of(vi, "AS1", TIKTAL_ATTR_8021AS_CLOCK_ACCURACY), ok(expected)) << accuracy;
    }
    EXPECT_EQ(int32Of(vi, "AS1", TIKTAL_ATTR_8021AS_GM_CLOCK_ACCURACY), ok(33));    // the number 33
    EXPECT_EQ(int32Of(vi, "TAB1", TIKTAL_ATTR_8021AS_GM_CLOCK_ACCURACY), ok(35));   // "WITHIN_1US"

    const std::pair<const char*, ViStatus> thresholds[] = {
        {R"("800")", VI_SUCCESS}, {"800", VI_SUCCESS}, {"true", tiktalerr_internalSoftware},
        {R"("8x")", tiktalerr_internalSoftware}};
    for (const auto& [threshold, expected] : thresholds) {
        setMember("AS1", "neighborPropDelayThreshold", threshold);
        const Read<ViInt32> read = int32Of(vi, "AS1", TIKTAL_ATTR_8021AS_NEIGHBOR_PROP_DELAY_THRESHOLD);
        EXPECT_EQ(read, (Read<ViInt32>{expected, expected ? kUnsetInt32 : 800})) << threshold;
    }
}

TEST_F(TimeService, ReportsTheSelectedTimeReferenceAndItsOffset) {
    for (const char* ignored : {static_cast<const char*>(nullptr), "", "BC1"}) {
        EXPECT_EQ(servedDuring([&] { EXPECT_EQ(stringOf(vi, ignored, TIKTAL_ATTR_SELECTED_TIME_REFERENCE), ok("PTP1")); }),
                  2) << "one request for the size query, one for the text";
    }
    EXPECT_EQ(lastRequest(*sim).query, "attribute=selectedTrId");
    EXPECT_EQ(stringOf(vi, nullptr, TIKTAL_ATTR_SELECTED_TIME_REFERENCE_TYPE), ok("IEEE 1588-2008"));
    EXPECT_EQ(real64Of(vi, nullptr, TIKTAL_ATTR_SELECTED_TIME_REFERENCE_OFFSET), ok(1.5));
    EXPECT_EQ(lastRequest(*sim).query, "attribute=selectedTrOffsetNanos");
    EXPECT_EQ(real64Of(vi, "AS1", TIKTAL_ATTR_SELECTED_TIME_REFERENCE_OFFSET_NS), ok(1500000000.0));
    sim->mergeState(R"({"selectedTrOffsetNanos":"-250"})");
    EXPECT_EQ(real64Of(vi, nullptr, TIKTAL_ATTR_SELECTED_TIME_REFERENCE_OFFSET_NS), ok(-250.0));

    EXPECT_EQ(booleanOf(vi, "PTP1", TIKTAL_ATTR_TIME_REFERENCE_SELECTED), ok(VI_TRUE));
    EXPECT_EQ(booleanOf(vi, "BC1", TIKTAL_ATTR_TIME_REFERENCE_SELECTED, VI_TRUE), ok(VI_FALSE));
    // A name must be one of the listed names, not merely part of the list. The type request comes
    // first; the simulator refuses it for a name it does not know, so it is answered here.
    for (const char* unlisted : {"PTP", "TP1", "GPS9", "PTP1,BC1"}) {
        answerWith(R"({"data":{"type":"IEEE 1588-2008"}})");
        EXPECT_EQ(booleanOf(vi, unlisted, TIKTAL_ATTR_TIME_REFERENCE_SELECTED),
                  Read<ViBoolean>({tiktalerr_trInstanceNotFound, kUnsetBoolean})) << unlisted;
        EXPECT_EQ(lastRequest(*sim).query, "attribute=allTimeReferences") << unlisted;
    }
    EXPECT_EQ(booleanOf(vi, "GPS9", TIKTAL_ATTR_TIME_REFERENCE_SELECTED),
              Read<ViBoolean>({tiktalerr_remoteDeviceResourceNotFound, kUnsetBoolean}));

    sim->mergeState(R"({"selectedTrId":"AS1"})");
    EXPECT_EQ(stringOf(vi, nullptr, TIKTAL_ATTR_SELECTED_TIME_REFERENCE_TYPE), ok("IEEE 802.1AS-2011"));
    EXPECT_EQ(booleanOf(vi, "PTP1", TIKTAL_ATTR_TIME_REFERENCE_SELECTED), ok(VI_FALSE));
    EXPECT_EQ(booleanOf(vi, "AS1", TIKTAL_ATTR_TIME_REFERENCE_SELECTED), ok(VI_TRUE));

    sim->mergeState(R"({"selectedTrId":null,"selectedTrOffsetNanos":null})");
    EXPECT_STATUS(tiktal_GetAttributeViString(vi, nullptr, TIKTAL_ATTR_SELECTED_TIME_REFERENCE, 0, nullptr), 1);
    EXPECT_EQ(stringOf(vi, nullptr, TIKTAL_ATTR_SELECTED_TIME_REFERENCE), ok(""));
    EXPECT_EQ(stringOf(vi, nullptr, TIKTAL_ATTR_SELECTED_TIME_REFERENCE_TYPE), ok(""));
    EXPECT_EQ(real64Of(vi, nullptr, TIKTAL_ATTR_SELECTED_TIME_REFERENCE_OFFSET), ok(0.0));
    EXPECT_EQ(real64Of(vi, nullptr, TIKTAL_ATTR_SELECTED_TIME_REFERENCE_OFFSET_NS), ok(0.0));
    EXPECT_EQ(booleanOf(vi, "PTP1", TIKTAL_ATTR_TIME_REFERENCE_SELECTED, VI_TRUE), ok(VI_FALSE));
}

TEST_F(TimeService, ListsTheTimeReferenceNamesInTheServicesOrder) {
    EXPECT_EQ(namesOf(vi), ok("PTP1,BC1,AS1,TAB1"));
    EXPECT_EQ(lastRequest(*sim).query, "attribute=allTimeReferences");
    setReferences(R"({"PTP1":{"type":"IEEE 1588-2008"},"8021AS":{"type":"IEEE 802.1AS-2011"},"GPS":{"type":"GPS"}})");
    EXPECT_STATUS(tiktal_GetTimeReferenceNames(vi, 0, nullptr), 16);
    char empty[4] = "";
    EXPECT_STATUS(tiktal_GetTimeReferenceNames(vi, 0, empty), 16);
    EXPECT_EQ(namesOf(vi), ok("PTP1,8021AS,GPS"));
    char small[15];
    EXPECT_STATUS(tiktal_GetTimeReferenceNames(vi, sizeof small, small), tiktalerr_invParameter);
    EXPECT_STATUS(tiktal_GetTimeReferenceNames(vi, 16, nullptr), tiktalerr_invParameter);

    setReferences("{}");
    EXPECT_STATUS(tiktal_GetTimeReferenceNames(vi, 0, nullptr), 1);
    EXPECT_EQ(namesOf(vi), ok(""));

    answerWith(R"({"data":{"allTimeReferences":["PTP1",7]}})");
    char kept[8] = "kept";
    EXPECT_STATUS(tiktal_GetTimeReferenceNames(vi, sizeof kept, kept), tiktalerr_internalSoftware);
    EXPECT_STREQ(kept, "kept");
}

TEST_F(TimeService, SplitsTheServiceTimeIntoSecondsAndNanoseconds) {
    const struct {
        const char* offset;
        ViStatus status;
        ViUInt32 seconds, nanoseconds;
    } cases[] = {
        {R"("1700000000123456789")", VI_SUCCESS, 1700000000u, 123456789u},
        {R"("999999999")", VI_SUCCESS, 0u, 999999999u},
        {R"("1000000000")", VI_SUCCESS, 1u, 0u},
        {R"("-0")", VI_SUCCESS, 0u, 0u},
        {R"("4294967295999999999")", VI_SUCCESS, 4294967295u, 999999999u},
        {R"("4294967296000000000")", tiktalerr_overflow, 7u, 7u},
        // A negative count is no time, whatever it comes to modulo 2^64.
        {R"("-1")", tiktalerr_internalSoftware, 7u, 7u},
        {R"("-1000000000")", tiktalerr_internalSoftware, 7u, 7u},
        {R"("-18446744073709551615")", tiktalerr_internalSoftware, 7u, 7u},
        {R"("-00")", VI_SUCCESS, 0u, 0u},
        {R"("abc")", tiktalerr_internalSoftware, 7u, 7u},
        {R"("")", tiktalerr_internalSoftware, 7u, 7u},
        {R"("12 ")", tiktalerr_internalSoftware, 7u, 7u},
        {"1700000000123456789", tiktalerr_internalSoftware, 7u, 7u},
    };
    for (const auto& c : cases) {
        sim->mergeState(std::string(R"({"epochOffsetInNsec":)") + c.offset + "}");
        ViUInt32 seconds = 7, nanoseconds = 7;
        ViUInt16 fraction = 7;
        EXPECT_STATUS(tiktal_GetTime(vi, &seconds, &nanoseconds, &fraction), c.status) << c.offset;
        EXPECT_EQ(seconds, c.seconds) << c.offset;
        EXPECT_EQ(nanoseconds, c.nanoseconds) << c.offset;
        EXPECT_EQ(fraction, c.status == VI_SUCCESS ? 0u : 7u) << c.offset;
    }
    EXPECT_EQ(lastRequest(*sim).query, "attribute=epochOffsetInNsec");

    ViUInt32 seconds = 7, nanoseconds = 7;
    ViUInt16 fraction = 7;
    EXPECT_STATUS(tiktal_GetTime(vi, nullptr, &nanoseconds, &fraction), tiktalerr_invParameter);
    EXPECT_STATUS(tiktal_GetTime(vi, &seconds, nullptr, &fraction), tiktalerr_invParameter);
    EXPECT_STATUS(tiktal_GetTime(vi, &seconds, &nanoseconds, nullptr), tiktalerr_invParameter);
    EXPECT_EQ(seconds + nanoseconds + fraction, 21u);
}

TEST_F(TimeService, ReadsMembersThatAreNullOddlySpelledOrOddlyTyped) {
    setMember("PTP1", "isEnabled", "null");
    EXPECT_EQ(booleanOf(vi, "PTP1", TIKTAL_ATTR_TIME_REFERENCE_ENABLED, VI_TRUE), ok(VI_FALSE));

    answerWith(R"({"data":{"PortState":"PTP_MASTER"}})", 1);  // after the type request
    EXPECT_EQ(int32Of(vi, "PTP1", TIKTAL_ATTR_1588_PORT_STATE), ok(5));
    answerWith(R"({"DATA":{"PRIORITY1":99}})", 1);
    EXPECT_EQ(int32Of(vi, "PTP1", TIKTAL_ATTR_1588_PRIORITY1), ok(99));
    setMember("PTP1", "clockClass", "31");
    answerWith(R"({"data":{"Type":"IEEE 1588-2008 BC"}})");
    EXPECT_EQ(int32Of(vi, "PTP1", TIKTAL_ATTR_1588_CLOCK_CLASS), ok(31));  // read as a boundary clock
    EXPECT_EQ(lastRequest(*sim).path, "/tiktalwebs/sync_1/PTP1/clockClass");

    const std::pair<const char*, Read<ViInt32>> numbers[] = {
        {"2147483647.9", ok(2147483647)}, {"2.9", ok(2)}, {"-2.9", ok(-2)}, {"-2147483648.5", ok(-2147483647 - 1)},
        {"2147483648", {tiktalerr_internalSoftware, kUnsetInt32}},
        {"-2147483649", {tiktalerr_internalSoftware, kUnsetInt32}},
        {R"("5")", {tiktalerr_internalSoftware, kUnsetInt32}}};
    for (const auto& [number, expected] : numbers) {
        setMember("PTP1", "priority1", number);
        EXPECT_EQ(int32Of(vi, "PTP1", TIKTAL_ATTR_1588_PRIORITY1), expected) << number;
    }
    for (const char* delay : {"1234.5", R"("abc")", R"("")"}) {
        setMember("PTP1", "meanPathDelay_ns", delay);
        EXPECT_EQ(real64Of(vi, "PTP1", TIKTAL_ATTR_1588_MEAN_PATH_DELAY),
                  Read<ViReal64>({tiktalerr_internalSoftware, kUnsetReal64})) << delay;
    }
    setMember("PTP1", "meanPathDelay_ns", R"("-1e3")");
    EXPECT_EQ(real64Of(vi, "PTP1", TIKTAL_ATTR_1588_MEAN_PATH_DELAY), ok(-1000.0));
}

TEST_F(TimeService, TurnsHttpAndEnvelopeFailuresIntoStatuses) {
    const auto offset = [&] { return real64Of(vi, nullptr, TIKTAL_ATTR_SELECTED_TIME_REFERENCE_OFFSET).status; };
    sim->next(R"({"count":1})");
    sim->next(R"({"status":404})");  // the value request, after the type request
    EXPECT_STATUS(int32Of(vi, "PTP1", TIKTAL_ATTR_1588_PRIORITY1).status, tiktalerr_remoteDeviceResourceNotFound);
    EXPECT_STATUS(int32Of(vi, "NOPE", TIKTAL_ATTR_1588_PRIORITY1).status, tiktalerr_remoteDeviceResourceNotFound);
    sim->next(R"({"status":202})");
    EXPECT_STATUS(offset(), tiktalerr_warn_networkClientInProgress);
    for (const char* status : {"400", "500", "503"}) {
        sim->next(std::string(R"({"status":)") + status + "}");
        EXPECT_STATUS(offset(), tiktalerr_remoteDeviceCommunicationFailure) << status;
    }
    sim->next(R"({"error":{"success":false,"errorCode":-123,"errorText":"t","errorInfo":"i"}})");
    EXPECT_STATUS(offset(), -123);
    sim->next(R"({"error":{"success":true,"errorCode":-123}})");
    EXPECT_STATUS(offset(), VI_SUCCESS);
    sim->next(R"({"wrapResult":true})");
    EXPECT_EQ(real64Of(vi, nullptr, TIKTAL_ATTR_SELECTED_TIME_REFERENCE_OFFSET), ok(1.5));

    // A failure whose code is 0 would read as success; it is a communication failure.
    for (const char* body : {R"({"error":{"success":false},"data":{"selectedTrOffsetNanos":"5"}})",
                             R"({"error":{"success":false,"errorCode":0},"data":{"selectedTrOffsetNanos":"5"}})",
                             R"({"error":{"errorCode":0},"data":{"selectedTrOffsetNanos":"5"}})",
                             R"({"error":"boom","data":{"selectedTrOffsetNanos":"5"}})",
                             R"({"error":null,"data":{"selectedTrOffsetNanos":"5"}})", "", "<html>busy</html>"}) {
        answerWith(body);
        EXPECT_STATUS(offset(), tiktalerr_remoteDeviceCommunicationFailure) << body;
    }
    // The session stays usable after every failure.
    EXPECT_EQ(real64Of(vi, nullptr, TIKTAL_ATTR_SELECTED_TIME_REFERENCE_OFFSET), ok(1.5));
}

TEST(TimeServiceConnection, RefusedAndTimedOutRequestsAreCommunicationFailures) {
    TimeServiceSim sim;
    Session session(sim.resource());
    ASSERT_STATUS(session.status(), VI_SUCCESS);
    sim.next(R"({"delayMs":60000})");
    EXPECT_STATUS(int32Of(session.vi(), "PTP1", TIKTAL_ATTR_1588_PRIORITY1).status,
                  tiktalerr_remoteDeviceCommunicationFailure);  // after the client's 5 s
    sim.release();
    EXPECT_EQ(int32Of(session.vi(), "PTP1", TIKTAL_ATTR_1588_PRIORITY1), ok(128));
    sim.stop();
    EXPECT_STATUS(int32Of(session.vi(), "PTP1", TIKTAL_ATTR_1588_PRIORITY1).status,
                  tiktalerr_remoteDeviceCommunicationFailure);
    EXPECT_STATUS(tiktal_PersistConfig(session.vi()), tiktalerr_remoteDeviceCommunicationFailure);
}

TEST_F(TimeService, PersistsTheServicesConfiguration) {
    const auto persisted = [&] {
        std::ifstream file(sim->statePath());
        std::stringstream text;
        text << file.rdbuf();
        const Json state = parse(text.str());
        const cJSON* ptp1 = cJSON_GetObjectItemCaseSensitive(cJSON_GetObjectItemCaseSensitive(state.get(), "timeReferences"), "PTP1");
        const cJSON* priority1 = cJSON_GetObjectItemCaseSensitive(ptp1, "priority1");
        return cJSON_IsNumber(priority1) ? priority1->valueint : -1;
    };
    EXPECT_STATUS(tiktal_SetAttributeViInt32(vi, "PTP1", TIKTAL_ATTR_1588_PRIORITY1, 77), VI_SUCCESS);
    EXPECT_EQ(persisted(), 128) << "written only by persisting";
    EXPECT_STATUS(tiktal_PersistConfig(vi), VI_SUCCESS);
    const Request persist = lastRequest(*sim);
    EXPECT_EQ(persist.method, "PUT");
    EXPECT_EQ(persist.path, "/tiktalwebs/sync_1/persist");
    EXPECT_EQ(persist.body, "");
    EXPECT_EQ(persisted(), 77);

    sim->next(R"({"status":500})");
    EXPECT_STATUS(tiktal_PersistConfig(vi), tiktalerr_remoteDeviceCommunicationFailure);
}

TEST_F(TimeService, RefusesWhatTheServiceCannotDoWithoutAskingIt) {
    EXPECT_EQ(servedDuring([&] {
                  EXPECT_STATUS(tiktal_reset(vi), tiktalerr_featureNotSupported);
                  EXPECT_STATUS(tiktal_AdjustTime_beta(vi, 1, 2), tiktalerr_rsrcUnavailable);
                  EXPECT_STATUS(tiktal_SetTimeReferenceFreeRunning(vi), tiktalerr_featureNotSupported);
                  EXPECT_STATUS(tiktal_SetTimeReference1588OrdinaryClock(vi), tiktalerr_featureNotSupported);
                  EXPECT_STATUS(tiktal_SetTimeReference8021AS(vi), tiktalerr_featureNotSupported);
                  ViInt16 result = -1;
                  std::string message(256, '#');
                  EXPECT_STATUS(tiktal_self_test(vi, &result, message.data()), VI_SUCCESS);
                  EXPECT_EQ(result, 0);
                  EXPECT_STREQ(message.c_str(), "Self test passed");
              }), 0);

    ViSession other = 1234;
    EXPECT_STATUS(tiktal_init(sim->resource().c_str(), VI_FALSE, VI_TRUE, &other), tiktalerr_resetNotSupported);
    EXPECT_EQ(other, 0u);
    EXPECT_EQ(int32Of(vi, "PTP1", TIKTAL_ATTR_1588_PRIORITY1), ok(128));
}

TEST_F(TimeService, EncodesEveryOtherByteOfANameInThePath) {
    const std::pair<const char*, const char*> names[] = {
        {"PTP 2", "PTP%202"}, {"a/b", "a%2Fb"}, {"x?y#z%", "x%3Fy%23z%25"}, {"ok-._~9", "ok-._~9"},
        {"\xC3\xA9+&=", "%C3%A9%2B%26%3D"}};
    ViInt32 priority = 10;
    for (const auto& [name, encoded] : names) {
        setMember(name, "type", R"("IEEE 1588-2008")");
        setMember(name, "priority1", std::to_string(priority));
        const std::string path = std::string("/tiktalwebs/sync_1/") + encoded + "/priority1";
        EXPECT_EQ(int32Of(vi, name, TIKTAL_ATTR_1588_PRIORITY1), ok(priority)) << name;
        EXPECT_EQ(lastRequest(*sim).path, path);
        EXPECT_STATUS(tiktal_SetAttributeViInt32(vi, name, TIKTAL_ATTR_1588_PRIORITY1, priority + 1), VI_SUCCESS) << name;
        EXPECT_EQ(lastRequest(*sim).path, path);
        EXPECT_EQ(int32Of(vi, name, TIKTAL_ATTR_1588_PRIORITY1), ok(priority + 1)) << name;
        ++priority;
    }
    sim->mergeState(R"({"selectedTrId":"x?y#z%"})");
    EXPECT_EQ(booleanOf(vi, "x?y#z%", TIKTAL_ATTR_TIME_REFERENCE_SELECTED), ok(VI_TRUE));
    EXPECT_EQ(stringOf(vi, nullptr, TIKTAL_ATTR_SELECTED_TIME_REFERENCE_TYPE), ok("IEEE 1588-2008"));
    EXPECT_EQ(lastRequest(*sim).path, "/tiktalwebs/sync_1/x%3Fy%23z%25/type");
}

}  // namespace
