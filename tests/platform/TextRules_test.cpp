#include "parvel/platform/TextRules.h"

#include <gtest/gtest.h>

namespace parvel::testing {
namespace {

std::string encoded(unsigned codePoint) {
    const auto tail = [codePoint](int shift) {
        return static_cast<char>(0x80 | (codePoint >> shift & 0x3F));
    };
    if (codePoint < 0x80)
        return {static_cast<char>(codePoint)};
    if (codePoint < 0x800)
        return {static_cast<char>(0xC0 | codePoint >> 6), tail(0)};
    if (codePoint < 0x10000)
        return {static_cast<char>(0xE0 | codePoint >> 12), tail(6), tail(0)};
    return {static_cast<char>(0xF0 | codePoint >> 18), tail(12), tail(6), tail(0)};
}

TEST(IsValidUTF8, TakesEveryCodePointButSurrogates) {
    for (unsigned codePoint = 0; codePoint <= 0x10FFFF; ++codePoint) {
        const bool isSurrogate = codePoint >= 0xD800 && codePoint <= 0xDFFF;
        ASSERT_EQ(isValidUTF8(encoded(codePoint)), !isSurrogate) << codePoint;
    }
    EXPECT_FALSE(isValidUTF8(encoded(0x110000)));
    EXPECT_TRUE(isValidUTF8(""));
}

TEST(IsValidUTF8, RefusesOverlongCutAndStrayBytes) {
    for (std::string_view text :
         {"\x80", "\xBF", "\xC0\x80", "\xC1\xBF", "\xC3", "\xC3(", "\xE0\x80\x80", "\xE0\x9F\xBF",
          "\xE2\x82", "\xE2(\xA1", "\xED\xA0\x80", "\xF0\x80\x80\x80", "\xF0\x8F\xBF\xBF",
          "\xF0\x9F\x98", "\xF4\x90\x80\x80", "\xF5\x80\x80\x80", "\xFE", "\xFF"})
        EXPECT_FALSE(isValidUTF8(text));
}

TEST(IsValidUTF8, RefusesALeadByteThatThereIsNotWhateverFollows) {
    for (unsigned lead : {0x80U, 0x9FU, 0xBFU, 0xC0U, 0xC1U, 0xF5U, 0xF8U, 0xFFU}) {
        std::string text(1, static_cast<char>(lead));
        for (int following = 0; following < 4; ++following) {
            EXPECT_FALSE(isValidUTF8(text)) << lead << " and " << following;
            text += '\xA0';
        }
    }
}

TEST(IsValidUTF8, FindsABadByteAnywhereInALongText) {
    for (std::size_t position = 0; position < 40; ++position) {
        std::string text(40, 'a');
        EXPECT_TRUE(isValidUTF8(text));
        text[position] = '\xFF';
        EXPECT_FALSE(isValidUTF8(text)) << position;
    }
}

TEST(WithReplacedInvalidUTF8, PutsOneReplacementForEachBadByte) {
    EXPECT_EQ(withReplacedInvalidUTF8("a\xFF\xE2\x82"
                                      "b"),
              "a\uFFFD\uFFFD\uFFFDb");
    EXPECT_EQ(withReplacedInvalidUTF8("\xED\xA0\xBD"), "\uFFFD\uFFFD\uFFFD");
    EXPECT_EQ(withReplacedInvalidUTF8("0123456789\xC3"), "0123456789\uFFFD");
}

TEST(WithReplacedInvalidUTF8, LeavesValidTextAsItIs) {
    const std::string text("a\0ä€😀 0123456789", 21);

    EXPECT_EQ(withReplacedInvalidUTF8(text), text);
    EXPECT_EQ(withReplacedInvalidUTF8(""), "");
}

TEST(AppendUTF8, WritesTheShortestFormOfEachLength) {
    std::string text = "x";
    for (unsigned codePoint : {0x7FU, 0x80U, 0x7FFU, 0x800U, 0xFFFFU, 0x10000U, 0x10FFFFU})
        appendUTF8(text, codePoint);

    EXPECT_EQ(text,
              "x\x7F\xC2\x80\xDF\xBF\xE0\xA0\x80\xEF\xBF\xBF\xF0\x90\x80\x80\xF4\x8F\xBF\xBF");
}

TEST(UTF16Length, CountsTwoUnitsAboveTheBasicPlane) {
    EXPECT_EQ(utf16Length(""), 0U);
    EXPECT_EQ(utf16Length("abc"), 3U);
    EXPECT_EQ(utf16Length("ä€"), 2U);
    EXPECT_EQ(utf16Length("a😀b"), 4U);
}

TEST(TextRules, LowersASCII) {
    EXPECT_EQ(TextRules::host().lowercased("EPUB [@`{Z"), "epub [@`{z");
    EXPECT_EQ(TextRules::host().lowercased(""), "");
}

TEST(TextRules, LowersByUnicodesRulesOfNoLanguage) {
    EXPECT_EQ(TextRules::host().lowercased("ÄÖÜ ΑΣ I"), "äöü ας i");
    EXPECT_EQ(TextRules::host().lowercased("İ"), "i\u0307");
}

TEST(TextRules, LeavesBytesThatAreNoUTF8) {
    EXPECT_EQ(TextRules::host().lowercased("A\xFF\xC3"
                                           "Ä\xE2\x82"),
              "a\xFF\xC3"
              "ä\xE2\x82");
}

}  // namespace
}  // namespace parvel::testing
