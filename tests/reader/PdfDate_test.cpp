#include "reader/PdfDate.h"

#include <gtest/gtest.h>

#include "parvel/foundation/Date.h"

namespace parvel::testing {
namespace {

std::string pdfDate(std::string_view text) {
    const std::optional<double> seconds = reader::secondsOfPdfDate(text);
    return seconds ? isoText(Date{*seconds}) : "none";
}

TEST(PdfDate, ReadsAFullDateInUTC) {
    EXPECT_EQ(pdfDate("D:20200229123456Z"), "2020-02-29T12:34:56Z");
}

TEST(PdfDate, TakesADateWithoutZoneForUTC) {
    EXPECT_EQ(pdfDate("D:20200229123456"), "2020-02-29T12:34:56Z");
}

TEST(PdfDate, CountsTheZoneIn) {
    EXPECT_EQ(pdfDate("D:20200101000000+01'30'"), "2019-12-31T22:30:00Z");
    EXPECT_EQ(pdfDate("D:20200101000000-08'00'"), "2020-01-01T08:00:00Z");
}

TEST(PdfDate, ReadsZonesThatAreWrittenShort) {
    EXPECT_EQ(pdfDate("D:20200101000000-08'00"), "2020-01-01T08:00:00Z");
    EXPECT_EQ(pdfDate("D:20200101000000-08"), "2020-01-01T08:00:00Z");
    EXPECT_EQ(pdfDate("D:20200101000000+0530"), "2019-12-31T18:30:00Z");
    EXPECT_EQ(pdfDate("D:20200101000000Z00'00'"), "2020-01-01T00:00:00Z");
}

TEST(PdfDate, FillsUpWhatIsMissingBehindTheYear) {
    EXPECT_EQ(pdfDate("D:2020"), "2020-01-01T00:00:00Z");
    EXPECT_EQ(pdfDate("D:202002"), "2020-02-01T00:00:00Z");
    EXPECT_EQ(pdfDate("D:20200203"), "2020-02-03T00:00:00Z");
    EXPECT_EQ(pdfDate("D:2020020304"), "2020-02-03T04:00:00Z");
    EXPECT_EQ(pdfDate("D:202002030405"), "2020-02-03T04:05:00Z");
}

TEST(PdfDate, NeedsNoPrefix) {
    EXPECT_EQ(pdfDate("20200203040506"), "2020-02-03T04:05:06Z");
}

TEST(PdfDate, LeavesBlanksAndNULsAroundItOut) {
    using namespace std::string_view_literals;
    EXPECT_EQ(pdfDate(" D:20200203040506Z\n\0"sv), "2020-02-03T04:05:06Z");
}

TEST(PdfDate, ReadsYearsFarFromNow) {
    EXPECT_EQ(pdfDate("D:18600101000000Z"), "1860-01-01T00:00:00Z");
    EXPECT_EQ(pdfDate("D:19600101000000Z"), "1960-01-01T00:00:00Z");
    EXPECT_EQ(pdfDate("D:21000301000000Z"), "2100-03-01T00:00:00Z");
    EXPECT_EQ(pdfDate("D:99991231235959Z"), "9999-12-31T23:59:59Z");
}

TEST(PdfDate, CountsTheOldWritersYearsFrom1900) {
    EXPECT_EQ(pdfDate("D:191000203040506"), "2000-02-03T04:05:06Z");
    EXPECT_EQ(pdfDate("D:191010203040506"), "2001-02-03T04:05:06Z");
}

TEST(PdfDate, TakesAFullDateOfThe1910sAsItStands) {
    EXPECT_EQ(pdfDate("D:19100203040506"), "1910-02-03T04:05:06Z");
}

TEST(PdfDate, IsNoneForADayOrTimeThatDoesNotExist) {
    for (const char* text : {"D:20201301", "D:20200001", "D:20200230", "D:20190229", "D:20200132",
                             "D:2020010124", "D:202001012360", "D:20200101235960", "D:00000101",
                             "D:20200101000000+24'00'", "D:20200101000000+01'60'"})
        EXPECT_EQ(pdfDate(text), "none") << text;
}

TEST(PdfDate, IsNoneForOtherTexts) {
    for (const char* text : {"", "D:", "D:20", "yesterday", "2020-01-01", "2020-01",
                             "2020-01-01T00:00:00Z", "Mon Jan 1 2020", "D:20200101000000+x"})
        EXPECT_EQ(pdfDate(text), "none") << text;
}

TEST(PdfDate, LeavesOutWhatFollowsTheSeconds) {
    EXPECT_EQ(pdfDate("D:20200203040506 (local)"), "2020-02-03T04:05:06Z");
}

}  // namespace
}  // namespace parvel::testing
