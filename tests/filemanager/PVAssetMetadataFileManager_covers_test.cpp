#include <gtest/gtest.h>

#include "parvel/foundation/PVCasts.h"
#include "tests/support/ManagedFolder.h"
#include "tests/support/RecordedLog.h"
#include "tests/support/Records.h"
#include "tests/support/RefusingServices.h"

namespace parvel::testing {
namespace {

using Lines = std::vector<std::string>;
using Act = RefusingFileSystem::Act;

Value bytesValue(std::string_view text) {
    return Data::copyOf(text);
}

/// Books as package folders whose cover files are replaced.
class ReplacingCovers : public ManagedFolder {
protected:
    AssetPtr book() {
        return PVAssetMetadata::metadataWithURL_dictionary(makeFolder("a.epub"), nullptr);
    }
    AssetPtr bookWithCover(std::string_view cover) {
        m_folder.write("a.epub/BazaarArtwork", cover);
        return book();
    }
    AssetPtr update(const AssetPtr& updated, const Value& cover) {
        return m_manager->_updateImageCoverDataForMetadta_updates_error(
            updated, recordOver({{"PVCoverImageData", cover}}), &m_error);
    }
    void refuse(Act act, const std::string& name) {
        m_manager->setFileManager(
            std::make_shared<RefusingFileSystem>([act, name](Act asked, const URL& url) {
                return asked == act && url.lastPathComponent() == name;
            }));
    }
    [[nodiscard]] std::string coverFile() const { return m_folder.read("a.epub/BazaarArtwork"); }
    [[nodiscard]] std::string backupFile() const {
        return m_folder.read("a.epub/BazaarArtwork-original");
    }
    [[nodiscard]] URL coverURL() const { return m_folder.url("a.epub/BazaarArtwork"); }
    [[nodiscard]] URL backupURL() const { return m_folder.url("a.epub/BazaarArtwork-original"); }
};

TEST_F(ReplacingCovers, WithoutANewCoverTheRecordComesBack) {
    const AssetPtr asset = bookWithCover("old");
    RecordedLog log;

    EXPECT_EQ(m_manager->_updateImageCoverDataForMetadta_updates_error(
                  asset, recordOver({{"itemName", "T"}}), &m_error),
              asset);
    EXPECT_EQ(m_manager->_updateImageCoverDataForMetadta_updates_error(asset, nullptr), asset);
    EXPECT_EQ(
        log.lines(),
        (Lines{"debug ReplaceCover: start", "debug ReplaceCover: No cover to update -- Done",
               "debug ReplaceCover: start", "debug ReplaceCover: No cover to update -- Done"}));
    EXPECT_EQ(names("a.epub"), Names{"BazaarArtwork"});
}

TEST_F(ReplacingCovers, AValueThatIsNoImageIsNoNewCover) {
    const AssetPtr asset = bookWithCover("old");

    EXPECT_EQ(update(asset, "text"), asset);
    EXPECT_EQ(update(asset, integerValue(1)), asset);
    EXPECT_EQ(coverFile(), "old");
}

TEST_F(ReplacingCovers, ANewCoverReplacesTheFileAndTheOriginalIsKept) {
    const AssetPtr asset = bookWithCover("old");
    RecordedLog log;

    const AssetPtr updated = update(asset, bytesValue("new"));

    ASSERT_TRUE(updated);
    EXPECT_EQ(coverFile(), "new");
    EXPECT_EQ(backupFile(), "old");
    EXPECT_EQ(names("a.epub"), (Names{"BazaarArtwork", "BazaarArtwork-original"}));
    EXPECT_EQ(valueOf(updated->coverImageDataReplaced()), bytesValue("old"));
    EXPECT_EQ(log.lines(), (Lines{"debug ReplaceCover: start",
                                  "default ReplaceCover: Moved aside original book cover",
                                  "default ReplaceCover: Wrote new cover image -- Done"}));
    EXPECT_FALSE(m_error);
}

TEST_F(ReplacingCovers, TheReturnedRecordIsNotGivenTheNewCover) {
    const AssetPtr updated = update(bookWithCover("old"), bytesValue("new"));

    ASSERT_TRUE(updated);
    EXPECT_FALSE(updated->coverImageData());
}

TEST_F(ReplacingCovers, AFirstCoverReplacesTheNullMarker) {
    const AssetPtr asset = book();
    RecordedLog log;

    const AssetPtr updated = update(asset, bytesValue("new"));

    ASSERT_TRUE(updated);
    EXPECT_EQ(coverFile(), "new");
    EXPECT_EQ(valueOf(updated->coverImageDataReplaced()), Value());
    EXPECT_EQ(log.lines(),
              (Lines{"debug ReplaceCover: start",
                     "error ReplaceCover: Failed to move aside the original BazaarArtwork: " +
                         coverURL().absoluteString() + " error: " +
                         logText(makeFileError(PVFileErrorCode::NoSuchFile, coverURL())),
                     "default ReplaceCover: Wrote new cover image -- Done"}));
}

TEST_F(ReplacingCovers, WhatIsPassedOverStaysOutOfTheCallersError) {
    ASSERT_TRUE(update(book(), bytesValue("new")));
    EXPECT_FALSE(m_error);
}

TEST_F(ReplacingCovers, ACoverThatCanNotBeMovedAsideIsReplacedAllTheSame) {
    const AssetPtr asset = bookWithCover("old");
    refuse(Act::Move, "BazaarArtwork");

    const AssetPtr updated = update(asset, bytesValue("new"));

    ASSERT_TRUE(updated);
    EXPECT_FALSE(m_error);
    EXPECT_EQ(valueOf(updated->coverImageDataReplaced()), bytesValue("old"));
    EXPECT_EQ(coverFile(), "new");
    EXPECT_EQ(names("a.epub"), Names{"BazaarArtwork"});
}

TEST_F(ReplacingCovers, AFailedWritesErrorIsPassedOut) {
    const AssetPtr asset = book();
    const RefusingFileWriter writer;

    EXPECT_FALSE(update(asset, bytesValue("new")));

    EXPECT_EQ(m_error, makePOSIXError(EIO, coverURL()));
}

TEST_F(ReplacingCovers, WithoutAPlaceForTheErrorTheMovesAsideIsLoggedAllTheSame) {
    const AssetPtr asset = book();
    RecordedLog log;

    EXPECT_TRUE(m_manager->_updateImageCoverDataForMetadta_updates_error(
        asset, recordOver({{"PVCoverImageData", bytesValue("new")}})));

    ASSERT_EQ(log.lines().size(), 3U);
    EXPECT_TRUE(log.lines()[1].ends_with(
        " error: " + logText(makeFileError(PVFileErrorCode::NoSuchFile, coverURL()))));
}

TEST_F(ReplacingCovers, ASecondCoverKeepsTheFirstOriginal) {
    AssetPtr asset = bookWithCover("first");
    ASSERT_TRUE(asset = update(asset, bytesValue("second")));
    RecordedLog log;

    const AssetPtr updated = update(asset, bytesValue("third"));

    ASSERT_TRUE(updated);
    EXPECT_EQ(coverFile(), "third");
    EXPECT_EQ(backupFile(), "first");
    EXPECT_EQ(valueOf(updated->coverImageDataReplaced()), bytesValue("second"));
    ASSERT_EQ(log.lines().size(), 3U);
    EXPECT_EQ(log.lines()[1],
              "error ReplaceCover: Failed to move aside the original BazaarArtwork: " +
                  coverURL().absoluteString() +
                  " error: " + logText(makeFileError(PVFileErrorCode::FileExists, backupURL())));
    EXPECT_FALSE(m_error);
}

TEST_F(ReplacingCovers, AnEmptyCoverIsNone) {
    const AssetPtr asset = bookWithCover("old");

    EXPECT_FALSE(update(asset, Data()));
    EXPECT_FALSE(m_error);
    EXPECT_EQ(names("a.epub"), Names{"BazaarArtwork"});
    EXPECT_EQ(coverFile(), "old");
}

TEST_F(ReplacingCovers, AFailedWriteLeavesTheOriginalMovedAside) {
    const AssetPtr asset = bookWithCover("old");
    const RefusingFileWriter writer;
    RecordedLog log;

    EXPECT_FALSE(update(asset, bytesValue("new")));

    EXPECT_EQ(m_error, makePOSIXError(EIO, coverURL()));
    EXPECT_EQ(names("a.epub"), Names{"BazaarArtwork-original"});
    EXPECT_EQ(backupFile(), "old");
    EXPECT_EQ(log.lines().back(), "error ReplaceCover: Failed to write new cover image -- Fail");
}

TEST_F(ReplacingCovers, ACoverThatIsALinkIsMovedAsideUnread) {
    m_folder.write("secret", "secret");
    makeFolder("a.epub");
    std::filesystem::create_symlink("../secret", m_folder / "a.epub/BazaarArtwork");

    const AssetPtr updated = update(book(), bytesValue("new"));

    ASSERT_TRUE(updated);
    EXPECT_EQ(valueOf(updated->coverImageDataReplaced()), Value());
    EXPECT_EQ(m_folder.read("secret"), "secret");
    EXPECT_EQ(coverFile(), "new");
    EXPECT_FALSE(std::filesystem::is_symlink(m_folder / "a.epub/BazaarArtwork"));
}

TEST_F(ReplacingCovers, RemovingTheCoverRestoresTheFirstOriginal) {
    AssetPtr asset = bookWithCover("first");
    ASSERT_TRUE(asset = update(asset, bytesValue("second")));
    ASSERT_TRUE(asset = update(asset, bytesValue("third")));
    RecordedLog log;

    const AssetPtr updated = update(asset, Value());

    ASSERT_TRUE(updated);
    EXPECT_EQ(coverFile(), "first");
    EXPECT_EQ(names("a.epub"), Names{"BazaarArtwork"});
    EXPECT_EQ(valueOf(updated->coverImageData()), bytesValue("first"));
    EXPECT_EQ(log.lines(),
              (Lines{"debug ReplaceCover: start",
                     "default ReplaceCover: udpates.coverImageData = null -- Removing existing "
                     "metadata",
                     "debug ReplaceCover: Restored existing URL -- Success"}));
    EXPECT_FALSE(m_error);
}

TEST_F(ReplacingCovers, RemovingAMissingCoverIsNoneAndLeavesTheBackup) {
    const AssetPtr asset = book();
    m_folder.write("a.epub/BazaarArtwork-original", "first");

    EXPECT_FALSE(update(asset, Value()));
    EXPECT_EQ(m_error, makeFileError(PVFileErrorCode::NoSuchFile, coverURL()));
    EXPECT_EQ(names("a.epub"), Names{"BazaarArtwork-original"});
}

TEST_F(ReplacingCovers, ARemovalThatFailsLeavesBothFiles) {
    const AssetPtr asset = bookWithCover("second");
    m_folder.write("a.epub/BazaarArtwork-original", "first");
    refuse(Act::Remove, "BazaarArtwork");

    EXPECT_FALSE(update(asset, Value()));
    EXPECT_EQ(m_error, makePOSIXError(EIO, coverURL()));
    EXPECT_EQ(coverFile(), "second");
    EXPECT_EQ(backupFile(), "first");
}

TEST_F(ReplacingCovers, WithoutABackupNoCoverIsLeftAndTheErrorTells) {
    const AssetPtr asset = bookWithCover("only");
    RecordedLog log;

    const AssetPtr updated = update(asset, Value());

    ASSERT_TRUE(updated);
    EXPECT_FALSE(updated->coverImageData());
    EXPECT_EQ(names("a.epub"), Names{});
    const Error error = makeFileError(PVFileErrorCode::NoSuchFile, backupURL());
    EXPECT_EQ(m_error, error);
    EXPECT_EQ(log.lines().back(),
              "error ReplaceCover: Could not restore original cover: " +
                  m_folder.url("a.epub/BazaarMetadata-original.plist").absoluteString() +
                  " error: " + logText(error));
}

TEST_F(ReplacingCovers, TheLineOfAFailedRestorationNamesTheStoreFilesBackup) {
    const AssetPtr asset = bookWithCover("second");
    m_folder.write("a.epub/BazaarArtwork-original", "first");
    refuse(Act::Move, "BazaarArtwork-original");
    RecordedLog log;

    ASSERT_TRUE(m_manager->_updateImageCoverDataForMetadta_updates_error(
        asset, recordOver({{"PVCoverImageData", Value()}})));

    EXPECT_EQ(log.lines().back(),
              "error ReplaceCover: Could not restore original cover: " +
                  m_folder.url("a.epub/BazaarMetadata-original.plist").absoluteString() +
                  " error: " + logText(makePOSIXError(EIO, backupURL())));
    EXPECT_EQ(names("a.epub"), Names{"BazaarArtwork-original"});
}

TEST_F(ReplacingCovers, AKindWithoutCoverFileIsOnlyGivenTheCover) {
    for (const char* name : {"a.pdf", "a.m4a"}) {
        const AssetPtr single = asset(name);
        RecordedLog log;

        const AssetPtr updated = update(single, bytesValue("new"));

        ASSERT_TRUE(updated);
        EXPECT_EQ(valueOf(updated->coverImageData()), bytesValue("new"));
        EXPECT_FALSE(updated->coverImageDataReplaced());
        EXPECT_EQ(log.lines(), Lines{"debug ReplaceCover: start"});
    }
    EXPECT_EQ(names(), (Names{"a.m4a", "a.pdf"}));
}

TEST_F(ReplacingCovers, AKindWithoutCoverFileIsGivenTheNullMarkerAsItIs) {
    const auto single = asset("a.pdf");
    const Data cover = Data::copyOf("old");
    single->setCoverImageData(&cover);

    const AssetPtr updated = update(single, Value());

    ASSERT_TRUE(updated);
    EXPECT_EQ(valueOf(updated->coverImageData()), Value());
}

TEST_F(ReplacingCovers, AKindWithoutCoverFileIsGivenAnEmptyCoverToo) {
    const AssetPtr updated = update(asset("a.pdf"), Data());

    ASSERT_TRUE(updated);
    EXPECT_EQ(valueOf(updated->coverImageData()), Value(Data()));
}

TEST_F(ReplacingCovers, NoRecordComesBackAsNone) {
    EXPECT_FALSE(update(nullptr, bytesValue("new")));
}

}  // namespace
}  // namespace parvel::testing
