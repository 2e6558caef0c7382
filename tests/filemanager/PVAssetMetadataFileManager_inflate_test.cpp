#include <gtest/gtest.h>

#include "tests/support/EditedLibrary.h"
#include "tests/support/RecordedLog.h"

namespace parvel::testing {
namespace {

using Lines = std::vector<std::string>;

class InflatingAssets : public EditedLibrary {
protected:
    AssetPtr inflate(const AssetPtr& inflated) {
        return m_manager->inflateAsset_temporaryDirectory_error(inflated, m_folder.url("temporary"),
                                                                &m_error);
    }
};

TEST_F(InflatingAssets, ThePackageTakesThePlaceOfTheZipFile) {
    const AssetPtr book = zippedBook();
    ASSERT_TRUE(book);
    RecordedLog log;

    const AssetPtr inflated = inflate(book);

    ASSERT_TRUE(inflated);
    EXPECT_EQ(inflated->url(), m_folder.url("library/a.epub"));
    EXPECT_TRUE(isFolder("library/a.epub"));
    EXPECT_EQ(names("library/a.epub"), (Names{"META-INF", "OPS", "mimetype"}));
    EXPECT_EQ(names("temporary"), Names{});
    EXPECT_EQ(log.lines().front(),
              "default inflateMetadata: start {asset: 1, temporaryDirectory: 1");
    EXPECT_FALSE(m_error);
}

TEST_F(InflatingAssets, TheBookOfTheSourceURLIsExpandedUnderItsOwnName) {
    const AssetPtr book = zippedBook();
    ASSERT_TRUE(book);
    const std::string zip = m_folder.read("library/a.epub");
    const URL imported = EpubBuilder{}.file("imported", "x").zip(m_folder / "imported.epub");
    const AssetPtr elsewhere =
        book->copyWithUpdates([&](PVMutableAssetMetadata& copy) { copy.setSourceURL(imported); });

    const AssetPtr inflated = inflate(elsewhere);

    ASSERT_TRUE(inflated);
    EXPECT_EQ(inflated->url(), m_folder.url("library/imported.epub"));
    EXPECT_EQ(names("library"), (Names{"a.epub", "imported.epub"}));
    EXPECT_EQ(m_folder.read("library/a.epub"), zip);
    EXPECT_EQ(m_folder.read("library/imported.epub/imported"), "x");
    EXPECT_TRUE(std::filesystem::is_regular_file(m_folder / "imported.epub"));
}

TEST_F(InflatingAssets, ABookWhoseSourceIsGoneStays) {
    const AssetPtr book = zippedBook();
    ASSERT_TRUE(book);
    const std::string zip = m_folder.read("library/a.epub");
    const AssetPtr elsewhere = book->copyWithUpdates(
        [&](PVMutableAssetMetadata& copy) { copy.setSourceURL(m_folder.url("gone.epub")); });

    EXPECT_FALSE(inflate(elsewhere));

    EXPECT_EQ(m_error, makeFileError(PVFileErrorCode::NoSuchFile, m_folder.url("gone.epub")));
    EXPECT_EQ(m_folder.read("library/a.epub"), zip);
    EXPECT_EQ(names("library"), Names{"a.epub"});
}

TEST_F(InflatingAssets, AnythingElseComesBackAsItIs) {
    const AssetPtr package = expandedBook();
    const auto document = pdf("library/a.pdf");
    const AssetPtr audiobook = asset("library/a.m4a");
    RecordedLog log;

    EXPECT_EQ(inflate(package), package);
    EXPECT_EQ(inflate(document), document);
    EXPECT_EQ(m_manager->inflateAsset_temporaryDirectory_error(audiobook, std::nullopt), audiobook);
    EXPECT_EQ(log.lines(),
              (Lines{"default inflateMetadata: start {asset: 1, temporaryDirectory: 1",
                     "default inflateMetadata: start {asset: 1, temporaryDirectory: 1",
                     "default inflateMetadata: start {asset: 1, temporaryDirectory: 0"}));
}

TEST_F(InflatingAssets, AMissingBookIsNoneWithoutAnError) {
    const auto book = PVAssetMetadata::metadataWithURL_dictionary(m_folder.url("a.epub"), nullptr);
    RecordedLog log;

    EXPECT_FALSE(inflate(book));

    EXPECT_FALSE(m_error);
    EXPECT_EQ(log.lines(), (Lines{"default inflateMetadata: start {asset: 1, temporaryDirectory: 1",
                                  "error Failed to get directory status",
                                  "error inflateMetadata: failed to get compressed status: " +
                                      m_folder.url("a.epub").absoluteString() + " error: (null)"}));
}

TEST_F(InflatingAssets, NoRecordIsNone) {
    RecordedLog log;

    EXPECT_FALSE(m_manager->inflateAsset_temporaryDirectory_error(nullptr, std::nullopt));

    EXPECT_EQ(log.lines(),
              (Lines{"default inflateMetadata: start {asset: 0, temporaryDirectory: 0",
                     "error inflateMetadata: failed to get compressed status: (null) error: "
                     "(null)"}));
}

TEST_F(InflatingAssets, ADamagedZipFileStays) {
    const auto book = asset("library/a.epub", "no zip file");

    EXPECT_FALSE(inflate(book));

    EXPECT_EQ(m_error, makePOSIXError(EBADMSG, m_folder.url("library/a.epub")));
    EXPECT_EQ(m_folder.read("library/a.epub"), "no zip file");
    EXPECT_EQ(names("temporary"), Names{});
}

TEST_F(InflatingAssets, WhatAnEarlierRunLeftInTheTemporaryDirectoryIsCleared) {
    const AssetPtr book = zippedBook();
    m_folder.write("temporary/a.epub/OPS/half.xhtml", "left over");

    ASSERT_TRUE(inflate(book));

    EXPECT_EQ(names("library/a.epub/OPS"), (Names{"content.opf", "text.xhtml"}));
}

TEST_F(InflatingAssets, WithoutATemporaryDirectoryTheZipFileIsDeleted) {
    const AssetPtr book = zippedBook();
    ASSERT_TRUE(book);

    EXPECT_FALSE(m_manager->inflateAsset_temporaryDirectory_error(book, std::nullopt, &m_error));

    EXPECT_EQ(m_error, makeFileError(PVFileErrorCode::NoSuchFile, m_folder.url("library/a.epub")));
    EXPECT_EQ(names("library"), Names{});
}

}  // namespace
}  // namespace parvel::testing
