#include "parvel/foundation/Number.h"

#include <gtest/gtest.h>

#include <cmath>
#include <limits>
#include <utility>
#include <vector>

namespace parvel::testing {
namespace {

constexpr std::int64_t kLeastSigned = std::numeric_limits<std::int64_t>::min();
constexpr std::int64_t kMostSigned = std::numeric_limits<std::int64_t>::max();
constexpr std::uint64_t kMostUnsigned = std::numeric_limits<std::uint64_t>::max();
constexpr std::uint64_t kTwoTo63 = 1ULL << 63;
constexpr double kNaN = std::numeric_limits<double>::quiet_NaN();
constexpr double kInfinity = std::numeric_limits<double>::infinity();

void expectEqual(const Number& left, const Number& right) {
    EXPECT_TRUE(left == right);
    EXPECT_TRUE(right == left);
    EXPECT_EQ(left.hash(), right.hash());
}

TEST(Number, KeepsItsKind) {
    EXPECT_EQ(Number::boolean(true).kind(), Number::Kind::Boolean);
    EXPECT_EQ(Number::signedInteger(1).kind(), Number::Kind::Signed);
    EXPECT_EQ(Number::real(1).kind(), Number::Kind::Real);
}

TEST(Number, IsUnsignedOnlyAboveTheSignedRange) {
    EXPECT_EQ(Number::unsignedInteger(kTwoTo63 - 1).kind(), Number::Kind::Signed);
    EXPECT_EQ(Number::unsignedInteger(kTwoTo63).kind(), Number::Kind::Unsigned);
}

TEST(Number, EqualsAcrossKinds) {
    expectEqual(Number::boolean(true), Number::signedInteger(1));
    expectEqual(Number::signedInteger(1), Number::real(1.0));
    expectEqual(Number::boolean(false), Number::real(-0.0));
    expectEqual(Number::signedInteger(kLeastSigned), Number::real(-0x1p63));
    expectEqual(Number::unsignedInteger(kTwoTo63), Number::real(0x1p63));
    expectEqual(Number::unsignedInteger(kMostUnsigned - 2047), Number::real(0x1p64 - 2048));
}

TEST(Number, ComparesWithoutRounding) {
    EXPECT_NE(Number::signedInteger((1LL << 53) + 1), Number::real(0x1p53));
    EXPECT_NE(Number::signedInteger(kMostSigned), Number::real(0x1p63));
    EXPECT_NE(Number::unsignedInteger(kMostUnsigned), Number::real(0x1p64));
    EXPECT_NE(Number::signedInteger(-1), Number::unsignedInteger(kMostUnsigned));
    EXPECT_NE(Number::boolean(true), Number::signedInteger(2));
    EXPECT_NE(Number::signedInteger(1), Number::real(1.5));
    EXPECT_NE(Number::real(kInfinity), Number::real(-kInfinity));
}

TEST(Number, EqualsWhereTheExactValuesDo) {
    static_assert(std::numeric_limits<long double>::digits >= 64, "holds every value exactly");
    std::vector<std::pair<Number, long double>> numbers;
    for (int power = 0; power <= 64; ++power) {
        const double real = std::ldexp(1.0, power);
        for (double value : {real, -real, std::nextafter(real, 0), std::nextafter(real, 1e300),
                             std::nextafter(-real, 0), std::nextafter(-real, -1e300)})
            numbers.emplace_back(Number::real(value), value);
        for (std::uint64_t step : {std::uint64_t{0}, std::uint64_t{1}, kMostUnsigned}) {
            const std::uint64_t whole = (power < 64 ? 1ULL << power : 0) + step;
            const auto sign = static_cast<std::int64_t>(whole);
            numbers.emplace_back(Number::unsignedInteger(whole), whole);
            numbers.emplace_back(Number::signedInteger(sign), sign);
        }
    }
    for (const auto& [left, leftValue] : numbers) {
        for (const auto& [right, rightValue] : numbers) {
            ASSERT_EQ(left == right, leftValue == rightValue) << leftValue << " " << rightValue;
            ASSERT_TRUE(leftValue != rightValue || left.hash() == right.hash()) << leftValue;
        }
    }
}

TEST(Number, NaNEqualsNaNAlone) {
    expectEqual(Number::real(kNaN), Number::real(-kNaN));
    EXPECT_NE(Number::real(kNaN), Number::real(0));
}

TEST(Number, IsTrueUnlessItIsZero) {
    EXPECT_FALSE(Number::boolean(false).boolValue());
    EXPECT_FALSE(Number::signedInteger(0).boolValue());
    EXPECT_FALSE(Number::real(-0.0).boolValue());
    EXPECT_TRUE(Number::signedInteger(-1).boolValue());
    EXPECT_TRUE(Number::unsignedInteger(kTwoTo63).boolValue());
    EXPECT_TRUE(Number::real(0.25).boolValue());
    EXPECT_TRUE(Number::real(kNaN).boolValue());
}

TEST(Number, CutsRealsTowardZeroAndSaturatesThem) {
    EXPECT_EQ(Number::real(1.9).int64Value(), 1);
    EXPECT_EQ(Number::real(-1.9).int64Value(), -1);
    EXPECT_EQ(Number::real(0x1p63).int64Value(), kMostSigned);
    EXPECT_EQ(Number::real(kInfinity).int64Value(), kMostSigned);
    EXPECT_EQ(Number::real(-1e300).int64Value(), kLeastSigned);
    EXPECT_EQ(Number::real(kNaN).int64Value(), 0);
}

TEST(Number, AnUnsignedValueKeepsItsBitsAsASignedOne) {
    EXPECT_EQ(Number::unsignedInteger(kMostUnsigned).int64Value(), -1);
}

TEST(Number, ANegativeValueWrapsAsAnUnsignedOne) {
    EXPECT_EQ(Number::signedInteger(-1).unsignedValue(), kMostUnsigned);
    EXPECT_EQ(Number::real(-1.5).unsignedValue(), kMostUnsigned);
    EXPECT_EQ(Number::real(-1e300).unsignedValue(), kTwoTo63);
    EXPECT_EQ(Number::real(0x1p63).unsignedValue(), kTwoTo63);
    EXPECT_EQ(Number::real(1e300).unsignedValue(), kMostUnsigned);
    EXPECT_EQ(Number::real(kNaN).unsignedValue(), 0U);
}

TEST(Number, ReadsAsADouble) {
    EXPECT_EQ(Number::boolean(true).doubleValue(), 1);
    EXPECT_EQ(Number::signedInteger(-3).doubleValue(), -3);
    EXPECT_EQ(Number::unsignedInteger(kTwoTo63).doubleValue(), 0x1p63);
    EXPECT_EQ(Number::real(2.5).doubleValue(), 2.5);
}

TEST(Number, PrintsInDecimal) {
    EXPECT_EQ(Number::boolean(true).stringValue(), "1");
    EXPECT_EQ(Number::boolean(false).stringValue(), "0");
    EXPECT_EQ(Number::signedInteger(kLeastSigned).stringValue(), "-9223372036854775808");
    EXPECT_EQ(Number::unsignedInteger(kMostUnsigned).stringValue(), "18446744073709551615");
}

TEST(Number, PrintsWholeRealsBelow1e15AsIntegers) {
    EXPECT_EQ(Number::real(3).stringValue(), "3");
    EXPECT_EQ(Number::real(-3).stringValue(), "-3");
    EXPECT_EQ(Number::real(-0.0).stringValue(), "0");
    EXPECT_EQ(Number::real(999999999999999).stringValue(), "999999999999999");
    EXPECT_EQ(Number::real(-999999999999999).stringValue(), "-999999999999999");
    EXPECT_EQ(Number::real(1e15).stringValue(), "1e+15");
}

TEST(Number, PrintsOtherRealsAsTheShortestTextThatReadsBack) {
    EXPECT_EQ(Number::real(1.5).stringValue(), "1.5");
    EXPECT_EQ(Number::real(0.1).stringValue(), "0.1");
    EXPECT_EQ(Number::real(1e20).stringValue(), "1e+20");
    EXPECT_EQ(Number::real(-1e-300).stringValue(), "-1e-300");
    EXPECT_EQ(Number::real(-std::numeric_limits<double>::max()).stringValue(),
              "-1.7976931348623157e+308");
}

TEST(Number, PrintsWhatIsNoFiniteNumber) {
    EXPECT_EQ(Number::real(kNaN).stringValue(), "nan");
    EXPECT_EQ(Number::real(-kNaN).stringValue(), "nan");
    EXPECT_EQ(Number::real(-kInfinity).stringValue(), "-inf");
}

}  // namespace
}  // namespace parvel::testing
