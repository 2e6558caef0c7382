#include "parvel/platform/linux/cloud/JsonText.h"

#include <string>

#include <gtest/gtest.h>

namespace parvel::testing {
namespace {

using host::valueOfJson;

TEST(JsonText, ReadsEveryKindOfValue) {
    const auto value = valueOfJson(
        " {\"a\" : [1, -2.5e1, true, false, null], \"b\":{}, \"c\" : [] , \"d\": \"text\"} ");

    const Value expected(
        Dictionary{{"a", Array{Number::real(1), Number::real(-25), Number::boolean(true),
                               Number::boolean(false), Null{}}},
                   {"b", Dictionary()},
                   {"c", Array()},
                   {"d", "text"}});
    EXPECT_EQ(value, expected);
}

TEST(JsonText, ReadsEscapes) {
    EXPECT_EQ(valueOfJson(R"("\"\\\/\b\f\n\r\t\u00fc\u20AC\ud83d\ude00")"),
              Value("\"\\/\b\f\n\r\tü€😀"));
}

TEST(JsonText, TheLastEntryWithAKeyCounts) {
    EXPECT_EQ(valueOfJson("{\"a\":1,\"a\":2}"), Value(Dictionary{{"a", Number::real(2)}}));
}

TEST(JsonText, WhatIsNoJsonGivesNone) {
    for (const char* text : {"",
                             " ",
                             "{",
                             "}",
                             "[1",
                             "[1,]",
                             "[,1]",
                             "{\"a\"}",
                             "{\"a\":}",
                             "{a:1}",
                             "{\"a\":1,}",
                             "\"a",
                             "\"\\x\"",
                             "\"\\u12\"",
                             "\"\\ud800\"",
                             "\"\\ud800x\"",
                             "\"\\udc00\"",
                             "tru",
                             "1 2",
                             "+1",
                             "1e",
                             "--1",
                             "01",
                             "-01",
                             "1.",
                             ".5",
                             "-.5",
                             "1.e5",
                             "-",
                             "\"a\nb\"",
                             "nan",
                             "1e999"})
        EXPECT_EQ(valueOfJson(text), std::nullopt) << text;
}

TEST(JsonText, NestingIsBounded) {
    EXPECT_TRUE(valueOfJson(std::string(32, '[') + std::string(32, ']')));
    EXPECT_FALSE(valueOfJson(std::string(33, '[') + std::string(33, ']')));
}

TEST(JsonText, TheNumberOfValuesIsBounded) {
    std::string text = "[0";
    for (int i = 0; i < 200'000; ++i)
        text += ",0";

    EXPECT_FALSE(valueOfJson(text + "]"));
}

}  // namespace
}  // namespace parvel::testing
