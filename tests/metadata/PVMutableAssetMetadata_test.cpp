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

}  // namespace
}  // namespace parvel::testing
