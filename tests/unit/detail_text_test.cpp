// The status exception's detail text: member order, escaping, the code-merge rule, growth.
#include <cjson/cJSON.h>
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "errors/zrerr.h"

namespace {

using zrerr::Exception;
using zrerr::ExceptionBase;

struct Json {
    explicit Json(const char* text) : root(cJSON_Parse(text)) {}
    ~Json() { cJSON_Delete(root); }
    std::vector<std::string> keys(const cJSON* object) const {
        std::vector<std::string> names;
        for (const cJSON* item = object ? object->child : nullptr; item; item = item->next) names.push_back(item->string);
        return names;
    }
    cJSON* root;
};

// Exposes the buffer size and lets a test refuse growth.
struct Probe : Exception {
    // The virtual base is built by the most derived class, so the routine is passed here.
    explicit Probe(zrerr::GrowRoutine grow = ExceptionBase::defaultGrow) : ExceptionBase(grow) {}
    std::uint32_t capacity() const { return _capacity; }
};

TEST(DetailText, RaiseWritesStandardMembersThenSiteMembersInOrder) {
    const int line = __LINE__ + 1;
    const Exception e = ZRERR_RAISE(tiktalerr_invalidObject).debug("msg", "SessionDB::getSession: id not found").debug("id", 2147483647u);
    EXPECT_EQ(e.code(), tiktalerr_invalidObject);
    Json json(e.what());
    ASSERT_NE(json.root, nullptr) << e.what();
    EXPECT_EQ(json.keys(json.root), (std::vector<std::string>{"error_constant", "file", "line", "component", "tiktal_debug"}));
    EXPECT_STREQ(cJSON_GetObjectItem(json.root, "error_constant")->valuestring, "tiktalerr_invalidObject");
    EXPECT_STREQ(cJSON_GetObjectItem(json.root, "file")->valuestring, "tests/unit/detail_text_test.cpp");
    EXPECT_EQ(cJSON_GetObjectItem(json.root, "line")->valueint, line);
    EXPECT_STREQ(cJSON_GetObjectItem(json.root, "component")->valuestring, "tiktal_impl");
    const cJSON* debug = cJSON_GetObjectItem(json.root, "tiktal_debug");
    EXPECT_EQ(json.keys(debug), (std::vector<std::string>{"msg", "id"}));
    EXPECT_NE(std::string(e.what()).find("\"id\":2147483647}"), std::string::npos) << e.what();
}

TEST(DetailText, IntegersAreSignedOrUnsignedByType) {
    const Exception e = ZRERR_RAISE(tiktalerr_internalSoftware).debug("code", -52000).debug("id", 4294967295u);
    const std::string text = e.what();
    EXPECT_NE(text.find("\"code\":-52000"), std::string::npos) << text;
    EXPECT_NE(text.find("\"id\":4294967295"), std::string::npos) << text;
}

TEST(DetailText, WithoutSiteMembersThereIsNoDebugObject) {
    const Exception e = ZRERR_RAISE(tiktalerr_invParameter);
    Json json(e.what());
    EXPECT_EQ(json.keys(json.root), (std::vector<std::string>{"error_constant", "file", "line", "component"}));
    EXPECT_STREQ(Exception().what(), "");
}

TEST(DetailText, JsonMembersKeepTheirStructureAtTheirPlaceInTheOrder) {
    Exception e = ZRERR_RAISE(tiktalerr_invParameter);
    e.addJson("records", "[{\"type\":\"comment\"},1]");
    e.addJson("absent", nullptr);
    e.debug("msg", "after");
    e.addJson("nested", "{\"api\":\"open\"}", true);
    Json json(e.what());
    ASSERT_NE(json.root, nullptr) << e.what();
    EXPECT_EQ(json.keys(json.root),
              (std::vector<std::string>{"error_constant", "file", "line", "component", "records", "tiktal_debug"}));
    const cJSON* records = cJSON_GetObjectItem(json.root, "records");
    ASSERT_TRUE(cJSON_IsArray(records));
    EXPECT_STREQ(cJSON_GetObjectItem(cJSON_GetArrayItem(records, 0), "type")->valuestring, "comment");
    const cJSON* debug = cJSON_GetObjectItem(json.root, "tiktal_debug");
    EXPECT_EQ(json.keys(debug), (std::vector<std::string>{"msg", "nested"}));
    EXPECT_STREQ(cJSON_GetObjectItem(cJSON_GetObjectItem(debug, "nested"), "api")->valuestring, "open");
}

TEST(DetailText, EscapesEveryControlCharacter) {
    std::string all = "\"\\/";
    for (int c = 1; c < 32; ++c) all += static_cast<char>(c);
    all += '\x7f';
    all += "\xc3\xa9";  // UTF-8 passes unchanged
    const Exception e = ZRERR_RAISE(tiktalerr_invParameter).debug("value", all.c_str());
    Json json(e.what());
    ASSERT_NE(json.root, nullptr) << e.what();
    EXPECT_EQ(cJSON_GetObjectItem(cJSON_GetObjectItem(json.root, "tiktal_debug"), "value")->valuestring, all);

    const std::string text = e.what();
    for (const char* escaped : {"\\\"", "\\\\", "\\b", "\\t", "\\n", "\\f", "\\r", "\\u0001", "\\u001f", "\\u007f", "\xc3\xa9"})
        EXPECT_NE(text.find(escaped), std::string::npos) << escaped << " in " << text;
    for (char raw = 1; raw < 32; ++raw) EXPECT_EQ(text.find(raw), std::string::npos) << int(raw);
}

TEST(DetailText, FirstErrorIsKeptAndAWarningGivesWayToAnError) {
    Exception e = ZRERR_RAISE(tiktalerr_invParameter).debug("func", "first");
    EXPECT_FALSE(e.setCode(tiktalerr_deviceNotFound));
    e.addText("func", "second", true);
    EXPECT_EQ(e.code(), tiktalerr_invParameter);
    EXPECT_EQ(std::string(e.what()).find("second"), std::string::npos);

    Exception w = ZRERR_RAISE(tiktalerr_warn_networkClientInProgress).debug("func", "warning");
    EXPECT_FALSE(w.setCode(tiktalerr_warn_unknownStatus));  // one warning does not replace another
    EXPECT_EQ(w.code(), tiktalerr_warn_networkClientInProgress);
    w.merge(ZRERR_RAISE(tiktalerr_trTypeMismatch).debug("func", "error"));
    EXPECT_EQ(w.code(), tiktalerr_trTypeMismatch);
    const std::string text = w.what();
    EXPECT_EQ(text.find("warning"), std::string::npos) << text;
    EXPECT_NE(text.find("\"func\":\"error\""), std::string::npos) << text;
    Json json(text.c_str());
    EXPECT_NE(json.root, nullptr) << text;

    Exception zero;
    EXPECT_FALSE(zero.setCode(0));
    zero.addText("key", "dropped");
    EXPECT_STREQ(zero.what(), "");
}

TEST(DetailText, CopiesOwnTheirText) {
    auto* original = new Exception(ZRERR_RAISE(tiktalerr_nsupAttr).debug("func", "copy me"));
    const Exception copy(*original);
    const std::string expected = original->what();
    EXPECT_NE(copy.what(), original->what());
    delete original;
    EXPECT_EQ(copy.what(), expected);
    EXPECT_EQ(copy.code(), tiktalerr_nsupAttr);
    try {
        throw copy;
    } catch (const std::exception& caught) {
        EXPECT_EQ(caught.what(), expected);
        const auto* base = dynamic_cast<const ExceptionBase*>(&caught);
        ASSERT_NE(base, nullptr);
        EXPECT_EQ(base->what(), caught.what());
    }
}

TEST(DetailText, BufferGrowsToPowersOfTwo) {
    Probe e;
    e.setCode(tiktalerr_invParameter);
    EXPECT_EQ(e.capacity(), 512u);
    const std::string big(700, 'x');
    e.addText("big", big.c_str());
    EXPECT_EQ(e.capacity(), 1024u);
    const std::string bigger(3000, 'y');
    e.addText("bigger", bigger.c_str());
    EXPECT_EQ(e.capacity(), 4096u);
    Json json(e.what());
    ASSERT_NE(json.root, nullptr);
    EXPECT_EQ(cJSON_GetObjectItem(json.root, "bigger")->valuestring, bigger);
}

int gGrowCalls = 0;
// Allows the first buffer only, then refuses to grow.
bool growOnce(ExceptionBase& self, std::uint32_t size) noexcept {
    if (size != 0 && gGrowCalls++ > 0) return false;
    return ExceptionBase::defaultGrow(self, size);
}

TEST(DetailText, FailedGrowthLosesLaterMembersButNeverTheCode) {
    gGrowCalls = 0;
    Probe e(growOnce);
    e.setCode(tiktalerr_deviceNotFound);
    e.addText("small", "fits");
    const std::string big(600, 'z');
    e.addText("big", big.c_str());
    e.addText("after", "dropped too");
    EXPECT_EQ(e.code(), tiktalerr_deviceNotFound);
    EXPECT_STREQ(e.what(), "{\"small\":\"fits\"}");

    gGrowCalls = 1;  // no buffer at all
    Probe none(growOnce);
    none.setCode(tiktalerr_deviceNotFound);
    none.addText("key", "value");
    EXPECT_EQ(none.code(), tiktalerr_deviceNotFound);
    EXPECT_STREQ(none.what(), "");
}

TEST(Normalize, MapsLowerLayerCodesOnly) {
    EXPECT_EQ(zrerr::normalize(-52005), tiktalerr_invParameter);
    EXPECT_EQ(zrerr::normalize(-52000), tiktalerr_outOfMemory);
    EXPECT_EQ(zrerr::normalize(-89130), tiktalerr_deviceNotFound);
    EXPECT_EQ(zrerr::normalize(-89138), static_cast<ViStatus>(0xBFFF0042));
    EXPECT_EQ(zrerr::normalize(static_cast<ViStatus>(0xBFFA8501)), tiktalerr_trInstanceNotFound);
    EXPECT_EQ(zrerr::normalize(static_cast<ViStatus>(0xBFFA8502)), static_cast<ViStatus>(0xBFFA406E));
    for (ViStatus unchanged : {tiktalerr_deviceNotFound, tiktalerr_invParameter, static_cast<ViStatus>(-89169),
                               static_cast<ViStatus>(-52011), static_cast<ViStatus>(0xBFFA8503), 0, 1})
        EXPECT_EQ(zrerr::normalize(unchanged), unchanged);
}

}  // namespace
