#include "parvel/filemanager/AssetNames.h"

#include <gtest/gtest.h>

#include "parvel/metadata/PVMutableAssetMetadata.h"
#include "parvel/platform/TextRules.h"
#include "tests/support/RepeatedText.h"
#include "tests/support/TranslatingLocaliser.h"

namespace parvel::testing {
namespace {

std::optional<String> sanitized(const std::string& path, const std::optional<String>& title) {
    const auto record =
        PVAssetMetadata::metadataWithURL_dictionary(URL::fileURLWithPath(path), nullptr);
    record->setTitle(title);
    return sanitizedFileName(record);
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

TEST(SanitizedName, OnlyBlanksCollapse) {
    EXPECT_EQ(sanitized("/a.epub",
                        "a\t \tb\xC2\xA0\xC2\xA0"
                        "c"),
              "a b\xC2\xA0\xC2\xA0"
              "c.epub");
}

TEST(SanitizedName, ATitleThatEndsInTheExtensionKeepsItsLetters) {
    EXPECT_EQ(sanitized("/a.epub", "Book.epub"), "Bookepub.epub");
}

TEST(SanitizedName, TheItemsNameLosesItsLastExtensionAlone) {
    EXPECT_EQ(sanitized("/a.tar.epub", std::nullopt), "atar.epub");
}

TEST(SanitizedName, ANameThatIsAnExtensionAloneIsUnknown) {
    EXPECT_EQ(sanitized("/.epub", std::nullopt), "unknown.epub");
}

TEST(SanitizedName, TheExtensionKeepsItsSpelling) {
    EXPECT_EQ(sanitized("/a.E-PUB", "Book"), "Book.E-PUB");
}

TEST(SanitizedName, BytesThatAreNoTextBecomeTheReplacementCharacter) {
    EXPECT_EQ(sanitized("/a\xFF.epub", std::nullopt), "a\xEF\xBF\xBD.epub");
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

TEST(SanitizedName, TheApplicationNamesWhatHasNoName) {
    const TranslatingLocaliser localiser("DEFAULT_UBIQUITY_FILENAME=unknown", "unbekannt");

    EXPECT_EQ(sanitized("/a.epub", "?!…"), "unbekannt.epub");
    EXPECT_EQ(sanitized("/???", std::nullopt), "unbekannt");
}

TEST(SanitizedName, ATitleOfBlanksIsOneBlank) {
    EXPECT_EQ(sanitized("/a.epub", "   "), " .epub");
}

TEST(SanitizedName, ALongTitleIsCutTo254UnitsLessTheExtension) {
    EXPECT_EQ(sanitized("/a.epub", String(300, 'x')), String(250, 'x') + ".epub");
    EXPECT_EQ(sanitized("/a.epub", String(250, 'x')), String(250, 'x') + ".epub");
}

TEST(SanitizedName, LengthsAreCountedInUTF16Units) {
    EXPECT_EQ(sanitized("/a.epub", repeatedText("漢", 300)), repeatedText("漢", 250) + ".epub");
    EXPECT_EQ(sanitized("/a.epub", repeatedText("😀", 200)), repeatedText("😀", 125) + ".epub");
}

TEST(SanitizedName, ALongExtensionLeavesTheTitleWhatRoomThereIs) {
    EXPECT_EQ(sanitized("/a." + String(253, 'e'), "Book"), "B." + String(253, 'e'));
    EXPECT_EQ(sanitized("/a." + repeatedText("漢", 253), "Book"), "B." + repeatedText("漢", 253));
}

TEST(SanitizedName, AnExtensionOf254UnitsAndMoreLeavesNothingOfTheTitle) {
    for (const int units : {254, 255, 300})
        EXPECT_EQ(sanitized("/a." + String(units, 'e'), "Book"), "unknown." + String(units, 'e'));
}

TEST(SanitizedName, ANameWithoutExtensionIsCutTo254Units) {
    EXPECT_EQ(sanitized("/" + String(300, 'x'), std::nullopt), String(254, 'x'));
}

TEST(SanitizedName, ACutThroughASurrogatePairLeavesTheReplacementCharacter) {
    EXPECT_EQ(sanitized("/a.epub", "x" + repeatedText("😀", 200)),
              "x" + repeatedText("😀", 124) + "\xEF\xBF\xBD.epub");
}

TEST(FittingName, AShortNameStays) {
    EXPECT_EQ(fittingFileName("a.epub"), "a.epub");
    EXPECT_EQ(fittingFileName(String(250, 'x') + ".epub"), String(250, 'x') + ".epub");
}

TEST(FittingName, ALongNameIsCutAtWholeCodePointsWithRoomForACount) {
    const String fitting = fittingFileName(repeatedText("漢", 250) + ".epub");

    EXPECT_EQ(fitting, repeatedText("漢", 81) + ".epub");
    EXPECT_LE(fitting.size() + 5, 255U);
    EXPECT_TRUE(isValidUTF8(fitting));
}

TEST(FittingName, ANameWithoutExtensionIsCutToo) {
    EXPECT_EQ(fittingFileName(repeatedText("漢", 100)), repeatedText("漢", 83));
}

TEST(FittingName, AnExtensionThatFillsTheNameLeavesNoStem) {
    EXPECT_EQ(fittingFileName("unknown." + String(254, 'e')), "." + String(254, 'e'));
}

}  // namespace
}  // namespace parvel::testing
