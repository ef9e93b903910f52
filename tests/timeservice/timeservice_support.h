// Helpers of the time-service session tests: reads through the C interface that return the status
// together with the value, and access to the simulator's record of the last request.
#pragma once

#include <cjson/cJSON.h>
#include <gtest/gtest.h>
#include <tiktal/tiktal.h>

#include <cstdio>
#include <functional>
#include <memory>
#include <ostream>
#include <string>

#include "timeservice_sim.h"

namespace ts {

// Statuses print as hexadecimal, the way the header defines them.
inline std::string hex(ViStatus status) {
    char text[16];
    std::snprintf(text, sizeof text, "0x%08X", static_cast<unsigned>(status));
    return text;
}
#define EXPECT_STATUS(call, expected) EXPECT_EQ(ts::hex(call), ts::hex(expected))
#define ASSERT_STATUS(call, expected) ASSERT_EQ(ts::hex(call), ts::hex(expected))

// The outcome of one read: the status and the value the caller's variable holds afterwards.
template <class T>
struct Read {
    ViStatus status;
    T value;
    bool operator==(const Read& other) const { return status == other.status && value == other.value; }
};
template <class T>
std::ostream& operator<<(std::ostream& out, const Read<T>& read) {
    return out << "{" << hex(read.status) << ", " << +read.value << "}";
}
inline std::ostream& operator<<(std::ostream& out, const Read<std::string>& read) {
    return out << "{" << hex(read.status) << ", \"" << read.value << "\"}";
}
template <class T>
Read<T> ok(T value) { return {VI_SUCCESS, value}; }
inline Read<std::string> ok(const char* value) { return {VI_SUCCESS, value}; }

// Variables start with these values, so a read that fails shows whether it wrote them.
constexpr ViInt32 kUnsetInt32 = -12345;
constexpr ViReal64 kUnsetReal64 = -0.25;
constexpr ViBoolean kUnsetBoolean = 7;

inline Read<ViInt32> int32Of(ViSession vi, const char* tr, ViAttr attribute, ViInt32 start = kUnsetInt32) {
    ViInt32 value = start;
    const ViStatus status = tiktal_GetAttributeViInt32(vi, tr, attribute, &value);
    return {status, value};
}
inline Read<ViReal64> real64Of(ViSession vi, const char* tr, ViAttr attribute) {
    ViReal64 value = kUnsetReal64;
    const ViStatus status = tiktal_GetAttributeViReal64(vi, tr, attribute, &value);
    return {status, value};
}
inline Read<ViBoolean> booleanOf(ViSession vi, const char* tr, ViAttr attribute, ViBoolean start = kUnsetBoolean) {
    ViBoolean value = start;
    const ViStatus status = tiktal_GetAttributeViBoolean(vi, tr, attribute, &value);
    return {status, value};
}

// A text read as an application does it: the size query, then a buffer of exactly that size.
// A failing size query gives its status and the empty text.
template <class Call>
Read<std::string> textOf(Call call) {
    const ViStatus size = call(0, nullptr);
    if (size <= 0) return {size, ""};
    std::string buffer(static_cast<std::size_t>(size), '#');
    const ViStatus status = call(size, buffer.data());
    if (status != VI_SUCCESS) return {status, ""};
    EXPECT_EQ(buffer.back(), '\0') << "the text does not end where the size query said";
    EXPECT_EQ(buffer.find('\0'), buffer.size() - 1) << "the text is shorter than the size query said";
    return ok(buffer.c_str());
}
inline Read<std::string> stringOf(ViSession vi, const char* tr, ViAttr attribute) {
    return textOf([&](ViInt32 size, ViChar* buffer) { return tiktal_GetAttributeViString(vi, tr, attribute, size, buffer); });
}
inline Read<std::string> namesOf(ViSession vi) {
    return textOf([&](ViInt32 size, ViChar* buffer) { return tiktal_GetTimeReferenceNames(vi, size, buffer); });
}

using Json = std::unique_ptr<cJSON, decltype(&cJSON_Delete)>;
inline Json parse(const std::string& text) { return Json(cJSON_Parse(text.c_str()), cJSON_Delete); }
inline std::string print(const cJSON* item) {
    char* printed = cJSON_PrintUnformatted(item);
    std::string text = printed ? printed : "";
    cJSON_free(printed);
    return text;
}
// `text` as a JSON string literal.
inline std::string quoted(const std::string& text) {
    Json item(cJSON_CreateString(text.c_str()), cJSON_Delete);
    return print(item.get());
}

// The last service request the simulator saw, member by member; headers by name.
struct Request {
    std::string method, path, query, body, accept, contentType;
};
inline Request lastRequest(TimeServiceSim& sim) {
    const Json last = parse(sim.lastRequest());
    const auto text = [&](const cJSON* object, const char* name) {
        const cJSON* item = cJSON_GetObjectItemCaseSensitive(object, name);
        return cJSON_IsString(item) ? std::string(item->valuestring) : std::string("<none>");
    };
    const cJSON* headers = cJSON_GetObjectItemCaseSensitive(last.get(), "headers");
    return {text(last.get(), "method"), text(last.get(), "path"),    text(last.get(), "query"),
            text(last.get(), "body"),   text(headers, "Accept"),     text(headers, "Content-Type")};
}

// Opens a session on construction and closes it on destruction.
class Session {
public:
    explicit Session(const std::string& resource, ViBoolean reset = VI_FALSE)
        : _status(tiktal_init(resource.c_str(), VI_FALSE, reset, &_vi)) {}
    ~Session() {
        if (_vi) tiktal_close(_vi);
    }
    Session(const Session&) = delete;
    Session& operator=(const Session&) = delete;
    ViStatus status() const { return _status; }
    ViSession vi() const { return _vi; }

private:
    ViSession _vi = 0;
    ViStatus _status;
};

// One simulator per suite; every test starts from its default state with a fresh session.
class TimeService : public ::testing::Test {
protected:
    static void SetUpTestSuite() {
        sim = new TimeServiceSim();
        defaultState = new std::string(sim->state());
    }
    static void TearDownTestSuite() {
        delete sim;
        delete defaultState;
        sim = nullptr;
        defaultState = nullptr;
    }
    void SetUp() override {
        sim->replaceState(*defaultState);
        sim->reset();
        ASSERT_STATUS(tiktal_init(sim->resource().c_str(), VI_FALSE, VI_FALSE, &vi), VI_SUCCESS);
        sim->reset();  // each test counts its own requests
    }
    void TearDown() override {
        if (vi) tiktal_close(vi);
    }

    // Service requests answered while `call` runs.
    static long servedDuring(const std::function<void()>& call) {
        const long before = sim->served();
        call();
        return sim->served() - before;
    }
    // Sets member `key` of time reference `tr` to the JSON value `value`.
    static void setMember(const std::string& tr, const std::string& key, const std::string& value) {
        sim->mergeState(R"({"timeReferences":{)" + quoted(tr) + ":{" + quoted(key) + ":" + value + "}}}");
    }
    // Replaces the whole set of time references, keeping the rest of the default state.
    static void setReferences(const std::string& references) {
        Json state = parse(*defaultState);
        cJSON_ReplaceItemInObjectCaseSensitive(state.get(), "timeReferences", cJSON_Parse(references.c_str()));
        sim->replaceState(print(state.get()));
    }
    // The next service request is answered with HTTP 200 and `body` (after `skip` requests answered
    // normally).
    static void answerWith(const std::string& body, int skip = 0) {
        if (skip > 0) sim->next(R"({"count":)" + std::to_string(skip) + "}");
        sim->next(R"({"status":200,"body":)" + quoted(body) + "}");
    }

    inline static TimeServiceSim* sim = nullptr;
    inline static std::string* defaultState = nullptr;
    ViSession vi = 0;
};

}  // namespace ts
