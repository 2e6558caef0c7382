#include <gtest/gtest.h>

#include "tests/support/EnvironmentValue.h"
#include "tests/support/ManagedFolder.h"
#include "tests/support/RecordedLog.h"
#include "tests/support/RecordingFileSystem.h"
#include "tests/support/Records.h"

namespace parvel::testing {
namespace {

using Lines = std::vector<std::string>;

class Trashing : public ManagedFolder {
protected:
    AssetPtr trash(const AssetPtr& asset) { return m_manager->trashAsset_error(asset, &m_error); }
    /// The place that the record of the trashed asset names.
    std::optional<URL> placeOfTrashed(const AssetPtr& asset) {
        const AssetPtr trashed = trash(asset);
        return trashed ? trashed->trashedURL() : std::nullopt;
    }
    [[nodiscard]] URL inTrash(const std::string& name) const {
        return m_folder.url("data/Trash/files/" + name);
    }

    EnvironmentValue m_data{"XDG_DATA_HOME", m_folder / "data"};
};

TEST_F(Trashing, ATrashedAssetGetsItsDisplayNameInTheTrash) {
    const auto book = asset("a.epub");
    book->setDisplayName("My Book.epub");
    RecordedLog log;

    const AssetPtr trashed = trash(book);

    ASSERT_TRUE(trashed);
    EXPECT_EQ(trashed->trashedURL(), inTrash("My Book.epub"));
    EXPECT_EQ(trashed->url(), m_folder.url("a.epub"));
    EXPECT_FALSE(book->trashedURL());
    EXPECT_EQ(names("data/Trash/files"), Names{"My Book.epub"});
    EXPECT_EQ(names("data/Trash/info"), Names{"My Book.epub.trashinfo"});
    EXPECT_EQ(log.lines(), (Lines{"debug trashAsset: start",
                                  "debug trashAsset: renamed asset in trash directory",
                                  "debug trashAsset: Success"}));
    EXPECT_FALSE(m_error);
}

TEST_F(Trashing, ADisplayNameWithoutExtensionKeepsTheTrashsOwnName) {
    const auto book = asset("a.epub");
    book->setDisplayName("My Book");
    RecordedLog log;

    EXPECT_EQ(placeOfTrashed(book), inTrash("a.epub"));
    EXPECT_EQ(names("data/Trash/files"), Names{"a.epub"});
    EXPECT_EQ(log.lines(), (Lines{"debug trashAsset: start",
                                  "error trashAsset: Failed to rename file in trash directory",
                                  "debug trashAsset: Success"}));
    EXPECT_FALSE(m_error);
}

TEST_F(Trashing, TheGivenServiceIsAskedForTheTrashAndTheRename) {
    const auto service = std::make_shared<RecordingFileSystem>();
    m_manager->setFileManager(service);
    const auto book = asset("a.epub");
    book->setDisplayName("My Book.epub");

    EXPECT_TRUE(trash(book));

    EXPECT_EQ(service->calls,
              (Lines{"trash " + (m_folder / "a.epub"), "move " + inTrash("a.epub").path() + " to " +
                                                           inTrash("My Book.epub").path()}));
}

TEST_F(Trashing, AMissingExtensionIsJoinedAsAComponent) {
    const auto service = std::make_shared<RecordingFileSystem>();
    m_manager->setFileManager(service);
    const auto book = asset("a.epub");
    book->setDisplayName("My Book");

    EXPECT_TRUE(trash(book));

    ASSERT_EQ(service->calls.size(), 3U);
    EXPECT_EQ(service->calls[2],
              "move " + inTrash("a.epub").path() + " to " + inTrash("My Book/epub").path());
}

/// Makes the folder that a move leads into.
class ObligingService : public ForwardingFileSystemService {
public:
    ObligingService() : ForwardingFileSystemService(FileSystemService::makeDefault()) {}
    bool moveItem(const URL& source, const URL& destination, ErrorOut error) override {
        std::filesystem::create_directories(destination.deletingLastPathComponent().path());
        return ForwardingFileSystemService::moveItem(source, destination, error);
    }
};

TEST_F(Trashing, ARenameThatAServiceMakesPossibleGivesThePlace) {
    m_manager->setFileManager(std::make_shared<ObligingService>());
    const auto book = asset("a.epub");
    book->setDisplayName("My Book");
    RecordedLog log;

    EXPECT_EQ(placeOfTrashed(book), inTrash("My Book/epub"));
    EXPECT_EQ(log.lines()[1], "debug trashAsset: renamed asset in trash directory");
}

TEST_F(Trashing, AnItemWithoutExtensionTakesAPlainDisplayName) {
    const auto notes = asset("notes");
    notes->setDisplayName("My Notes");
    RecordedLog log;

    EXPECT_EQ(placeOfTrashed(notes), inTrash("My Notes"));
    EXPECT_EQ(names("data/Trash/files"), Names{"My Notes"});
    EXPECT_EQ(log.lines()[1], "debug trashAsset: renamed asset in trash directory");
}

TEST_F(Trashing, AnyExtensionOfTheDisplayNameWillDo) {
    const auto book = asset("a.epub");
    book->setDisplayName("Vol. 2");

    EXPECT_EQ(placeOfTrashed(book), inTrash("Vol. 2"));
}

TEST_F(Trashing, ANameThatIsTakenInTheTrashIsAFailedRename) {
    m_folder.write("data/Trash/files/My Book.epub", "other");
    const auto book = asset("a.epub", "mine");
    book->setDisplayName("My Book.epub");
    RecordedLog log;

    EXPECT_EQ(placeOfTrashed(book), inTrash("a.epub"));
    EXPECT_EQ(m_folder.read("data/Trash/files/My Book.epub"), "other");
    EXPECT_EQ(m_folder.read("data/Trash/files/a.epub"), "mine");
    EXPECT_EQ(log.lines(), (Lines{"debug trashAsset: start",
                                  "error trashAsset: Failed to rename file in trash directory",
                                  "debug trashAsset: Success"}));
}

TEST_F(Trashing, TheErrorStaysAsItWasWithAndWithoutARename) {
    m_error = makeNoIdentityError();
    for (const char* name : {"My Book.epub", "My Book"}) {
        const auto book = asset("a.epub");
        book->setDisplayName(name);

        EXPECT_TRUE(trash(book));

        EXPECT_EQ(m_error, makeNoIdentityError());
    }
}

TEST_F(Trashing, ADisplayNameThatIsNoTextIsNone) {
    asset("a.epub");
    const auto book =
        recordOver({{"path", m_folder / "a.epub"}, {"PVDisplayName", integerValue(7)}});
    RecordedLog log;

    EXPECT_EQ(placeOfTrashed(book), inTrash("a.epub"));
    EXPECT_EQ(log.lines().size(), 2U);
}

/// Trashes and does not tell where.
class SilentTrash : public ForwardingFileSystemService {
public:
    SilentTrash() : ForwardingFileSystemService(FileSystemService::makeDefault()) {}
    bool trashItem(const URL& item, std::optional<URL>*, ErrorOut error) override {
        return ForwardingFileSystemService::trashItem(item, nullptr, error);
    }
};

TEST_F(Trashing, AnItemWhosePlaceInTheTrashIsNotToldIsTrashedAllTheSame) {
    m_manager->setFileManager(std::make_shared<SilentTrash>());
    const auto book = asset("a.epub");
    RecordedLog log;

    const AssetPtr trashed = trash(book);

    ASSERT_TRUE(trashed);
    EXPECT_FALSE(trashed->trashedURL());
    EXPECT_EQ(log.lines(), (Lines{"debug trashAsset: start",
                                  "error trashAsset: Failed to rename file in trash directory",
                                  "debug trashAsset: Success"}));
}

TEST_F(Trashing, WhatNamesNoItemCanNotBeTrashed) {
    for (const AssetPtr& missing : {AssetPtr(), AssetPtr(emptyRecord())}) {
        m_error.reset();
        RecordedLog log;

        EXPECT_FALSE(trash(missing));

        EXPECT_EQ(m_error, makeMissingURLError());
        EXPECT_EQ(log.lines(),
                  (Lines{"debug trashAsset: start",
                         "error trashAsset: Fail: (null) error: " + logText(*m_error)}));
    }
}

TEST_F(Trashing, ADisplayNameThatIsTheTrashsOwnNameIsAFailedRename) {
    const auto book = asset("a.epub");
    RecordedLog log;

    EXPECT_EQ(placeOfTrashed(book), inTrash("a.epub"));
    EXPECT_EQ(names("data/Trash/info"), Names{"a.epub.trashinfo"});
    EXPECT_EQ(log.lines()[1], "error trashAsset: Failed to rename file in trash directory");
}

TEST_F(Trashing, ARecordWithoutDisplayNameKeepsTheTrashsOwnName) {
    const auto book = asset("a.epub");
    book->setDisplayName(std::nullopt);
    RecordedLog log;

    EXPECT_EQ(placeOfTrashed(book), inTrash("a.epub"));
    EXPECT_EQ(log.lines(), (Lines{"debug trashAsset: start", "debug trashAsset: Success"}));
}

TEST_F(Trashing, ADisplayNameThatIsAPathMovesNothingOutOfTheTrash) {
    makeFolder("outside");
    for (const char* name : {"../../../outside/x.epub", "/outside/x.epub", "..", ".",
                             "a/../../../../outside/x.epub"}) {
        const auto book = asset("a.epub");
        book->setDisplayName(name);

        const AssetPtr trashed = trash(book);

        ASSERT_TRUE(trashed) << name;
        EXPECT_EQ(trashed->trashedURL()->deletingLastPathComponent(),
                  m_folder.url("data/Trash/files"));
    }
    EXPECT_EQ(names("outside"), Names{});
}

TEST_F(Trashing, ADisplayNameDoesNotMoveTheAssetIntoAnotherTrashedItem) {
    makeFolder("data/Trash/files/My Book");
    const auto book = asset("a.epub");
    book->setDisplayName("My Book");

    EXPECT_EQ(placeOfTrashed(book), inTrash("a.epub"));
    EXPECT_EQ(names("data/Trash/files/My Book"), Names{});
}

TEST_F(Trashing, AnEmptyDisplayNameKeepsTheTrashsOwnName) {
    const auto book = asset("a.epub");
    book->setDisplayName("");

    EXPECT_EQ(placeOfTrashed(book), inTrash("a.epub"));
}

TEST_F(Trashing, AMissingAssetCanNotBeTrashed) {
    const auto book = PVAssetMetadata::metadataWithURL_dictionary(m_folder.url("a.epub"), nullptr);
    RecordedLog log;

    EXPECT_FALSE(trash(book));

    EXPECT_EQ(m_error, makeFileError(PVFileErrorCode::NoSuchFile, m_folder.url("a.epub")));
    EXPECT_EQ(log.lines(), (Lines{"debug trashAsset: start",
                                  "error trashAsset: Fail: " + logText(m_folder.url("a.epub")) +
                                      " error: " + logText(*m_error)}));
}

TEST_F(Trashing, AFailedTrashingLogsItsErrorAlsoWhereNobodyAsked) {
    const auto book = PVAssetMetadata::metadataWithURL_dictionary(m_folder.url("a.epub"), nullptr);
    RecordedLog log;

    EXPECT_FALSE(m_manager->trashAsset_error(book));

    EXPECT_NE(log.lines()[1].find("Code=4"), std::string::npos);
}

TEST_F(Trashing, ABookThatIsNotDownloadedIsNotTrashed) {
    makeFolder(".stfolder");
    m_folder.write("a.epub.nextcloud", " ");
    const auto book = PVAssetMetadata::metadataWithURL_dictionary(m_folder.url("a.epub"), nullptr);

    EXPECT_FALSE(trash(book));

    EXPECT_EQ(m_error, makePOSIXError(ETIMEDOUT, m_folder.url("a.epub")));
    EXPECT_EQ(names(), (Names{".stfolder", "a.epub.nextcloud"}));
}

}  // namespace
}  // namespace parvel::testing
