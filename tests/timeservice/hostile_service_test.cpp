// Time-service sessions against a service that answers in hostile or broken ways, and callers that
// give hostile resource names: every case must fail with a clear error status, store nothing, and
// neither crash the caller nor report success or a warning.
#include <chrono>
#include <thread>

#include "timeservice_support.h"

namespace {

using namespace ts;

constexpr std::size_t kMaxAnswerBytes = 4 * 1024 * 1024;  // the documented limit of an answer

std::string repeated(const std::string& piece, std::size_t count) {
    std::string text;
    text.reserve(piece.size() * count);
    for (std::size_t i = 0; i < count; ++i) text += piece;
    return text;
}

// The error envelope of a failed request, with `code` written exactly as given.
std::string errorWithCode(const std::string& code) {
    return R"({"error":{"success":false,"errorCode":)" + code + R"(,"errorText":"t","errorInfo":"i"}})";
}

TEST_F(TimeService, DeeplyNestedAnswersFailWithoutExhaustingTheStack) {
    for (const std::string& deep : {std::string(100000, '['), repeated(R"({"a":)", 100000),
                                    R"({"devices":)" + repeated("[", 50000) + repeated("]", 50000) + "}"}) {
        answerWith(deep);
        ViSession opened = 0xDEADBEEF;
        EXPECT_STATUS(tiktal_init(sim->resource().c_str(), VI_FALSE, VI_FALSE, &opened),
                      tiktalerr_remoteDeviceCommunicationFailure);
        EXPECT_EQ(opened, 0u);
        answerWith(deep, 1);  // the value, after the type
        EXPECT_EQ(int32Of(vi, "PTP1", TIKTAL_ATTR_1588_PRIORITY1),
                  Read<ViInt32>({tiktalerr_remoteDeviceCommunicationFailure, kUnsetInt32}));
    }
    // Nesting that the protocol never needs, but within bounds, is read as usual.
    answerWith(R"({"data":{"priority1":7,"x":)" + repeated("[", 100) + repeated("]", 100) + "}}", 1);
    EXPECT_EQ(int32Of(vi, "PTP1", TIKTAL_ATTR_1588_PRIORITY1), ok(7));
}

TEST_F(TimeService, AHundredThousandNamesAreListedAndSearched) {
    constexpr int kCount = 100000;
    std::string list, expected;
    for (int i = 0; i < kCount; ++i) {
        const std::string name = "TR" + std::to_string(i);
        list += (i ? ",\"" : "\"") + name + "\"";
        expected += (i ? "," : "") + name;
    }
    const std::string names = R"({"data":{"allTimeReferences":[)" + list + "]}}";
    sim->next(R"({"count":2,"status":200,"body":)" + quoted(names) + "}");  // the size query and the read
    EXPECT_EQ(namesOf(vi), ok(expected.c_str()));

    // TIME_REFERENCE_SELECTED: the type of the name, the list, then the selection.
    for (const char* name : {"TR99999", "TR0", "TR5000"}) {
        answerWith(R"({"data":{"type":"IEEE 1588-2008"}})");
        answerWith(names);
        answerWith(R"({"data":{"selectedTrId":"TR99999"}})");
        const bool last = std::string(name) == "TR99999";
        EXPECT_EQ(booleanOf(vi, name, TIKTAL_ATTR_TIME_REFERENCE_SELECTED), ok<ViBoolean>(last ? VI_TRUE : VI_FALSE))
            << name;
    }
    answerWith(R"({"data":{"type":"IEEE 1588-2008"}})");
    answerWith(names);
    EXPECT_STATUS(booleanOf(vi, "TR100000", TIKTAL_ATTR_TIME_REFERENCE_SELECTED).status, tiktalerr_trInstanceNotFound);
}

TEST_F(TimeService, NumbersBeyondADoubleAndNullValuesAreFailuresThatStoreNothing) {
    const Read<ViInt32> int32Failure{tiktalerr_internalSoftware, kUnsetInt32};
    for (const std::string& value : {std::string("1e400"), std::string("-1e400"), std::string(400, '9'), std::string("null")}) {
        answerWith(R"({"data":{"priority1":)" + value + "}}", 1);
        EXPECT_EQ(int32Of(vi, "PTP1", TIKTAL_ATTR_1588_PRIORITY1), int32Failure) << value;
        answerWith(R"({"data":{"stepsRemoved":)" + value + "}}", 1);
        EXPECT_EQ(int32Of(vi, "PTP1", TIKTAL_ATTR_1588_STEPS_REMOVED), int32Failure) << value;
        answerWith(R"({"data":{"gmClockAccuracy":)" + value + "}}", 1);  // a name or a number
        EXPECT_EQ(int32Of(vi, "AS1", TIKTAL_ATTR_8021AS_GM_CLOCK_ACCURACY), int32Failure) << value;
        answerWith(R"({"data":{"localClockId":)" + value + "}}", 1);
        EXPECT_EQ(stringOf(vi, "PTP1", TIKTAL_ATTR_1588_CLOCK_ID), Read<std::string>({tiktalerr_internalSoftware, ""}))
            << value;
        answerWith(R"({"data":{"meanPathDelay_ns":)" + value + "}}", 1);
        EXPECT_EQ(real64Of(vi, "PTP1", TIKTAL_ATTR_1588_MEAN_PATH_DELAY),
                  Read<ViReal64>({tiktalerr_internalSoftware, kUnsetReal64})) << value;
    }
    // A Boolean that is null still reads false; one beyond a double is no Boolean.
    answerWith(R"({"data":{"isEnabled":null}})", 1);
    EXPECT_EQ(booleanOf(vi, "PTP1", TIKTAL_ATTR_TIME_REFERENCE_ENABLED), ok<ViBoolean>(VI_FALSE));
    answerWith(R"({"data":{"isEnabled":1e400}})", 1);
    EXPECT_EQ(booleanOf(vi, "PTP1", TIKTAL_ATTR_TIME_REFERENCE_ENABLED),
              Read<ViBoolean>({tiktalerr_internalSoftware, kUnsetBoolean}));

    // A selection beyond a double is not "no selection"; null still is.
    answerWith(R"({"data":{"selectedTrId":1e400}})");
    EXPECT_STATUS(stringOf(vi, nullptr, TIKTAL_ATTR_SELECTED_TIME_REFERENCE).status, tiktalerr_internalSoftware);
    answerWith(R"({"data":{"selectedTrOffsetNanos":1e400}})");
    EXPECT_EQ(real64Of(vi, nullptr, TIKTAL_ATTR_SELECTED_TIME_REFERENCE_OFFSET_NS),
              Read<ViReal64>({tiktalerr_internalSoftware, kUnsetReal64}));
    sim->next(R"({"count":2,"status":200,"body":"{\"data\":{\"selectedTrId\":null}}"})");
    EXPECT_EQ(stringOf(vi, nullptr, TIKTAL_ATTR_SELECTED_TIME_REFERENCE), ok(""));

    // The service sends measurements as texts: a text that is no finite number is no value.
    for (const char* text : {"inf", "-Infinity", "nan", "NAN(1)", "1e400"}) {
        setMember("PTP1", "meanPathDelay_ns", quoted(text));
        EXPECT_EQ(real64Of(vi, "PTP1", TIKTAL_ATTR_1588_MEAN_PATH_DELAY),
                  Read<ViReal64>({tiktalerr_internalSoftware, kUnsetReal64})) << text;
    }
}

TEST_F(TimeService, AnErrorEnvelopeIsAlwaysAnError) {
    const auto offset = [&] { return real64Of(vi, nullptr, TIKTAL_ATTR_SELECTED_TIME_REFERENCE_OFFSET); };
    const Read<ViReal64> communicationFailure{tiktalerr_remoteDeviceCommunicationFailure, kUnsetReal64};
    const std::pair<const char*, ViStatus> codes[] = {
        {"-123", -123},
        {"-123.0", -123},
        {"-1.23e2", -123},
        {"-2147483648", static_cast<ViStatus>(0x80000000)},
        {"3220848643", tiktalerr_featureNotSupported},  // 0xBFFA4003 written without sign
        {"2147483648", static_cast<ViStatus>(0x80000000)},
        {"4294967295", -1},
    };
    for (const auto& [code, status] : codes) {
        answerWith(errorWithCode(code));
        EXPECT_EQ(offset(), Read<ViReal64>({status, kUnsetReal64})) << code;
    }
    for (const char* code : {"0", "5", "1073365092" /* 0x3FFA4064, a warning */, "2147483647", "4294967296",
                             "4294967297", "-2147483649", "-1e10", "1e400", "-123.5", "0.5", "\"-5\"", "true",
                             "null", "{}", "[-5]"}) {
        answerWith(errorWithCode(code));
        EXPECT_EQ(offset(), communicationFailure) << code;
    }

    // Opening: no session and an error, never a warning.
    answerWith(errorWithCode("1073365092"));
    ViSession opened = 0xDEADBEEF;
    EXPECT_STATUS(tiktal_init(sim->resource().c_str(), VI_FALSE, VI_FALSE, &opened),
                  tiktalerr_remoteDeviceCommunicationFailure);
    EXPECT_EQ(opened, 0u);
    // A size query never answers a size that the service made up.
    answerWith(errorWithCode("2147483647"), 1);
    EXPECT_STATUS(tiktal_GetAttributeViString(vi, "PTP1", TIKTAL_ATTR_1588_CLOCK_ID, 0, nullptr),
                  tiktalerr_remoteDeviceCommunicationFailure);
}

TEST_F(TimeService, OnlyAnArrayListsNamesAndOnlyAScalarListsNone) {
    for (const char* list : {R"({"PTP1":"PTP1"})", "{}", R"([1])", R"(["a",null])"}) {
        answerWith(std::string(R"({"data":{"allTimeReferences":)") + list + "}}");
        char kept[] = "kept";
        EXPECT_STATUS(tiktal_GetTimeReferenceNames(vi, sizeof kept, kept), tiktalerr_internalSoftware) << list;
        EXPECT_STREQ(kept, "kept");
    }
    for (const char* scalar : {"null", "5", R"("PTP1")", "true"}) {
        sim->next(std::string(R"({"count":2,"status":200,"body":)") +
                  quoted(std::string(R"({"data":{"allTimeReferences":)") + scalar + "}}") + "}");
        EXPECT_EQ(namesOf(vi), ok("")) << scalar;
    }
}

TEST_F(TimeService, AnswersAreTakenUpToTheLimitAndRefusedBeyondIt) {
    const std::string head = R"({"data":{"allTimeReferences":[")", tail = R"("]}})";
    const std::string fits = head + std::string(kMaxAnswerBytes - head.size() - tail.size(), 'n') + tail;
    sim->next(R"({"count":2,"status":200,"body":)" + quoted(fits) + "}");
    const Read<std::string> names = namesOf(vi);
    EXPECT_STATUS(names.status, VI_SUCCESS);
    EXPECT_EQ(names.value.size(), kMaxAnswerBytes - head.size() - tail.size());

    const std::string tooLarge = head + std::string(kMaxAnswerBytes - head.size() - tail.size() + 1, 'n') + tail;
    answerWith(tooLarge);
    EXPECT_EQ(namesOf(vi), Read<std::string>({tiktalerr_remoteDeviceCommunicationFailure, ""}));

    // A service that sends a gigabyte is cut off once the limit is passed (or, when it announces
    // its length, before the body): the service stops long before the end.
    for (const char* chunked : {"false", "true"}) {
        sim->reset();
        sim->next(std::string(R"({"repeat":1073741824,"body":"n","chunked":)") + chunked + "}");
        EXPECT_EQ(namesOf(vi), Read<std::string>({tiktalerr_remoteDeviceCommunicationFailure, ""})) << chunked;
        const auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(10);
        while (sim->streaming() > 0) {
            ASSERT_LT(std::chrono::steady_clock::now(), deadline) << "the answer went on after the session left";
            std::this_thread::sleep_for(std::chrono::milliseconds(5));
        }
        EXPECT_LT(sim->streamed(), 64LL << 20) << chunked;  // the limit and the sockets' buffers, no more
    }
    EXPECT_EQ(int32Of(vi, "PTP1", TIKTAL_ATTR_1588_PRIORITY1), ok(128));  // the session goes on
}

TEST_F(TimeService, HostsThatWouldSendTheRequestElsewhereAreNotTimeServices) {
    const std::string host = sim->host();
    const std::string names[] = {
        "sync://user:secret@" + host + "/sync_1", "sync://" + host + "?x=/sync_1", "sync://" + host + "#x/sync_1",
        "sync://" + host + "\\x/sync_1",     "sync://" + host + " /sync_1",   "sync://" + host + "\t/sync_1",
        "sync://" + host + "\x01/sync_1",    "sync://" + host + "\xC0\xAE/sync_1",
    };
    EXPECT_EQ(servedDuring([&] {
                  for (const std::string& name : names) {
                      ViSession opened = 0xDEADBEEF;
                      EXPECT_STATUS(tiktal_init(name.c_str(), VI_FALSE, VI_FALSE, &opened), tiktalerr_deviceNotFound)
                          << name;
                      EXPECT_EQ(opened, 0u) << name;
                  }
              }), 0);
}

TEST_F(TimeService, WritesGoOutWithoutWaitingForAContinue) {
    EXPECT_STATUS(tiktal_SetAttributeViInt32(vi, "PTP1", TIKTAL_ATTR_1588_PRIORITY2, 9), VI_SUCCESS);
    const Json last = parse(sim->lastRequest());
    const cJSON* headers = cJSON_GetObjectItemCaseSensitive(last.get(), "headers");
    EXPECT_EQ(cJSON_GetObjectItem(headers, "Expect"), nullptr) << print(headers);
    EXPECT_EQ(lastRequest(*sim).body, R"({"version":1,"data":{"priority2":"9"}})");
    EXPECT_EQ(int32Of(vi, "PTP1", TIKTAL_ATTR_1588_PRIORITY2), ok(9));
}

}  // namespace
