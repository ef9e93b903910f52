// Checked JSON access and the member helpers.
#include <gtest/gtest.h>

#include <boost/numeric/conversion/converter_policies.hpp>
#include <boost/lexical_cast.hpp>
#include <string>
#include <vector>

#include "errors/zrerr.h"
#include "json/helpers.h"
#include "json/zrjsonlh.h"

namespace {

using namespace zrjsonlh;

// Runs `f` and returns the status and error-constant name it raised.
template <class F>
std::pair<std::int32_t, std::string> failure(F&& f) {
    try {
        f();
    } catch (const zrerr::Exception& e) {
        const std::string text = e.what();
        const auto start = text.find("\"error_constant\":\"") + 18;
        return {e.code(), text.substr(start, text.find('"', start) - start)};
    }
    return {0, "no failure"};
}

TEST(Json, ChecksNameTheKindOfMismatch) {
    const CppJson json(R"({"Data": {"n": 1.5}, "list": [1, "two", null], "flag": true})");
    const cJSON* root = json.get();
    EXPECT_EQ(getObjectItem(root, "data"), getObjectItem(root, "DATA"));  // names ignore case
    EXPECT_EQ(failure([&] { getObjectItem(root, "missing"); }), std::make_pair(-52006, std::string("jsonErrorsObjectItemNotFound")));
    EXPECT_EQ(failure([&] { getObjectItem(getObjectItem(root, "list"), "x"); }), std::make_pair(-52004, std::string("jsonErrorsNotAnObject")));
    const cJSON* list = getObjectItem(root, "list");
    EXPECT_EQ(getString(getArrayItem(list, 1)), "two");
    EXPECT_EQ(failure([&] { getArrayItem(list, 3); }), std::make_pair(-52006, std::string("jsonErrorsArrayItemOutOfBounds")));
    EXPECT_THROW(getArrayItem(list, 2147483648u), boost::numeric::positive_overflow);
    EXPECT_EQ(failure([&] { getArrayItem(root, 0); }), std::make_pair(-52004, std::string("jsonErrorsNotAnArray")));
    EXPECT_EQ(failure([&] { getString(getArrayItem(list, 0)); }), std::make_pair(-52004, std::string("jsonErrorsTypeMismatch")));
    EXPECT_EQ(failure([&] { checkBool(getArrayItem(list, 2)); }), std::make_pair(-52004, std::string("jsonErrorsTypeMismatch")));
    EXPECT_NO_THROW(checkBool(getObjectItem(root, "flag")));
    EXPECT_EQ(failure([] { CppJson("{\"a\":"); }), std::make_pair(-52005, std::string("jsonErrorsInvalidJSON")));
    EXPECT_EQ(failure([] { parse(nullptr); }).first, -52005);
    EXPECT_NO_THROW(CppJson("[1] trailing text is ignored"));
}

TEST(Json, Int32TruncatesTowardZeroWithinItsRange) {
    const auto read = [](const char* number) {
        const CppJson json(number);
        return getInt32(json.get());
    };
    EXPECT_EQ(read("2.9"), 2);
    EXPECT_EQ(read("-2.9"), -2);
    EXPECT_EQ(read("2147483647.9"), 2147483647);
    EXPECT_EQ(read("-2147483648.9"), -2147483647 - 1);
    EXPECT_THROW(read("2147483648"), boost::numeric::positive_overflow);
    EXPECT_THROW(read("-2147483649"), boost::numeric::negative_overflow);
    EXPECT_EQ(failure([&] { read("\"5\""); }).first, -52004);
}

TEST(Json, EqualsComparesDeeplyAndIgnoresMemberOrder) {
    const auto same = [](const char* a, const char* b) {
        const CppJson x(a), y(b);
        return equals(x.get(), y.get());
    };
    EXPECT_TRUE(same(R"({"a":1,"b":[true,null,"s"]})", R"({"b":[true,null,"s"],"A":1.0})"));
    EXPECT_FALSE(same("{}", R"({"a":null})"));
    EXPECT_FALSE(same("[1,2]", "[2,1]"));
    EXPECT_FALSE(same("[1]", "[1,1]"));
    EXPECT_FALSE(same(R"("s")", R"("S")"));
    EXPECT_FALSE(same("1", "true"));
    EXPECT_FALSE(same("false", "true"));
}

TEST(Json, CreatedNumbersAndPrintedText) {
    CppJson json("{}");
    addItemToObject(json.get(), "big", createNumber(std::uint32_t{4294967295u}));
    addItemToObject(json.get(), "neg", createNumber(std::int32_t{-7}));
    EXPECT_EQ(getObjectItem(json.get(), "big")->valuedouble, 4294967295.0);
    EXPECT_EQ(getObjectItem(json.get(), "big")->valueint, 2147483647);  // saturated
    EXPECT_EQ(printUnformatted(json.get()), R"({"big":4294967295,"neg":-7})");
    EXPECT_NE(print(json.get()).find('\n'), std::string::npos);
}

TEST(Json, ArrayIteratorWalksTheElements) {
    const CppJson json("[10, 20, 30]");
    auto it = ArrayIterator::begin(json.get());
    EXPECT_EQ(ArrayIterator::distance(it, ArrayIterator::end()), 3);
    EXPECT_EQ((*it)->valueint, 10);
    ++it;
    ++it;
    ++it;
    EXPECT_TRUE(it == ArrayIterator::end());
    EXPECT_EQ(failure([&] { ++it; }), std::make_pair(-52006, std::string("jsonErrorsArrayItemOutOfBounds")));
    const auto third = ++ ++ArrayIterator::begin(json.get());
    EXPECT_EQ(failure([&] { ArrayIterator::distance(third, ArrayIterator::begin(json.get())); }).first, -52006);
}

TEST(JsonHelpers, StringMembers) {
    std::string out = "unchanged";
    EXPECT_FALSE(zrjson::getStringMember(R"({"other":"x"})", "key", out));
    EXPECT_TRUE(zrjson::getStringMember(R"({"Key":null})", "key", out));
    EXPECT_EQ(out, "unchanged");
    EXPECT_TRUE(zrjson::getStringMember(R"({"KEY":"value"})", "key", out));
    EXPECT_EQ(out, "value");
    try {
        zrjson::getStringMember(R"({"key":1})", "key", out);
        ADD_FAILURE();
    } catch (const zrerr::Exception& e) {
        EXPECT_EQ(e.code(), -52004);
        const std::string text = e.what();
        EXPECT_NE(text.find("\"error_constant\":\"errCode\""), std::string::npos) << text;
        EXPECT_NE(text.find("Error parsing: expected data type does not match the parsed value."), std::string::npos);
        EXPECT_NE(text.find("\"key\":\"key\""), std::string::npos);
        EXPECT_NE(text.find(R"("JSON":"{\"key\":1}")"), std::string::npos) << text;
    }
    EXPECT_EQ(failure([&] { zrjson::getStringMember("not json", "key", out); }).first, -52005);
}

TEST(JsonHelpers, ObjectAndStringArrayMembers) {
    std::string text;
    EXPECT_TRUE(zrjson::getObjectMemberText(R"({"data": { "a" : [1, 2] }})", "DATA", text));
    EXPECT_EQ(text, R"({"a":[1,2]})");
    EXPECT_FALSE(zrjson::getObjectMemberText(R"({"x":{}})", "data", text));
    EXPECT_EQ(failure([&] { zrjson::getObjectMemberText(R"({"data":[]})", "data", text); }).second, "jsonErrorsNotAnObject");

    std::vector<std::string> names{"old"};
    EXPECT_TRUE(zrjson::getStringArrayMember(R"({"devices":null})", "devices", names));
    EXPECT_EQ(names, std::vector<std::string>{"old"});
    EXPECT_TRUE(zrjson::getStringArrayMember(R"({"devices":["/a/b","c"]})", "devices", names));
    EXPECT_EQ(names, (std::vector<std::string>{"/a/b", "c"}));
    EXPECT_FALSE(zrjson::getStringArrayMember("{}", "devices", names));
    EXPECT_EQ(failure([&] { zrjson::getStringArrayMember(R"({"devices":["a",1]})", "devices", names); }).second,
              "jsonErrorsTypeMismatch");
    EXPECT_EQ(names, (std::vector<std::string>{"/a/b", "c"}));  // nothing partial
}

TEST(JsonHelpers, Int32MembersFromNumbersOrDecimalText) {
    EXPECT_EQ(zrjson::getInt32Member(R"({"n":5})", "n"), 5);
    EXPECT_EQ(zrjson::getInt32Member(R"({"N":"5"})", "n"), 5);
    EXPECT_EQ(zrjson::getInt32Member(R"({"n":"-2147483648"})", "n"), -2147483647 - 1);
    EXPECT_EQ(zrjson::getInt32Member(R"({"n":2.9})", "n"), 2);
    EXPECT_EQ(zrjson::getInt32Member(R"({"n":-2.9})", "n"), -2);
    EXPECT_THROW(zrjson::getInt32Member(R"({"n":3000000000})", "n"), boost::numeric::positive_overflow);
    for (const char* bad : {R"({"n":"3000000000"})", R"({"n":"5x"})", R"({"n":" 5"})", R"({"n":""})"})
        EXPECT_THROW(zrjson::getInt32Member(bad, "n"), boost::bad_lexical_cast) << bad;
    for (const char* absent : {R"({"m":5})", R"({"n":true})", R"({"n":null})"})
        EXPECT_EQ(failure([&] { zrjson::getInt32Member(absent, "n"); }).first, tiktalerr_internalSoftware) << absent;
}

}  // namespace
