#include "parvel/foundation/Date.h"

#include "tests/support/TestRounds.h"

#include <gtest/gtest.h>

#include <cstdio>
#include <ctime>
#include <limits>
#include <random>

namespace parvel::testing {
namespace {

TEST(Date, CountsFromTheReferenceDate) {
    EXPECT_EQ(isoText(Date{0}), "2001-01-01T00:00:00Z");
    EXPECT_EQ(isoText(Date{-1}), "2000-12-31T23:59:59Z");
    EXPECT_EQ(isoText(Date{-978307200}), "1970-01-01T00:00:00Z");
}

TEST(Date, NowIsTheClockOfTheHost) {
    const double now = static_cast<double>(std::time(nullptr) - kReferenceDateUnixSeconds);

    EXPECT_NEAR(Date::now().secondsSinceReferenceDate, now, 60);
}

TEST(Date, PrintsLeapDaysAndTheTimeOfDay) {
    EXPECT_EQ(isoText(Date{99705600 + 3661}), "2004-02-29T01:01:01Z");
}

TEST(Date, AgreesWithTheHostsCalendar) {
    std::mt19937_64 random(1);
    std::uniform_int_distribution<std::int64_t> anySecond(-63113904000, 252423993599);
    for (std::size_t round = 0; round < testRounds(5000); ++round) {
        const std::int64_t seconds = anySecond(random);
        const auto unixSeconds = static_cast<std::time_t>(seconds + kReferenceDateUnixSeconds);
        std::tm time{};
        ASSERT_NE(gmtime_r(&unixSeconds, &time), nullptr);
        char expected[64];
        std::snprintf(expected, sizeof expected, "%04d-%02d-%02dT%02d:%02d:%02dZ",
                      time.tm_year + 1900, time.tm_mon + 1, time.tm_mday, time.tm_hour, time.tm_min,
                      time.tm_sec);
        ASSERT_EQ(isoText(Date{static_cast<double>(seconds)}), expected);
    }
}

TEST(Date, PrintsAsManyFractionalDigitsAsTheValueNeeds) {
    EXPECT_EQ(isoText(Date{0.5}), "2001-01-01T00:00:00.5Z");
    EXPECT_EQ(isoText(Date{59.015625}), "2001-01-01T00:00:59.015625Z");
    EXPECT_EQ(isoText(Date{0.1}),
              "2001-01-01T00:00:00.1000000000000000055511151231257827021181583404541015625Z");
}

TEST(Date, CountsTheFractionUpwardsBeforeTheReferenceDateToo) {
    EXPECT_EQ(isoText(Date{-0.25}), "2000-12-31T23:59:59.75Z");
    EXPECT_EQ(isoText(Date{-1.5}), "2000-12-31T23:59:58.5Z");
}

TEST(Date, PrintsTheSmallestFractionExactly) {
    const std::string after = isoText(Date{std::numeric_limits<double>::denorm_min()});
    const std::string before = isoText(Date{-std::numeric_limits<double>::denorm_min()});

    EXPECT_EQ(after.size(), std::string("2001-01-01T00:00:00.Z").size() + 1074);
    EXPECT_TRUE(after.starts_with("2001-01-01T00:00:00.000000"));
    EXPECT_TRUE(before.starts_with("2000-12-31T23:59:59.999999"));
    EXPECT_TRUE(before.ends_with("5Z"));
}

TEST(Date, PrintsTheYears1To9999AndNoOthers) {
    EXPECT_EQ(isoText(Date{-63113904000}), "0001-01-01T00:00:00Z");
    EXPECT_EQ(isoText(Date{-63113904001}), "");
    EXPECT_EQ(isoText(Date{252423993599.5}), "9999-12-31T23:59:59.5Z");
    EXPECT_EQ(isoText(Date{252423993600}), "");
}

TEST(Date, HasNoTextWhereItIsNoTime) {
    EXPECT_EQ(isoText(Date{std::numeric_limits<double>::quiet_NaN()}), "");
    EXPECT_EQ(isoText(Date{std::numeric_limits<double>::infinity()}), "");
    EXPECT_EQ(isoText(Date{-std::numeric_limits<double>::max()}), "");
}

TEST(Date, EqualsItselfEvenWhereItIsNoNumber) {
    const Date none{std::numeric_limits<double>::quiet_NaN()};

    EXPECT_EQ(none, none);
    EXPECT_NE(none, Date{0});
    EXPECT_EQ(Date{-0.0}, Date{0.0});
    EXPECT_NE(Date{1}, Date{2});
}

}  // namespace
}  // namespace parvel::testing
