#include <gtest/gtest.h>

#include "parvel/metadata/PVAssetMetadata.h"
#include "parvel/metadata/PVAssetMetadataKeys.h"
#include "tests/support/RecordedLog.h"
#include "tests/support/Records.h"

namespace parvel::testing {
namespace {

/// A record with an entry under each of the keys that a representation drops, and with others.
Dictionary manyEntries() {
    return {{"BazaarU Permlink", "https://example.org/"},
            {"PVCoverImageData", Data::copyOf(std::string_view("image"))},
            {"PVCoverImageDataReplaced", booleanValue(true)},
            {"PVDisplayName", "A"},
            {"PVGeneratedItemId", "G"},
            {"PVGenerationCount", integerValue(3)},
            {"PVHasPendingUpdate", booleanValue(true)},
            {"PVInsertionDate", integerValue(5)},
            {"PVIsLocked", booleanValue(true)},
            {"PVPercentComplete", realValue(0.5)},
            {"PVWasRedacted", booleanValue(true)},
            {"genre", "g"},
            {"itemId", "7"},
            {"path", "/a.epub"},
            {"sourcePath", "/source.epub"},
            {"trashedPath", "/trash/a.epub"},
            {"x-store-key", Array{"x"}}};
}

Dictionary manyEntriesWithout(std::initializer_list<std::string_view> keys) {
    return manyEntries().without(keys);
}

// The five.

// Deliberate: the live dictionary, not a copy.
TEST(FullRepresentation, IsTheRecordsOwnDictionary) {
    const MutableAssetPtr record = recordOver(manyEntries());

    EXPECT_EQ(record->dictionaryRepresentation(), record->backingDictionary());
    EXPECT_EQ(*record->dictionaryRepresentation(), manyEntries());
}

TEST(ContentLibraryRepresentation, LeavesOutTheCoverAndTheMarkOfItsReplacement) {
    EXPECT_EQ(*recordOver(manyEntries())->contentLibraryRepresentation(),
              manyEntriesWithout({"PVCoverImageData", "PVCoverImageDataReplaced"}));
}

// Deliberate: the library's other private keys stay.
TEST(BazaarMetadataRepresentation, LeavesOutTheEightKeysAlone) {
    EXPECT_EQ(*recordOver(manyEntries())->bazaarMetadataRepresentation(),
              manyEntriesWithout({"path", "PVGeneratedItemId", "PVCoverImageData",
                                  "PVCoverImageDataReplaced", "PVWasRedacted", "PVHasPendingUpdate",
                                  "PVPercentComplete", "sourcePath"}));
}

TEST(BazaarMetadataRepresentation, KeepsDisplayNameAndGenreOfARedactedRecord) {
    const MutableAssetPtr record =
        recordOver({{"PVWasRedacted", booleanValue(true)}, {"PVDisplayName", "A"}, {"genre", "g"}});

    EXPECT_EQ(*record->bazaarMetadataRepresentation(),
              (Dictionary{{"PVDisplayName", "A"}, {"genre", "g"}}));
}

// Deliberate: the mark of the cover's replacement stays.
TEST(ProgressRepresentation, LeavesOutTheCoverAlone) {
    EXPECT_EQ(*recordOver(manyEntries())->progressRepresentation(),
              manyEntriesWithout({"PVCoverImageData"}));
}

TEST(IdentityRepresentation, HoldsTheThreeIdentities) {
    EXPECT_EQ(*recordOver(manyEntries())->identityRepresentation(),
              (Dictionary{{"itemId", "7"}, {"PVGeneratedItemId", "G"}, {"path", "/a.epub"}}));
}

TEST(IdentityRepresentation, LeavesOutWhatIsAbsent) {
    EXPECT_TRUE(emptyRecord()->identityRepresentation()->empty());
    EXPECT_EQ(*recordOver({{"PVGeneratedItemId", "G"}})->identityRepresentation(),
              (Dictionary{{"PVGeneratedItemId", "G"}}));
}

TEST(IdentityRepresentation, HoldsThePathOfTheExplicitURL) {
    const MutableAssetPtr record = emptyRecord();
    record->setUrl(URL::fileURLWithPath("/BOOK.EPUB"));

    EXPECT_EQ(*record->identityRepresentation(), (Dictionary{{"path", "/BOOK.EPUB"}}));
}

TEST(IdentityRepresentation, HoldsIDsAsTheyAreStored) {
    const Dictionary identity{{"itemId", integerValue(7)}, {"PVGeneratedItemId", Array{}}};

    EXPECT_EQ(*recordOver(identity)->identityRepresentation(), identity);
}

TEST(IdentityRepresentation, LeavesOutAPathThatIsNoText) {
    EXPECT_TRUE(recordOver({{"path", integerValue(5)}})->identityRepresentation()->empty());
}

TEST(Representations, AreCopiesButForTheFullOne) {
    const MutableAssetPtr record = recordOver(manyEntries());
    const auto contentLibrary = record->contentLibraryRepresentation();
    const auto bazaarMetadata = record->bazaarMetadataRepresentation();
    const auto progress = record->progressRepresentation();
    const auto identity = record->identityRepresentation();

    record->setBackingDictionary({});
    record->setGenre("later");

    EXPECT_EQ(valueOf(contentLibrary->find("genre")), Value("g"));
    EXPECT_EQ(valueOf(bazaarMetadata->find("genre")), Value("g"));
    EXPECT_EQ(valueOf(progress->find("genre")), Value("g"));
    EXPECT_EQ(valueOf(identity->find("itemId")), Value("7"));
}

// By flavour.

TEST(Flavour, DispatchesToTheFive) {
    const MutableAssetPtr record = recordOver(manyEntries());

    EXPECT_EQ(record->dictionaryRepresentationWithFlavor(0), record->dictionaryRepresentation());
    EXPECT_EQ(*record->dictionaryRepresentationWithFlavor(1),
              *record->contentLibraryRepresentation());
    EXPECT_EQ(*record->dictionaryRepresentationWithFlavor(2),
              *record->bazaarMetadataRepresentation());
    EXPECT_EQ(*record->dictionaryRepresentationWithFlavor(3), *record->progressRepresentation());
    EXPECT_EQ(*record->dictionaryRepresentationWithFlavor(4), *record->identityRepresentation());
}

TEST(Flavour, HasTheDocumentedNumbers) {
    EXPECT_EQ(PVAssetMetadataFlavorFull, 0);
    EXPECT_EQ(PVAssetMetadataFlavorContentLibrary, 1);
    EXPECT_EQ(PVAssetMetadataFlavorBazaarMetadata, 2);
    EXPECT_EQ(PVAssetMetadataFlavorProgress, 3);
    EXPECT_EQ(PVAssetMetadataFlavorIdentity, 4);
}

TEST(Flavour, IsLoggedAndGivesNoneWhenItIsUnknown) {
    const MutableAssetPtr record = recordOver(manyEntries());
    const RecordedLog log;

    EXPECT_EQ(record->dictionaryRepresentationWithFlavor(5), nullptr);
    EXPECT_EQ(record->dictionaryRepresentationWithFlavor(-1), nullptr);

    EXPECT_EQ(log.lines(), (std::vector<std::string>{"error Unexpected flavor 5",
                                                     "error Unexpected flavor -1"}));
}

TEST(ListOfRepresentations, StandsInTheOrderOfTheRecords) {
    const auto representations = PVAssetMetadata::dictionaryRepresentationsForAssets_flavor(
        {recordOver({{"itemId", "2"}}), recordOver({{"itemId", "1"}})},
        PVAssetMetadataFlavorIdentity);

    ASSERT_EQ(representations.size(), 2u);
    EXPECT_EQ(*representations[0], (Dictionary{{"itemId", "2"}}));
    EXPECT_EQ(*representations[1], (Dictionary{{"itemId", "1"}}));
}

TEST(ListOfRepresentations, SkipsAbsentRecords) {
    const auto representations = PVAssetMetadata::dictionaryRepresentationsForAssets_flavor(
        {nullptr, recordOver({{"itemId", "1"}}), nullptr}, PVAssetMetadataFlavorFull);

    ASSERT_EQ(representations.size(), 1u);
    EXPECT_EQ(*representations[0], (Dictionary{{"itemId", "1"}}));
}

TEST(ListOfRepresentations, IsEmptyForAnUnknownFlavour) {
    const RecordedLog log;

    EXPECT_TRUE(PVAssetMetadata::dictionaryRepresentationsForAssets_flavor(
                    {emptyRecord(), emptyRecord()}, 9)
                    .empty());
    EXPECT_EQ(log.lines(),
              (std::vector<std::string>{"error Unexpected flavor 9", "error Unexpected flavor 9"}));
}

TEST(ListOfAssetIDs, StandsInOrderWithoutAbsentOnes) {
    const std::vector<String> assetIDs = PVAssetMetadata::assetIDsForAssets(
        {recordOver({{"itemId", integerValue(2)}}), emptyRecord(), nullptr,
         recordOver({{"PVGeneratedItemId", "G"}})});

    EXPECT_EQ(assetIDs, (std::vector<String>{"2", "G"}));
}

// Equality.

TEST(EqualRecords, HaveEqualDictionaries) {
    const MutableAssetPtr record = recordOver(manyEntries());

    EXPECT_TRUE(record->isEqual(record.get()));
    EXPECT_TRUE(record->isEqual(recordOver(manyEntries()).get()));
    EXPECT_EQ(record->hash(), recordOver(manyEntries())->hash());
}

TEST(EqualRecords, CompareTheirNumbersByValue) {
    const MutableAssetPtr one = recordOver({{"rating", integerValue(1)}});
    const MutableAssetPtr other = recordOver({{"rating", booleanValue(true)}});

    EXPECT_TRUE(one->isEqual(other.get()));
    EXPECT_EQ(one->hash(), other->hash());
}

TEST(EqualRecords, DifferInNoEntry) {
    const MutableAssetPtr record = recordOver({{"genre", "g"}});

    EXPECT_FALSE(record->isEqual(recordOver({{"genre", "h"}}).get()));
    EXPECT_FALSE(record->isEqual(recordOver({{"genre", "g"}, {"year", "1"}}).get()));
    EXPECT_FALSE(record->isEqual(emptyRecord().get()));
}

TEST(EqualRecords, AreNeverNull) {
    EXPECT_FALSE(emptyRecord()->isEqual(nullptr));
}

// Deliberate: neither the explicit URL nor the cached kind is compared.
TEST(EqualRecords, MayDifferInURLAndKind) {
    const MutableAssetPtr record = recordOver({{"path", "/c.epub"}});
    const MutableAssetPtr other = recordOver({{"path", "/c.epub"}});
    record->setBackingURL(URL::fileURLWithPath("/a.epub"));
    other->setBackingURL(URL::fileURLWithPath("/b.epub"));
    other->setAssetType(PVAssetTypePDF);

    EXPECT_TRUE(record->isEqual(other.get()));
    EXPECT_EQ(record->hash(), other->hash());
}

TEST(EqualRecords, MayBeOfEitherClass) {
    const auto base = PVAssetMetadata::initWithURL_dictionary_validate(std::nullopt, nullptr,
                                                                       /*validate=*/false);

    EXPECT_TRUE(base->isEqual(emptyRecord().get()));
    EXPECT_TRUE(emptyRecord()->isEqual(base.get()));
}

// Extended attributes.

TEST(KeptInAttributes, AreBooksAndPDFsAlone) {
    EXPECT_TRUE(recordOver({{"path", "/a.epub"}})->shouldUpdateXattrMetadata());
    EXPECT_TRUE(recordOver({{"path", "/a.folium"}})->shouldUpdateXattrMetadata());
    EXPECT_TRUE(recordOver({{"path", "/a.pdf"}})->shouldUpdateXattrMetadata());
    EXPECT_FALSE(recordOver({{"path", "/a.m4a"}})->shouldUpdateXattrMetadata());
    EXPECT_FALSE(recordOver({{"path", "/a.txt"}})->shouldUpdateXattrMetadata());
    EXPECT_FALSE(emptyRecord()->shouldUpdateXattrMetadata());
}

TEST(KeptInAttributes, AreRecordsByTheirKindAndNotByTheirURL) {
    const MutableAssetPtr record = recordOver({{"path", "/a.m4a"}});
    record->setAssetType(PVAssetTypeEPub);

    EXPECT_TRUE(record->shouldUpdateXattrMetadata());
}

// The description.

TEST(Description, IsTheContentLibraryRepresentation) {
    const MutableAssetPtr record = recordOver({{"genre", "g"},
                                               {"PVCoverImageDataReplaced", booleanValue(true)},
                                               {"pageCount", integerValue(12)}});

    EXPECT_EQ(record->description(), "{genre = \"g\"; pageCount = 12}");
}

TEST(Description, ShowsACoverAsText) {
    const MutableAssetPtr record =
        recordOver({{"PVCoverImageData", Data::copyOf(std::string_view("image"))}, {"genre", "g"}});

    EXPECT_EQ(record->description(), "{PVCoverImageData = \"<data>\"; genre = \"g\"}");
}

TEST(Description, ShowsACoverOfAnyKindAsTheSameText) {
    for (const Value& value : valuesOfEveryKind())
        EXPECT_EQ(recordOver({{"PVCoverImageData", value}})->description(),
                  "{PVCoverImageData = \"<data>\"}");
}

TEST(Description, LeavesTheRecordAlone) {
    const MutableAssetPtr record = recordOver(manyEntries());

    static_cast<void>(record->description());

    EXPECT_EQ(*record->backingDictionary(), manyEntries());
}

TEST(Description, IsHowARecordPrintsInTheLog) {
    EXPECT_EQ(logText(*recordOver({{"genre", "g"}})), "{genre = \"g\"}");
}

TEST(Description, IsNullInTheLogForNoRecord) {
    EXPECT_EQ(logText(AssetPtr()), "(null)");
}

// Hostile dictionaries.

constexpr std::string_view everyKey[] = {key::path,
                                         key::sourcePath,
                                         key::previousPath,
                                         key::trashedPath,
                                         key::generatedID,
                                         key::displayName,
                                         key::format,
                                         key::producer,
                                         key::generationCount,
                                         key::isPreview,
                                         key::hasPendingUpdates,
                                         key::wasRedacted,
                                         key::isLocked,
                                         key::isExplicit,
                                         key::permlink,
                                         key::storeID,
                                         key::artistName,
                                         key::itemName,
                                         key::versionNumber,
                                         key::shouldDisableOptimizeSpeed,
                                         key::shouldDisableTouchEmulation,
                                         key::desktopSupportLevel,
                                         key::pageCount,
                                         key::updateDate,
                                         key::modificationDate,
                                         key::releaseDate,
                                         key::insertionDate,
                                         key::genre,
                                         key::assetDescription,
                                         key::bookInfo,
                                         key::allocatedSize,
                                         key::percentComplete,
                                         key::downloadInfo,
                                         key::coverImageData,
                                         key::coverImageDataReplaced,
                                         key::uploadErrorDomain,
                                         key::uploadErrorCode,
                                         key::sortTitle,
                                         key::sortAuthor,
                                         key::comments,
                                         key::year,
                                         key::lastOpenDate,
                                         key::purchaseDate,
                                         key::rating};

/// Reads all that converts or tests a stored value.
void readConvertedProperties(const PVAssetMetadata& record) {
    static_cast<void>(record.url());
    static_cast<void>(record.assetID());
    static_cast<void>(record.sourceURL());
    static_cast<void>(record.previousURL());
    static_cast<void>(record.trashedURL());
    static_cast<void>(record.permlink());
    static_cast<void>(record.generationCount());
    static_cast<void>(record.isPreview());
    static_cast<void>(record.pageCount());
    static_cast<void>(record.insertionDate());
    static_cast<void>(record.packageHash());
    static_cast<void>(record.allocatedSize());
    static_cast<void>(record.percentComplete());
    static_cast<void>(record.uploadError());
    static_cast<void>(record.title());
    static_cast<void>(record.purchaseDate());
    static_cast<void>(record.rating());
    static_cast<void>(record.isRMT());
    static_cast<void>(record.bazaarMetadataURL());
    static_cast<void>(record.description());
}

class AHostileDictionary : public ::testing::TestWithParam<std::string_view> {};

TEST_P(AHostileDictionary, MakesARecordThatReadsAndCopiesWhateverTheKindOfAValue) {
    for (const Value& value : valuesOfEveryKind()) {
        const Dictionary dictionary{{String(GetParam()), value}};
        const MutableAssetPtr record =
            PVAssetMetadata::metadataWithURL_dictionary(std::nullopt, &dictionary);
        ASSERT_TRUE(record);

        readConvertedProperties(*record);
        EXPECT_TRUE(record->copyWithZone()->isEqual(record.get()));
        EXPECT_TRUE(record->containsAsset(*record));
        for (std::int64_t flavor = 0; flavor <= 4; ++flavor)
            EXPECT_NE(record->dictionaryRepresentationWithFlavor(flavor), nullptr);
    }
}

TEST_P(AHostileDictionary, MakesAnUpdateRecordWhateverTheKindOfAValue) {
    for (const Value& value : valuesOfEveryKind()) {
        const Dictionary dictionary{{String(GetParam()), value}};
        const MutableAssetPtr record =
            PVAssetMetadata::updatesMetadataWithDictionary_error(&dictionary);

        readConvertedProperties(*record);
        EXPECT_EQ(valueOf(record->backingDictionary()->find(GetParam())), value);
    }
}

INSTANTIATE_TEST_SUITE_P(EveryKey, AHostileDictionary, ::testing::ValuesIn(everyKey),
                         [](const auto& row) {
                             std::string name(row.param);
                             std::erase_if(name,
                                           [](char c) { return c == ' ' || c == '-' || c == '.'; });
                             return name;
                         });

}  // namespace
}  // namespace parvel::testing
