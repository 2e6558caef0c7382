#include "parvel/filemanager/AssetNames.h"

#include <gtest/gtest.h>

#include "parvel/metadata/PVMutableAssetMetadata.h"
#include "parvel/platform/TextRules.h"

namespace parvel::testing {
namespace {

std::optional<String> sanitized(const std::string& path, const std::optional<String>& title) {
    const auto record =
        PVAssetMetadata::metadataWithURL_dictionary(URL::fileURLWithPath(path), nullptr);
    record->setTitle(title);
    return sanitizedFileName(record);
}

String repeated(std::string_view text, int count) {
    String result;
    while (count-- > 0)
        result += text;
    return result;
}

TEST(SanitizedName, TheTitleNamesTheAssetWithItsExtension) {
    EXPECT_EQ(sanitized("/a.epub", "My Book"), "My Book.epub");
}

TEST(SanitizedName, WithoutTitleTheItemsOwnNameIsTaken) {
    EXPECT_EQ(sanitized("/a b.epub", std::nullopt), "a b.epub");
    EXPECT_EQ(sanitized("/a b.epub", ""), "a b.epub");
}

TEST(SanitizedName, WithoutExtensionTheItemsOwnNameIsTakenAndNoDotWritten) {
    EXPECT_EQ(sanitized("/ab", "My Book"), "ab");
}

TEST(SanitizedName, ARecordWithoutURLHasNoName) {
    EXPECT_EQ(sanitizedFileName(nullptr), std::nullopt);
    const Dictionary dictionary{{"itemName", "T"}};
    EXPECT_EQ(
        sanitizedFileName(PVAssetMetadata::metadataWithURL_dictionary(std::nullopt, &dictionary)),
        std::nullopt);
}

TEST(SanitizedName, ForbiddenCharactersGoAndBlanksCollapse) {
    EXPECT_EQ(sanitized("/a.epub", "A  --  B?"), "A -- B.epub");
    EXPECT_EQ(sanitized("/a.epub", "a/b\\c?d%e*f|g\"h<i>j:k#l"), "abcdefghijkl.epub");
    EXPECT_EQ(sanitized("/a.epub", "Dr. No"), "Dr No.epub");
}

TEST(SanitizedName, LowLineAndHyphenMinusStay) {
    EXPECT_EQ(sanitized("/a.epub", "a_b-c"), "a_b-c.epub");
}

TEST(SanitizedName, ControlFormatAndUnassignedCharactersGo) {
    EXPECT_EQ(sanitized("/a.epub",
                        "a\n\tb\xE2\x80\x8D"
                        "c\xC2\xAD"
                        "d\xEF\xBF\xBF"
                        "e\xCD\xB8"
                        "f"),
              "abcdef.epub");
}

TEST(SanitizedName, SymbolsLettersAndPrivateUseStay) {
    EXPECT_EQ(sanitized("/a.epub", "$+=~^ üß漢\xEE\x80\x80"), "$+=~^ üß漢\xEE\x80\x80.epub");
}

TEST(SanitizedName, ATitleOfPunctuationAloneIsUnknown) {
    EXPECT_EQ(sanitized("/a.epub", "?!…"), "unknown.epub");
}

TEST(SanitizedName, ATitleOfBlanksIsOneBlank) {
    EXPECT_EQ(sanitized("/a.epub", "   "), " .epub");
}

TEST(SanitizedName, ALongTitleIsCutTo254UnitsLessTheExtension) {
    EXPECT_EQ(sanitized("/a.epub", String(300, 'x')), String(250, 'x') + ".epub");
    EXPECT_EQ(sanitized("/a.epub", String(250, 'x')), String(250, 'x') + ".epub");
}

TEST(SanitizedName, LengthsAreCountedInUTF16Units) {
    EXPECT_EQ(sanitized("/a.epub", repeated("漢", 300)), repeated("漢", 250) + ".epub");
    EXPECT_EQ(sanitized("/a.epub", repeated("😀", 200)), repeated("😀", 125) + ".epub");
}

TEST(SanitizedName, ACutThroughASurrogatePairLeavesTheReplacementCharacter) {
    EXPECT_EQ(sanitized("/a.epub", "x" + repeated("😀", 200)),
              "x" + repeated("😀", 124) + "\xEF\xBF\xBD.epub");
}

TEST(FittingName, AShortNameStays) {
    EXPECT_EQ(fittingFileName("a.epub"), "a.epub");
    EXPECT_EQ(fittingFileName(String(250, 'x') + ".epub"), String(250, 'x') + ".epub");
}

TEST(FittingName, ALongNameIsCutAtWholeCodePointsWithRoomForACount) {
    const String fitting = fittingFileName(repeated("漢", 250) + ".epub");

    EXPECT_EQ(fitting, repeated("漢", 81) + ".epub");
    EXPECT_LE(fitting.size() + 5, 255U);
    EXPECT_TRUE(isValidUTF8(fitting));
}

}  // namespace
}  // namespace parvel::testing
