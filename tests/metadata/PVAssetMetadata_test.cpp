#include "parvel/metadata/PVAssetMetadata.h"

#include <gtest/gtest.h>

#include "parvel/metadata/PVAssetMetadataKeys.h"
#include "tests/support/Records.h"

namespace parvel::testing {
namespace {

template <class Row>
std::string rowName(const ::testing::TestParamInfo<Row>& info) {
    return info.param.name;
}

// Values that are given as they are stored.

struct StoredProperty {
    const char* name;
    std::string_view key;
    const Value* (PVAssetMetadata::*get)() const;
};

class AStoredProperty : public ::testing::TestWithParam<StoredProperty> {
protected:
    static std::optional<Value> read(const PVAssetMetadata& record) {
        return valueOf((record.*GetParam().get)());
    }
};

TEST_P(AStoredProperty, IsNullWhenAbsent) {
    EXPECT_EQ(read(*emptyRecord()), std::nullopt);
}

TEST_P(AStoredProperty, IsTheValueUnderItsKeyWhateverItsKind) {
    for (const Value& value : valuesOfEveryKind())
        EXPECT_EQ(read(*recordOver({{String(GetParam().key), value}})), value);
}

INSTANTIATE_TEST_SUITE_P(
    KeyTable, AStoredProperty,
    ::testing::Values(
        StoredProperty{"generatedID", "PVGeneratedItemId", &PVAssetMetadata::generatedID},
        StoredProperty{"displayName", "PVDisplayName", &PVAssetMetadata::displayName},
        StoredProperty{"format", "PVBooksFormat", &PVAssetMetadata::format},
        StoredProperty{"producer", "PVBookProducer", &PVAssetMetadata::producer},
        StoredProperty{"storeID", "itemId", &PVAssetMetadata::storeID},
        StoredProperty{"artistName", "artistName", &PVAssetMetadata::artistName},
        StoredProperty{"itemName", "itemName", &PVAssetMetadata::itemName},
        StoredProperty{"versionNumber", "versionNumber", &PVAssetMetadata::versionNumber},
        StoredProperty{"desktopSupportLevel", "desktopSupportLevel",
                       &PVAssetMetadata::desktopSupportLevel},
        StoredProperty{"updateDate", "updateDate", &PVAssetMetadata::updateDate},
        StoredProperty{"modificationDate", "modificationDate", &PVAssetMetadata::modificationDate},
        StoredProperty{"releaseDate", "releaseDate", &PVAssetMetadata::releaseDate},
        StoredProperty{"genre", "genre", &PVAssetMetadata::genre},
        StoredProperty{"assetDescription", "bookDescription", &PVAssetMetadata::assetDescription},
        StoredProperty{"downloadInfo", "com.kestrel.BazaarStore.downloadInfo",
                       &PVAssetMetadata::downloadInfo},
        StoredProperty{"coverImageData", "PVCoverImageData", &PVAssetMetadata::coverImageData},
        StoredProperty{"coverImageDataReplaced", "PVCoverImageDataReplaced",
                       &PVAssetMetadata::coverImageDataReplaced}),
    rowName<StoredProperty>);

// Values inside "book-info".

class ABookInfoProperty : public AStoredProperty {};

TEST_P(ABookInfoProperty, IsNullWithoutBookInfo) {
    EXPECT_EQ(read(*emptyRecord()), std::nullopt);
}

TEST_P(ABookInfoProperty, IsNullWhenBookInfoLacksIt) {
    EXPECT_EQ(read(*recordOver({{"book-info", Dictionary{{"other", "x"}}}})), std::nullopt);
}

TEST_P(ABookInfoProperty, IsTheValueInBookInfoWhateverItsKind) {
    for (const Value& value : valuesOfEveryKind()) {
        const Dictionary bookInfo{{String(GetParam().key), value}};
        EXPECT_EQ(read(*recordOver({{"book-info", bookInfo}})), value);
    }
}

TEST_P(ABookInfoProperty, IsNullWhenBookInfoIsNoDictionary) {
    for (const Value& value : valuesOfEveryKind()) {
        if (value.typeID() != TypeID::Dictionary) {
            EXPECT_EQ(read(*recordOver({{"book-info", value}})), std::nullopt);
        }
    }
}

TEST_P(ABookInfoProperty, IsNotReadFromTheTopLevel) {
    EXPECT_EQ(read(*recordOver({{String(GetParam().key), "x"}})), std::nullopt);
}

INSTANTIATE_TEST_SUITE_P(KeyTable, ABookInfoProperty,
                         ::testing::Values(StoredProperty{"packageHash", "package-file-hash",
                                                          &PVAssetMetadata::packageHash},
                                           StoredProperty{"coverImagePath", "cover-image-path",
                                                          &PVAssetMetadata::coverImagePath},
                                           StoredProperty{"mimeType", "mime-type",
                                                          &PVAssetMetadata::mimeType}),
                         rowName<StoredProperty>);

// Booleans.

struct BooleanProperty {
    const char* name;
    std::string_view key;
    bool (PVAssetMetadata::*get)() const;
};

class ABooleanProperty : public ::testing::TestWithParam<BooleanProperty> {
protected:
    static bool read(const Value& value) {
        return ((*recordOver({{String(GetParam().key), value}})).*GetParam().get)();
    }
};

TEST_P(ABooleanProperty, IsFalseWhenAbsent) {
    EXPECT_FALSE(((*emptyRecord()).*GetParam().get)());
}

TEST_P(ABooleanProperty, IsTheStoredBoolean) {
    EXPECT_TRUE(read(booleanValue(true)));
    EXPECT_FALSE(read(booleanValue(false)));
}

TEST_P(ABooleanProperty, IsTrueForAnyNumberButZero) {
    EXPECT_TRUE(read(integerValue(-1)));
    EXPECT_TRUE(read(realValue(0.5)));
    EXPECT_FALSE(read(integerValue(0)));
}

TEST_P(ABooleanProperty, ReadsText) {
    EXPECT_TRUE(read("YES"));
    EXPECT_FALSE(read("no"));
}

TEST_P(ABooleanProperty, IsFalseForAnyOtherKind) {
    EXPECT_FALSE(read(Value()));
    EXPECT_FALSE(read(Date{1}));
    EXPECT_FALSE(read(Data::copyOf(std::string_view("1"))));
    EXPECT_FALSE(read(Array{booleanValue(true)}));
    EXPECT_FALSE(read(Dictionary{{"a", booleanValue(true)}}));
}

INSTANTIATE_TEST_SUITE_P(
    KeyTable, ABooleanProperty,
    ::testing::Values(BooleanProperty{"isPreview", "isPreview", &PVAssetMetadata::isPreview},
                      BooleanProperty{"hasPendingUpdates", "PVHasPendingUpdate",
                                      &PVAssetMetadata::hasPendingUpdates},
                      BooleanProperty{"wasRedacted", "PVWasRedacted",
                                      &PVAssetMetadata::wasRedacted},
                      BooleanProperty{"isLocked", "PVIsLocked", &PVAssetMetadata::isLocked},
                      BooleanProperty{"isExplicit", "explicit", &PVAssetMetadata::isExplicit},
                      BooleanProperty{"shouldDisableOptimizeSpeed", "shouldDisableOptimizeSpeed",
                                      &PVAssetMetadata::shouldDisableOptimizeSpeed},
                      BooleanProperty{"shouldDisableTouchEmulation", "shouldDisableTouchEmulation",
                                      &PVAssetMetadata::shouldDisableTouchEmulation}),
    rowName<BooleanProperty>);

// Unsigned numbers.

struct UnsignedProperty {
    const char* name;
    std::string_view key;
    std::uint64_t (PVAssetMetadata::*get)() const;
};

class AnUnsignedProperty : public ::testing::TestWithParam<UnsignedProperty> {
protected:
    static std::uint64_t read(const Value& value) {
        return ((*recordOver({{String(GetParam().key), value}})).*GetParam().get)();
    }
};

TEST_P(AnUnsignedProperty, IsZeroWhenAbsent) {
    EXPECT_EQ(((*emptyRecord()).*GetParam().get)(), 0u);
}

TEST_P(AnUnsignedProperty, IsTheStoredNumber) {
    EXPECT_EQ(read(integerValue(42)), 42u);
    EXPECT_EQ(read(Number::unsignedInteger(UINT64_MAX)), UINT64_MAX);
}

TEST_P(AnUnsignedProperty, WrapsANegativeNumber) {
    EXPECT_EQ(read(integerValue(-1)), UINT64_MAX);
}

TEST_P(AnUnsignedProperty, ReadsText) {
    EXPECT_EQ(read("12 pages"), 12u);
    EXPECT_EQ(read("many"), 0u);
}

TEST_P(AnUnsignedProperty, IsZeroForAnyOtherKind) {
    EXPECT_EQ(read(Value()), 0u);
    EXPECT_EQ(read(Date{5}), 0u);
    EXPECT_EQ(read(Array{integerValue(5)}), 0u);
}

INSTANTIATE_TEST_SUITE_P(KeyTable, AnUnsignedProperty,
                         ::testing::Values(UnsignedProperty{"generationCount", "PVGenerationCount",
                                                            &PVAssetMetadata::generationCount},
                                           UnsignedProperty{"pageCount", "pageCount",
                                                            &PVAssetMetadata::pageCount},
                                           UnsignedProperty{"allocatedSize", "PVAllocatedSize",
                                                            &PVAssetMetadata::allocatedSize}),
                         rowName<UnsignedProperty>);

TEST(PVAssetMetadata, TellsAnAllocatedSizeOfZeroFromNone) {
    EXPECT_TRUE(recordOver({{"PVAllocatedSize", integerValue(0)}})->_hasAllocatedSize());
    EXPECT_FALSE(emptyRecord()->_hasAllocatedSize());
}

// URLs.

struct URLProperty {
    const char* name;
    std::string_view key;
    std::optional<URL> (PVAssetMetadata::*get)() const;
};

class AURLProperty : public ::testing::TestWithParam<URLProperty> {
protected:
    static std::optional<URL> read(const Value& value) {
        return ((*recordOver({{String(GetParam().key), value}})).*GetParam().get)();
    }
};

TEST_P(AURLProperty, IsNoneWhenAbsent) {
    EXPECT_EQ(((*emptyRecord()).*GetParam().get)(), std::nullopt);
}

TEST_P(AURLProperty, IsTheFileURLOfThePathAsItStands) {
    EXPECT_EQ(read("/books/../A b.EPUB"), URL::fileURLWithPath("/books/../A b.EPUB"));
}

TEST_P(AURLProperty, KeepsThePathsBytesWhereTheyAreNoUTF8) {
    EXPECT_EQ(read("/books/\xFF.epub").value().path(), "/books/\xFF.epub");
}

TEST_P(AURLProperty, IsNoneForAnEmptyPath) {
    EXPECT_EQ(read(""), std::nullopt);
}

TEST_P(AURLProperty, IsNoneForAnyOtherKind) {
    for (const Value& value : valuesOfEveryKind()) {
        if (value.typeID() != TypeID::String) {
            EXPECT_EQ(read(value), std::nullopt);
        }
    }
}

INSTANTIATE_TEST_SUITE_P(
    KeyTable, AURLProperty,
    ::testing::Values(URLProperty{"url", "path", &PVAssetMetadata::url},
                      URLProperty{"sourceURL", "sourcePath", &PVAssetMetadata::sourceURL},
                      URLProperty{"previousURL", "PVItemPreviousPath",
                                  &PVAssetMetadata::previousURL},
                      URLProperty{"trashedURL", "trashedPath", &PVAssetMetadata::trashedURL}),
    rowName<URLProperty>);

TEST(PVAssetMetadata, PrefersTheExplicitURLToThePath) {
    const MutableAssetPtr record = recordOver({{"path", "/a.epub"}});

    record->setBackingURL(URL::fileURLWithPath("/b.epub"));

    EXPECT_EQ(record->url(), URL::fileURLWithPath("/b.epub"));
    EXPECT_EQ(valueOf(record->backingDictionary()->find("path")), Value("/a.epub"));
}

TEST(PVAssetMetadata, FallsBackToThePathWhenTheExplicitURLGoes) {
    const MutableAssetPtr record = recordOver({{"path", "/a.epub"}});
    record->setBackingURL(URL::fileURLWithPath("/b.epub"));

    record->setBackingURL(std::nullopt);

    EXPECT_EQ(record->url(), URL::fileURLWithPath("/a.epub"));
}

TEST(PVAssetMetadata, ParsesThePermlink) {
    const MutableAssetPtr record = recordOver({{"BazaarU Permlink", "https://example.org/b?id=1"}});

    EXPECT_EQ(record->permlink().value().absoluteString(), "https://example.org/b?id=1");
}

TEST(PVAssetMetadata, HasNoPermlinkForAnEmptyText) {
    EXPECT_EQ(recordOver({{"BazaarU Permlink", ""}})->permlink(), std::nullopt);
}

TEST(PVAssetMetadata, HasNoPermlinkForATextThatIsNoURL) {
    EXPECT_EQ(recordOver({{"BazaarU Permlink", "not a URL"}})->permlink(), std::nullopt);
}

TEST(PVAssetMetadata, HasNoPermlinkForAnyOtherKind) {
    for (const Value& value : valuesOfEveryKind())
        EXPECT_EQ(recordOver({{"BazaarU Permlink", value}})->permlink(), std::nullopt);
}

// The asset ID.

TEST(PVAssetMetadata, TakesTheStoreIDAsAssetIDWhereBothAreThere) {
    const MutableAssetPtr record = recordOver({{"itemId", "12345"}, {"PVGeneratedItemId", "G"}});

    EXPECT_EQ(record->assetID(), "12345");
}

TEST(PVAssetMetadata, TakesTheDecimalStringOfANumberAsAssetID) {
    EXPECT_EQ(recordOver({{"itemId", integerValue(77)}})->assetID(), "77");
    EXPECT_EQ(recordOver({{"itemId", realValue(1.5)}})->assetID(), "1.5");
}

TEST(PVAssetMetadata, TakesTheGeneratedIDAsAssetIDWithoutStoreID) {
    EXPECT_EQ(recordOver({{"PVGeneratedItemId", "G"}})->assetID(), "G");
}

TEST(PVAssetMetadata, TakesTheGeneratedIDAsAssetIDWhenTheStoreIDHasNoStringForm) {
    const MutableAssetPtr record =
        recordOver({{"itemId", Array{"12345"}}, {"PVGeneratedItemId", "G"}});

    EXPECT_EQ(record->assetID(), "G");
}

TEST(PVAssetMetadata, TakesAnEmptyStoreIDAsAssetID) {
    EXPECT_EQ(recordOver({{"itemId", ""}, {"PVGeneratedItemId", "G"}})->assetID(), "");
}

TEST(PVAssetMetadata, HasNoAssetIDWithoutIDs) {
    EXPECT_EQ(emptyRecord()->assetID(), std::nullopt);
}

TEST(PVAssetMetadata, HasNoAssetIDWhereTheGeneratedIDIsNoText) {
    EXPECT_EQ(recordOver({{"PVGeneratedItemId", integerValue(5)}})->assetID(), std::nullopt);
}

// The insertion date.

TEST(PVAssetMetadata, WasInsertedNowWhenNoDateIsStored) {
    const Date before = Date::now();
    const Date inserted = emptyRecord()->insertionDate();
    const Date after = Date::now();

    EXPECT_GE(inserted.secondsSinceReferenceDate, before.secondsSinceReferenceDate);
    EXPECT_LE(inserted.secondsSinceReferenceDate, after.secondsSinceReferenceDate);
}

TEST(PVAssetMetadata, ReadsTheInsertionDateAfreshWhenNoneIsStored) {
    const MutableAssetPtr record = emptyRecord();

    static_cast<void>(record->insertionDate());

    EXPECT_FALSE(record->backingDictionary()->contains("PVInsertionDate"));
}

TEST(PVAssetMetadata, WasInsertedAtTheReferenceDateForZero) {
    EXPECT_EQ(recordOver({{"PVInsertionDate", integerValue(0)}})->insertionDate(), Date{0});
}

TEST(PVAssetMetadata, WasInsertedAtTheStoredSeconds) {
    EXPECT_EQ(recordOver({{"PVInsertionDate", integerValue(-61)}})->insertionDate(), Date{-61});
    EXPECT_EQ(recordOver({{"PVInsertionDate", realValue(12.75)}})->insertionDate(), Date{12});
    EXPECT_EQ(recordOver({{"PVInsertionDate", realValue(2e15)}})->insertionDate(), Date{2e15});
    EXPECT_EQ(recordOver({{"PVInsertionDate", "500"}})->insertionDate(), Date{500});
}

TEST(PVAssetMetadata, WasInsertedAtTheReferenceDateForAKindThatIsNoNumber) {
    EXPECT_EQ(recordOver({{"PVInsertionDate", Array{}}})->insertionDate(), Date{0});
}

// The share that is complete.

TEST(PVAssetMetadata, IsNotAtAllCompleteWhenNoShareIsStored) {
    EXPECT_EQ(emptyRecord()->percentComplete(), 0.0);
}

TEST(PVAssetMetadata, ReadsTheShareThatIsComplete) {
    EXPECT_EQ(recordOver({{"PVPercentComplete", realValue(0.25)}})->percentComplete(), 0.25);
    EXPECT_EQ(recordOver({{"PVPercentComplete", integerValue(1)}})->percentComplete(), 1.0);
    EXPECT_EQ(recordOver({{"PVPercentComplete", "0.5"}})->percentComplete(), 0.5);
    EXPECT_EQ(recordOver({{"PVPercentComplete", Value()}})->percentComplete(), 0.0);
}

// The upload error.

TEST(PVAssetMetadata, ReadsTheUploadErrorWithoutUserInfo) {
    const MutableAssetPtr record =
        recordOver({{"PVUploadErrorDomain", "D"}, {"PVUploadErrorCode", integerValue(-5)}});

    EXPECT_EQ(record->uploadError(), Error("D", -5));
}

TEST(PVAssetMetadata, HasNoUploadErrorForCodeZero) {
    const MutableAssetPtr record =
        recordOver({{"PVUploadErrorDomain", "D"}, {"PVUploadErrorCode", integerValue(0)}});

    EXPECT_EQ(record->uploadError(), std::nullopt);
}

TEST(PVAssetMetadata, HasNoUploadErrorWithoutCode) {
    EXPECT_EQ(recordOver({{"PVUploadErrorDomain", "D"}})->uploadError(), std::nullopt);
}

TEST(PVAssetMetadata, HasNoUploadErrorWithoutDomain) {
    EXPECT_EQ(recordOver({{"PVUploadErrorCode", integerValue(3)}})->uploadError(), std::nullopt);
}

TEST(PVAssetMetadata, HasNoUploadErrorWhereTheDomainIsNoText) {
    for (const Value& value : valuesOfEveryKind()) {
        if (value.typeID() == TypeID::String)
            continue;
        const MutableAssetPtr record =
            recordOver({{"PVUploadErrorDomain", value}, {"PVUploadErrorCode", integerValue(3)}});
        EXPECT_EQ(record->uploadError(), std::nullopt);
    }
}

TEST(PVAssetMetadata, ReadsAnUploadErrorsCodeFromText) {
    const MutableAssetPtr record =
        recordOver({{"PVUploadErrorDomain", "D"}, {"PVUploadErrorCode", "17"}});

    EXPECT_EQ(record->uploadError(), Error("D", 17));
}

}  // namespace
}  // namespace parvel::testing
