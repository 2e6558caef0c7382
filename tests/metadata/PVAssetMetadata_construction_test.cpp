#include <gtest/gtest.h>

#include "parvel/metadata/PVAssetMetadata.h"
#include "parvel/metadata/PVMutableAssetMetadata.h"
#include "tests/support/RecordedLog.h"
#include "tests/support/Records.h"

namespace parvel::testing {
namespace {

// The base class's initialiser.

// Deliberate: the base class keeps nothing.
TEST(BaseInitialiser, IgnoresItsArguments) {
    const Dictionary dictionary{{"path", "/b.epub"}, {"itemId", "7"}};

    const auto record = PVAssetMetadata::initWithURL_dictionary_validate(
        URL::fileURLWithPath("/a.epub"), &dictionary, /*validate=*/true);

    EXPECT_TRUE(record->backingDictionary()->empty());
    EXPECT_EQ(record->url(), std::nullopt);
    EXPECT_EQ(record->assetType(), PVAssetTypeUnknown);
}

TEST(BaseInitialiser, WritesNoLog) {
    const RecordedLog log;

    static_cast<void>(
        PVAssetMetadata::initWithURL_dictionary_validate(std::nullopt, nullptr, /*validate=*/true));

    EXPECT_TRUE(log.lines().empty());
}

TEST(BaseInitialiser, MakesARecordWhoseCopiesAreEmpty) {
    const auto record = PVAssetMetadata::initWithURL_dictionary_validate(std::nullopt, nullptr,
                                                                         /*validate=*/false);
    record->setBackingDictionary({{"genre", "g"}});

    EXPECT_TRUE(record->copyWithZone()->backingDictionary()->empty());
}

// metadataWithURL:dictionary:

TEST(MetadataWithURL, IsNoneWithoutURLAndEntries) {
    const RecordedLog log;
    const Dictionary empty;

    EXPECT_EQ(PVAssetMetadata::metadataWithURL_dictionary(std::nullopt, nullptr), nullptr);
    EXPECT_EQ(PVAssetMetadata::metadataWithURL_dictionary(std::nullopt, &empty), nullptr);
    EXPECT_TRUE(log.lines().empty());
}

TEST(MetadataWithURL, IsAValidatedRecord) {
    const Dictionary dictionary{{"itemId", integerValue(42)}};

    const MutableAssetPtr record =
        PVAssetMetadata::metadataWithURL_dictionary(URL::fileURLWithPath("/a.epub"), &dictionary);

    EXPECT_EQ(record->assetID(), "42");
    EXPECT_EQ(record->url(), URL::fileURLWithPath("/a.epub"));
    EXPECT_EQ(record->generationCount(), 1u);
}

TEST(MetadataWithURL, NeedsNoEntriesBesideAURL) {
    EXPECT_NE(PVAssetMetadata::metadataWithURL_dictionary(URL::fileURLWithPath("/a.epub"), nullptr),
              nullptr);
}

// updatesMetadataWithDictionary:error:

TEST(UpdatesMetadata, HoldsTheDictionaryAsItStands) {
    const Dictionary dictionary{{"itemId", integerValue(0)}, {"genre", Value()}};

    const MutableAssetPtr record =
        PVAssetMetadata::updatesMetadataWithDictionary_error(&dictionary);

    EXPECT_EQ(*record->backingDictionary(), dictionary);
}

TEST(UpdatesMetadata, TakesTheDisplayNameFromTheItemName) {
    const Dictionary dictionary{{"itemName", "A Title"}};

    const MutableAssetPtr record =
        PVAssetMetadata::updatesMetadataWithDictionary_error(&dictionary);

    EXPECT_EQ(valueOf(record->displayName()), Value("A Title"));
}

TEST(UpdatesMetadata, TakesAnItemNameOfAnyKind) {
    for (const Value& value : valuesOfEveryKind()) {
        const Dictionary dictionary{{"itemName", value}};
        EXPECT_EQ(
            valueOf(
                PVAssetMetadata::updatesMetadataWithDictionary_error(&dictionary)->displayName()),
            value);
    }
}

TEST(UpdatesMetadata, KeepsItsDisplayName) {
    const Dictionary dictionary{{"itemName", "A Title"}, {"PVDisplayName", "Shown"}};

    const MutableAssetPtr record =
        PVAssetMetadata::updatesMetadataWithDictionary_error(&dictionary);

    EXPECT_EQ(valueOf(record->displayName()), Value("Shown"));
}

TEST(UpdatesMetadata, IsEmptyWithoutDictionary) {
    const RecordedLog log;

    EXPECT_TRUE(PVAssetMetadata::updatesMetadataWithDictionary_error(nullptr)
                    ->backingDictionary()
                    ->empty());
    EXPECT_TRUE(log.lines().empty());
}

TEST(UpdatesMetadata, LeavesTheErrorAlone) {
    std::optional<Error> error = makeNoIdentityError();

    static_cast<void>(PVAssetMetadata::updatesMetadataWithDictionary_error(nullptr, &error));

    EXPECT_EQ(error, makeNoIdentityError());
}

// identityMetadata...

TEST(IdentityMetadata, IsNoneWithoutAnyIdentity) {
    std::optional<Error> error;

    EXPECT_EQ(PVAssetMetadata::identityMetadataWithStoreID_generatedID_url_error(
                  nullptr, nullptr, std::nullopt, &error),
              nullptr);

    ASSERT_TRUE(error);
    EXPECT_EQ(error->domain(), PVParvelFoundationErrorDomain);
    EXPECT_EQ(error->code(), -1006);
    EXPECT_TRUE(error->userInfo().empty());
}

TEST(IdentityMetadata, FailsWithoutAPlaceForTheError) {
    EXPECT_EQ(PVAssetMetadata::identityMetadataWithStoreID_generatedID_url_error(nullptr, nullptr,
                                                                                 std::nullopt),
              nullptr);
}

TEST(IdentityMetadata, HoldsAllThree) {
    const Value storeID = integerValue(7);
    const Value generatedID = "G";
    std::optional<Error> error;

    const MutableAssetPtr record =
        PVAssetMetadata::identityMetadataWithStoreID_generatedID_url_error(
            &storeID, &generatedID, URL::fileURLWithPath("/A.EPUB"), &error);

    EXPECT_EQ(*record->backingDictionary(), (Dictionary{{"itemId", "7"},
                                                        {"PVGeneratedItemId", "G"},
                                                        {"path", "/A.epub"},
                                                        {"sourcePath", "/A.EPUB"},
                                                        {"PVDisplayName", "A.EPUB"}}));
    EXPECT_EQ(error, std::nullopt);
}

TEST(IdentityMetadata, HasNoPathNorURLNorWarningWithAGeneratedIDAlone) {
    const RecordedLog log;
    const Value generatedID = "G";

    const MutableAssetPtr record =
        PVAssetMetadata::identityMetadataWithStoreID_generatedID_url_error(nullptr, &generatedID,
                                                                           std::nullopt);

    EXPECT_EQ(*record->backingDictionary(), (Dictionary{{"PVGeneratedItemId", "G"}}));
    EXPECT_EQ(record->url(), std::nullopt);
    EXPECT_TRUE(log.lines().empty());
}

TEST(IdentityMetadata, HasNoPathNorURLNorWarningWithAStoreIDAlone) {
    const RecordedLog log;
    const Value storeID = integerValue(7);

    const MutableAssetPtr record =
        PVAssetMetadata::identityMetadataWithStoreID_generatedID_url_error(&storeID, nullptr,
                                                                           std::nullopt);

    ASSERT_TRUE(record);
    EXPECT_EQ(*record->backingDictionary(),
              (Dictionary{{"itemId", "7"}, {"PVGenerationCount", integerValue(1)}}));
    EXPECT_EQ(record->url(), std::nullopt);
    EXPECT_TRUE(log.lines().empty());
}

TEST(IdentityMetadata, HasTheURLAlone) {
    const MutableAssetPtr record =
        PVAssetMetadata::identityMetadataWithStoreID_generatedID_url_error(
            nullptr, nullptr, URL::fileURLWithPath("/a.pdf"));

    EXPECT_EQ(record->url(), URL::fileURLWithPath("/a.pdf"));
    EXPECT_EQ(record->assetID(), std::nullopt);
}

TEST(IdentityMetadata, GivesTheURLBackExactlyAsItWasGiven) {
    const MutableAssetPtr record =
        PVAssetMetadata::identityMetadataWithStoreID_generatedID_url_error(
            nullptr, nullptr, URL::fromString("file:///B%6Fok.EPUB"));

    EXPECT_EQ(record->url().value().absoluteString(), "file:///B%6Fok.EPUB");
}

TEST(IdentityMetadata, IsReadFromADictionarysThreeKeys) {
    const Dictionary dictionary{{"itemId", integerValue(7)},
                                {"PVGeneratedItemId", "G"},
                                {"path", "/a.epub"},
                                {"genre", "left out"}};

    const MutableAssetPtr record =
        PVAssetMetadata::identityMetadataWithDictionary_error(&dictionary);

    EXPECT_EQ(*record->backingDictionary(), (Dictionary{{"itemId", "7"},
                                                        {"PVGeneratedItemId", "G"},
                                                        {"path", "/a.epub"},
                                                        {"sourcePath", "/a.epub"},
                                                        {"PVDisplayName", "a.epub"}}));
}

TEST(IdentityMetadata, IsNoneForADictionaryWithoutIdentity) {
    const Dictionary dictionary{{"genre", "g"}};
    std::optional<Error> error;

    EXPECT_EQ(PVAssetMetadata::identityMetadataWithDictionary_error(&dictionary, &error), nullptr);
    EXPECT_EQ(error, makeNoIdentityError());
}

TEST(IdentityMetadata, IsNoneForAnAbsentDictionary) {
    std::optional<Error> error;

    EXPECT_EQ(PVAssetMetadata::identityMetadataWithDictionary_error(nullptr, &error), nullptr);
    EXPECT_EQ(error, makeNoIdentityError());
}

TEST(IdentityMetadata, IsNoneForAPathThatIsNoText) {
    const Dictionary dictionary{{"path", Array{"/a.epub"}}};
    std::optional<Error> error;

    EXPECT_EQ(PVAssetMetadata::identityMetadataWithDictionary_error(&dictionary, &error), nullptr);
    EXPECT_EQ(error, makeNoIdentityError());
}

// deserializedMetadataFromDictionary:error:

TEST(DeserializedMetadata, IsAValidatedRecordOverTheWholeDictionary) {
    const Dictionary dictionary{
        {"path", "/a.epub"}, {"itemId", integerValue(7)}, {"genre", "g"}, {"x", "y"}};
    std::optional<Error> error;

    const MutableAssetPtr record =
        PVAssetMetadata::deserializedMetadataFromDictionary_error(&dictionary, &error);

    EXPECT_EQ(*record->backingDictionary(), (Dictionary{{"path", "/a.epub"},
                                                        {"itemId", "7"},
                                                        {"genre", "g"},
                                                        {"x", "y"},
                                                        {"sourcePath", "/a.epub"},
                                                        {"PVDisplayName", "a.epub"},
                                                        {"PVGenerationCount", integerValue(1)}}));
    EXPECT_EQ(error, std::nullopt);
}

TEST(DeserializedMetadata, IsNoneWithoutUsablePath) {
    for (const Dictionary& dictionary :
         {Dictionary{}, Dictionary{{"itemId", "7"}}, Dictionary{{"path", ""}},
          Dictionary{{"path", integerValue(1)}}, Dictionary{{"path", Value()}}}) {
        std::optional<Error> error;
        EXPECT_EQ(PVAssetMetadata::deserializedMetadataFromDictionary_error(&dictionary, &error),
                  nullptr);
        EXPECT_EQ(error, makeNoIdentityError());
    }
}

TEST(DeserializedMetadata, IsNoneForAnAbsentDictionary) {
    std::optional<Error> error;

    EXPECT_EQ(PVAssetMetadata::deserializedMetadataFromDictionary_error(nullptr, &error), nullptr);
    EXPECT_EQ(error, makeNoIdentityError());
}

// Copies.

TEST(CopiedRecord, IsIndependent) {
    const MutableAssetPtr record = recordOver({{"genre", "g"}});

    const auto copy = std::dynamic_pointer_cast<PVMutableAssetMetadata>(record->copyWithZone());
    ASSERT_TRUE(copy);
    copy->setGenre("other");

    EXPECT_EQ(valueOf(record->genre()), Value("g"));
    EXPECT_EQ(valueOf(copy->genre()), Value("other"));
}

TEST(CopiedRecord, IsEqual) {
    const MutableAssetPtr record = recordOver({{"genre", "g"}, {"itemId", integerValue(0)}});

    EXPECT_TRUE(record->copyWithZone()->isEqual(record.get()));
}

// Deliberate: the explicit URL is not copied, the path is.
TEST(CopiedRecord, HasTheURLOfItsPath) {
    const MutableAssetPtr record = emptyRecord();
    record->setUrl(URL::fileURLWithPath("/BOOK.EPUB"));

    EXPECT_EQ(record->copyWithZone()->url(), URL::fileURLWithPath("/BOOK.epub"));
}

TEST(CopiedRecord, HasNoKindCached) {
    const MutableAssetPtr record = emptyRecord();
    record->setAssetType(PVAssetTypePDF);

    EXPECT_EQ(record->copyWithZone()->assetType(), PVAssetTypeUnknown);
}

TEST(CopyWithUpdates, LeavesTheReceiverAlone) {
    const AssetPtr record = recordOver({{"genre", "g"}, {"year", "1900"}});

    const MutableAssetPtr copy = record->copyWithUpdates([](PVMutableAssetMetadata& changed) {
        changed.setGenre(std::nullopt);
        changed.setTitle("T");
    });

    EXPECT_EQ(*record->backingDictionary(), (Dictionary{{"genre", "g"}, {"year", "1900"}}));
    EXPECT_EQ(*copy->backingDictionary(), (Dictionary{{"itemName", "T"}, {"year", "1900"}}));
}

// Deliberate: the explicit URL is not copied, nor is the cached kind.
TEST(CopyWithUpdates, HasTheURLAndTheKindOfItsPath) {
    const MutableAssetPtr record = recordOver({{"path", "/a.epub"}});
    record->setBackingURL(URL::fileURLWithPath("/elsewhere.m4a"));
    record->setAssetType(PVAssetTypePDF);

    const MutableAssetPtr copy = record->copyWithUpdates([](PVMutableAssetMetadata&) {});

    EXPECT_EQ(copy->url(), URL::fileURLWithPath("/a.epub"));
    EXPECT_EQ(copy->assetType(), PVAssetTypeEPub);
}

TEST(CopyWithUpdates, ChangesNoEntryOfItsOwn) {
    const Dictionary dictionary{{"path", "/A.EPUB"}, {"itemId", integerValue(0)}};

    const MutableAssetPtr copy =
        recordOver(dictionary)->copyWithUpdates([](PVMutableAssetMetadata&) {});

    EXPECT_EQ(*copy->backingDictionary(), dictionary);
}

TEST(CopyWithUpdates, KeepsAURLThatTheCallbackSets) {
    const AssetPtr record = recordOver({{"path", "/a.epub"}});

    const MutableAssetPtr copy = record->copyWithUpdates(
        [](PVMutableAssetMetadata& changed) { changed.setUrl(URL::fileURLWithPath("/B.EPUB")); });

    EXPECT_EQ(copy->url(), URL::fileURLWithPath("/B.EPUB"));
}

TEST(CopyWithUpdatedURL, GivesTheCopyAloneTheURL) {
    const AssetPtr record = recordOver({{"path", "/a.epub"}});

    const MutableAssetPtr copy = record->copyWithUpdatedURL(URL::fileURLWithPath("/b.epub"));

    EXPECT_EQ(*record->backingDictionary(), (Dictionary{{"path", "/a.epub"}}));
    EXPECT_EQ(*copy->backingDictionary(), (Dictionary{{"path", "/b.epub"}}));
    EXPECT_EQ(copy->url(), URL::fileURLWithPath("/b.epub"));
}

TEST(CopyWithUpdatedURL, TakesTheURLAway) {
    const AssetPtr record = recordOver({{"path", "/a.epub"}, {"genre", "g"}});

    const MutableAssetPtr copy = record->copyWithUpdatedURL(std::nullopt);

    EXPECT_EQ(copy->url(), std::nullopt);
    EXPECT_EQ(*copy->backingDictionary(), (Dictionary{{"genre", "g"}}));
}

// The three fields.

TEST(PVAssetMetadata, HasAnEmptyDictionaryAndNoURLAtFirst) {
    const auto record = PVAssetMetadata::initWithURL_dictionary_validate(std::nullopt, nullptr,
                                                                         /*validate=*/false);

    EXPECT_TRUE(record->backingDictionary()->empty());
    EXPECT_EQ(record->backingURL(), std::nullopt);
    EXPECT_EQ(record->assetType(), PVAssetTypeUnknown);
}

TEST(PVAssetMetadata, TakesAnotherDictionary) {
    const MutableAssetPtr record = recordOver({{"genre", "old"}, {"year", "1900"}});

    record->setBackingDictionary({{"genre", "new"}});

    EXPECT_EQ(*record->backingDictionary(), (Dictionary{{"genre", "new"}}));
}

TEST(PVAssetMetadata, LeavesAnEarlierDictionaryAloneWhenItTakesAnother) {
    const MutableAssetPtr record = recordOver({{"genre", "old"}});
    const std::shared_ptr<const Dictionary> earlier = record->backingDictionary();

    record->setBackingDictionary({{"genre", "new"}});

    EXPECT_EQ(*earlier, (Dictionary{{"genre", "old"}}));
}

}  // namespace
}  // namespace parvel::testing
