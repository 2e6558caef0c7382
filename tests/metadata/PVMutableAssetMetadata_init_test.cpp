#include "parvel/metadata/PVMutableAssetMetadata.h"

#include <gtest/gtest.h>

#include "tests/support/RecordedLog.h"
#include "tests/support/Records.h"

namespace parvel::testing {
namespace {

constexpr std::string_view headlessLine =
    "error Initializing headless metadata -- May need to support for the metadata update case but I don't like it...";

std::optional<Value> entryUnder(std::string_view key, const MutableAssetPtr& record) {
    return valueOf(record->backingDictionary()->find(key));
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
    EXPECT_EQ(entryUnder("path", record), Value("/new.epub"));
    EXPECT_EQ(entryUnder("sourcePath", record), Value("/new.epub"));
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

    EXPECT_EQ(entryUnder("PVGenerationCount", record), std::nullopt);
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

    EXPECT_EQ(entryUnder("itemId", record), std::nullopt);
}

TEST(ValidatedRecord, HasItsStoreIDAsText) {
    const MutableAssetPtr record =
        validated(std::nullopt, {{"path", "/a.epub"}, {"itemId", integerValue(42)}});

    EXPECT_EQ(entryUnder("itemId", record), Value("42"));
}

TEST(ValidatedRecord, KeepsAStoreIDThatIsText) {
    const MutableAssetPtr record = validated(std::nullopt, {{"path", "/a.epub"}, {"itemId", "0"}});

    EXPECT_EQ(entryUnder("itemId", record), Value("0"));
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

    EXPECT_EQ(entryUnder("path", record), Value("/books/a\xFF.epub"));
    EXPECT_EQ(entryUnder("sourcePath", record), Value("/books/a\xFF.epub"));
    EXPECT_EQ(entryUnder("PVDisplayName", record), Value("a\xEF\xBF\xBD.epub"));
}

TEST(ValidatedRecord, HasAUselessPathReplacedByTheURL) {
    const MutableAssetPtr record =
        validated(URL::fileURLWithPath("/a.epub"), {{"path", integerValue(5)}});

    EXPECT_EQ(entryUnder("path", record), Value("/a.epub"));
}

TEST(ValidatedRecord, KeepsUnknownKeys) {
    const MutableAssetPtr record =
        validated(std::nullopt, {{"path", "/a.epub"}, {"x-store-key", Array{"a"}}});

    EXPECT_EQ(entryUnder("x-store-key", record), Value(Array{"a"}));
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

}  // namespace
}  // namespace parvel::testing
