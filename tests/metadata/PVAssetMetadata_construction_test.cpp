#include <gtest/gtest.h>

#include "parvel/metadata/PVAssetMetadata.h"
#include "parvel/metadata/PVMutableAssetMetadata.h"
#include "tests/support/RecordedLog.h"
#include "tests/support/Records.h"

namespace parvel::testing {
namespace {

constexpr std::string_view headlessLine =
    "error Initializing headless metadata -- May need to support for the metadata update case but I don't like it...";

std::optional<Value> entryOf(const PVAssetMetadata& record, std::string_view key) {
    return valueOf(record.backingDictionary()->find(key));
}

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

// Without validation.

TEST(UnvalidatedRecord, HoldsACopyOfTheDictionary) {
    Dictionary dictionary{{"genre", "g"}};
    const MutableAssetPtr record = recordOver(dictionary);

    dictionary.set("genre", "other");
    record->setYear("1900");

    EXPECT_EQ(*record->backingDictionary(), (Dictionary{{"genre", "g"}, {"year", "1900"}}));
    EXPECT_EQ(dictionary, (Dictionary{{"genre", "other"}}));
}

TEST(UnvalidatedRecord, ChangesNoEntry) {
    const Dictionary dictionary{{"itemId", integerValue(0)}, {"path", "/A.EPUB"}};

    EXPECT_EQ(*recordOver(dictionary)->backingDictionary(), dictionary);
}

// Deliberate: a URL that the dictionary doesn't hold is not acquired.
TEST(UnvalidatedRecord, DoesNotKeepTheURL) {
    const Dictionary dictionary{{"genre", "g"}};

    const MutableAssetPtr record = PVMutableAssetMetadata::initWithURL_dictionary_validate(
        URL::fileURLWithPath("/a.epub"), &dictionary, /*validate=*/false);

    EXPECT_EQ(record->url(), std::nullopt);
    EXPECT_EQ(record->backingURL(), std::nullopt);
}

TEST(UnvalidatedRecord, HasTheURLOfItsPath) {
    const MutableAssetPtr record = recordOver({{"path", "/A.EPUB"}});

    EXPECT_EQ(record->url(), URL::fileURLWithPath("/A.EPUB"));
    EXPECT_EQ(record->backingURL(), std::nullopt);
}

TEST(UnvalidatedRecord, IsEmptyWithoutDictionary) {
    const MutableAssetPtr record = PVMutableAssetMetadata::initWithURL_dictionary_validate(
        URL::fileURLWithPath("/a.epub"), nullptr, /*validate=*/false);

    EXPECT_TRUE(record->backingDictionary()->empty());
}

TEST(UnvalidatedRecord, IsNotLoggedAsHeadless) {
    const RecordedLog log;

    static_cast<void>(emptyRecord());

    EXPECT_TRUE(log.lines().empty());
}

// With validation.

MutableAssetPtr validated(const std::optional<URL>& url, const Dictionary& dictionary) {
    return PVMutableAssetMetadata::initWithURL_dictionary_validate(url, &dictionary,
                                                                   /*validate=*/true);
}

TEST(ValidatedRecord, IsMadeSoundFromAPathAlone) {
    const MutableAssetPtr record = validated(std::nullopt, {{"path", "/books/A Title.epub"}});

    EXPECT_EQ(*record->backingDictionary(), (Dictionary{{"path", "/books/A Title.epub"},
                                                        {"sourcePath", "/books/A Title.epub"},
                                                        {"PVDisplayName", "A Title.epub"},
                                                        {"PVGenerationCount", integerValue(1)}}));
    EXPECT_EQ(record->url(), URL::fileURLWithPath("/books/A Title.epub"));
}

TEST(ValidatedRecord, IsMadeSoundFromAURLAlone) {
    const MutableAssetPtr record = PVMutableAssetMetadata::initWithURL_dictionary_validate(
        URL::fileURLWithPath("/books/BOOK.EPUB"), nullptr, /*validate=*/true);

    EXPECT_EQ(*record->backingDictionary(), (Dictionary{{"path", "/books/BOOK.epub"},
                                                        {"sourcePath", "/books/BOOK.EPUB"},
                                                        {"PVDisplayName", "BOOK.EPUB"},
                                                        {"PVGenerationCount", integerValue(1)}}));
    EXPECT_EQ(record->url(), URL::fileURLWithPath("/books/BOOK.EPUB"));
}

TEST(ValidatedRecord, TakesTheGivenURLBeforeThePath) {
    const MutableAssetPtr record =
        validated(URL::fileURLWithPath("/new.epub"), {{"path", "/old.epub"}});

    EXPECT_EQ(record->url(), URL::fileURLWithPath("/new.epub"));
    EXPECT_EQ(entryOf(*record, "path"), Value("/new.epub"));
    EXPECT_EQ(entryOf(*record, "sourcePath"), Value("/new.epub"));
}

TEST(ValidatedRecord, LeavesTheCallersDictionaryAlone) {
    const Dictionary dictionary{{"itemId", integerValue(0)}, {"path", "/A.EPUB"}};
    const Dictionary before = dictionary;

    static_cast<void>(validated(std::nullopt, dictionary));

    EXPECT_EQ(dictionary, before);
}

// Deliberate: without generated ID the count begins anew.
TEST(ValidatedRecord, OverwritesTheGenerationCountWithoutGeneratedID) {
    const MutableAssetPtr record =
        validated(std::nullopt, {{"path", "/a.epub"}, {"PVGenerationCount", integerValue(9)}});

    EXPECT_EQ(record->generationCount(), 1u);
}

TEST(ValidatedRecord, KeepsTheGenerationCountBesideAGeneratedID) {
    const MutableAssetPtr record = validated(
        std::nullopt,
        {{"path", "/a.epub"}, {"PVGeneratedItemId", "G"}, {"PVGenerationCount", integerValue(9)}});

    EXPECT_EQ(record->generationCount(), 9u);
}

TEST(ValidatedRecord, GetsNoGenerationCountBesideAGeneratedID) {
    const MutableAssetPtr record =
        validated(std::nullopt, {{"path", "/a.epub"}, {"PVGeneratedItemId", "G"}});

    EXPECT_EQ(entryOf(*record, "PVGenerationCount"), std::nullopt);
}

TEST(ValidatedRecord, CountsAGeneratedIDOfAnyKind) {
    for (const Value& value : valuesOfEveryKind()) {
        const MutableAssetPtr record = validated(
            std::nullopt, {{"PVGeneratedItemId", value}, {"PVGenerationCount", integerValue(9)}});
        EXPECT_EQ(record->generationCount(), 9u);
    }
}

TEST(ValidatedRecord, LosesAStoreIDOfZero) {
    const MutableAssetPtr record =
        validated(std::nullopt, {{"path", "/a.epub"}, {"itemId", integerValue(0)}});

    EXPECT_EQ(entryOf(*record, "itemId"), std::nullopt);
}

TEST(ValidatedRecord, HasItsStoreIDAsText) {
    const MutableAssetPtr record =
        validated(std::nullopt, {{"path", "/a.epub"}, {"itemId", integerValue(42)}});

    EXPECT_EQ(entryOf(*record, "itemId"), Value("42"));
}

TEST(ValidatedRecord, KeepsAStoreIDThatIsText) {
    const MutableAssetPtr record = validated(std::nullopt, {{"path", "/a.epub"}, {"itemId", "0"}});

    EXPECT_EQ(entryOf(*record, "itemId"), Value("0"));
}

TEST(ValidatedRecord, KeepsItsSourceURL) {
    const MutableAssetPtr record =
        validated(std::nullopt, {{"path", "/a.epub"}, {"sourcePath", "/source.epub"}});

    EXPECT_EQ(record->sourceURL(), URL::fileURLWithPath("/source.epub"));
}

TEST(ValidatedRecord, GetsItsSourceURLWhereTheStoredOneIsUnusable) {
    EXPECT_EQ(validated(std::nullopt, {{"path", "/a.epub"}, {"sourcePath", integerValue(5)}})
                  ->sourceURL(),
              URL::fileURLWithPath("/a.epub"));
    EXPECT_EQ(validated(std::nullopt, {{"path", "/a.epub"}, {"sourcePath", ""}})->sourceURL(),
              URL::fileURLWithPath("/a.epub"));
}

TEST(ValidatedRecord, KeepsItsDisplayName) {
    for (const Value& value : valuesOfEveryKind()) {
        const MutableAssetPtr record =
            validated(std::nullopt, {{"path", "/a.epub"}, {"PVDisplayName", value}});
        EXPECT_EQ(valueOf(record->displayName()), value);
    }
}

TEST(ValidatedRecord, KeepsAPathsBytesAndShowsThemReplaced) {
    const MutableAssetPtr record = validated(std::nullopt, {{"path", "/books/a\xFF.epub"}});

    EXPECT_EQ(entryOf(*record, "path"), Value("/books/a\xFF.epub"));
    EXPECT_EQ(entryOf(*record, "sourcePath"), Value("/books/a\xFF.epub"));
    EXPECT_EQ(entryOf(*record, "PVDisplayName"), Value("a\xEF\xBF\xBD.epub"));
}

TEST(ValidatedRecord, HasAUselessPathReplacedByTheURL) {
    const MutableAssetPtr record =
        validated(URL::fileURLWithPath("/a.epub"), {{"path", integerValue(5)}});

    EXPECT_EQ(entryOf(*record, "path"), Value("/a.epub"));
}

TEST(ValidatedRecord, KeepsUnknownKeys) {
    const MutableAssetPtr record =
        validated(std::nullopt, {{"path", "/a.epub"}, {"x-store-key", Array{"a"}}});

    EXPECT_EQ(entryOf(*record, "x-store-key"), Value(Array{"a"}));
}

TEST(ValidatedRecord, IsLoggedAndMadeWithoutURLAndIdentity) {
    const RecordedLog log;

    const MutableAssetPtr record = validated(std::nullopt, {{"genre", "g"}});

    EXPECT_EQ(log.lines(), std::vector{std::string(headlessLine)});
    EXPECT_EQ(*record->backingDictionary(),
              (Dictionary{{"genre", "g"}, {"PVGenerationCount", integerValue(1)}}));
}

TEST(ValidatedRecord, IsHeadlessWhenItsStoreIDIsLost) {
    const RecordedLog log;

    static_cast<void>(validated(std::nullopt, {{"itemId", integerValue(-3)}}));

    EXPECT_EQ(log.lines(), std::vector{std::string(headlessLine)});
}

TEST(ValidatedRecord, IsHeadlessWithAPathThatIsNoText) {
    const RecordedLog log;

    static_cast<void>(validated(std::nullopt, {{"path", integerValue(3)}}));

    EXPECT_EQ(log.lines(), std::vector{std::string(headlessLine)});
}

TEST(ValidatedRecord, IsNotHeadlessWithAnIdentity) {
    const RecordedLog log;

    static_cast<void>(validated(std::nullopt, {{"itemId", "5"}}));
    static_cast<void>(validated(std::nullopt, {{"PVGeneratedItemId", "G"}}));
    static_cast<void>(validated(std::nullopt, {{"path", "/a.epub"}}));

    EXPECT_TRUE(log.lines().empty());
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

TEST(IdentityMetadata, HasTheURLAlone) {
    const MutableAssetPtr record =
        PVAssetMetadata::identityMetadataWithStoreID_generatedID_url_error(
            nullptr, nullptr, URL::fileURLWithPath("/a.pdf"));

    EXPECT_EQ(record->url(), URL::fileURLWithPath("/a.pdf"));
    EXPECT_EQ(record->assetID(), std::nullopt);
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

TEST(CopyWithUpdates, KeepsAURLThatTheCallbackSets) {
    const AssetPtr record = recordOver({{"path", "/a.epub"}});

    const MutableAssetPtr copy = record->copyWithUpdates(
        [](PVMutableAssetMetadata& changed) { changed.setUrl(URL::fileURLWithPath("/B.EPUB")); });

    EXPECT_EQ(copy->url(), URL::fileURLWithPath("/B.EPUB"));
}

TEST(CopyWithUpdatedURL, GivesTheCopyAloneTheURL) {
    const AssetPtr record = recordOver({{"path", "/a.epub"}});

    const MutableAssetPtr copy = record->copyWithUpdatedURL(URL::fileURLWithPath("/b.epub"));

    EXPECT_EQ(entryOf(*record, "path"), Value("/a.epub"));
    EXPECT_EQ(entryOf(*copy, "path"), Value("/b.epub"));
    EXPECT_EQ(copy->url(), URL::fileURLWithPath("/b.epub"));
}

TEST(CopyWithUpdatedURL, TakesTheURLAway) {
    const AssetPtr record = recordOver({{"path", "/a.epub"}, {"genre", "g"}});

    const MutableAssetPtr copy = record->copyWithUpdatedURL(std::nullopt);

    EXPECT_EQ(copy->url(), std::nullopt);
    EXPECT_EQ(*copy->backingDictionary(), (Dictionary{{"genre", "g"}}));
}

}  // namespace
}  // namespace parvel::testing
