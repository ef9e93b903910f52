// The in-place scanner of time-service answers.
#include <gtest/gtest.h>

#include <string>

#include "client/envelope.h"

namespace {

namespace env = zr::vantle::shared::envelope;

TEST(Envelope, WholeTextCheckGivesEachErrorCode) {
    for (const char* good : {"{}", " [ ] ", R"({"a":[1,-2.5e3,true,false,null,"\u00e9\n"]})", "0", "\"s\"", "\t{\r\n}\n"})
        EXPECT_EQ(env::check(good), env::kOk) << good;
    const std::pair<const char*, env::ScanError> bad[] = {
        {"", env::kInvalidValue},
        {"   ", env::kInvalidValue},
        {"<html>", env::kInvalidValue},
        {"01", env::kTrailingCharacters},
        {"[1.]", env::kInvalidValue},
        {"{\"a\":tru}", env::kInvalidValue},
        {"{a:1}", env::kMalformedString},
        {"\"abc", env::kMalformedString},
        {"\"a\tb\"", env::kMalformedString},
        {"{\"a\":1", env::kObjectNotClosed},
        {"{\"a\":{\"b\":1}", env::kObjectNotClosed},
        {"[1,2", env::kArrayNotClosed},
        {"{\"a\" 1}", env::kMissingColon},
        {"{\"a\":1 \"b\":2}", env::kUnexpectedCharacter},
        {"[1 2]", env::kUnexpectedCharacter},
        {"\"\\x\"", env::kInvalidEscape},
        {"\"\\u12G4\"", env::kInvalidEscape},
        {"{\"a\":1,}", env::kTrailingComma},
        {"[1,]", env::kTrailingComma},
        {"{} {}", env::kTrailingCharacters},
    };
    for (const auto& [text, code] : bad) EXPECT_EQ(env::check(text), code) << text;

    // Nesting is walked to kMaxDepth levels; deeper fails without exhausting the stack.
    const auto nested = [](std::size_t depth, const char* open, const char* close) {
        std::string text;
        for (std::size_t i = 0; i < depth; ++i) text += open;
        text += "1";
        for (std::size_t i = 0; i < depth; ++i) text += close;
        return text;
    };
    EXPECT_EQ(env::check(nested(env::kMaxDepth, "[", "]")), env::kOk);
    EXPECT_EQ(env::check(nested(env::kMaxDepth, "{\"a\":", "}")), env::kOk);
    EXPECT_EQ(env::check(nested(env::kMaxDepth + 1, "[", "]")), env::kTooDeep);
    EXPECT_EQ(env::check(std::string(1000000, '[')), env::kTooDeep);
    EXPECT_EQ(env::check("[" + nested(env::kMaxDepth, "{\"a\":", "}") + "]"), env::kTooDeep);
    EXPECT_FALSE(env::valueText(std::string(1000000, '['), 0).has_value());
}

TEST(Envelope, FindsMembersByDecodedNameAndReadsValues) {
    const std::string text = R"( { "x" : {"error":1}, "er\u0072or" : { "success" : true, "errorCode" : -123.9,
        "errorText" : "a \"quoted\" text" }, "result" :  {"data" : { "k" : [ 1, 2 ] } } } )";
    const auto error = env::findMember(text, "error");
    ASSERT_TRUE(error.has_value());
    const std::string errorText(*env::valueText(text, *error));
    EXPECT_TRUE(env::readBool(errorText, *env::findMember(errorText, "success")));
    EXPECT_FALSE(env::readWholeNumber(errorText, *env::findMember(errorText, "errorCode")).has_value());
    EXPECT_EQ(env::readString(errorText, *env::findMember(errorText, "errorText")), R"(a \"quoted\" text)");
    EXPECT_EQ(*env::valueText(text, *env::findMember(text, "result")), R"({"data" : { "k" : [ 1, 2 ] } })");
    EXPECT_FALSE(env::findMember(text, "Result").has_value());  // exact names
    EXPECT_FALSE(env::findMember("[1]", "result").has_value());
    EXPECT_FALSE(env::findMember(R"({"a":1 "result":2})", "result").has_value());  // malformed before it

    // The walk of the whole check notes the same values: the first of each name, at the top only.
    env::Envelope members;
    ASSERT_EQ(env::check(text, members), env::kOk);
    EXPECT_EQ(members.error, env::valueText(text, *error));
    EXPECT_EQ(members.result, env::valueText(text, *env::findMember(text, "result")));
    ASSERT_EQ(env::check(R"({"result" : 1 ,"result":2})", members), env::kOk);
    EXPECT_EQ(members.result, "1");
    ASSERT_EQ(env::check(R"([{"result":1,"error":2}])", members), env::kOk);
    EXPECT_FALSE(members.result || members.error);

    const std::string scalars =
        R"({"t":true,"n":"7","big":1e12,"i":42,"s":5,"w":-5.0e0,"huge":1e400,"digits":)" + std::string(400, '9') + "}";
    const auto whole = [&](const char* name) { return env::readWholeNumber(scalars, *env::findMember(scalars, name)); };
    EXPECT_FALSE(env::readBool(scalars, *env::findMember(scalars, "n")));
    EXPECT_FALSE(whole("n").has_value());
    EXPECT_EQ(whole("i"), 42.0);
    EXPECT_EQ(whole("big"), 1e12);
    EXPECT_EQ(whole("w"), -5.0);
    EXPECT_FALSE(whole("huge").has_value());  // beyond a double
    EXPECT_FALSE(whole("digits").has_value());
    EXPECT_FALSE(whole("t").has_value());
    EXPECT_EQ(env::readString(scalars, *env::findMember(scalars, "s")), "");
}

}  // namespace
