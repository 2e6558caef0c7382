#include <gtest/gtest.h>

#include "parvel/metadata/PVAssetMetadata.h"
#include "tests/support/Records.h"

namespace parvel::testing {
namespace {

template <class Row>
std::string checkedRowName(const ::testing::TestParamInfo<Row>& info) {
    return info.param.name;
}

struct CheckedText {
    const char* name;
    std::string_view key;
    std::optional<String> (PVAssetMetadata::*get)() const;
};

class ACheckedText : public ::testing::TestWithParam<CheckedText> {
protected:
    static std::optional<String> read(const Value& value) {
        return ((*recordOver({{String(GetParam().key), value}})).*GetParam().get)();
    }
};

TEST_P(ACheckedText, IsNoneWhenAbsent) {
    EXPECT_EQ(((*emptyRecord()).*GetParam().get)(), std::nullopt);
}

TEST_P(ACheckedText, IsTheStoredText) {
    EXPECT_EQ(read("Some text"), "Some text");
    EXPECT_EQ(read(""), "");
}

TEST_P(ACheckedText, IsNoneForAnyOtherKind) {
    for (const Value& value : valuesOfEveryKind()) {
        if (value.typeID() != TypeID::String) {
            EXPECT_EQ(read(value), std::nullopt);
        }
    }
}

INSTANTIATE_TEST_SUITE_P(
    KeyTable, ACheckedText,
    ::testing::Values(CheckedText{"title", "itemName", &PVAssetMetadata::title},
                      CheckedText{"sortTitle", "sort-name", &PVAssetMetadata::sortTitle},
                      CheckedText{"author", "artistName", &PVAssetMetadata::author},
                      CheckedText{"sortAuthor", "sort-artist", &PVAssetMetadata::sortAuthor},
                      CheckedText{"comments", "comments", &PVAssetMetadata::comments},
                      CheckedText{"bookDescription", "bookDescription",
                                  &PVAssetMetadata::bookDescription},
                      CheckedText{"year", "year", &PVAssetMetadata::year}),
    checkedRowName<CheckedText>);

struct CheckedDate {
    const char* name;
    std::string_view key;
    std::optional<Date> (PVAssetMetadata::*get)() const;
};

class ACheckedDate : public ::testing::TestWithParam<CheckedDate> {
protected:
    static std::optional<Date> read(const Value& value) {
        return ((*recordOver({{String(GetParam().key), value}})).*GetParam().get)();
    }
};

TEST_P(ACheckedDate, IsNoneWhenAbsent) {
    EXPECT_EQ(((*emptyRecord()).*GetParam().get)(), std::nullopt);
}

TEST_P(ACheckedDate, IsTheStoredDate) {
    EXPECT_EQ(read(Date{86400.5}), Date{86400.5});
}

TEST_P(ACheckedDate, IsNoneForAnyOtherKind) {
    for (const Value& value : valuesOfEveryKind()) {
        if (value.typeID() != TypeID::Date) {
            EXPECT_EQ(read(value), std::nullopt);
        }
    }
}

// Deliberate: the purchase date is kept under the key of the first opening.
INSTANTIATE_TEST_SUITE_P(KeyTable, ACheckedDate,
                         ::testing::Values(CheckedDate{"lastOpenDate", "PVLastOpenedDate",
                                                       &PVAssetMetadata::lastOpenDate},
                                           CheckedDate{"purchaseDate", "PVFirstOpenedDate",
                                                       &PVAssetMetadata::purchaseDate}),
                         checkedRowName<CheckedDate>);

TEST(PVAssetMetadata, HasNoRatingWhenAbsent) {
    EXPECT_EQ(emptyRecord()->rating(), std::nullopt);
}

TEST(PVAssetMetadata, GivesTheStoredRating) {
    EXPECT_EQ(recordOver({{"rating", integerValue(4)}})->rating(), Number::signedInteger(4));
    EXPECT_EQ(recordOver({{"rating", booleanValue(true)}})->rating(), Number::boolean(true));
}

TEST(PVAssetMetadata, HasNoRatingWhereItIsNoNumber) {
    for (const Value& value : valuesOfEveryKind()) {
        if (value.typeID() != TypeID::Number) {
            EXPECT_EQ(recordOver({{"rating", value}})->rating(), std::nullopt);
        }
    }
}

}  // namespace
}  // namespace parvel::testing
