#include "parvel/metadata/PVMutableAssetMetadata.h"

#include <limits>

#include <gtest/gtest.h>

#include "tests/support/Records.h"

namespace parvel::testing {
namespace {

template <class Row>
std::string conversionName(const ::testing::TestParamInfo<Row>& info) {
    return info.param.name;
}

const Dictionary& entriesOf(const MutableAssetPtr& record) {
    return *record->backingDictionary();
}

// The insertion date.

struct InsertionRow {
    const char* name;
    double date;
    std::int64_t stored;
};

class AnInsertionDate : public ::testing::TestWithParam<InsertionRow> {};

TEST_P(AnInsertionDate, IsStoredAsWholeSecondsCutTowardZero) {
    const MutableAssetPtr record = emptyRecord();

    record->setInsertionDate(Date{GetParam().date});

    const Value* seconds = entriesOf(record).find("PVInsertionDate");
    ASSERT_TRUE(seconds && seconds->as<Number>());
    EXPECT_EQ(seconds->as<Number>()->kind(), Number::Kind::Signed);
    EXPECT_EQ(*seconds, integerValue(GetParam().stored));
}

INSTANTIATE_TEST_SUITE_P(
    Seconds, AnInsertionDate,
    ::testing::Values(InsertionRow{"Whole", 12, 12}, InsertionRow{"Fraction", 12.9, 12},
                      InsertionRow{"NegativeFraction", -12.9, -12},
                      InsertionRow{"TooLate", 1e300, INT64_MAX},
                      InsertionRow{"TooEarly", -1e300, INT64_MIN},
                      InsertionRow{"Never", std::numeric_limits<double>::quiet_NaN(), 0}),
    conversionName<InsertionRow>);

TEST(PVMutableAssetMetadata, RemovesTheInsertionDate) {
    const MutableAssetPtr record = recordOver({{"PVInsertionDate", integerValue(5)}});

    record->setInsertionDate(std::nullopt);

    EXPECT_TRUE(entriesOf(record).empty());
}

// URLs.

struct PathSetter {
    const char* name;
    const char* key;
    void (PVMutableAssetMetadata::*set)(const std::optional<URL>&);
};

class APathSetter : public ::testing::TestWithParam<PathSetter> {};

TEST_P(APathSetter, StoresThePathWithItsCase) {
    const MutableAssetPtr record = emptyRecord();

    ((*record).*GetParam().set)(URL::fileURLWithPath("/Books/A b\xFF.EPUB"));

    EXPECT_EQ(entriesOf(record), (Dictionary{{GetParam().key, "/Books/A b\xFF.EPUB"}}));
}

TEST_P(APathSetter, RemovesItsKeyForNone) {
    const MutableAssetPtr record = recordOver({{GetParam().key, "/a"}});

    ((*record).*GetParam().set)(std::nullopt);

    EXPECT_TRUE(entriesOf(record).empty());
}

INSTANTIATE_TEST_SUITE_P(KeyTable, APathSetter,
                         ::testing::Values(PathSetter{"setSourceURL", "sourcePath",
                                                      &PVMutableAssetMetadata::setSourceURL},
                                           PathSetter{"setPreviousURL", "PVItemPreviousPath",
                                                      &PVMutableAssetMetadata::setPreviousURL},
                                           PathSetter{"setTrashedURL", "trashedPath",
                                                      &PVMutableAssetMetadata::setTrashedURL}),
                         conversionName<PathSetter>);

TEST(PVMutableAssetMetadata, StoresTheURLsPathWithItsExtensionInLowerCase) {
    const MutableAssetPtr record = emptyRecord();

    record->setUrl(URL::fileURLWithPath("/LIB.EPUB/BOOK.EPUB"));

    EXPECT_EQ(entriesOf(record), (Dictionary{{"path", "/LIB.EPUB/BOOK.epub"}}));
}

TEST(PVMutableAssetMetadata, GivesTheURLBackExactlyAsItWasSet) {
    const MutableAssetPtr record = emptyRecord();
    const URL url = URL::fromString("file:///B%6Fok.EPUB").value();

    record->setUrl(url);

    EXPECT_EQ(record->url().value().absoluteString(), "file:///B%6Fok.EPUB");
}

TEST(PVMutableAssetMetadata, TakesURLAndPathAway) {
    const MutableAssetPtr record = emptyRecord();
    record->setUrl(URL::fileURLWithPath("/a.epub"));

    record->setUrl(std::nullopt);

    EXPECT_EQ(record->backingURL(), std::nullopt);
    EXPECT_EQ(record->url(), std::nullopt);
    EXPECT_TRUE(entriesOf(record).empty());
}

TEST(PVMutableAssetMetadata, StoresThePermlinksText) {
    const MutableAssetPtr record = emptyRecord();

    record->setPermlink(URL::fromString("https://example.org/A?b=c%20d"));
    EXPECT_EQ(entriesOf(record),
              (Dictionary{{"BazaarU Permlink", "https://example.org/A?b=c%20d"}}));

    record->setPermlink(std::nullopt);
    EXPECT_TRUE(entriesOf(record).empty());
}

// The store ID.

struct StoreIDRow {
    const char* name;
    Value given;
    std::optional<Value> stored;
};

class AStoreID : public ::testing::TestWithParam<StoreIDRow> {};

TEST_P(AStoreID, IsNormalised) {
    const MutableAssetPtr record = recordOver({{"itemId", "old"}});

    record->setStoreID(&GetParam().given);

    EXPECT_EQ(valueOf(record->storeID()), GetParam().stored);
}

INSTANTIATE_TEST_SUITE_P(
    Kinds, AStoreID,
    ::testing::Values(
        StoreIDRow{"Number", integerValue(42), Value("42")},
        StoreIDRow{"LargeNumber", Number::unsignedInteger(UINT64_MAX),
                   Value("18446744073709551615")},
        StoreIDRow{"Zero", integerValue(0), std::nullopt},
        StoreIDRow{"Negative", integerValue(-1), std::nullopt},
        StoreIDRow{"True", booleanValue(true), Value("1")},
        StoreIDRow{"False", booleanValue(false), std::nullopt},
        StoreIDRow{"RealAboveOne", realValue(1.5), Value("1.5")},
        StoreIDRow{"RealBelowOne", realValue(0.1), std::nullopt},
        StoreIDRow{"NoNumber", realValue(std::numeric_limits<double>::quiet_NaN()), std::nullopt},
        StoreIDRow{"Text", "12345", Value("12345")}, StoreIDRow{"TextOfZero", "0", Value("0")},
        StoreIDRow{"EmptyText", "", Value("")}, StoreIDRow{"NoDigits", "abc", Value("abc")},
        StoreIDRow{"Null", Value(), Value()}, StoreIDRow{"Date", Date{5}, Value(Date{5})},
        StoreIDRow{"Array", Array{"5"}, Value(Array{"5"})}),
    conversionName<StoreIDRow>);

TEST(PVMutableAssetMetadata, RemovesTheStoreID) {
    const MutableAssetPtr record = recordOver({{"itemId", "5"}});

    record->setStoreID(nullptr);

    EXPECT_TRUE(entriesOf(record).empty());
}

TEST(PVMutableAssetMetadata, TakesItsOwnStoreID) {
    const MutableAssetPtr record = recordOver({{"itemId", integerValue(5)}});

    record->setStoreID(record->storeID());

    EXPECT_EQ(valueOf(record->storeID()), Value("5"));
}

// The upload error.

TEST(PVMutableAssetMetadata, StoresAnUploadErrorsDomainAndCodeAlone) {
    const MutableAssetPtr record = emptyRecord();

    record->setUploadError(makePOSIXError(5, URL::fileURLWithPath("/a.epub")));

    EXPECT_EQ(entriesOf(record), (Dictionary{{"PVUploadErrorDomain", "PVPOSIXErrorDomain"},
                                             {"PVUploadErrorCode", integerValue(5)}}));
    EXPECT_EQ(record->uploadError(), Error("PVPOSIXErrorDomain", 5));
}

TEST(PVMutableAssetMetadata, KeepsAnUploadErrorsCodeExactly) {
    const MutableAssetPtr record = emptyRecord();

    record->setUploadError(Error("D", -9007199254740993));

    EXPECT_EQ(entriesOf(record).find("PVUploadErrorCode")->as<Number>()->kind(),
              Number::Kind::Signed);
    EXPECT_EQ(record->uploadError(), Error("D", -9007199254740993));
}

TEST(PVMutableAssetMetadata, RemovesBothKeysOfTheUploadError) {
    const MutableAssetPtr record = recordOver(
        {{"PVUploadErrorDomain", "D"}, {"PVUploadErrorCode", integerValue(5)}, {"genre", "g"}});

    record->setUploadError(std::nullopt);

    EXPECT_EQ(entriesOf(record), (Dictionary{{"genre", "g"}}));
}

// The cover image.

TEST(PVMutableAssetMetadata, StoresTheCoverImageAndRemovesIt) {
    const MutableAssetPtr record = emptyRecord();
    const Data image = Data::copyOf(std::string_view("image"));

    record->setCoverImageData(&image);
    EXPECT_EQ(entriesOf(record), (Dictionary{{"PVCoverImageData", image}}));

    record->setCoverImageData(nullptr);
    EXPECT_TRUE(entriesOf(record).empty());
}

TEST(PVMutableAssetMetadata, StoresTheMarkOfAReplacedCoverOfAnyKind) {
    for (const Value& value : valuesOfEveryKind()) {
        const MutableAssetPtr record = emptyRecord();
        record->setCoverImageDataReplaced(&value);
        EXPECT_EQ(entriesOf(record), (Dictionary{{"PVCoverImageDataReplaced", value}}));
    }
}

TEST(PVMutableAssetMetadata, RemovesTheMarkOfAReplacedCover) {
    const MutableAssetPtr record = recordOver({{"PVCoverImageDataReplaced", booleanValue(true)}});

    record->setCoverImageDataReplaced(nullptr);

    EXPECT_TRUE(entriesOf(record).empty());
}

// Deliberate: thumbnails are not kept.
TEST(PVMutableAssetMetadata, KeepsNoThumbnail) {
    const MutableAssetPtr record = recordOver({{"genre", "g"}});
    const Data image = Data::copyOf(std::string_view("image"));

    record->setThumbnail(&image);
    record->setThumbnail(nullptr);

    EXPECT_EQ(entriesOf(record), (Dictionary{{"genre", "g"}}));
}

// Combining.

TEST(CombinedRecord, TakesTheArgumentsEntriesAndKeepsItsOthers) {
    const MutableAssetPtr record = recordOver({{"genre", "mine"}, {"year", "1900"}});

    record->combineWithMetadata(recordOver({{"genre", "theirs"}, {"comments", "c"}}).get());

    EXPECT_EQ(entriesOf(record),
              (Dictionary{{"genre", "theirs"}, {"year", "1900"}, {"comments", "c"}}));
}

TEST(CombinedRecord, ReplacesNestedDictionariesWhole) {
    const MutableAssetPtr record = recordOver({{"book-info", Dictionary{{"mime-type", "m"}}}});

    record->combineWithMetadata(
        recordOver({{"book-info", Dictionary{{"cover-image-path", "c"}}}}).get());

    EXPECT_EQ(entriesOf(record),
              (Dictionary{{"book-info", Dictionary{{"cover-image-path", "c"}}}}));
}

TEST(CombinedRecord, StaysForNull) {
    const MutableAssetPtr record = recordOver({{"genre", "g"}});

    record->combineWithMetadata(nullptr);

    EXPECT_EQ(entriesOf(record), (Dictionary{{"genre", "g"}}));
}

TEST(CombinedRecord, StaysWhenCombinedWithItself) {
    const MutableAssetPtr record = recordOver({{"genre", "g"}, {"year", "1900"}});

    record->combineWithMetadata(record.get());

    EXPECT_EQ(entriesOf(record), (Dictionary{{"genre", "g"}, {"year", "1900"}}));
}

TEST(CombinedRecord, LeavesTheArgumentAlone) {
    const MutableAssetPtr other = recordOver({{"genre", "theirs"}});

    recordOver({{"genre", "mine"}, {"year", "1900"}})->combineWithMetadata(other.get());

    EXPECT_EQ(entriesOf(other), (Dictionary{{"genre", "theirs"}}));
}

TEST(CombinedRecord, KeepsItsURLAndItsKind) {
    const MutableAssetPtr record = emptyRecord();
    record->setUrl(URL::fileURLWithPath("/a.pdf"));
    ASSERT_EQ(record->assetType(), PVAssetTypePDF);

    record->combineWithMetadata(recordOver({{"path", "/b.epub"}}).get());

    EXPECT_EQ(record->url(), URL::fileURLWithPath("/a.pdf"));
    EXPECT_EQ(record->assetType(), PVAssetTypePDF);
    EXPECT_EQ(valueOf(entriesOf(record).find("path")), Value("/b.epub"));
}

// The live dictionary.

TEST(PVMutableAssetMetadata, ShowsLaterChangesInItsDictionary) {
    const MutableAssetPtr record = recordOver({{"genre", "g"}});
    const std::shared_ptr<const Dictionary> live = record->dictionaryRepresentation();

    record->setGenre("later");
    record->setYear("1900");

    EXPECT_EQ(*live, (Dictionary{{"genre", "later"}, {"year", "1900"}}));
}

}  // namespace
}  // namespace parvel::testing
