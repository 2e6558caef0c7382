#include <thread>
#include <vector>

#include <gtest/gtest.h>

#include "parvel/metadata/PVAssetMetadata.h"
#include "tests/support/Records.h"

namespace parvel::testing {
namespace {

URL fileNamed(std::string_view name) {
    return URL::fileURLWithPath("/library").appendingPathComponent(name);
}

MutableAssetPtr assetNamed(std::string_view name) {
    return recordOver({{"path", fileNamed(name).path()}});
}

// The kind.

struct ExtensionRow {
    const char* name;
    std::string_view file;
    PVAssetType type;
};

class AFileName : public ::testing::TestWithParam<ExtensionRow> {};

TEST_P(AFileName, TellsTheKind) {
    EXPECT_EQ(PVAssetMetadata::assetTypeForAssetAtURL(fileNamed(GetParam().file)), GetParam().type);
}

TEST_P(AFileName, TellsARecordsKind) {
    EXPECT_EQ(assetNamed(GetParam().file)->assetType(), GetParam().type);
}

INSTANTIATE_TEST_SUITE_P(
    Extensions, AFileName,
    ::testing::Values(ExtensionRow{"EPub", "a.epub", PVAssetTypeEPub},
                      ExtensionRow{"EPubInCapitals", "Book.EPUB", PVAssetTypeEPub},
                      ExtensionRow{"Folium", "a.folium", PVAssetTypeKestrelPub},
                      ExtensionRow{"FoliumInMixedCase", "book.Folium", PVAssetTypeKestrelPub},
                      ExtensionRow{"PDF", "a.pdf", PVAssetTypePDF},
                      ExtensionRow{"PDFInCapitals", "x.PDF", PVAssetTypePDF},
                      ExtensionRow{"M4a", "a.m4a", PVAssetTypeAudiobook},
                      ExtensionRow{"M4aInCapitals", "a.M4A", PVAssetTypeAudiobook},
                      ExtensionRow{"M4b", "a.m4b", PVAssetTypeUnknown},
                      ExtensionRow{"Mp3", "a.mp3", PVAssetTypeUnknown},
                      ExtensionRow{"TheLastExtensionAlone", "archive.epub.zip", PVAssetTypeUnknown},
                      ExtensionRow{"ALongerExtension", "a.epubs", PVAssetTypeUnknown},
                      ExtensionRow{"AShorterExtension", "a.epu", PVAssetTypeUnknown},
                      ExtensionRow{"NoExtension", "epub", PVAssetTypeUnknown},
                      ExtensionRow{"ATrailingDot", "a.epub.", PVAssetTypeUnknown},
                      ExtensionRow{"ANameThatBeginsWithTheDot", ".epub", PVAssetTypeEPub}),
    [](const auto& row) { return row.param.name; });

TEST(AssetKind, IsUnknownWithoutExtension) {
    EXPECT_EQ(PVAssetMetadata::assetTypeForFileExtension(std::nullopt), PVAssetTypeUnknown);
    EXPECT_EQ(PVAssetMetadata::assetTypeForFileExtension(""), PVAssetTypeUnknown);
}

TEST(AssetKind, IsUnknownWithoutURL) {
    EXPECT_EQ(PVAssetMetadata::assetTypeForAssetAtURL(std::nullopt), PVAssetTypeUnknown);
    EXPECT_EQ(emptyRecord()->assetType(), PVAssetTypeUnknown);
}

TEST(AssetKind, HasTheDocumentedNumbers) {
    EXPECT_EQ(PVAssetTypeUnknown, 0);
    EXPECT_EQ(PVAssetTypeEPub, 1);
    EXPECT_EQ(PVAssetTypeKestrelPub, 2);
    EXPECT_EQ(PVAssetTypePDF, 3);
    EXPECT_EQ(PVAssetTypeAudiobook, 4);
}

// Deliberate: once told, the kind sticks.
TEST(AssetKind, StaysWhenTheRecordIsGivenAnotherURL) {
    const MutableAssetPtr record = assetNamed("a.pdf");
    ASSERT_EQ(record->assetType(), PVAssetTypePDF);

    record->setUrl(fileNamed("a.epub"));

    EXPECT_EQ(record->assetType(), PVAssetTypePDF);
}

TEST(AssetKind, IsFoundAgainAfterTheCacheIsCleared) {
    const MutableAssetPtr record = assetNamed("a.pdf");
    ASSERT_EQ(record->assetType(), PVAssetTypePDF);
    record->setUrl(fileNamed("a.epub"));

    record->setAssetType(PVAssetTypeUnknown);

    EXPECT_EQ(record->assetType(), PVAssetTypeEPub);
}

TEST(AssetKind, IsNotRememberedWhileUnknown) {
    const MutableAssetPtr record = emptyRecord();
    ASSERT_EQ(record->assetType(), PVAssetTypeUnknown);

    record->setUrl(fileNamed("a.m4a"));

    EXPECT_EQ(record->assetType(), PVAssetTypeAudiobook);
}

TEST(AssetKind, IsTheOneThatWasSet) {
    const MutableAssetPtr record = assetNamed("a.pdf");

    record->setAssetType(PVAssetTypeAudiobook);

    EXPECT_EQ(record->assetType(), PVAssetTypeAudiobook);
}

TEST(AssetKind, IsReadByManyThreadsAtOnce) {
    const AssetPtr record = assetNamed("a.epub");
    std::vector<PVAssetType> seen(4);
    std::vector<std::thread> threads;

    for (PVAssetType& type : seen)
        threads.emplace_back([&type, &record] { type = record->assetType(); });
    for (std::thread& thread : threads)
        thread.join();

    EXPECT_EQ(seen, std::vector<PVAssetType>(4, PVAssetTypeEPub));
}

TEST(AssetKind, AnswersThePredicatesOfAnEPub) {
    const MutableAssetPtr record = assetNamed("a.epub");
    EXPECT_TRUE(record->isEPub());
    EXPECT_TRUE(record->isBook());
    EXPECT_FALSE(record->isKestrelPub());
    EXPECT_FALSE(record->isPDF());
    EXPECT_FALSE(record->isAudiobook());
}

TEST(AssetKind, AnswersThePredicatesOfAFolium) {
    const MutableAssetPtr record = assetNamed("a.folium");
    EXPECT_TRUE(record->isKestrelPub());
    EXPECT_TRUE(record->isBook());
    EXPECT_FALSE(record->isEPub());
    EXPECT_FALSE(record->isPDF());
    EXPECT_FALSE(record->isAudiobook());
}

TEST(AssetKind, AnswersThePredicatesOfAPDF) {
    const MutableAssetPtr record = assetNamed("a.pdf");
    EXPECT_TRUE(record->isPDF());
    EXPECT_FALSE(record->isBook());
    EXPECT_FALSE(record->isEPub());
    EXPECT_FALSE(record->isKestrelPub());
    EXPECT_FALSE(record->isAudiobook());
}

TEST(AssetKind, AnswersThePredicatesOfAnAudiobook) {
    const MutableAssetPtr record = assetNamed("a.m4a");
    EXPECT_TRUE(record->isAudiobook());
    EXPECT_FALSE(record->isBook());
    EXPECT_FALSE(record->isEPub());
    EXPECT_FALSE(record->isKestrelPub());
    EXPECT_FALSE(record->isPDF());
}

TEST(AssetKind, TellsBookURLs) {
    EXPECT_TRUE(PVAssetMetadata::isBookURL(fileNamed("a.epub")));
    EXPECT_TRUE(PVAssetMetadata::isBookURL(fileNamed("a.folium")));
    EXPECT_FALSE(PVAssetMetadata::isBookURL(fileNamed("a.pdf")));
    EXPECT_FALSE(PVAssetMetadata::isBookURL(fileNamed("a.m4a")));
    EXPECT_FALSE(PVAssetMetadata::isBookURL(std::nullopt));
}

// Rich-media books.

MutableAssetPtr assetMadeBy(const Value& producer, std::string_view name) {
    return recordOver({{"path", fileNamed(name).path()}, {"PVBookProducer", producer}});
}

TEST(RichMediaBook, IsAnEPubOfTheAuthoringTool) {
    EXPECT_TRUE(assetMadeBy("Folium Author", "a.epub")->isRMT());
    EXPECT_TRUE(assetMadeBy("Folium Author 2.0", "a.epub")->isRMT());
}

TEST(RichMediaBook, IsNeverAFolium) {
    EXPECT_FALSE(assetMadeBy("Folium Author 2.0", "a.folium")->isRMT());
}

TEST(RichMediaBook, IsNoBookOfAnotherProducer) {
    EXPECT_FALSE(assetMadeBy("folium author", "a.epub")->isRMT());
    EXPECT_FALSE(assetMadeBy("The Folium Author", "a.epub")->isRMT());
    EXPECT_FALSE(assetMadeBy("Folium Auth", "a.epub")->isRMT());
    EXPECT_FALSE(assetNamed("a.epub")->isRMT());
}

TEST(RichMediaBook, HasItsKindCachedByTheQuestionWhoeverItsProducerIs) {
    const MutableAssetPtr record = assetMadeBy("Another", "a.epub");
    ASSERT_FALSE(record->isRMT());

    record->setUrl(fileNamed("a.pdf"));

    EXPECT_EQ(record->assetType(), PVAssetTypeEPub);
}

TEST(RichMediaBook, IsNoBookWhoseProducerIsNoText) {
    for (const Value& value : valuesOfEveryKind())
        EXPECT_FALSE(assetMadeBy(value, "a.epub")->isRMT());
}

// Members of a book package.

struct MemberRow {
    const char* name;
    std::string_view member;
    std::optional<URL> (*ofBase)(const std::optional<URL>&);
    std::optional<URL> (PVAssetMetadata::*ofRecord)() const;
};

class APackageMember : public ::testing::TestWithParam<MemberRow> {};

TEST_P(APackageMember, StandsInAnEPub) {
    EXPECT_EQ(GetParam().ofBase(fileNamed("x.epub")).value().path(),
              "/library/x.epub/" + std::string(GetParam().member));
}

TEST_P(APackageMember, StandsInAFolium) {
    EXPECT_EQ(GetParam().ofBase(fileNamed("x.Folium")).value().path(),
              "/library/x.Folium/" + std::string(GetParam().member));
}

TEST_P(APackageMember, IsNoneWithoutABook) {
    EXPECT_EQ(GetParam().ofBase(fileNamed("x.pdf")), std::nullopt);
    EXPECT_EQ(GetParam().ofBase(std::nullopt), std::nullopt);
}

TEST_P(APackageMember, StandsBelowTheRecordsURL) {
    EXPECT_EQ(((*assetNamed("x.epub")).*GetParam().ofRecord)(),
              GetParam().ofBase(fileNamed("x.epub")));
}

TEST_P(APackageMember, IsNoneForARecordThatIsNoBook) {
    EXPECT_EQ(((*assetNamed("x.pdf")).*GetParam().ofRecord)(), std::nullopt);
    EXPECT_EQ(((*emptyRecord()).*GetParam().ofRecord)(), std::nullopt);
}

INSTANTIATE_TEST_SUITE_P(
    Paths, APackageMember,
    ::testing::Values(MemberRow{"BazaarMetadata", "BazaarMetadata.plist",
                                PVAssetMetadata::bazaarMetadataURLWithBaseURL,
                                &PVAssetMetadata::bazaarMetadataURL},
                      MemberRow{"BazaarMetadataBackup", "BazaarMetadata-original.plist",
                                PVAssetMetadata::bazaarMetadataBackupURLWithBaseURL,
                                &PVAssetMetadata::bazaarMetadataBackupURL},
                      MemberRow{"BazaarArtwork", "BazaarArtwork",
                                PVAssetMetadata::bazaarArtworkURLWithBaseURL,
                                &PVAssetMetadata::bazaarArtworkURL},
                      MemberRow{"BazaarArtworkBackup", "BazaarArtwork-original",
                                PVAssetMetadata::bazaarArtworkBackupURLWithBaseURL,
                                &PVAssetMetadata::bazaarArtworkBackupURL}),
    [](const auto& row) { return row.param.name; });

TEST(PackageMember, NamesTheContainerDocument) {
    EXPECT_EQ(PVAssetMetadataContainerXMLPath, "META-INF/container.xml");
}

TEST(PackageMember, GoesByTheRecordsURLAndNotByAKindCachedBefore) {
    const MutableAssetPtr record = assetNamed("a.pdf");
    ASSERT_TRUE(record->isPDF());

    record->setUrl(fileNamed("a.epub"));

    EXPECT_EQ(record->bazaarArtworkURL(), fileNamed("a.epub/BazaarArtwork"));
}

// Other records.

TEST(ContainedRecord, IsOneWhoseEntriesAllStandInTheOther) {
    const MutableAssetPtr record = recordOver({{"genre", "g"}, {"year", "1900"}});

    EXPECT_TRUE(record->containsAsset(*recordOver({{"year", "1900"}})));
    EXPECT_TRUE(record->containsAsset(*record));
}

TEST(ContainedRecord, MayBeEmpty) {
    EXPECT_TRUE(emptyRecord()->containsAsset(*emptyRecord()));
    EXPECT_TRUE(recordOver({{"genre", "g"}})->containsAsset(*emptyRecord()));
}

TEST(ContainedRecord, HasNoOtherValue) {
    EXPECT_FALSE(recordOver({{"genre", "g"}})->containsAsset(*recordOver({{"genre", "h"}})));
}

TEST(ContainedRecord, HasNoOtherKey) {
    EXPECT_FALSE(recordOver({{"genre", "g"}})->containsAsset(*recordOver({{"year", "g"}})));
}

TEST(ContainedRecord, IsComparedDeeply) {
    const MutableAssetPtr record =
        recordOver({{"book-info", Dictionary{{"a", Array{integerValue(1)}}}}});

    EXPECT_TRUE(record->containsAsset(
        *recordOver({{"book-info", Dictionary{{"a", Array{booleanValue(true)}}}}})));
    EXPECT_FALSE(record->containsAsset(
        *recordOver({{"book-info", Dictionary{{"a", Array{integerValue(2)}}}}})));
}

}  // namespace
}  // namespace parvel::testing
