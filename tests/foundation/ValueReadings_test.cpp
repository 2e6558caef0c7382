#include "parvel/foundation/ValueReadings.h"

#include <gtest/gtest.h>

#include <limits>

namespace parvel::testing {
namespace {

constexpr std::int64_t kLeast = std::numeric_limits<std::int64_t>::min();
constexpr std::int64_t kMost = std::numeric_limits<std::int64_t>::max();

const Value kOtherKinds[] = {Value(), Value(Date{1}), Value(Data::copyOf("1")), Value(Array{"1"}),
                             Value(Dictionary{{"1", "1"}})};

double doubleOf(std::string_view text) {
    const Value value(text);
    return doubleReading(&value);
}

TEST(StringForm, IsAStringsOwnTextAndANumbersDecimalForm) {
    const Value text("Title");
    const Value flag(Number::boolean(true));
    const Value real(Number::real(1.5));

    EXPECT_EQ(stringForm(&text), "Title");
    EXPECT_EQ(stringForm(&flag), "1");
    EXPECT_EQ(stringForm(&real), "1.5");
}

TEST(StringForm, IsNoneForEveryOtherKindAndForNothing) {
    EXPECT_EQ(stringForm(nullptr), std::nullopt);
    for (const Value& value : kOtherKinds)
        EXPECT_EQ(stringForm(&value), std::nullopt);
}

TEST(Int64Reading, ReadsLeadingDigits) {
    EXPECT_EQ(int64Reading("4 stars"), 4);
    EXPECT_EQ(int64Reading(" \t\n\v\f\r-12x"), -12);
    EXPECT_EQ(int64Reading("+007"), 7);
    EXPECT_EQ(int64Reading("1/../../x"), 1);
}

TEST(Int64Reading, Is0WithoutDigits) {
    for (std::string_view text : {"", " ", "-", "+-1", "- 1", "abc", ".5",
                                  "\xC2\xA0"
                                  "1"})
        EXPECT_EQ(int64Reading(text), 0) << text;
    EXPECT_EQ(int64Reading(std::string_view("\0001", 2)), 0);
}

TEST(Int64Reading, SaturatesAtTheLimits) {
    EXPECT_EQ(int64Reading("9223372036854775807"), kMost);
    EXPECT_EQ(int64Reading("9223372036854775808"), kMost);
    EXPECT_EQ(int64Reading("-9223372036854775807"), kLeast + 1);
    EXPECT_EQ(int64Reading("-9223372036854775808"), kLeast);
    EXPECT_EQ(int64Reading("-9223372036854775809"), kLeast);
    EXPECT_EQ(int64Reading("99999999999999999999"), kMost);
    EXPECT_EQ(int64Reading("-" + std::string(1000, '9')), kLeast);
    EXPECT_EQ(int64Reading(std::string(1000, '0') + "5"), 5);
}

TEST(Int64Reading, ReadsANumberThroughItsStringForm) {
    const Value cut(Number::real(1.5));
    const Value small(Number::real(0.1));
    const Value large(Number::real(1e20));
    const Value beyond(Number::unsignedInteger(1ULL << 63));

    EXPECT_EQ(int64Reading(&cut), 1);
    EXPECT_EQ(int64Reading(&small), 0);
    EXPECT_EQ(int64Reading(&large), 1);
    EXPECT_EQ(int64Reading(&beyond), kMost);
}

TEST(Int64Reading, Is0ForEveryOtherKindAndForNothing) {
    EXPECT_EQ(int64Reading(static_cast<const Value*>(nullptr)), 0);
    for (const Value& value : kOtherKinds)
        EXPECT_EQ(int64Reading(&value), 0);
}

TEST(BoolReading, IsTrueForAYesOrADigitThatIsNotZero) {
    for (std::string_view text :
         {"Y", "yes", "T", "true", "1", "9", "  +007", "-0y", "000T", "1 no", "-5"})
        EXPECT_TRUE(boolReading(text)) << text;
}

TEST(BoolReading, IsFalseForEverythingElse) {
    for (std::string_view text : {"", "0", "00", "no", "false", "N", "x1", "--1", " - 1", "0 1"})
        EXPECT_FALSE(boolReading(text)) << text;
    EXPECT_FALSE(boolReading(std::string_view("\0Y", 2)));
    EXPECT_FALSE(boolReading(std::string_view("0\0", 2)));
}

TEST(BoolReading, OfANumberIsWhetherItIsNotZero) {
    const Value half(Number::real(0.5));
    const Value zero(Number::real(-0.0));
    const Value text("true");

    EXPECT_TRUE(boolReading(&half));
    EXPECT_FALSE(boolReading(&zero));
    EXPECT_TRUE(boolReading(&text));
}

TEST(BoolReading, IsFalseForEveryOtherKindAndForNothing) {
    EXPECT_FALSE(boolReading(static_cast<const Value*>(nullptr)));
    for (const Value& value : kOtherKinds)
        EXPECT_FALSE(boolReading(&value));
}

TEST(UnsignedReading, WrapsNegativeValues) {
    const Value number(Number::signedInteger(-1));
    const Value text("-1");
    const Value large(Number::unsignedInteger(1ULL << 63));

    EXPECT_EQ(unsignedReading(&number), std::numeric_limits<std::uint64_t>::max());
    EXPECT_EQ(unsignedReading(&text), std::numeric_limits<std::uint64_t>::max());
    EXPECT_EQ(unsignedReading(&large), 1ULL << 63);
}

TEST(UnsignedReading, Is0ForEveryOtherKindAndForNothing) {
    EXPECT_EQ(unsignedReading(nullptr), 0U);
    for (const Value& value : kOtherKinds)
        EXPECT_EQ(unsignedReading(&value), 0U);
}

TEST(DoubleReading, ReadsALeadingDecimalNumber) {
    EXPECT_EQ(doubleOf(" +1.5 stars"), 1.5);
    EXPECT_EQ(doubleOf("-2e3"), -2000);
    EXPECT_EQ(doubleOf(".5"), 0.5);
    EXPECT_EQ(doubleOf("5."), 5);
    EXPECT_EQ(doubleOf("3,5"), 3);
    EXPECT_EQ(doubleOf("0x10"), 0);
}

TEST(DoubleReading, Is0WithoutANumber) {
    for (std::string_view text : {"", " ", "-", ".", "inf", "nan", "-inf", "--5", "+-5", "e5"})
        EXPECT_EQ(doubleOf(text), 0) << text;
}

TEST(DoubleReading, TellsTooLargeFromTooSmall) {
    constexpr double infinity = std::numeric_limits<double>::infinity();

    EXPECT_EQ(doubleOf("1e999"), infinity);
    EXPECT_EQ(doubleOf("-1e999"), -infinity);
    EXPECT_EQ(doubleOf("1" + std::string(400, '0')), infinity);
    EXPECT_EQ(doubleOf("0.0001e99999999999999999999"), infinity);
    EXPECT_EQ(doubleOf("1e-999"), 0);
    EXPECT_EQ(doubleOf("0." + std::string(400, '0') + "1"), 0);
    EXPECT_EQ(doubleOf("1000e-99999999999999999999"), 0);
}

TEST(DoubleReading, OfANumberIsItsValue) {
    const Value number(Number::real(0.25));

    EXPECT_EQ(doubleReading(&number), 0.25);
}

TEST(DoubleReading, Is0ForEveryOtherKindAndForNothing) {
    EXPECT_EQ(doubleReading(nullptr), 0);
    for (const Value& value : kOtherKinds)
        EXPECT_EQ(doubleReading(&value), 0);
}

}  // namespace
}  // namespace parvel::testing
