#include <gtest/gtest.h>

#include "cli/Reconciliation.h"
#include "parvel/metadata/PVAssetMetadataKeys.h"
#include "tests/support/Records.h"

namespace parvel::testing {
namespace {

using cli::MovedAsset;
using cli::movedAssets;
using cli::uninspectedURLs;

/// A record of a path and an identity under the key.
AssetPtr identified(const std::string& path, std::string_view identityKey, const Value& identity) {
    Dictionary dictionary{{std::string(key::path), path}};
    dictionary.set(identityKey, identity);
    return recordOver(dictionary);
}

AssetPtr generated(const std::string& path, const std::string& identity) {
    return identified(path, key::generatedID, identity);
}

using Pairs = std::vector<std::pair<std::string, std::string>>;

Pairs pathsOf(const std::vector<MovedAsset>& moved) {
    Pairs paths;
    for (const MovedAsset& each : moved)
        paths.emplace_back(each.orphan->url()->path(), each.missing->url()->path());
    return paths;
}

TEST(MovedAssets, AreOrphansWithAMissingAssetOfTheirGeneratedIdentity) {
    EXPECT_EQ(pathsOf(movedAssets({generated("/a", "1"), generated("/b", "2")},
                                  {generated("/c", "2"), generated("/d", "3")})),
              (Pairs{{"/b", "/c"}}));
}

TEST(MovedAssets, AreFoundByTheStoresIdentityOfEitherKind) {
    EXPECT_EQ(pathsOf(movedAssets({identified("/a", key::storeID, Number::signedInteger(77))},
                                  {identified("/b", key::storeID, "77")})),
              (Pairs{{"/a", "/b"}}));
}

TEST(MovedAssets, NeverAreThoseWhoseIdentitiesAreOfTwoKinds) {
    EXPECT_EQ(pathsOf(movedAssets({identified("/a", key::storeID, "77")}, {generated("/b", "77")})),
              Pairs());
}

TEST(MovedAssets, ArePairedOneToOneInTheirOrder) {
    EXPECT_EQ(
        pathsOf(movedAssets({generated("/a", "1"), generated("/b", "1"), generated("/c", "1")},
                            {generated("/d", "1"), generated("/e", "1")})),
        (Pairs{{"/a", "/d"}, {"/b", "/e"}}));
}

TEST(MovedAssets, NeverAreThoseWithoutIdentity) {
    EXPECT_EQ(pathsOf(movedAssets({recordOver({{"path", "/a"}}), emptyRecord()},
                                  {recordOver({{"path", "/b"}}), generated("/c", "")})),
              Pairs());
}

TEST(UninspectedURLs, AreThoseOfNoRecordAndNoMissingAsset) {
    const auto url = [](std::string_view path) { return URL::fileURLWithPath(path); };

    EXPECT_EQ(uninspectedURLs({url("/x/./a"), url("/b"), url("/c"), url("/d")},
                              {generated("/x/a", "1"), emptyRecord()}, {generated("/c", "2")}),
              (std::vector<URL>{url("/b"), url("/d")}));
}

}  // namespace
}  // namespace parvel::testing
