#include "parvel/metadata/PVMutableAssetMetadata.h"

#include <limits>

#include <gtest/gtest.h>

#include "tests/support/Records.h"

namespace parvel::testing {
namespace {

template <class Row>
std::string setterName(const ::testing::TestParamInfo<Row>& info) {
    return info.param.name;
}

const Dictionary& dictionaryOf(const MutableAssetPtr& record) {
    return *record->backingDictionary();
}

// Texts.

struct TextSetter {
    const char* name;
    const char* key;
    void (PVMutableAssetMetadata::*set)(std::optional<String>);
};

class ATextSetter : public ::testing::TestWithParam<TextSetter> {};

TEST_P(ATextSetter, StoresUnderItsKey) {
    const MutableAssetPtr record = emptyRecord();

    ((*record).*GetParam().set)("text");

    EXPECT_EQ(dictionaryOf(record), (Dictionary{{GetParam().key, "text"}}));
}

TEST_P(ATextSetter, OverwritesAndTouchesNothingElse) {
    const MutableAssetPtr record = recordOver({{GetParam().key, integerValue(1)}, {"other", "o"}});

    ((*record).*GetParam().set)("");

    EXPECT_EQ(dictionaryOf(record), (Dictionary{{GetParam().key, ""}, {"other", "o"}}));
}

TEST_P(ATextSetter, RemovesItsKeyForNone) {
    const MutableAssetPtr record = recordOver({{GetParam().key, "text"}, {"other", "o"}});

    ((*record).*GetParam().set)(std::nullopt);

    EXPECT_EQ(dictionaryOf(record), (Dictionary{{"other", "o"}}));
}

INSTANTIATE_TEST_SUITE_P(
    KeyTable, ATextSetter,
    ::testing::Values(
        TextSetter{"setGeneratedID", "PVGeneratedItemId", &PVMutableAssetMetadata::setGeneratedID},
        TextSetter{"setDisplayName", "PVDisplayName", &PVMutableAssetMetadata::setDisplayName},
        TextSetter{"setFormat", "PVBooksFormat", &PVMutableAssetMetadata::setFormat},
        TextSetter{"setProducer", "PVBookProducer", &PVMutableAssetMetadata::setProducer},
        TextSetter{"setArtistName", "artistName", &PVMutableAssetMetadata::setArtistName},
        TextSetter{"setItemName", "itemName", &PVMutableAssetMetadata::setItemName},
        TextSetter{"setVersionNumber", "versionNumber", &PVMutableAssetMetadata::setVersionNumber},
        TextSetter{"setGenre", "genre", &PVMutableAssetMetadata::setGenre},
        TextSetter{"setAssetDescription", "bookDescription",
                   &PVMutableAssetMetadata::setAssetDescription},
        TextSetter{"setTitle", "itemName", &PVMutableAssetMetadata::setTitle},
        TextSetter{"setSortTitle", "sort-name", &PVMutableAssetMetadata::setSortTitle},
        TextSetter{"setAuthor", "artistName", &PVMutableAssetMetadata::setAuthor},
        TextSetter{"setSortAuthor", "sort-artist", &PVMutableAssetMetadata::setSortAuthor},
        TextSetter{"setComments", "comments", &PVMutableAssetMetadata::setComments},
        TextSetter{"setBookDescription", "bookDescription",
                   &PVMutableAssetMetadata::setBookDescription},
        TextSetter{"setYear", "year", &PVMutableAssetMetadata::setYear}),
    setterName<TextSetter>);

// Texts inside "book-info".

class ABookInfoSetter : public ::testing::TestWithParam<TextSetter> {};

TEST_P(ABookInfoSetter, MakesBookInfoWhereThereIsNone) {
    const MutableAssetPtr record = emptyRecord();

    ((*record).*GetParam().set)("text");

    EXPECT_EQ(dictionaryOf(record),
              (Dictionary{{"book-info", Dictionary{{GetParam().key, "text"}}}}));
}

TEST_P(ABookInfoSetter, KeepsBookInfosOtherEntries) {
    const MutableAssetPtr record =
        recordOver({{"book-info", Dictionary{{GetParam().key, "old"}, {"other", "o"}}}});

    ((*record).*GetParam().set)("new");

    EXPECT_EQ(dictionaryOf(record),
              (Dictionary{{"book-info", Dictionary{{GetParam().key, "new"}, {"other", "o"}}}}));
}

TEST_P(ABookInfoSetter, LeavesBookInfoEmptyWhenItsLastEntryGoes) {
    const MutableAssetPtr record =
        recordOver({{"book-info", Dictionary{{GetParam().key, "text"}}}});

    ((*record).*GetParam().set)(std::nullopt);

    EXPECT_EQ(dictionaryOf(record), (Dictionary{{"book-info", Dictionary{}}}));
}

TEST_P(ABookInfoSetter, StoresAnEmptyBookInfoForNoneWhereThereIsNone) {
    const MutableAssetPtr record = emptyRecord();

    ((*record).*GetParam().set)(std::nullopt);

    EXPECT_EQ(dictionaryOf(record), (Dictionary{{"book-info", Dictionary{}}}));
}

TEST_P(ABookInfoSetter, ReplacesABookInfoThatIsNoDictionary) {
    for (const Value& value : valuesOfEveryKind()) {
        if (value.typeID() == TypeID::Dictionary)
            continue;
        const MutableAssetPtr record = recordOver({{"book-info", value}});

        ((*record).*GetParam().set)("text");

        EXPECT_EQ(dictionaryOf(record),
                  (Dictionary{{"book-info", Dictionary{{GetParam().key, "text"}}}}));
    }
}

TEST_P(ABookInfoSetter, LeavesTheDictionaryThatTheRecordWasMadeOverAlone) {
    const Dictionary dictionary{{"book-info", Dictionary{{GetParam().key, "old"}}}};
    const Dictionary before = dictionary;

    ((*recordOver(dictionary)).*GetParam().set)("new");

    EXPECT_EQ(dictionary, before);
}

// Deliberate: the asset ID that is set is kept as the package hash.
INSTANTIATE_TEST_SUITE_P(KeyTable, ABookInfoSetter,
                         ::testing::Values(TextSetter{"setPackageHash", "package-file-hash",
                                                      &PVMutableAssetMetadata::setPackageHash},
                                           TextSetter{"setCoverImagePath", "cover-image-path",
                                                      &PVMutableAssetMetadata::setCoverImagePath},
                                           TextSetter{"setMimeType", "mime-type",
                                                      &PVMutableAssetMetadata::setMimeType},
                                           TextSetter{"setAssetID", "package-file-hash",
                                                      &PVMutableAssetMetadata::setAssetID}),
                         setterName<TextSetter>);

TEST(PVMutableAssetMetadata, SetsThePackageHashAsAssetIDAndNeitherOfTheIDs) {
    const MutableAssetPtr record = recordOver({{"itemId", "5"}, {"PVGeneratedItemId", "G"}});

    record->setAssetID("HASH");

    EXPECT_EQ(valueOf(record->packageHash()), Value("HASH"));
    EXPECT_EQ(valueOf(record->storeID()), Value("5"));
    EXPECT_EQ(valueOf(record->generatedID()), Value("G"));
    EXPECT_EQ(record->assetID(), "5");
}

// Booleans.

struct BooleanSetter {
    const char* name;
    const char* key;
    void (PVMutableAssetMetadata::*set)(bool);
};

class ABooleanSetter : public ::testing::TestWithParam<BooleanSetter> {
protected:
    static std::optional<Number> stored(bool boolean) {
        const MutableAssetPtr record = recordOver({{GetParam().key, "old"}});
        ((*record).*GetParam().set)(boolean);
        const Value* value = dictionaryOf(record).find(GetParam().key);
        const Number* number = value ? value->as<Number>() : nullptr;
        return number ? std::optional<Number>(*number) : std::nullopt;
    }
};

TEST_P(ABooleanSetter, StoresTrueAsABoolean) {
    const std::optional<Number> number = stored(true);
    ASSERT_TRUE(number);
    EXPECT_EQ(number->kind(), Number::Kind::Boolean);
    EXPECT_TRUE(number->boolValue());
}

TEST_P(ABooleanSetter, StoresFalseAsABooleanAndDoesNotRemove) {
    const std::optional<Number> number = stored(false);
    ASSERT_TRUE(number);
    EXPECT_EQ(number->kind(), Number::Kind::Boolean);
    EXPECT_FALSE(number->boolValue());
}

INSTANTIATE_TEST_SUITE_P(
    KeyTable, ABooleanSetter,
    ::testing::Values(
        BooleanSetter{"setPreview", "isPreview", &PVMutableAssetMetadata::setPreview},
        BooleanSetter{"setHasPendingUpdates", "PVHasPendingUpdate",
                      &PVMutableAssetMetadata::setHasPendingUpdates},
        BooleanSetter{"setWasRedacted", "PVWasRedacted", &PVMutableAssetMetadata::setWasRedacted},
        BooleanSetter{"setLocked", "PVIsLocked", &PVMutableAssetMetadata::setLocked},
        BooleanSetter{"setExplicit", "explicit", &PVMutableAssetMetadata::setExplicit}),
    setterName<BooleanSetter>);

// Numbers.

struct UnsignedSetter {
    const char* name;
    const char* key;
    void (PVMutableAssetMetadata::*set)(std::uint64_t);
};

class AnUnsignedSetter : public ::testing::TestWithParam<UnsignedSetter> {};

TEST_P(AnUnsignedSetter, StoresANumberUnderItsKey) {
    for (const std::uint64_t number :
         {std::uint64_t{0}, std::uint64_t{42}, std::numeric_limits<std::uint64_t>::max()}) {
        const MutableAssetPtr record = recordOver({{GetParam().key, "old"}});

        ((*record).*GetParam().set)(number);

        EXPECT_EQ(dictionaryOf(record),
                  (Dictionary{{GetParam().key, Number::unsignedInteger(number)}}));
    }
}

INSTANTIATE_TEST_SUITE_P(
    KeyTable, AnUnsignedSetter,
    ::testing::Values(UnsignedSetter{"setGenerationCount", "PVGenerationCount",
                                     &PVMutableAssetMetadata::setGenerationCount},
                      UnsignedSetter{"setPageCount", "pageCount",
                                     &PVMutableAssetMetadata::setPageCount},
                      UnsignedSetter{"setAllocatedSize", "PVAllocatedSize",
                                     &PVMutableAssetMetadata::setAllocatedSize}),
    setterName<UnsignedSetter>);

TEST(PVMutableAssetMetadata, StoresTheShareThatIsCompleteAsAReal) {
    const MutableAssetPtr record = emptyRecord();

    record->setPercentComplete(1);

    const Value* share = dictionaryOf(record).find("PVPercentComplete");
    ASSERT_TRUE(share && share->as<Number>());
    EXPECT_EQ(share->as<Number>()->kind(), Number::Kind::Real);
    EXPECT_EQ(share->as<Number>()->doubleValue(), 1.0);
}

TEST(PVMutableAssetMetadata, StoresTheRatingAndRemovesIt) {
    const MutableAssetPtr record = emptyRecord();

    record->setRating(Number::real(4.5));
    EXPECT_EQ(dictionaryOf(record), (Dictionary{{"rating", realValue(4.5)}}));

    record->setRating(std::nullopt);
    EXPECT_TRUE(dictionaryOf(record).empty());
}

// Dates.

struct DateSetter {
    const char* name;
    const char* key;
    void (PVMutableAssetMetadata::*set)(std::optional<Date>);
};

class ADateSetter : public ::testing::TestWithParam<DateSetter> {};

TEST_P(ADateSetter, StoresADateUnderItsKey) {
    const MutableAssetPtr record = emptyRecord();

    ((*record).*GetParam().set)(Date{86400.5});

    EXPECT_EQ(dictionaryOf(record), (Dictionary{{GetParam().key, Date{86400.5}}}));
}

TEST_P(ADateSetter, RemovesItsKeyForNone) {
    const MutableAssetPtr record = recordOver({{GetParam().key, Date{1}}});

    ((*record).*GetParam().set)(std::nullopt);

    EXPECT_TRUE(dictionaryOf(record).empty());
}

// Deliberate: the first opening is read back as the purchase date.
INSTANTIATE_TEST_SUITE_P(
    KeyTable, ADateSetter,
    ::testing::Values(
        DateSetter{"setUpdateDate", "updateDate", &PVMutableAssetMetadata::setUpdateDate},
        DateSetter{"setModificationDate", "modificationDate",
                   &PVMutableAssetMetadata::setModificationDate},
        DateSetter{"setReleaseDate", "releaseDate", &PVMutableAssetMetadata::setReleaseDate},
        DateSetter{"setLastOpened", "PVLastOpenedDate", &PVMutableAssetMetadata::setLastOpened},
        DateSetter{"setFirstOpened", "PVFirstOpenedDate", &PVMutableAssetMetadata::setFirstOpened}),
    setterName<DateSetter>);

TEST(PVMutableAssetMetadata, ReadsTheFirstOpeningBackAsThePurchaseDate) {
    const MutableAssetPtr record = emptyRecord();

    record->setFirstOpened(Date{7});

    EXPECT_EQ(record->purchaseDate(), Date{7});
    EXPECT_EQ(record->lastOpenDate(), std::nullopt);
}

struct InsertionRow {
    const char* name;
    double date;
    std::int64_t stored;
};

class AnInsertionDate : public ::testing::TestWithParam<InsertionRow> {};

TEST_P(AnInsertionDate, IsStoredAsWholeSecondsCutTowardZero) {
    const MutableAssetPtr record = emptyRecord();

    record->setInsertionDate(Date{GetParam().date});

    const Value* seconds = dictionaryOf(record).find("PVInsertionDate");
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
    setterName<InsertionRow>);

TEST(PVMutableAssetMetadata, RemovesTheInsertionDate) {
    const MutableAssetPtr record = recordOver({{"PVInsertionDate", integerValue(5)}});

    record->setInsertionDate(std::nullopt);

    EXPECT_TRUE(dictionaryOf(record).empty());
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

    EXPECT_EQ(dictionaryOf(record), (Dictionary{{GetParam().key, "/Books/A b\xFF.EPUB"}}));
}

TEST_P(APathSetter, RemovesItsKeyForNone) {
    const MutableAssetPtr record = recordOver({{GetParam().key, "/a"}});

    ((*record).*GetParam().set)(std::nullopt);

    EXPECT_TRUE(dictionaryOf(record).empty());
}

INSTANTIATE_TEST_SUITE_P(KeyTable, APathSetter,
                         ::testing::Values(PathSetter{"setSourceURL", "sourcePath",
                                                      &PVMutableAssetMetadata::setSourceURL},
                                           PathSetter{"setPreviousURL", "PVItemPreviousPath",
                                                      &PVMutableAssetMetadata::setPreviousURL},
                                           PathSetter{"setTrashedURL", "trashedPath",
                                                      &PVMutableAssetMetadata::setTrashedURL}),
                         setterName<PathSetter>);

TEST(PVMutableAssetMetadata, StoresTheURLsPathWithItsExtensionInLowerCase) {
    const MutableAssetPtr record = emptyRecord();

    record->setUrl(URL::fileURLWithPath("/LIB.EPUB/BOOK.EPUB"));

    EXPECT_EQ(dictionaryOf(record), (Dictionary{{"path", "/LIB.EPUB/BOOK.epub"}}));
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
    EXPECT_TRUE(dictionaryOf(record).empty());
}

TEST(PVMutableAssetMetadata, StoresThePermlinksText) {
    const MutableAssetPtr record = emptyRecord();

    record->setPermlink(URL::fromString("https://example.org/A?b=c%20d"));
    EXPECT_EQ(dictionaryOf(record),
              (Dictionary{{"BazaarU Permlink", "https://example.org/A?b=c%20d"}}));

    record->setPermlink(std::nullopt);
    EXPECT_TRUE(dictionaryOf(record).empty());
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
    setterName<StoreIDRow>);

TEST(PVMutableAssetMetadata, RemovesTheStoreID) {
    const MutableAssetPtr record = recordOver({{"itemId", "5"}});

    record->setStoreID(nullptr);

    EXPECT_TRUE(dictionaryOf(record).empty());
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

    EXPECT_EQ(dictionaryOf(record), (Dictionary{{"PVUploadErrorDomain", "PVPOSIXErrorDomain"},
                                                {"PVUploadErrorCode", integerValue(5)}}));
    EXPECT_EQ(record->uploadError(), Error("PVPOSIXErrorDomain", 5));
}

TEST(PVMutableAssetMetadata, RemovesBothKeysOfTheUploadError) {
    const MutableAssetPtr record = recordOver(
        {{"PVUploadErrorDomain", "D"}, {"PVUploadErrorCode", integerValue(5)}, {"genre", "g"}});

    record->setUploadError(std::nullopt);

    EXPECT_EQ(dictionaryOf(record), (Dictionary{{"genre", "g"}}));
}

// The cover image.

TEST(PVMutableAssetMetadata, StoresTheCoverImageAndRemovesIt) {
    const MutableAssetPtr record = emptyRecord();
    const Data image = Data::copyOf(std::string_view("image"));

    record->setCoverImageData(&image);
    EXPECT_EQ(dictionaryOf(record), (Dictionary{{"PVCoverImageData", image}}));

    record->setCoverImageData(nullptr);
    EXPECT_TRUE(dictionaryOf(record).empty());
}

TEST(PVMutableAssetMetadata, StoresTheMarkOfAReplacedCoverOfAnyKind) {
    for (const Value& value : valuesOfEveryKind()) {
        const MutableAssetPtr record = emptyRecord();
        record->setCoverImageDataReplaced(&value);
        EXPECT_EQ(dictionaryOf(record), (Dictionary{{"PVCoverImageDataReplaced", value}}));
    }
}

TEST(PVMutableAssetMetadata, RemovesTheMarkOfAReplacedCover) {
    const MutableAssetPtr record = recordOver({{"PVCoverImageDataReplaced", booleanValue(true)}});

    record->setCoverImageDataReplaced(nullptr);

    EXPECT_TRUE(dictionaryOf(record).empty());
}

// Deliberate: thumbnails are not kept.
TEST(PVMutableAssetMetadata, KeepsNoThumbnail) {
    const MutableAssetPtr record = recordOver({{"genre", "g"}});
    const Data image = Data::copyOf(std::string_view("image"));

    record->setThumbnail(&image);
    record->setThumbnail(nullptr);

    EXPECT_EQ(dictionaryOf(record), (Dictionary{{"genre", "g"}}));
}

// Combining.

TEST(CombinedRecord, TakesTheArgumentsEntriesAndKeepsItsOthers) {
    const MutableAssetPtr record = recordOver({{"genre", "mine"}, {"year", "1900"}});

    record->combineWithMetadata(recordOver({{"genre", "theirs"}, {"comments", "c"}}).get());

    EXPECT_EQ(dictionaryOf(record),
              (Dictionary{{"genre", "theirs"}, {"year", "1900"}, {"comments", "c"}}));
}

TEST(CombinedRecord, ReplacesNestedDictionariesWhole) {
    const MutableAssetPtr record = recordOver({{"book-info", Dictionary{{"mime-type", "m"}}}});

    record->combineWithMetadata(
        recordOver({{"book-info", Dictionary{{"cover-image-path", "c"}}}}).get());

    EXPECT_EQ(dictionaryOf(record),
              (Dictionary{{"book-info", Dictionary{{"cover-image-path", "c"}}}}));
}

TEST(CombinedRecord, StaysForNull) {
    const MutableAssetPtr record = recordOver({{"genre", "g"}});

    record->combineWithMetadata(nullptr);

    EXPECT_EQ(dictionaryOf(record), (Dictionary{{"genre", "g"}}));
}

TEST(CombinedRecord, StaysWhenCombinedWithItself) {
    const MutableAssetPtr record = recordOver({{"genre", "g"}, {"year", "1900"}});

    record->combineWithMetadata(record.get());

    EXPECT_EQ(dictionaryOf(record), (Dictionary{{"genre", "g"}, {"year", "1900"}}));
}

TEST(CombinedRecord, LeavesTheArgumentAlone) {
    const MutableAssetPtr other = recordOver({{"genre", "theirs"}});

    recordOver({{"genre", "mine"}, {"year", "1900"}})->combineWithMetadata(other.get());

    EXPECT_EQ(dictionaryOf(other), (Dictionary{{"genre", "theirs"}}));
}

TEST(CombinedRecord, KeepsItsURLAndItsKind) {
    const MutableAssetPtr record = emptyRecord();
    record->setUrl(URL::fileURLWithPath("/a.pdf"));
    ASSERT_EQ(record->assetType(), PVAssetTypePDF);

    record->combineWithMetadata(recordOver({{"path", "/b.epub"}}).get());

    EXPECT_EQ(record->url(), URL::fileURLWithPath("/a.pdf"));
    EXPECT_EQ(record->assetType(), PVAssetTypePDF);
    EXPECT_EQ(valueOf(dictionaryOf(record).find("path")), Value("/b.epub"));
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
