#include <gtest/gtest.h>

#include "tests/support/ManagedFolder.h"
#include "tests/support/RecordedLog.h"

namespace parvel::testing {
namespace {

using Lines = std::vector<std::string>;

class TakingAway : public ManagedFolder {
protected:
    void SetUp() override { setenv("XDG_DATA_HOME", (m_folder / "data").c_str(), 1); }
    void TearDown() override { unsetenv("XDG_DATA_HOME"); }

    [[nodiscard]] URL inTrash(const std::string& name) const {
        return m_folder.url("data/Trash/files/" + name);
    }
};

TEST_F(TakingAway, ATrashedAssetGetsItsDisplayNameInTheTrash) {
    const auto book = asset("a.epub");
    book->setDisplayName("My Book.epub");
    RecordedLog log;

    const AssetPtr trashed = m_manager->trashAsset_error(book, &m_error);

    ASSERT_TRUE(trashed);
    EXPECT_EQ(trashed->trashedURL(), inTrash("My Book.epub"));
    EXPECT_EQ(names("data/Trash/files"), Names{"My Book.epub"});
    EXPECT_EQ(names("data/Trash/info"), Names{"My Book.epub.trashinfo"});
    EXPECT_EQ(log.lines(), (Lines{"debug trashAsset: start",
                                  "debug trashAsset: renamed asset in trash directory",
                                  "debug trashAsset: Success"}));
    EXPECT_FALSE(m_error);
}

TEST_F(TakingAway, ADisplayNameWithoutExtensionKeepsTheTrashsOwnName) {
    const auto book = asset("a.epub");
    book->setDisplayName("My Book");
    RecordedLog log;

    const AssetPtr trashed = m_manager->trashAsset_error(book, &m_error);

    ASSERT_TRUE(trashed);
    EXPECT_EQ(trashed->trashedURL(), inTrash("a.epub"));
    EXPECT_EQ(names("data/Trash/files"), Names{"a.epub"});
    EXPECT_EQ(log.lines(), (Lines{"debug trashAsset: start",
                                  "error trashAsset: Failed to rename file in trash directory",
                                  "debug trashAsset: Success"}));
    EXPECT_FALSE(m_error);
}

TEST_F(TakingAway, ADisplayNameThatIsTheTrashsOwnNameIsAFailedRename) {
    const auto book = asset("a.epub");
    RecordedLog log;

    const AssetPtr trashed = m_manager->trashAsset_error(book, &m_error);

    ASSERT_TRUE(trashed);
    EXPECT_EQ(trashed->trashedURL(), inTrash("a.epub"));
    EXPECT_EQ(names("data/Trash/info"), Names{"a.epub.trashinfo"});
    EXPECT_EQ(log.lines()[1], "error trashAsset: Failed to rename file in trash directory");
}

TEST_F(TakingAway, ARecordWithoutDisplayNameKeepsTheTrashsOwnName) {
    const auto book = asset("a.epub");
    book->setDisplayName(std::nullopt);
    RecordedLog log;

    const AssetPtr trashed = m_manager->trashAsset_error(book, &m_error);

    ASSERT_TRUE(trashed);
    EXPECT_EQ(trashed->trashedURL(), inTrash("a.epub"));
    EXPECT_EQ(log.lines(), (Lines{"debug trashAsset: start", "debug trashAsset: Success"}));
}

TEST_F(TakingAway, ADisplayNameThatIsAPathMovesNothingOutOfTheTrash) {
    makeFolder("outside");
    for (const char* name : {"../../../outside/x.epub", "/outside/x.epub", "..", ".",
                             "a/../../../../outside/x.epub"}) {
        const auto book = asset("a.epub");
        book->setDisplayName(name);

        const AssetPtr trashed = m_manager->trashAsset_error(book, &m_error);

        ASSERT_TRUE(trashed) << name;
        EXPECT_EQ(trashed->trashedURL()->deletingLastPathComponent(),
                  m_folder.url("data/Trash/files"));
    }
    EXPECT_EQ(names("outside"), Names{});
}

TEST_F(TakingAway, ADisplayNameDoesNotMoveTheAssetIntoAnotherTrashedItem) {
    makeFolder("data/Trash/files/My Book");
    const auto book = asset("a.epub");
    book->setDisplayName("My Book");

    const AssetPtr trashed = m_manager->trashAsset_error(book, &m_error);

    ASSERT_TRUE(trashed);
    EXPECT_EQ(trashed->trashedURL(), inTrash("a.epub"));
    EXPECT_EQ(names("data/Trash/files/My Book"), Names{});
}

TEST_F(TakingAway, AnEmptyDisplayNameKeepsTheTrashsOwnName) {
    const auto book = asset("a.epub");
    book->setDisplayName("");

    const AssetPtr trashed = m_manager->trashAsset_error(book, &m_error);

    ASSERT_TRUE(trashed);
    EXPECT_EQ(trashed->trashedURL(), inTrash("a.epub"));
}

TEST_F(TakingAway, AMissingAssetCanNotBeTrashed) {
    const auto book = PVAssetMetadata::metadataWithURL_dictionary(m_folder.url("a.epub"), nullptr);
    RecordedLog log;

    EXPECT_FALSE(m_manager->trashAsset_error(book, &m_error));

    EXPECT_EQ(m_error, makeFileError(PVFileErrorCode::NoSuchFile, m_folder.url("a.epub")));
    EXPECT_EQ(log.lines(), (Lines{"debug trashAsset: start",
                                  "error trashAsset: Fail: " + logText(m_folder.url("a.epub")) +
                                      " error: " + logText(*m_error)}));
}

TEST_F(TakingAway, AFailedTrashingLogsItsErrorAlsoWhereNobodyAsked) {
    const auto book = PVAssetMetadata::metadataWithURL_dictionary(m_folder.url("a.epub"), nullptr);
    RecordedLog log;

    EXPECT_FALSE(m_manager->trashAsset_error(book));

    EXPECT_NE(log.lines()[1].find("Code=4"), std::string::npos);
}

TEST_F(TakingAway, ABookThatIsNotDownloadedIsNotTrashed) {
    makeFolder(".stfolder");
    m_folder.write("a.epub.nextcloud", " ");
    const auto book = PVAssetMetadata::metadataWithURL_dictionary(m_folder.url("a.epub"), nullptr);

    EXPECT_FALSE(m_manager->trashAsset_error(book, &m_error));

    EXPECT_EQ(m_error, makePOSIXError(ETIMEDOUT, m_folder.url("a.epub")));
    EXPECT_EQ(names(), (Names{".stfolder", "a.epub.nextcloud"}));
}

TEST_F(TakingAway, ARemovedAssetIsGone) {
    const auto book = asset("a.epub/OPS/x");
    const auto package =
        PVAssetMetadata::metadataWithURL_dictionary(m_folder.url("a.epub"), nullptr);
    RecordedLog log;

    EXPECT_TRUE(m_manager->removeAsset_error(package, &m_error));

    EXPECT_EQ(names(), Names{});
    EXPECT_EQ(log.lines(),
              (Lines{"default removeAsset: start {asset: 1} " + logText(m_folder.url("a.epub")),
                     "debug removeAsset: Success"}));
}

TEST_F(TakingAway, RemovingAMissingAssetIsThePlatformsError) {
    const auto book = PVAssetMetadata::metadataWithURL_dictionary(m_folder.url("a.epub"), nullptr);
    RecordedLog log;

    EXPECT_FALSE(m_manager->removeAsset_error(book, &m_error));

    EXPECT_EQ(m_error, makeFileError(PVFileErrorCode::NoSuchFile, m_folder.url("a.epub")));
    EXPECT_EQ(log.lines()[1], "error removeAsset: Failed: " + logText(m_folder.url("a.epub")) +
                                  " error: " + logText(*m_error));
}

TEST_F(TakingAway, RemovingNoRecordLogsThatNoneWasGiven) {
    RecordedLog log;

    EXPECT_FALSE(m_manager->removeAsset_error(nullptr, &m_error));

    EXPECT_EQ(log.lines()[0], "default removeAsset: start {asset: 0} (null)");
}

TEST_F(TakingAway, AnAssetThatIsNotDownloadedIsRemovedByItsPlaceholder) {
    makeFolder(".stfolder");
    m_folder.write("a.epub.nextcloud", " ");
    const auto book = PVAssetMetadata::metadataWithURL_dictionary(m_folder.url("a.epub"), nullptr);

    EXPECT_TRUE(m_manager->removeAsset_error(book, &m_error));

    EXPECT_EQ(names(), Names{".stfolder"});
}

TEST_F(TakingAway, NothingNamedLikeAPlaceholderIsRemovedOutsideOfSynchronisedFolders) {
    m_folder.write("a.epub.nextcloud", " ");
    m_folder.write("b.epub.nextcloud/kept", "kept");
    for (const char* name : {"a.epub", "b.epub"}) {
        const auto book = PVAssetMetadata::metadataWithURL_dictionary(m_folder.url(name), nullptr);

        EXPECT_FALSE(m_manager->removeAsset_error(book, &m_error));

        EXPECT_EQ(m_error, makeFileError(PVFileErrorCode::NoSuchFile, m_folder.url(name)));
    }
    EXPECT_EQ(names(), (Names{"a.epub.nextcloud", "b.epub.nextcloud"}));
    EXPECT_EQ(m_folder.read("b.epub.nextcloud/kept"), "kept");
}

TEST_F(TakingAway, ARedactedAssetIsMovedAside) {
    const URL aside = makeFolder("aside");
    const auto book = asset("a.epub");
    RecordedLog log;

    const AssetPtr redacted = m_manager->redactAsset_intoDirectory_error(book, aside, &m_error);

    ASSERT_TRUE(redacted);
    EXPECT_TRUE(redacted->wasRedacted());
    EXPECT_EQ(redacted->url(), m_folder.url("aside/a.epub"));
    EXPECT_EQ(names("aside"), Names{"a.epub"});
    EXPECT_EQ(log.lines(),
              (Lines{"default redactAsset: start asset: " + logText(m_folder.url("a.epub")) +
                         ", directory: " + logText(aside),
                     "debug redactAsset: Did perform redact move -- Success"}));
}

TEST_F(TakingAway, ARedactionDoesNotReplace) {
    const URL aside = makeFolder("aside");
    m_folder.write("aside/a.epub", "2");
    const auto book = asset("a.epub");
    RecordedLog log;

    EXPECT_FALSE(m_manager->redactAsset_intoDirectory_error(book, aside, &m_error));

    EXPECT_EQ(m_error, makeFileError(PVFileErrorCode::FileExists, m_folder.url("aside/a.epub")));
    EXPECT_EQ(m_folder.read("aside/a.epub"), "2");
    EXPECT_EQ(log.lines()[1], "error redactAsset: Failed redact asset: " +
                                  logText(m_folder.url("a.epub")) + " error: " + logText(*m_error));
}

TEST_F(TakingAway, RedactingNoAssetLeavesTheError) {
    RecordedLog log;

    EXPECT_FALSE(
        m_manager->redactAsset_intoDirectory_error(nullptr, makeFolder("aside"), &m_error));

    EXPECT_FALSE(m_error);
    EXPECT_EQ(log.lines()[1], "error redactAsset: Failed redact asset: (null) error: (null)");
}

}  // namespace
}  // namespace parvel::testing
