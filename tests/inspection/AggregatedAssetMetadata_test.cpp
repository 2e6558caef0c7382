#include "parvel/inspection/_PVAggregatedAssetMetadata.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "parvel/metadata/PVAssetMetadataKeys.h"
#include "tests/support/RecordedLog.h"
#include "tests/support/Records.h"
#include "tests/support/RefusingDigest.h"

namespace parvel::testing {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

/// Upper-case MD5 of "opf".
constexpr const char* opfHash = "872D732E7AFB7CDA1252C58FE1892265";

/// A book whose package document is the three bytes "opf", with records of the given entries.
class AggregatedMetadata : public ::testing::Test {
protected:
    std::shared_ptr<_PVAggregatedAssetMetadata> aggregate(
        const Dictionary& opf = {}, const std::optional<Dictionary>& store = std::nullopt,
        const std::optional<Dictionary>& preloaded = std::nullopt,
        std::string_view path = "/books/book.epub") {
        const URL url = URL::fileURLWithPath(path);
        auto made = _PVAggregatedAssetMetadata::initWithURL_opfMetadata_aggregateData(
            url, recordOver(opf),
            _PVAggregatedAssetData::initWithURL_opfData_path(url, Data::copyOf("opf"), "a.opf"));
        if (store)
            made->setBazaarMetadata(recordOver(*store));
        if (preloaded)
            made->setPreloadedMetadata(recordOver(*preloaded));
        return made;
    }

    static Dictionary::Entry entry(std::string_view key, Value value) {
        return {String(key), std::move(value)};
    }
    static std::optional<Value> generatedIDOf(const AssetPtr& record) {
        return valueOf(record->generatedID());
    }
};

TEST_F(AggregatedMetadata, ALaterSourceGoesOverAnEarlierOne) {
    const auto combined =
        aggregate({entry(key::itemName, "opf"), entry(key::genre, "opf"), entry(key::year, "opf"),
                   entry(key::producer, "opf")},
                  Dictionary{entry(key::genre, "store"), entry(key::year, "store"),
                             entry("unknown", "store")},
                  Dictionary{entry(key::year, "attribute"), entry(key::comments, "attribute")})
            ->combinedMetadata();

    EXPECT_EQ(combined->title(), "opf");
    EXPECT_EQ(valueOf(combined->producer()), "opf");
    EXPECT_EQ(valueOf(combined->genre()), "store");
    EXPECT_EQ(valueOf(combined->backingDictionary()->find("unknown")), "store");
    EXPECT_EQ(combined->year(), "attribute");
    EXPECT_EQ(combined->comments(), "attribute");
}

TEST_F(AggregatedMetadata, CombinesIntoANewRecordForTheURLEachTime) {
    const auto made = aggregate({entry(key::itemName, "T")});

    const auto first = made->combinedMetadata();
    first->setTitle("changed");

    EXPECT_EQ(made->combinedMetadata()->title(), "T");
    EXPECT_EQ(made->opfMetadata()->title(), "T");
    EXPECT_EQ(first->url(), URL::fileURLWithPath("/books/book.epub"));
}

TEST_F(AggregatedMetadata, AnOrdinaryEPUBIsIdentifiedByItsHashWhateverItSays) {
    const auto combined = aggregate({entry(key::generatedID, "from the OPF")})->combinedMetadata();

    EXPECT_EQ(valueOf(combined->packageHash()), opfHash);
    EXPECT_EQ(generatedIDOf(combined), opfHash);
    EXPECT_EQ(combined->assetID(), opfHash);
    EXPECT_FALSE(combined->isPreview());
    EXPECT_TRUE(combined->backingDictionary()->contains(key::isPreview));
}

TEST_F(AggregatedMetadata, TheToolsOwnPackageKeepsItsIdentifier) {
    const auto own = aggregate({entry(key::generatedID, "own")}, std::nullopt, std::nullopt,
                               "/books/book.folium");
    const auto bare = aggregate({}, std::nullopt, std::nullopt, "/books/book.folium");

    EXPECT_EQ(generatedIDOf(own->combinedMetadata()), "own");
    EXPECT_EQ(generatedIDOf(bare->combinedMetadata()), opfHash);
}

TEST_F(AggregatedMetadata, ARichMediaBookKeepsItsIdentifier) {
    const auto producer = entry(key::producer, "Folium Author 2");

    EXPECT_EQ(
        generatedIDOf(aggregate({producer, entry(key::generatedID, "own")})->combinedMetadata()),
        "own");
    EXPECT_EQ(generatedIDOf(aggregate({producer})->combinedMetadata()), opfHash);
}

TEST_F(AggregatedMetadata, AnIdentifierThatIsNoTextOrEmptyCountsAsNone) {
    for (const Value& value : {Value(""), Value(), integerValue(7)}) {
        const auto combined = aggregate({entry(key::generatedID, value)}, std::nullopt,
                                        std::nullopt, "/books/book.folium")
                                  ->combinedMetadata();
        EXPECT_EQ(generatedIDOf(combined), opfHash) << description(value);
    }
}

TEST_F(AggregatedMetadata, APreviewsStoreRecordIsIgnoredButForTheFlag) {
    const auto combined =
        aggregate({entry(key::itemName, "opf"), entry(key::generatedID, "own")},
                  Dictionary{entry(key::isPreview, booleanValue(true)), entry(key::storeID, "123"),
                             entry(key::itemName, "store")})
            ->combinedMetadata();

    EXPECT_EQ(combined->storeID(), nullptr);
    EXPECT_EQ(combined->title(), "opf");
    EXPECT_TRUE(combined->isPreview());
    EXPECT_EQ(generatedIDOf(combined), "own");
}

TEST_F(AggregatedMetadata, APreviewWithoutAnIdentifierTakesTheHash) {
    const auto combined =
        aggregate({}, Dictionary{entry(key::isPreview, booleanValue(true))})->combinedMetadata();

    EXPECT_EQ(generatedIDOf(combined), opfHash);
}

TEST_F(AggregatedMetadata, ABookThatTheStoreKnowsHasNoGeneratedID) {
    const auto combined =
        aggregate({entry(key::generatedID, "own")}, Dictionary{entry(key::storeID, "123")})
            ->combinedMetadata();

    EXPECT_EQ(combined->generatedID(), nullptr);
    EXPECT_EQ(combined->assetID(), "123");
    EXPECT_FALSE(combined->backingDictionary()->contains(key::isPreview));
    EXPECT_EQ(valueOf(combined->packageHash()), opfHash);
}

TEST_F(AggregatedMetadata, AStoreIDThatReadsAsZeroIsNone) {
    for (const char* storeID : {"0", "none", ""}) {
        const auto combined =
            aggregate({}, Dictionary{entry(key::storeID, storeID)})->combinedMetadata();
        EXPECT_EQ(generatedIDOf(combined), opfHash) << storeID;
    }
}

TEST_F(AggregatedMetadata, TheAttributesGoOverTheGeneratedID) {
    const auto combined =
        aggregate({}, std::nullopt, Dictionary{entry(key::generatedID, "attribute")})
            ->combinedMetadata();

    EXPECT_EQ(generatedIDOf(combined), "attribute");
    EXPECT_EQ(valueOf(combined->packageHash()), opfHash);
}

TEST_F(AggregatedMetadata, AHashFromTheStoreIsKept) {
    const auto combined =
        aggregate({}, Dictionary{entry(key::bookInfo,
                                       Dictionary{entry(key::packageHash, "from the store")})})
            ->combinedMetadata();

    EXPECT_EQ(valueOf(combined->packageHash()), "from the store");
    EXPECT_EQ(generatedIDOf(combined), "from the store");
}

TEST_F(AggregatedMetadata, AHashThatIsNoTextOrEmptyIsMadeAnew) {
    for (const Value& value : {Value(""), integerValue(7), Value()}) {
        const auto combined =
            aggregate({},
                      Dictionary{entry(key::bookInfo, Dictionary{entry(key::packageHash, value)})})
                ->combinedMetadata();
        EXPECT_EQ(valueOf(combined->packageHash()), opfHash) << description(value);
    }
}

TEST_F(AggregatedMetadata, TheCoverGoesOverTheStoresAndUnderTheAttributes) {
    const auto made = aggregate({}, Dictionary{entry(key::coverImageData, Data::copyOf("store"))});
    EXPECT_EQ(valueOf(made->combinedMetadata()->coverImageData()), Data::copyOf("store"));

    made->setCoverImageData(Data::copyOf("file"));
    EXPECT_EQ(valueOf(made->combinedMetadata()->coverImageData()), Data::copyOf("file"));

    made->setPreloadedMetadata(recordOver({entry(key::coverImageData, Data::copyOf("attribute"))}));
    EXPECT_EQ(valueOf(made->combinedMetadata()->coverImageData()), Data::copyOf("attribute"));
}

TEST_F(AggregatedMetadata, LogsNothingWhenTheHashIsMade) {
    const RecordedLog log;

    EXPECT_TRUE(aggregate()->combinedMetadata());

    EXPECT_THAT(log.lines(), IsEmpty());
}

TEST_F(AggregatedMetadata, AMissingHashIsLoggedAndLeavesTheGeneratedID) {
    const RefusingDigest digest;
    const RecordedLog log;

    const auto combined = aggregate({entry(key::generatedID, "own")})->combinedMetadata();

    EXPECT_EQ(combined->packageHash(), nullptr);
    EXPECT_EQ(generatedIDOf(combined), "own");
    EXPECT_THAT(log.lines(), ElementsAre("error Failed to generate opf md5"));
}

}  // namespace
}  // namespace parvel::testing
