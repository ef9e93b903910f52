// The time-service stand-in as a client sees it: a separate process, real sockets, plain libcurl.
#include "timeservice_sim.h"

#include <cjson/cJSON.h>
#include <curl/curl.h>
#include <gtest/gtest.h>

#include <chrono>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <future>
#include <map>
#include <memory>
#include <set>
#include <sstream>
#include <string>
#include <thread>
#include <vector>

#include <unistd.h>

namespace {

using Json = std::unique_ptr<cJSON, decltype(&cJSON_Delete)>;
Json parse(const std::string& text) { return Json(cJSON_Parse(text.c_str()), cJSON_Delete); }
const cJSON* at(const cJSON* object, const char* name) { return cJSON_GetObjectItemCaseSensitive(object, name); }
std::string compact(const cJSON* item) {
    char* text = cJSON_PrintUnformatted(item);
    const std::string copy = text ? text : "<not JSON>";
    cJSON_free(text);
    return copy;
}
std::string readFile(const std::string& path) {
    std::ostringstream text;
    text << std::ifstream(path).rdbuf();
    return text.str();
}

struct Reply {
    long status = 0;
    std::string body;
    std::string contentType;
    std::string headers;            // the header lines as received
    curl_off_t contentLength = -1;  // -1 without a Content-Length
    long connects = 0;              // connections the request opened; 0 when it reused one

    bool chunked() const { return headers.find("Transfer-Encoding: chunked\r\n") != std::string::npos; }
};

size_t appendBody(char* data, size_t size, size_t count, void* target) {
    static_cast<std::string*>(target)->append(data, size * count);
    return size * count;
}

using Handle = std::unique_ptr<CURL, decltype(&curl_easy_cleanup)>;
Handle newHandle() { return Handle(curl_easy_init(), curl_easy_cleanup); }

// Hands out the upload text piece by piece; libcurl learns no size, so the body travels chunked,
// as it does from the driver's transport.
size_t readUpload(char* buffer, size_t size, size_t count, void* source) {
    auto* text = static_cast<std::string*>(source);
    const size_t n = std::min(size * count, text->size());
    text->copy(buffer, n);
    text->erase(0, n);
    return n;
}

// One request on `curl`, which keeps its connection for the next one.
Reply request(CURL* curl, const std::string& method, const std::string& url, std::string upload = {}) {
    Reply reply;
    curl_slist* headers = curl_slist_append(nullptr, "Accept: vnd.zr.tiktal.v1/json; charset=utf-8");
    headers = curl_slist_append(headers, "Content-Type: vnd.zr.tiktal.v1/json; charset=utf-8");
    curl_easy_setopt(curl, CURLOPT_URL, url.c_str());
    curl_easy_setopt(curl, CURLOPT_HTTPHEADER, headers);
    curl_easy_setopt(curl, CURLOPT_NOSIGNAL, 1L);
    curl_easy_setopt(curl, CURLOPT_WRITEFUNCTION, appendBody);
    curl_easy_setopt(curl, CURLOPT_WRITEDATA, &reply.body);
    curl_easy_setopt(curl, CURLOPT_HEADERFUNCTION, appendBody);
    curl_easy_setopt(curl, CURLOPT_HEADERDATA, &reply.headers);
    curl_easy_setopt(curl, CURLOPT_UPLOAD, method == "PUT" ? 1L : 0L);
    if (method == "PUT") {
        curl_easy_setopt(curl, CURLOPT_READFUNCTION, readUpload);
        curl_easy_setopt(curl, CURLOPT_READDATA, &upload);
    }
    EXPECT_EQ(curl_easy_perform(curl), CURLE_OK) << method << " " << url;
    curl_easy_getinfo(curl, CURLINFO_RESPONSE_CODE, &reply.status);
    const char* type = nullptr;
    curl_easy_getinfo(curl, CURLINFO_CONTENT_TYPE, &type);
    reply.contentType = type ? type : "";
    curl_easy_getinfo(curl, CURLINFO_CONTENT_LENGTH_DOWNLOAD_T, &reply.contentLength);
    curl_easy_getinfo(curl, CURLINFO_NUM_CONNECTS, &reply.connects);
    curl_easy_setopt(curl, CURLOPT_HTTPHEADER, nullptr);
    curl_slist_free_all(headers);
    return reply;
}

// One request on a handle of its own, so on a connection of its own.
Reply request(const std::string& method, const std::string& url, std::string upload = {}) {
    return request(newHandle().get(), method, url, std::move(upload));
}

std::string putBody(const std::string& key, const std::string& value) {
    return R"({"version":1,"data":{")" + key + R"(":")" + value + R"("}})";
}

// The one member of "data" in a 200 answer.
Json dataValue(const Reply& reply, const char* key) {
    Json body = parse(reply.body);
    const cJSON* data = at(body.get(), "data");
    EXPECT_EQ(reply.status, 200) << reply.body;
    EXPECT_EQ(cJSON_GetArraySize(data), 1) << reply.body;
    const cJSON* value = at(data, key);
    return Json(value ? cJSON_Duplicate(value, true) : cJSON_CreateString("<absent>"), cJSON_Delete);
}

Reply get(const std::string& url) { return request("GET", url); }
// GET of one value: the member `key` of "data".
Json value(const std::string& url, const char* key) { return dataValue(get(url), key); }
// PUT of one attribute, as the driver writes it, to the URL that ends in "/" + key.
Reply put(const std::string& url, const std::string& key, const std::string& text) {
    return request("PUT", url, putBody(key, text));
}
Json written(const std::string& base, const std::string& key, const std::string& text) {
    return dataValue(put(base + key, key, text), key.c_str());
}

void expectErrorEnvelope(const Reply& reply, long status) {
    EXPECT_EQ(reply.status, status) << reply.body;
    Json body = parse(reply.body);
    const cJSON* error = at(body.get(), "error");
    ASSERT_TRUE(cJSON_IsObject(error)) << reply.body;
    EXPECT_TRUE(cJSON_IsFalse(at(error, "success")));
    ASSERT_TRUE(cJSON_IsNumber(at(error, "errorCode")));
    EXPECT_LT(at(error, "errorCode")->valuedouble, 0);
    EXPECT_TRUE(cJSON_IsString(at(error, "errorText")));
    EXPECT_TRUE(cJSON_IsString(at(error, "errorInfo")));
}

// The keys of each time-reference type in the driver's attribute dictionary, besides "type" and
// "isEnabled" that every type has.
const std::map<std::string, std::vector<std::string>> kKeysByType = {
    {"IEEE 1588-2008",
     {"portState", "stepsRemoved", "localClockId", "localClass", "localAccuracy", "priority1", "priority2",
      "gmClockId", "gmClass", "gmAccuracy", "gmPriority1", "gmPriority2", "logSyncInterval", "meanPathDelay_ns",
      "gmIpAddress", "bmcaMode", "interface"}},
    {"IEEE 1588-2008 BC",
     {"localClockId", "clockClass", "clockAccuracy", "priority1", "priority2", "gmClockId", "gmClockClass",
      "gmClockAccuracy", "gmPriority1", "gmPriority2"}},
    {"IEEE 802.1AS-2011",
     {"portState", "localClockId", "clockClass", "clockAccuracy", "priority1", "priority2", "gmClockId",
      "gmClockClass", "gmClockAccuracy", "gmPriority1", "gmPriority2", "logSyncInterval", "logAnnounceInterval",
      "interface", "neighborPropDelayThreshold", "asCapable"}},
    {"IEEE 802.1AS-2011 TAB",
     {"localClockId", "clockClass", "clockAccuracy", "priority1", "priority2", "gmClockId", "gmClockClass",
      "gmClockAccuracy", "gmPriority1", "gmPriority2"}},
};
const std::set<std::string> kPortStates = {"PTP_INITIALIZING", "PTP_FAULTY", "PTP_DISABLED", "PTP_LISTENING", "PTP_PRE_MASTER",
                                           "PTP_MASTER", "PTP_PASSIVE", "PTP_UNCALIBRATED", "PTP_SLAVE"};
const std::set<std::string> kAccuracies = {
    "WITHIN_25NS",  "WITHIN_100NS", "WITHIN_250NS", "WITHIN_1US",   "WITHIN_2.5US", "WITHIN_10US", "WITHIN_25US",
    "WITHIN_100US", "WITHIN_250US", "WITHIN_1MS",   "WITHIN_2.5MS", "WITHIN_10MS",  "WITHIN_25MS", "WITHIN_100MS",
    "WITHIN_250MS", "WITHIN_1S",    "WITHIN_10S",   "GREATER_THAN_10S", "ACCURACY_UNKNOWN"};
const std::set<std::string> kTextKeys = {"type", "portState", "localClockId", "gmClockId", "gmIpAddress",
                                         "bmcaMode", "interface", "meanPathDelay_ns"};

// The JSON type that the driver's session reads for the key: Booleans, texts (names from the fixed
// tables, and a mean path delay that is a number in a text), Int32 numbers, and the 802.1AS
// accuracies and the propagation delay threshold as either a text or a number.
void expectJsonType(const std::string& type, const std::string& key, const cJSON* value) {
    SCOPED_TRACE(type + " " + key);
    const bool accuracy = key.find("ccuracy") != std::string::npos;
    const bool textOrNumber = (accuracy && type.rfind("IEEE 802.1AS", 0) == 0) || key == "neighborPropDelayThreshold";
    if (key == "isEnabled" || key == "asCapable") {
        EXPECT_TRUE(cJSON_IsBool(value));
    } else if (cJSON_IsString(value) && (kTextKeys.count(key) || accuracy || textOrNumber)) {
        const std::string text = value->valuestring;
        char* end = nullptr;
        std::strtod(text.c_str(), &end);
        const bool decimal = !text.empty() && *end == '\0';
        EXPECT_TRUE(key != "meanPathDelay_ns" || decimal) << text;
        EXPECT_TRUE(key != "portState" || kPortStates.count(text)) << text;
        EXPECT_TRUE(key != "bmcaMode" || text == "slaveonly" || text == "masterslave" || text == "masteronly") << text;
        EXPECT_TRUE(!accuracy || kAccuracies.count(text)) << text;
    } else {
        ASSERT_TRUE(cJSON_IsNumber(value) && (textOrNumber || !(kTextKeys.count(key) || accuracy))) << compact(value);
        EXPECT_EQ(value->valuedouble, static_cast<double>(value->valueint));  // an Int32
    }
}

const std::string kDevice = "/tiktalwebs/sync_1";

TEST(TimeServiceSimulator, DeviceListAndServiceAttributes) {
    TimeServiceSim sim;
    const Reply devices = get(sim.url("/tiktalwebs/devices"));
    EXPECT_EQ(devices.contentType, "vnd.zr.tiktal.v1/json; charset=utf-8");
    EXPECT_EQ(compact(parse(devices.body).get()), R"({"devices":["/tiktal/sync_1"]})");

    EXPECT_STREQ(value(sim.url(kDevice + "?attribute=apiVersion"), "apiVersion")->valuestring, "1");
    EXPECT_STREQ(value(sim.url(kDevice + "?attribute=selectedTrId"), "selectedTrId")->valuestring, "PTP1");
    EXPECT_STREQ(value(sim.url(kDevice + "?attribute=selectedTrOffsetNanos"), "selectedTrOffsetNanos")->valuestring,
                 "1500000000");
    const Json epoch = value(sim.url(kDevice + "?attribute=epochOffsetInNsec"), "epochOffsetInNsec");
    ASSERT_TRUE(cJSON_IsString(epoch.get()));
    EXPECT_EQ(std::string(epoch->valuestring).find_first_not_of("0123456789"), std::string::npos);
    EXPECT_GT(std::stoull(epoch->valuestring), 1600000000ULL * 1000000000ULL);  // the real clock, in ns
    EXPECT_EQ(compact(value(sim.url(kDevice + "?attribute=allTimeReferences"), "allTimeReferences").get()),
              R"(["PTP1","BC1","AS1","TAB1"])");

    Json all = parse(get(sim.url(kDevice)).body);
    for (const char* name : {"allTimeReferences", "epochOffsetInNsec", "apiVersion", "selectedTrId", "selectedTrOffsetNanos"})
        EXPECT_NE(at(at(all.get(), "data"), name), nullptr) << name;
}

TEST(TimeServiceSimulator, EveryTypeServesEachOfItsKeysInTheExpectedJsonType) {
    TimeServiceSim sim;
    Json names = value(sim.url(kDevice + "?attribute=allTimeReferences"), "allTimeReferences");
    std::set<std::string> typesSeen;
    for (const cJSON* name = names->child; name; name = name->next) {
        const std::string base = kDevice + "/" + name->valuestring;
        Json metadata = parse(get(sim.url(base)).body);
        const cJSON* members = at(metadata.get(), "data");
        ASSERT_TRUE(cJSON_IsString(at(members, "type")));
        const std::string type = at(members, "type")->valuestring;
        ASSERT_EQ(kKeysByType.count(type), 1u) << type;
        typesSeen.insert(type);
        std::vector<std::string> keys = kKeysByType.at(type);
        keys.insert(keys.end(), {"type", "isEnabled"});
        for (const std::string& key : keys) {
            const Json one = value(sim.url(base + "/" + key), key.c_str());
            expectJsonType(type, key, one.get());
            EXPECT_TRUE(cJSON_Compare(one.get(), at(members, key.c_str()), true)) << base << "/" << key;
        }
    }
    EXPECT_EQ(typesSeen.size(), 4u);
}

TEST(TimeServiceSimulator, UnknownNamesAnswer404WithTheErrorEnvelope) {
    TimeServiceSim sim;
    for (const char* path : {"/tiktalwebs/sync_2", "/tiktalwebs/Sync_1/PTP1", "/tiktalwebs/sync_1/NOPE",
                             "/tiktalwebs/sync_1/PTP1/noSuchKey", "/tiktalwebs/sync_1?attribute=noSuch",
                             "/tiktalwebs/sync_1/PTP1/portState/more", "/tiktalwebs/sync_1/ptp1/portState"}) {
        SCOPED_TRACE(path);
        expectErrorEnvelope(get(sim.url(path)), 404);
    }
    expectErrorEnvelope(put(sim.url("/tiktalwebs/sync_1/PTP1/noSuchKey"), "noSuchKey", "1"), 404);
}

TEST(TimeServiceSimulator, ChunkedPutChangesValuesInTheStoredJsonType) {
    TimeServiceSim sim;
    const std::string base = sim.url(kDevice + "/PTP1/");
    EXPECT_EQ(written(base, "priority1", "100")->valuedouble, 100);
    Json last = parse(sim.lastRequest());
    EXPECT_STREQ(at(last.get(), "method")->valuestring, "PUT");
    EXPECT_STREQ(at(at(last.get(), "headers"), "Transfer-Encoding")->valuestring, "chunked");
    EXPECT_EQ(at(at(last.get(), "headers"), "Content-Length"), nullptr);
    EXPECT_EQ(at(last.get(), "body")->valuestring, putBody("priority1", "100"));
    EXPECT_EQ(value(base + "priority1", "priority1")->valuedouble, 100);

    EXPECT_TRUE(cJSON_IsFalse(written(base, "isEnabled", "0").get()));
    EXPECT_TRUE(cJSON_IsFalse(value(base + "isEnabled", "isEnabled").get()));
    EXPECT_TRUE(cJSON_IsTrue(written(base, "isEnabled", "true").get()));
    EXPECT_EQ(written(base, "logSyncInterval", "-4")->valuedouble, -4);
    EXPECT_STREQ(written(base, "bmcaMode", "slaveonly")->valuestring, "slaveonly");
    EXPECT_STREQ(value(base + "bmcaMode", "bmcaMode")->valuestring, "slaveonly");
}

TEST(TimeServiceSimulator, RefusesReadOnlyKeysUnfittingValuesAndMalformedBodies) {
    TimeServiceSim sim;
    const std::string ptp = sim.url(kDevice + "/PTP1/"), as = sim.url(kDevice + "/AS1/");
    expectErrorEnvelope(put(ptp + "portState", "portState", "PTP_MASTER"), 400);
    expectErrorEnvelope(put(ptp + "type", "type", "IEEE 1588-2008 BC"), 400);
    expectErrorEnvelope(put(ptp + "gmClockId", "gmClockId", "00:00:00:00:00:00:00:01"), 400);
    expectErrorEnvelope(put(as + "asCapable", "asCapable", "0"), 400);
    expectErrorEnvelope(put(ptp + "priority1", "priority1", "abc"), 400);
    expectErrorEnvelope(put(ptp + "priority1", "priority1", "12x"), 400);
    expectErrorEnvelope(put(ptp + "priority1", "priority1", ""), 400);
    expectErrorEnvelope(put(ptp + "isEnabled", "isEnabled", "2"), 400);
    expectErrorEnvelope(request("PUT", ptp + "priority1", "{\"version\":1,\"data\":{\"priority1\":\"5\"}"), 400);
    expectErrorEnvelope(request("PUT", ptp + "priority1", R"({"version":1,"data":{"priority1":5}})"), 400);
    expectErrorEnvelope(request("PUT", ptp + "priority1", R"({"version":1,"data":{"priority2":"5"}})"), 400);
    expectErrorEnvelope(request("PUT", ptp + "priority1", ""), 400);
    EXPECT_EQ(value(ptp + "priority1", "priority1")->valuedouble, 128);
    EXPECT_STREQ(value(ptp + "portState", "portState")->valuestring, "PTP_SLAVE");
    EXPECT_TRUE(cJSON_IsTrue(value(as + "asCapable", "asCapable").get()));
}

TEST(TimeServiceSimulator, HandWrittenStateFileAndPercentEncodedNames) {
    const std::filesystem::path folder = std::filesystem::temp_directory_path() / ("sim_state_" + std::to_string(getpid()));
    std::filesystem::create_directories(folder);
    std::ofstream(folder / "state.json") << R"({"device": "dev1", "deviceListPrefix": "/x/", "apiVersion": "2",
        "selectedTrId": null, "selectedTrOffsetNanos": null, "epochOffsetInNsec": "1700000000123456789",
        "timeReferences": {"PTP 2": {"type": "IEEE 1588-2008", "priority1": 128},
                           "a/b": {"type": "IEEE 802.1AS-2011", "isEnabled": false}}})";
    {
        TimeServiceSim sim({"", "127.0.0.3", (folder / "state.json").string()});
        EXPECT_EQ(sim.host().rfind("127.0.0.3:", 0), 0u);
        EXPECT_STREQ(parse(get(sim.url("/tiktalwebs/devices")).body)->child->child->valuestring, "/x/dev1");
        EXPECT_TRUE(cJSON_IsNull(value(sim.url("/tiktalwebs/dev1?attribute=selectedTrId"), "selectedTrId").get()));
        EXPECT_TRUE(cJSON_IsNull(value(sim.url("/tiktalwebs/dev1?attribute=selected%54rOffsetNanos"), "selectedTrOffsetNanos").get()));
        EXPECT_STREQ(value(sim.url("/tiktalwebs/dev1?attribute=epochOffsetInNsec"), "epochOffsetInNsec")->valuestring,
                     "1700000000123456789");
        EXPECT_EQ(written(sim.url("/tiktalwebs/dev1/PTP%202/"), "priority1", "7")->valuedouble, 7);
        EXPECT_EQ(value(sim.url("/tiktalwebs/dev1/PTP%202/priority1"), "priority1")->valuedouble, 7);
        EXPECT_TRUE(cJSON_IsFalse(value(sim.url("/tiktalwebs/dev1/a%2Fb/isEnabled"), "isEnabled").get()));
        EXPECT_STREQ(value(sim.url("/tiktalwebs/%64ev1/%61%2f%62/%74ype"), "type")->valuestring, "IEEE 802.1AS-2011");
        Json last = parse(sim.lastRequest());
        EXPECT_STREQ(at(last.get(), "path")->valuestring, "/tiktalwebs/%64ev1/%61%2f%62/%74ype");  // as sent
        expectErrorEnvelope(get(sim.url("/tiktalwebs/dev1/a%2/type")), 400);
    }
    std::filesystem::remove_all(folder);
}

TEST(TimeServiceSimulator, PersistWritesTheStateFileThatARestartServes) {
    TimeServiceSim first;
    Json initial = parse(readFile(first.statePath()));
    EXPECT_EQ(cJSON_GetArraySize(at(initial.get(), "timeReferences")), 4);  // the default, written at start

    put(first.url(kDevice + "/PTP1/priority2"), "priority2", "99");
    const Reply persisted = request("PUT", first.url(kDevice + "/persist"));
    EXPECT_EQ(persisted.status, 200);
    EXPECT_EQ(compact(parse(persisted.body).get()), R"({"data":{}})");
    Json saved = parse(readFile(first.statePath()));
    EXPECT_EQ(at(at(at(saved.get(), "timeReferences"), "PTP1"), "priority2")->valuedouble, 99);
    const auto entries = std::distance(std::filesystem::directory_iterator(std::filesystem::path(first.statePath()).parent_path()), {});
    EXPECT_EQ(entries, 1);  // no temporary file left beside it
    EXPECT_EQ(first.stop(), 0);

    TimeServiceSim second({"", "127.0.0.2", first.statePath()});
    EXPECT_EQ(value(second.url(kDevice + "/PTP1/priority2"), "priority2")->valuedouble, 99);
}

TEST(TimeServiceSimulator, DirectivesChangeTheNextAnswersInOrder) {
    TimeServiceSim sim;
    const std::string portState = sim.url(kDevice + "/PTP1/portState");
    const Reply normal = get(portState);

    sim.next(R"({"status":500})");
    const Reply failed = get(portState);
    EXPECT_EQ(failed.status, 500);
    EXPECT_EQ(failed.body, normal.body);
    sim.next(R"({"status":202,"body":""})");
    const Reply empty = get(portState);
    EXPECT_EQ(empty.status, 202);
    EXPECT_EQ(empty.body, "");
    sim.next(R"({"body":"{\"data\": [1,"})");
    EXPECT_EQ(get(portState).body, "{\"data\": [1,");

    sim.next(R"({"error":{"success":false,"errorCode":-123,"errorText":"t","errorInfo":"i"}})");
    Json withError = parse(get(portState).body);
    EXPECT_STREQ(at(at(withError.get(), "data"), "portState")->valuestring, "PTP_SLAVE");
    EXPECT_EQ(compact(at(withError.get(), "error")),
              R"({"success":false,"errorCode":-123,"errorText":"t","errorInfo":"i"})");

    sim.next(R"({"wrapResult":true})");
    const Reply wrapped = get(portState);
    EXPECT_NE(normal.body.find_first_of("\n\t "), std::string::npos);  // the inner text keeps its spacing
    EXPECT_EQ(wrapped.body, "{\"result\":" + normal.body + "}");

    sim.next(R"({"count":2,"status":404})");
    sim.next(R"({"status":503})");
    for (long expected : {404, 404, 503, 200}) EXPECT_EQ(get(portState).status, expected);

    EXPECT_THROW(sim.next(R"({"status":"500"})"), std::runtime_error);
    EXPECT_THROW(sim.next(R"({"colour":1})"), std::runtime_error);
    EXPECT_EQ(get(portState).status, 200);  // refused directives were not queued
}

TEST(TimeServiceSimulator, DelayedAnswerLeavesTheControlsAndOtherRequestsAnswering) {
    TimeServiceSim sim;
    sim.next(R"({"delayMs":600000})");
    auto delayed = std::async(std::launch::async, [&] { return get(sim.url("/tiktalwebs/devices")); });
    const auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(10);
    while (sim.held() < 1) ASSERT_LT(std::chrono::steady_clock::now(), deadline) << "the request never arrived";

    EXPECT_EQ(sim.served(), 0);
    EXPECT_STREQ(at(parse(sim.lastRequest()).get(), "path")->valuestring, "/tiktalwebs/devices");
    EXPECT_EQ(get(sim.url(kDevice + "/PTP1/type")).status, 200);  // another request passes it
    EXPECT_EQ(delayed.wait_for(std::chrono::seconds(0)), std::future_status::timeout);
    sim.release();
    EXPECT_EQ(delayed.get().status, 200);
    EXPECT_EQ(sim.served(), 2);
    EXPECT_EQ(sim.held(), 0);
}

TEST(TimeServiceSimulator, CounterCountsServiceRequestsAndResetClearsIt) {
    TimeServiceSim sim;
    EXPECT_EQ(sim.served(), 0);
    EXPECT_EQ(compact(parse(sim.lastRequest()).get()), "{}");
    get(sim.url("/tiktalwebs/devices"));
    get(sim.url("/tiktalwebs/nothing"));  // failed requests count too
    put(sim.url(kDevice + "/PTP1/priority1"), "priority1", "1");
    get(sim.url("/_sim/no-such-control"));  // controls do not count
    EXPECT_EQ(sim.served(), 3);
    sim.next(R"({"status":500})");
    sim.reset();
    EXPECT_EQ(sim.served(), 0);
    EXPECT_EQ(compact(parse(sim.lastRequest()).get()), "{}");
    EXPECT_EQ(get(sim.url("/tiktalwebs/devices")).status, 200);  // the directive is gone
    EXPECT_EQ(sim.served(), 1);
}

TEST(TimeServiceSimulator, ListensOnLoopbackOnly) {
    for (const char* address : {"0.0.0.0", "192.0.2.1", "localhost", "::"}) {
        SCOPED_TRACE(address);
        EXPECT_THROW(TimeServiceSim({"", address, ""}), std::runtime_error);
    }
    TimeServiceSim sim({"", "127.1.2.3", ""});
    EXPECT_EQ(get(sim.url("/tiktalwebs/devices")).status, 200);
}

TEST(TimeServiceSimulator, RequestsOnOneHandleShareOneConnectionCountedOncePerReset) {
    TimeServiceSim sim;
    const Handle client = newHandle();
    EXPECT_EQ(request(client.get(), "GET", sim.url("/tiktalwebs/devices")).connects, 1);
    EXPECT_EQ(request(client.get(), "PUT", sim.url(kDevice + "/PTP1/priority1"), putBody("priority1", "9")).connects, 0);
    EXPECT_EQ(request(client.get(), "GET", sim.url(kDevice + "/PTP1/priority1")).connects, 0);
    EXPECT_EQ(sim.served(), 3);
    EXPECT_EQ(sim.connections(), 1);  // the test controls' own connections do not count

    get(sim.url("/tiktalwebs/devices"));  // another handle, another connection
    EXPECT_EQ(sim.connections(), 2);
    sim.reset();
    EXPECT_EQ(sim.connections(), 0);
    // The kept-alive connection from before the reset counts again, once.
    EXPECT_EQ(request(client.get(), "GET", sim.url("/tiktalwebs/devices")).connects, 0);
    EXPECT_EQ(request(client.get(), "GET", sim.url("/tiktalwebs/devices")).connects, 0);
    EXPECT_EQ(sim.connections(), 1);
}

// The simulator keeps an idle connection open for 60 s, and stop() gives up after 10 s and kills it
// (exit status 128 + 9): a clean exit shows that the stop ended the idle connections at once.
TEST(TimeServiceSimulator, StopEndsIdleKeptAliveConnectionsAtOnce) {
    TimeServiceSim sim;
    const Handle session = newHandle();  // kept open, as a driver session keeps its own
    request(session.get(), "GET", sim.url("/tiktalwebs/devices"));
    ASSERT_EQ(request(session.get(), "GET", sim.url("/tiktalwebs/devices")).connects, 0);  // kept alive
    const Handle silent = newHandle();  // connected, never sends a request
    curl_easy_setopt(silent.get(), CURLOPT_URL, sim.url("/").c_str());
    curl_easy_setopt(silent.get(), CURLOPT_CONNECT_ONLY, 1L);
    ASSERT_EQ(curl_easy_perform(silent.get()), CURLE_OK);

    EXPECT_EQ(sim.stop(), 0);
    EXPECT_EQ(sim.stop(), 0);
    std::string body;
    curl_easy_setopt(session.get(), CURLOPT_WRITEFUNCTION, appendBody);
    curl_easy_setopt(session.get(), CURLOPT_WRITEDATA, &body);
    EXPECT_NE(curl_easy_perform(session.get()), CURLE_OK);  // it is gone
}

TEST(TimeServiceSimulator, RepeatStreamsTheBodyWithItsContentLengthOrChunked) {
    TimeServiceSim sim;
    const std::string url = sim.url("/tiktalwebs/devices");
    const Reply normal = get(url);
    EXPECT_EQ(normal.contentLength, static_cast<curl_off_t>(normal.body.size()));

    sim.next(R"({"repeat":3,"body":"abc","status":503})");
    const Reply three = get(url);
    EXPECT_EQ(three.status, 503);
    EXPECT_EQ(three.body, "abcabcabc");
    EXPECT_EQ(three.contentLength, 9);
    EXPECT_FALSE(three.chunked());
    EXPECT_EQ(three.contentType, "vnd.zr.tiktal.v1/json; charset=utf-8");
    EXPECT_EQ(sim.streamed(), 9);

    // A text of 7 bytes repeated past a megabyte: the pieces that the server sends begin anywhere
    // within the text.
    sim.next(R"({"repeat":150001,"body":"0123456"})");
    sim.next(R"({"repeat":150001,"body":"0123456","chunked":true})");
    for (const bool chunked : {false, true}) {
        SCOPED_TRACE(chunked ? "chunked" : "with Content-Length");
        const Reply answer = get(url);
        ASSERT_EQ(answer.body.size(), 1050007u);
        std::size_t wrong = 0;
        while (wrong < answer.body.size() && answer.body[wrong] == static_cast<char>('0' + wrong % 7)) ++wrong;
        EXPECT_EQ(wrong, answer.body.size()) << "the first wrong byte";
        EXPECT_EQ(answer.chunked(), chunked);
        EXPECT_EQ(answer.contentLength, chunked ? -1 : 1050007);
    }
    EXPECT_EQ(sim.streamed(), 9 + 2 * 1050007);

    sim.next(R"({"chunked":true})");  // without "repeat": the normal answer, chunked
    const Reply chunkedNormal = get(url);
    EXPECT_TRUE(chunkedNormal.chunked());
    EXPECT_EQ(chunkedNormal.body, normal.body);
    EXPECT_EQ(sim.streamed(), 9 + 2 * 1050007 + static_cast<long long>(normal.body.size()));
    sim.reset();
    EXPECT_EQ(sim.streamed(), 0);
}

TEST(TimeServiceSimulator, RefusesRepeatWithoutABodyOrOutOfRange) {
    TimeServiceSim sim;
    // 2^40 repeats of 8192 bytes make 2^53 bytes, the longest body the stats count exactly.
    const auto terabytes = [](std::size_t size) {
        return R"({"repeat":1099511627776,"body":")" + std::string(size, 'x') + R"("})";
    };
    const std::vector<std::string> refused = {R"({"repeat":3})",
                                              R"({"repeat":3,"body":""})",
                                              R"({"repeat":0,"body":"x"})",
                                              R"({"repeat":-1,"body":"x"})",
                                              R"({"repeat":1099511627777,"body":"x"})",  // 2^40 + 1
                                              R"({"repeat":2.5,"body":"x"})",
                                              R"({"repeat":"3","body":"x"})",
                                              R"({"chunked":1})",
                                              terabytes(8193)};
    for (const std::string& directive : refused) {
        SCOPED_TRACE(directive.substr(0, 60));
        EXPECT_THROW(sim.next(directive), std::runtime_error);
    }
    EXPECT_EQ(get(sim.url("/tiktalwebs/devices")).contentLength, 34);  // refused directives were not queued
    EXPECT_NO_THROW(sim.next(terabytes(8192)));
}

// Reads a GET's body until `enough` bytes have come, then gives up: libcurl closes the connection.
CURLcode giveUpAfter(const std::string& url, std::size_t enough) {
    struct Reader {
        std::size_t got = 0, enough = 0;
        static size_t take(char*, size_t size, size_t count, void* self) {
            auto* reader = static_cast<Reader*>(self);
            reader->got += size * count;
            return reader->got < reader->enough ? size * count : 0;
        }
    } reader;
    reader.enough = enough;
    const Handle curl = newHandle();
    curl_easy_setopt(curl.get(), CURLOPT_URL, url.c_str());
    curl_easy_setopt(curl.get(), CURLOPT_WRITEFUNCTION, Reader::take);
    curl_easy_setopt(curl.get(), CURLOPT_WRITEDATA, &reader);
    return curl_easy_perform(curl.get());
}

TEST(TimeServiceSimulator, AClientThatGivesUpEndsTheStreamLongBeforeItsEnd) {
    TimeServiceSim sim;
    for (const char* directive : {R"({"repeat":1099511627776,"body":"x"})",  // a terabyte
                                  R"({"repeat":1099511627776,"body":"x","chunked":true})"}) {
        SCOPED_TRACE(directive);
        sim.reset();
        sim.next(directive);
        EXPECT_EQ(giveUpAfter(sim.url("/tiktalwebs/devices"), 1 << 20), CURLE_WRITE_ERROR);
        const auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(10);
        while (sim.streaming() > 0) {
            ASSERT_LT(std::chrono::steady_clock::now(), deadline) << "the stream went on after the client left";
            std::this_thread::sleep_for(std::chrono::milliseconds(5));
        }
        EXPECT_GE(sim.streamed(), 1 << 20);
        EXPECT_LT(sim.streamed(), 256LL << 20);  // what the sockets' buffers held, not the terabyte
    }
}

}  // namespace
