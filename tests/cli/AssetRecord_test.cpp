#include <gtest/gtest.h>

#include "cli/AssetRecord.h"
#include "parvel/foundation/PVCasts.h"
#include "parvel/metadata/PVAssetMetadataKeys.h"
#include "tests/support/EpubBuilder.h"
#include "tests/support/TemporaryDirectory.h"

namespace parvel::testing {
namespace {

using cli::AssetRecord;
using cli::CommandLine;
using cli::Result;
using cli::Uninspectable;
using cli::UsageError;

/// The record choice after the command line was read.
AssetRecord chosen(Uninspectable uninspectable, const std::vector<std::string>& words = {}) {
    AssetRecord record(uninspectable);
    CommandLine line("parvel try", "PATH...", "Tries.");
    line.group("Options");
    record.declare(line);
    line.parse(words);
    record.read();
    return record;
}

TEST(AssetRecord, IsWhatInspectingGives) {
    const TemporaryDirectory folder;
    EpubBuilder{}.opf(opfText("<dc:title>T</dc:title>")).zip(folder / "a.epub");
    Result result = cli::resultForPath(folder / "a.epub");

    const AssetPtr record = chosen(Uninspectable::Fails).forResult(result);

    ASSERT_TRUE(record);
    EXPECT_EQ(record->title(), "T");
    EXPECT_EQ(result.error, std::nullopt);
}

TEST(AssetRecord, FailsWithTheInspectionsErrorAndReason) {
    const TemporaryDirectory folder;
    folder.write("a.epub", "no zip archive");
    Result result = cli::resultForPath(folder / "a.epub");

    EXPECT_FALSE(chosen(Uninspectable::Fails).forResult(result));

    ASSERT_TRUE(result.error);
    EXPECT_EQ(result.error->domain(), PVFileErrorDomain);
    EXPECT_EQ(result.reason, "the file is no zip archive, or a damaged one");
}

TEST(AssetRecord, OfAFileThatCanNotBeInspectedIsItsURLAlone) {
    const TemporaryDirectory folder;
    Result result = cli::resultForPath(folder / "absent.epub");

    const AssetPtr record = chosen(Uninspectable::HasItsURLAlone).forResult(result);

    ASSERT_TRUE(record);
    EXPECT_EQ(record->url(), folder.url("absent.epub"));
    EXPECT_EQ(record->assetID(), std::nullopt);
    EXPECT_EQ(result.error, std::nullopt);
    EXPECT_EQ(result.reason, "");
}

TEST(AssetRecord, ComesOutOfTheFileWithThePathAsItsURL) {
    const TemporaryDirectory folder;
    const std::string file =
        folder.write("record.json", R"({"itemName": "R", "itemId": 7, "path": "/elsewhere"})");
    EpubBuilder{}.opf(opfText("<dc:title>T</dc:title>")).zip(folder / "a.epub");
    Result result = cli::resultForPath(folder / "a.epub");

    const AssetPtr record = chosen(Uninspectable::Fails, {"--record", file}).forResult(result);

    ASSERT_TRUE(record);
    EXPECT_EQ(record->title(), "R");
    EXPECT_EQ(record->assetID(), "7");
    EXPECT_EQ(record->url(), folder.url("a.epub"));
    EXPECT_EQ(*record->dictionaryRepresentation()->find(key::path), folder / "a.epub");
}

TEST(AssetRecord, RefusesAFileWithoutARecord) {
    const TemporaryDirectory folder;
    const std::string file = folder.write("record.json", "[]");

    EXPECT_THROW(chosen(Uninspectable::Fails, {"--record", file}), UsageError);
}

}  // namespace
}  // namespace parvel::testing
