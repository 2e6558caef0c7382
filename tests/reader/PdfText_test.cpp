#include "reader/PdfText.h"

#include <gtest/gtest.h>

namespace parvel::testing {
namespace {

using reader::utf8OfPdfText;
using namespace std::string_view_literals;

TEST(PdfText, ReadsUTF16) {
    EXPECT_EQ(utf8OfPdfText(u"Zo\u00EB \u4F60 \U0001F4D8"), "Zo\u00EB \u4F60 \U0001F4D8");
}

TEST(PdfText, ReplacesHalvesOfSurrogatePairs) {
    const char16_t halves[] = {0xD83D, u'a', 0xDCD8, 0xD83D};
    EXPECT_EQ(utf8OfPdfText({halves, 4}), "\uFFFDa\uFFFD\uFFFD");
}

TEST(PdfText, ReadsBytesBehindAMarkAsUTF8) {
    EXPECT_EQ(utf8OfPdfText(u"\u00EF\u00BB\u00BF\u00C3\u00AD\u00C3\u009F"), "\u00ED\u00DF");
}

TEST(PdfText, ReplacesWhatIsNoUTF8BehindAMark) {
    EXPECT_EQ(utf8OfPdfText(u"\u00EF\u00BB\u00BFa\u00C3"), "a\uFFFD");
}

TEST(PdfText, ReadsOtherBytesAsPDFDocEncoding) {
    EXPECT_EQ(utf8OfPdfText(u"\u0018 \u0080 \u008D\u00E9\u008E \u0095"),
              "\u02D8 \u2022 \u201C\u00E9\u201D \u0141");
}

TEST(PdfText, ReplacesAByteThatPDFDocEncodingLeavesOut) {
    EXPECT_EQ(utf8OfPdfText(u"a\u009Fb"), "a\uFFFDb");
}

TEST(PdfText, LeavesANoBreakSpace) {
    EXPECT_EQ(utf8OfPdfText(u"Quoi\u00A0?"), "Quoi\u00A0?");
}

TEST(PdfText, EndsAtANUL) {
    EXPECT_EQ(utf8OfPdfText(u"ab\0cd"sv), "ab");
}

TEST(PdfText, IsEmptyForNoUnits) {
    EXPECT_EQ(utf8OfPdfText(u""), "");
}

}  // namespace
}  // namespace parvel::testing
