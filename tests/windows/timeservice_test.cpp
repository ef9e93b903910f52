// Time-service sessions under Wine: tiktal.dll reaches the simulator, a Linux process that
// windows-tests.sh started on a loopback address (TIKTAL_TEST_TIMESERVICE = HOST:PORT, its state
// file TIKTAL_TEST_TIMESERVICE_STATE), through Wine's sockets, zrcurl.dll and libcurl, found by
// the registry value ZRSHAREDDIR.
#ifndef WIN32_LEAN_AND_MEAN
#define WIN32_LEAN_AND_MEAN
#endif
#include <winsock2.h>
#include <ws2tcpip.h>

#include <cjson/cJSON.h>
#include <gtest/gtest.h>
#include <tiktal/tiktal.h>

#include <cstdlib>
#include <fstream>
#include <memory>
#include <sstream>
#include <string>

namespace {

std::string environment(const char* name) {
    const char* value = std::getenv(name);
    if (!value) ADD_FAILURE() << name << " is not set: run this program through windows-tests.sh";
    return value ? value : "";
}

const std::string kHost = environment("TIKTAL_TEST_TIMESERVICE");

// One request to the simulator's test controls over a connection of its own; the answer's body.
std::string control(const std::string& method, const std::string& path, const std::string& body = "") {
    WSADATA data;
    WSAStartup(MAKEWORD(2, 2), &data);
    const std::size_t colon = kHost.rfind(':');
    addrinfo hints{}, *found = nullptr;
    hints.ai_socktype = SOCK_STREAM;
    if (getaddrinfo(kHost.substr(0, colon).c_str(), kHost.substr(colon + 1).c_str(), &hints, &found) != 0) {
        ADD_FAILURE() << "getaddrinfo " << kHost;
        return "";
    }
    const SOCKET s = socket(found->ai_family, SOCK_STREAM, IPPROTO_TCP);
    const bool connected = connect(s, found->ai_addr, static_cast<int>(found->ai_addrlen)) == 0;
    freeaddrinfo(found);
    std::string answer;
    if (connected) {
        const std::string request = method + " " + path + " HTTP/1.1\r\nHost: " + kHost + "\r\nContent-Length: " +
                                    std::to_string(body.size()) + "\r\nConnection: close\r\n\r\n" + body;
        send(s, request.data(), static_cast<int>(request.size()), 0);
        char buffer[4096];
        for (int n; (n = recv(s, buffer, sizeof buffer, 0)) > 0;) answer.append(buffer, n);
    }
    closesocket(s);
    EXPECT_EQ(answer.rfind("HTTP/1.1 200", 0), 0u) << method << ' ' << path << ": " << answer;
    const std::size_t end = answer.find("\r\n\r\n");
    return end == std::string::npos ? "" : answer.substr(end + 4);
}

class Session {
public:
    explicit Session(const std::string& resource) : _status(tiktal_init(resource.c_str(), VI_FALSE, VI_FALSE, &_vi)) {}
    ~Session() { tiktal_close(_vi); }
    ViStatus status() const { return _status; }
    ViSession vi() const { return _vi; }

private:
    ViSession _vi = 0;
    ViStatus _status;
};

std::string resource() { return "sync://" + kHost + "/sync_1"; }

std::string text(ViSession vi, const char* tr, ViAttr attribute) {
    const ViStatus size = tiktal_GetAttributeViString(vi, tr, attribute, 0, nullptr);
    if (size <= 0) return "status " + std::to_string(size);
    std::string buffer(static_cast<std::size_t>(size), '#');
    EXPECT_EQ(tiktal_GetAttributeViString(vi, tr, attribute, size, buffer.data()), VI_SUCCESS);
    return buffer.c_str();
}

TEST(TimeServiceUnderWine, ReadsAndWritesAttributesOfEachType) {
    control("POST", "/_sim/reset");
    Session session(resource());
    ASSERT_EQ(session.status(), VI_SUCCESS);
    const ViSession vi = session.vi();
    char names[64];
    EXPECT_EQ(tiktal_GetTimeReferenceNames(vi, 0, nullptr), 18);
    EXPECT_EQ(tiktal_GetTimeReferenceNames(vi, sizeof names, names), VI_SUCCESS);
    EXPECT_STREQ(names, "PTP1,BC1,AS1,TAB1");
    EXPECT_EQ(text(vi, "PTP1", TIKTAL_ATTR_1588_CLOCK_ID), "00:80:2F:FF:FE:12:34:56");
    ViInt32 priority = 0;
    EXPECT_EQ(tiktal_GetAttributeViInt32(vi, "PTP1", TIKTAL_ATTR_1588_PRIORITY1, &priority), VI_SUCCESS);
    EXPECT_EQ(priority, 128);
    EXPECT_EQ(tiktal_SetAttributeViInt32(vi, "AS1", TIKTAL_ATTR_8021AS_PRIORITY1, 17), VI_SUCCESS);
    EXPECT_EQ(tiktal_GetAttributeViInt32(vi, "AS1", TIKTAL_ATTR_8021AS_PRIORITY1, &priority), VI_SUCCESS);
    EXPECT_EQ(priority, 17);
    ViReal64 delay = 0;
    EXPECT_EQ(tiktal_GetAttributeViReal64(vi, "PTP1", TIKTAL_ATTR_1588_MEAN_PATH_DELAY, &delay), VI_SUCCESS);
    EXPECT_EQ(delay, 1234.5);
    ViBoolean enabled = 7;
    EXPECT_EQ(tiktal_GetAttributeViBoolean(vi, "TAB1", TIKTAL_ATTR_TIME_REFERENCE_ENABLED, &enabled), VI_SUCCESS);
    EXPECT_EQ(enabled, VI_FALSE);
    EXPECT_EQ(tiktal_SetAttributeViBoolean(vi, "TAB1", TIKTAL_ATTR_TIME_REFERENCE_ENABLED, VI_TRUE), VI_SUCCESS);
    EXPECT_EQ(tiktal_GetAttributeViBoolean(vi, "TAB1", TIKTAL_ATTR_TIME_REFERENCE_ENABLED, &enabled), VI_SUCCESS);
    EXPECT_EQ(enabled, VI_TRUE);
    EXPECT_EQ(tiktal_GetAttributeViInt32(vi, "AS1", TIKTAL_ATTR_1588_GM_PRIORITY1, &priority), tiktalerr_trTypeMismatch);
}

TEST(TimeServiceUnderWine, ReadsTheTimeAndPersists) {
    Session session(resource());
    ASSERT_EQ(session.status(), VI_SUCCESS);
    control("POST", "/_sim/state", R"({"epochOffsetInNsec":"1700000000123456789"})");
    ViUInt32 seconds = 0, nanoseconds = 0;
    ViUInt16 fraction = 7;
    EXPECT_EQ(tiktal_GetTime(session.vi(), &seconds, &nanoseconds, &fraction), VI_SUCCESS);
    EXPECT_EQ(seconds, 1700000000u);
    EXPECT_EQ(nanoseconds, 123456789u);
    EXPECT_EQ(fraction, 0u);

    EXPECT_EQ(tiktal_SetAttributeViInt32(session.vi(), "BC1", TIKTAL_ATTR_1588_PRIORITY2, 99), VI_SUCCESS);
    EXPECT_EQ(tiktal_PersistConfig(session.vi()), VI_SUCCESS);
    std::ifstream file(environment("TIKTAL_TEST_TIMESERVICE_STATE"));
    std::stringstream text;
    text << file.rdbuf();
    const std::unique_ptr<cJSON, decltype(&cJSON_Delete)> state(cJSON_Parse(text.str().c_str()), cJSON_Delete);
    const cJSON* bc1 = cJSON_GetObjectItemCaseSensitive(cJSON_GetObjectItemCaseSensitive(state.get(), "timeReferences"), "BC1");
    EXPECT_EQ(cJSON_GetNumberValue(cJSON_GetObjectItemCaseSensitive(bc1, "priority2")), 99) << text.str();
}

TEST(TimeServiceUnderWine, FailuresOfTheServiceAndOfTheConnection) {
    Session session(resource());
    ASSERT_EQ(session.status(), VI_SUCCESS);
    const auto offset = [&] {
        ViReal64 value = 0;
        return tiktal_GetAttributeViReal64(session.vi(), nullptr, TIKTAL_ATTR_SELECTED_TIME_REFERENCE_OFFSET, &value);
    };
    const std::pair<const char*, ViStatus> directives[] = {
        {R"({"error":{"success":false,"errorCode":-123,"errorText":"t","errorInfo":"i"}})", -123},
        {R"({"status":404})", tiktalerr_remoteDeviceResourceNotFound},
        {R"({"status":500})", tiktalerr_remoteDeviceCommunicationFailure},
        {R"({"status":200,"body":"<html>busy</html>"})", tiktalerr_remoteDeviceCommunicationFailure},
        {R"({"status":202})", tiktalerr_warn_networkClientInProgress},
    };
    for (const auto& [directive, status] : directives) {
        control("POST", "/_sim/next", directive);
        EXPECT_EQ(offset(), status) << directive;
    }
    EXPECT_EQ(offset(), VI_SUCCESS);

    const std::size_t colon = kHost.rfind(':');
    EXPECT_EQ(Session("sync://" + kHost.substr(0, colon) + ":1/sync_1").status(), tiktalerr_remoteDeviceCommunicationFailure);
    for (const char* local : {"sync://localhost/sync_1", "sync://127.0.0.1/sync_1"})
        EXPECT_EQ(Session(local).status(), tiktalerr_deviceNotFound) << local;
}

}  // namespace
