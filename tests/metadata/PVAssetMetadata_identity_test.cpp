#include <gtest/gtest.h>

#include "parvel/metadata/PVAssetMetadata.h"
#include "tests/support/Records.h"

namespace parvel::testing {
namespace {

struct IdentityRow {
    const char* name;
    Dictionary dictionary;
    Dictionary other;
    bool matches;
};

std::string identityRowName(const ::testing::TestParamInfo<IdentityRow>& info) {
    return info.param.name;
}

// Without a key.

class AnIdentity : public ::testing::TestWithParam<IdentityRow> {};

TEST_P(AnIdentity, MatchesOrNot) {
    EXPECT_EQ(PVAssetMetadata::identityOfDictionary_matchesDictionary_key(GetParam().dictionary,
                                                                          GetParam().other),
              GetParam().matches);
}

TEST_P(AnIdentity, MatchesOrNotTheOtherWayRound) {
    EXPECT_EQ(PVAssetMetadata::identityOfDictionary_matchesDictionary_key(GetParam().other,
                                                                          GetParam().dictionary),
              GetParam().matches);
}

INSTANTIATE_TEST_SUITE_P(
    GeneratedID, AnIdentity,
    ::testing::Values(
        IdentityRow{"Equal", {{"PVGeneratedItemId", "G"}}, {{"PVGeneratedItemId", "G"}}, true},
        IdentityRow{"Different", {{"PVGeneratedItemId", "G"}}, {{"PVGeneratedItemId", "g"}}, false},
        IdentityRow{"Empty", {{"PVGeneratedItemId", ""}}, {{"PVGeneratedItemId", ""}}, false},
        IdentityRow{"OnOneSide", {{"PVGeneratedItemId", "G"}}, {}, false},
        IdentityRow{"Numbers",
                    {{"PVGeneratedItemId", integerValue(5)}},
                    {{"PVGeneratedItemId", integerValue(5)}},
                    false},
        IdentityRow{"NullMarkers",
                    {{"PVGeneratedItemId", Value()}},
                    {{"PVGeneratedItemId", Value()}},
                    false},
        IdentityRow{"DecidesBesideOtherStoreIDAndPath",
                    {{"PVGeneratedItemId", "G"}, {"itemId", "1"}, {"path", "/a.epub"}},
                    {{"PVGeneratedItemId", "G"}, {"itemId", "2"}, {"path", "/b.epub"}},
                    true}),
    identityRowName);

INSTANTIATE_TEST_SUITE_P(
    StoreID, AnIdentity,
    ::testing::Values(
        IdentityRow{"EqualTexts", {{"itemId", "77"}}, {{"itemId", "77"}}, true},
        IdentityRow{"NumberAndText", {{"itemId", integerValue(77)}}, {{"itemId", "77"}}, true},
        IdentityRow{"Numbers", {{"itemId", integerValue(77)}}, {{"itemId", realValue(77)}}, true},
        IdentityRow{"Different", {{"itemId", "77"}}, {{"itemId", "78"}}, false},
        IdentityRow{"OtherTextOfTheSameNumber", {{"itemId", "77"}}, {{"itemId", "077"}}, false},
        IdentityRow{"Zeros", {{"itemId", integerValue(0)}}, {{"itemId", integerValue(0)}}, false},
        IdentityRow{"TextsOfZero", {{"itemId", "0"}}, {{"itemId", "0"}}, false},
        IdentityRow{"Negative", {{"itemId", "-5"}}, {{"itemId", "-5"}}, false},
        IdentityRow{"NoDigits", {{"itemId", "abc"}}, {{"itemId", "abc"}}, false},
        IdentityRow{"Empty", {{"itemId", ""}}, {{"itemId", ""}}, false},
        IdentityRow{"LeadingDigits", {{"itemId", "4 stars"}}, {{"itemId", "4 stars"}}, true},
        IdentityRow{"Arrays", {{"itemId", Array{"1"}}}, {{"itemId", Array{"1"}}}, false},
        IdentityRow{"NullMarkers", {{"itemId", Value()}}, {{"itemId", Value()}}, false},
        // Deliberate: generated IDs that differ decide nothing.
        IdentityRow{"BesideOtherGeneratedIDs",
                    {{"itemId", "77"}, {"PVGeneratedItemId", "G"}},
                    {{"itemId", "77"}, {"PVGeneratedItemId", "H"}},
                    true}),
    identityRowName);

INSTANTIATE_TEST_SUITE_P(
    Path, AnIdentity,
    ::testing::Values(
        IdentityRow{"Equal", {{"path", "/x.epub"}}, {{"path", "/x.epub"}}, true},
        IdentityRow{"ExtensionsOfOtherCase", {{"path", "/x.EPUB"}}, {{"path", "/x.epub"}}, true},
        IdentityRow{"NamesOfOtherCase", {{"path", "/X.epub"}}, {{"path", "/x.epub"}}, false},
        IdentityRow{"Different", {{"path", "/x.epub"}}, {{"path", "/y.epub"}}, false},
        IdentityRow{"Empty", {{"path", ""}}, {{"path", ""}}, false},
        IdentityRow{"Numbers", {{"path", integerValue(5)}}, {{"path", integerValue(5)}}, false},
        IdentityRow{"NullMarkers", {{"path", Value()}}, {{"path", Value()}}, false},
        IdentityRow{"AFolderWithItsSlash", {{"path", "/x.epub/"}}, {{"path", "/x.EPUB"}}, true},
        IdentityRow{"InvalidBytes", {{"path", "/\xFF.epub"}}, {{"path", "/\xFF.epub"}}, true},
        IdentityRow{"BesideOtherIDs",
                    {{"itemId", "1"}, {"PVGeneratedItemId", "G"}, {"path", "/x.epub"}},
                    {{"itemId", "2"}, {"PVGeneratedItemId", "H"}, {"path", "/x.epub"}},
                    true}),
    identityRowName);

INSTANTIATE_TEST_SUITE_P(
    NoIdentity, AnIdentity,
    ::testing::Values(IdentityRow{"EmptyDictionaries", {}, {}, false},
                      IdentityRow{"OtherKeys", {{"genre", "g"}}, {{"genre", "g"}}, false}),
    identityRowName);

// With a key.

struct KeyedIdentityRow {
    const char* name;
    std::string_view key;
    std::optional<Value> value;
    std::optional<Value> other;
    bool matches;
};

class AKeyedIdentity : public ::testing::TestWithParam<KeyedIdentityRow> {
protected:
    static Dictionary dictionaryOf(const std::optional<Value>& value) {
        Dictionary dictionary;
        if (value)
            dictionary.set(GetParam().key, *value);
        return dictionary;
    }
};

TEST_P(AKeyedIdentity, MatchesOrNot) {
    EXPECT_EQ(PVAssetMetadata::identityOfDictionary_matchesDictionary_key(
                  dictionaryOf(GetParam().value), dictionaryOf(GetParam().other), GetParam().key),
              GetParam().matches);
}

INSTANTIATE_TEST_SUITE_P(
    Keys, AKeyedIdentity,
    ::testing::Values(
        KeyedIdentityRow{"NumberAndTextOfAStoreID", "itemId", integerValue(77), "77", true},
        KeyedIdentityRow{"StoreIDsOfZero", "itemId", integerValue(0), integerValue(0), false},
        KeyedIdentityRow{"StoreIDsWithoutDigits", "itemId", "abc", "abc", false},
        KeyedIdentityRow{"StoreIDsThatAreArrays", "itemId", Array{"1"}, Array{"1"}, false},
        KeyedIdentityRow{"AbsentStoreIDs", "itemId", std::nullopt, std::nullopt, false},
        KeyedIdentityRow{"AnAbsentSecondStoreID", "itemId", "77", std::nullopt, false},
        KeyedIdentityRow{"PathsWithExtensionsOfOtherCase", "path", "/x.EPUB", "/x.epub", true},
        KeyedIdentityRow{"PathsOfOtherCase", "path", "/X.epub", "/x.epub", false},
        KeyedIdentityRow{"PathsThatAreNoText", "path", integerValue(5), integerValue(5), true},
        KeyedIdentityRow{"OtherPathsThatAreNoText", "path", integerValue(5), integerValue(6),
                         false},
        KeyedIdentityRow{"AbsentPaths", "path", std::nullopt, std::nullopt, false},
        // With a key, an empty text is a value like any other.
        KeyedIdentityRow{"EmptyPaths", "path", "", "", true},
        KeyedIdentityRow{"GeneratedIDs", "PVGeneratedItemId", "G", "G", true},
        KeyedIdentityRow{"EmptyGeneratedIDs", "PVGeneratedItemId", "", "", true},
        KeyedIdentityRow{"OtherGeneratedIDs", "PVGeneratedItemId", "G", "H", false},
        KeyedIdentityRow{"AnyOtherKey", "genre", "g", "g", true},
        KeyedIdentityRow{"AnyOtherKeyWithOtherValues", "genre", "g", "G", false},
        KeyedIdentityRow{"AnyOtherKeyWithEqualNumbers", "rating", integerValue(1),
                         booleanValue(true), true},
        KeyedIdentityRow{"AnyOtherKeyAbsent", "genre", std::nullopt, std::nullopt, false},
        KeyedIdentityRow{"AnyOtherKeyAbsentFirst", "genre", std::nullopt, "g", false}),
    [](const auto& row) { return row.param.name; });

TEST(KeyedIdentity, LooksAtNoOtherKey) {
    EXPECT_FALSE(PVAssetMetadata::identityOfDictionary_matchesDictionary_key(
        {{"itemId", "1"}, {"path", "/x.epub"}}, {{"itemId", "2"}, {"path", "/x.epub"}}, "itemId"));
}

// Of records.

TEST(RecordsIdentity, MatchesThroughTheStoreIDOfADifferentKind) {
    EXPECT_TRUE(recordOver({{"itemId", integerValue(77)}})
                    ->hasMatchingIdentity(*recordOver({{"itemId", "77"}})));
}

TEST(RecordsIdentity, MatchesThroughTheExplicitURL) {
    const MutableAssetPtr record = recordOver({{"path", "/old.epub"}});
    record->setBackingURL(URL::fileURLWithPath("/X.EPUB"));

    EXPECT_TRUE(record->hasMatchingIdentity(*recordOver({{"path", "/X.epub"}})));
    EXPECT_FALSE(record->hasMatchingIdentity(*recordOver({{"path", "/old.epub"}})));
}

TEST(RecordsIdentity, MatchesNothingWithoutIDAndPath) {
    const MutableAssetPtr record = recordOver({{"genre", "g"}});

    EXPECT_FALSE(record->hasMatchingIdentity(*record));
}

}  // namespace
}  // namespace parvel::testing
