#include <cmath>
#include <limits>
#include <string>

#include <gtest/gtest.h>

#include "cli/JsonReader.h"
#include "cli/JsonWriter.h"

namespace parvel::testing {
namespace {

using cli::appendJson;
using cli::JsonError;
using cli::valueFromJson;

std::string json(const Value& value) {
    std::string text;
    appendJson(value, text);
    return text;
}

/// Reads what was written, and holds it to the value that was written.
void expectRoundTrip(const Value& value) {
    const std::string text = json(value);
    EXPECT_EQ(valueFromJson(text), value) << text;
}

std::string jsonProblemOf(std::string_view text) {
    try {
        static_cast<void>(valueFromJson(text));
    } catch (const JsonError& error) {
        return error.what();
    }
    return "read";
}

TEST(Json, WritesEveryKindOfValue) {
    const Value value = Dictionary{
        {"bytes", Data::copyOf("hi!")},
        {"date", Date{0}},
        {"list", Array{Number::boolean(true), Number::signedInteger(-5), Null{}}},
        {"real", Number::real(1)},
        {"text", "a"},
    };
    EXPECT_EQ(json(value), R"({"bytes":{"$data":"aGkh"},"date":{"$date":"2001-01-01T00:00:00Z"},)"
                           R"("list":[true,-5,null],"real":1.0,"text":"a"})");
}

TEST(Json, WritesEmptyContainers) {
    EXPECT_EQ(json(Array{Array(), Dictionary()}), "[[],{}]");
    expectRoundTrip(Array{Array(), Dictionary()});
}

TEST(Json, KeepsWholeNumbersExactOverBothRanges) {
    const Value value = Array{
        Number::signedInteger(std::numeric_limits<std::int64_t>::min()),
        Number::signedInteger(9007199254740993),
        Number::unsignedInteger(std::numeric_limits<std::uint64_t>::max()),
    };
    EXPECT_EQ(json(value), "[-9223372036854775808,9007199254740993,18446744073709551615]");
    expectRoundTrip(value);
}

TEST(Json, KeepsRealsExactAndReal) {
    const double reals[] = {0.1, 1e300, 5e-324, -0.0, 1e22, 123456789012345680.0, 1.5};
    for (const double real : reals) {
        const Value value = Number::real(real);
        const Value read = valueFromJson(json(value));
        EXPECT_EQ(read, value);
        EXPECT_EQ(read.as<Number>()->kind(), Number::Kind::Real) << json(value);
    }
}

TEST(Json, MarksRealsThatAreNotFinite) {
    using Limits = std::numeric_limits<double>;
    const Value value = Array{Number::real(Limits::infinity()), Number::real(-Limits::infinity()),
                              Number::real(Limits::quiet_NaN())};
    EXPECT_EQ(json(value), R"([{"$real":"inf"},{"$real":"-inf"},{"$real":"nan"}])");
    expectRoundTrip(value);
}

TEST(Json, KeepsBooleansBooleans) {
    const Value read = valueFromJson("[true,false]");
    EXPECT_EQ((*read.as<Array>())[0].as<Number>()->kind(), Number::Kind::Boolean);
    EXPECT_EQ(json(read), "[true,false]");
}

TEST(Json, KeepsDatesExact) {
    const double seconds[] = {0.5,    -0.5,  0.1,           -0.1,    -1e-9,
                              1e-300, -1.75, 694310399.999, -6.3e10, std::nextafter(-86400.0, 0.0)};
    for (const double each : seconds)
        expectRoundTrip(Date{each});
}

TEST(Json, WritesADateOutsideTheYears1To9999AsSeconds) {
    EXPECT_EQ(json(Date{1e12}), R"({"$date":1e+12})");
    expectRoundTrip(Date{1e12});
    expectRoundTrip(Date{-1e14});
    expectRoundTrip(Date{std::numeric_limits<double>::infinity()});
}

TEST(Json, ReadsADateOfWholeSecondsAsGiven) {
    EXPECT_EQ(valueFromJson(R"({"$date":86400})"), Value(Date{86400}));
    EXPECT_EQ(valueFromJson(R"({"$date":"2001-01-02T00:00:01Z"})"), Value(Date{86401}));
}

TEST(Json, KeepsBytesOfEveryLength) {
    for (const char* bytes : {"", "f", "fo", "foo", "foob", "fooba", "foobar"})
        expectRoundTrip(Data::copyOf(std::string_view(bytes)));
    EXPECT_EQ(json(Data::copyOf("fooba")), R"({"$data":"Zm9vYmE="})");
}

TEST(Json, EscapesADictionaryThatReadsAsAMark) {
    const Value looksLikeADate = Dictionary{{"$date", "2001-01-01T00:00:00Z"}};
    EXPECT_EQ(json(looksLikeADate), R"({"$$date":"2001-01-01T00:00:00Z"})");
    expectRoundTrip(looksLikeADate);
    expectRoundTrip(Dictionary{{"$$real", "inf"}});
    expectRoundTrip(Dictionary{{"$", "inf"}});
    expectRoundTrip(Dictionary{{"date", "inf"}});
}

TEST(Json, LeavesAMarkAmongOtherKeysAsItIs) {
    const Value value = Dictionary{{"$data", "YQ=="}, {"b", "c"}};
    EXPECT_EQ(json(value), R"({"$data":"YQ==","b":"c"})");
    expectRoundTrip(value);
}

TEST(Json, EscapesWhatActsOnATerminalOrBreaksLines) {
    const Value value = "\x1b[31m \x7f \n \"\\ \u0085 \u2028";
    EXPECT_EQ(json(value), R"("\u001b[31m \u007f \n \"\\ \u0085 \u2028")");
    expectRoundTrip(value);
}

TEST(Json, KeepsOtherTextAsItIs) {
    EXPECT_EQ(json("草枕 🌍 é"), "\"草枕 🌍 é\"");
    expectRoundTrip("草枕 🌍 é");
}

TEST(Json, WritesAByteThatIsNoUTF8AsALoneEscape) {
    EXPECT_EQ(json("a\xff\xc3z"), R"("a\udcff\udcc3z")");
}

TEST(Json, ReadsAnyBytesBackEqual) {
    for (const char* bytes : {"\xff", "\xc3", "\xed\xa0\x80", "\xf4\x90\x80\x80", "\xc0\xaf",
                              "\xe2\x82", "\x80\xf0\x9f\x8c\x8d\xf0\x9f"})
        expectRoundTrip(bytes);
}

TEST(Json, KeepsANulInText) {
    expectRoundTrip(std::string("a\0b", 3));
}

TEST(Json, ReadsPairsOfEscapesAsOneCharacter) {
    EXPECT_EQ(valueFromJson(R"("\ud83c\udf0d\u00e9")"), Value("🌍é"));
}

TEST(Json, RefusesHalfAPair) {
    EXPECT_EQ(jsonProblemOf(R"("\ud83c")"), "line 1, column 8: an escape is half of a pair");
    EXPECT_NE(jsonProblemOf(R"("\udc00")"), "read");
    EXPECT_NE(jsonProblemOf(R"("\ud83c\u0041")"), "read");
}

TEST(Json, RefusesWhatIsNoJson) {
    for (const char* text :
         {"",       " ",        "{",     "[1,]", "{\"a\":1,}", "{a:1}", "01",      "1.",
          ".5",     "+1",       "1e",    "-",    "tru",        "\"a",   "\"\\x\"", "\"\\u12\"",
          "\"\n\"", "\"\xff\"", "[1] 2", "nan",  "1e400",      "'a'",   "[1 2]",   "{\"a\" 1}"})
        EXPECT_NE(jsonProblemOf(text), "read") << text;
}

TEST(Json, RefusesAMarkOfAnotherForm) {
    for (const char* text :
         {R"({"$date":"yesterday"})", R"({"$date":"2001-02-30T00:00:00Z"})",
          R"({"$date":"2001-01-01T00:00:00.Z"})", R"({"$date":true})", R"({"$data":"YQ"})",
          R"({"$data":"Y!=="})", R"({"$data":7})", R"({"$real":"1"})"})
        EXPECT_NE(jsonProblemOf(text), "read") << text;
}

TEST(Json, SaysWhereTheTextIsWrong) {
    EXPECT_EQ(jsonProblemOf("{\n  \"a\": x\n}"), "line 2, column 8: a value is missing");
}

TEST(Json, BoundsTheNesting) {
    const std::string deepest = std::string(512, '[') + std::string(512, ']');
    EXPECT_EQ(jsonProblemOf(deepest), "read");
    EXPECT_EQ(jsonProblemOf("[" + deepest + "]"), "line 1, column 514: nested too deep");
    EXPECT_NE(jsonProblemOf(std::string(1000000, '[')), "read");
}

TEST(Json, TakesTheLastOfSeveralEntriesWithOneKey) {
    EXPECT_EQ(valueFromJson(R"({"a":1,"b":2,"a":3})"),
              Value(Dictionary{{"a", Number::signedInteger(3)}, {"b", Number::signedInteger(2)}}));
}

TEST(Json, ReadsWholeNumbersBeyondBothRangesAsReals) {
    EXPECT_EQ(valueFromJson("18446744073709551616"), Value(Number::real(18446744073709551616.0)));
}

TEST(Json, SkipsAByteOrderMarkAndWhiteSpace) {
    EXPECT_EQ(valueFromJson("\xEF\xBB\xBF \t\r\n[ 1 , 2 ] \n"),
              Value(Array{Number::signedInteger(1), Number::signedInteger(2)}));
}

}  // namespace
}  // namespace parvel::testing
