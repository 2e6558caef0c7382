#include "parvel/iotasks/PVInstallAssetMetadataIOTask.h"

#include <gtest/gtest.h>

#include "parvel/iotasks/PVCopyAssetMetadataIOTask.h"
#include "parvel/iotasks/PVCrateAssetMetadataIOTask.h"
#include "parvel/metadata/PVMutableAssetMetadata.h"
#include "tests/support/InstallFolder.h"

namespace parvel::testing {
namespace {

using Lines = std::vector<std::string>;

class Installing : public InstallFolder {};

TEST_F(Installing, ABooksTaskExpandsAndAnyOthersCopies) {
    for (const char* name : {"a.epub", "a.folium"})
        EXPECT_TRUE(std::dynamic_pointer_cast<PVCrateAssetMetadataIOTask>(
            m_manager->taskToInstallAsset(asset(name))->subtask()))
            << name;
    for (const char* name : {"a.pdf", "a.m4a", "a.txt"})
        EXPECT_TRUE(std::dynamic_pointer_cast<PVCopyAssetMetadataIOTask>(
            m_manager->taskToInstallAsset(asset(name))->subtask()))
            << name;
}

TEST_F(Installing, ATaskIsMadeForTheAssetAndTheManagerWithNoFlagSet) {
    const AssetPtr source = asset("a.epub");

    const auto task = m_manager->taskToInstallAsset(source);

    EXPECT_EQ(task->sourceMetadata(), source);
    EXPECT_EQ(task->manager(), m_manager);
    EXPECT_EQ(task->subtask()->sourceMetadata(), source);
    EXPECT_EQ(task->subtask()->manager(), m_manager);
    EXPECT_FALSE(task->temporaryDirectory());
    EXPECT_FALSE(task->updatingAsset());
    EXPECT_FALSE(task->replaceExisting());
    EXPECT_FALSE(task->renameIfCollision());
    EXPECT_FALSE(task->useAssetIDFileName());
    EXPECT_FALSE(task->makeUbiquitous());
    EXPECT_FALSE(task->shouldPlainCopy());
}

TEST_F(Installing, AZippedBookIsStagedStampedAndMovedIntoTheLibrary) {
    makeTask(zippedBook("Book.EPUB"), /*stages=*/true);

    const AssetPtr installed = execute();

    ASSERT_TRUE(installed);
    EXPECT_EQ(installed->url(), m_folder.url("library/Book.epub"));
    EXPECT_EQ(names("library"), Names{"Book.epub"});
    EXPECT_EQ(names("library/Book.epub"), (Names{"META-INF", "OPS", "mimetype"}));
    EXPECT_EQ(names("staging"), Names{});
    EXPECT_TRUE(installed->_hasAllocatedSize());
    EXPECT_GT(installed->allocatedSize(), 0U);
    EXPECT_EQ(installed->percentComplete(), 1.0);
    EXPECT_FALSE(m_error);
}

TEST_F(Installing, LogsItsStepsInTheirOrder) {
    makeTask(asset("a.pdf"), /*stages=*/true);
    RecordedLog log;

    ASSERT_TRUE(execute());

    const std::string staged = text("staging/a.pdf");
    ASSERT_GE(log.lines().size(), 4U);
    EXPECT_EQ(Lines(log.lines().begin(), log.lines().begin() + 4),
              (Lines{"default Install: start {targetDirectory: 1, temporaryDirectory: 1} "
                     "targetDirectory: " +
                         text("library") + " temporaryDirectory: " + text("staging"),
                     "default TemporaryDirectory: start {installDirectory: 1, "
                     "temporaryDirectory: 1}",
                     "debug TemporaryDiretory: Target URL available: " + staged,
                     "debug Copying to directory: " + text("staging")}));
    EXPECT_EQ(Lines(log.lines().end() - 2, log.lines().end()),
              (Lines{"debug Rename: Start",
                     "default Rename: Move without replacement. source: " + staged +
                         " target: " + text("library/a.pdf") + " error: (null)"}));
}

TEST_F(Installing, TheProgressHandlerIsHandedDown) {
    makeTask(asset("a.pdf"), /*stages=*/true);
    int calls = 0;
    m_task->setProgressHandler([&](const AssetPtr& record) {
        ++calls;
        EXPECT_GT(record->percentComplete(), 0);
    });

    ASSERT_TRUE(execute());

    EXPECT_EQ(calls, 1);
}

TEST_F(Installing, WithoutAHandlerTheSubtasksIsTakenAway) {
    makeTask(asset("a.pdf"), /*stages=*/true);
    m_task->subtask()->setProgressHandler([](const AssetPtr&) { FAIL(); });

    EXPECT_TRUE(execute());
}

TEST_F(Installing, WithoutACopyTheSourceItselfIsMoved) {
    makeTask(asset("a.pdf"), /*stages=*/false);
    m_task->setTemporaryDirectory(m_folder.url("staging"));

    const AssetPtr installed = execute();

    ASSERT_TRUE(installed);
    EXPECT_EQ(installed->url(), m_folder.url("library/a.pdf"));
    EXPECT_EQ(names("library"), Names{"a.pdf"});
    EXPECT_FALSE(names("").front() == "a.pdf");
    EXPECT_TRUE(installed->_hasAllocatedSize());
}

TEST_F(Installing, WithoutATemporaryDirectoryTheCopyIsMadeAtItsPlace) {
    makeTask(asset("a.pdf"), /*stages=*/false);
    m_task->setShouldPlainCopy(true);

    const AssetPtr installed = execute();

    ASSERT_TRUE(installed);
    EXPECT_EQ(installed->url(), m_folder.url("library/a.pdf"));
    EXPECT_EQ(m_folder.read("library/a.pdf"), "content");
    EXPECT_EQ(m_folder.read("a.pdf"), "content");
}

TEST_F(Installing, WithoutATemporaryDirectoryTheLibrarysNamesakeIsDeletedFirst) {
    m_folder.write("library/a.pdf", "another book");
    makeTask(asset("a.pdf"), /*stages=*/false);
    m_task->setShouldPlainCopy(true);
    RecordedLog log;

    EXPECT_TRUE(execute());

    EXPECT_EQ(m_folder.read("library/a.pdf"), "content");
    EXPECT_EQ(log.lines()[2], "default TemporaryDirectory: Deleted existig temporary file: " +
                                  text("library/a.pdf"));
}

TEST_F(Installing, WithoutATemporaryDirectoryASourceInTheLibraryIsDeletedItself) {
    makeTask(asset("library/a.pdf"), /*stages=*/false);
    m_task->setShouldPlainCopy(true);

    EXPECT_FALSE(execute());

    EXPECT_EQ(m_error, makeFileError(PVFileErrorCode::NoSuchFile, m_folder.url("library/a.pdf")));
    EXPECT_EQ(names("library"), Names{});
}

// The staging directory

TEST_F(Installing, TheStagingDirectoryIsTheTemporaryOneOrElseTheInstallDirectory) {
    makeTask(asset("a.pdf"), /*stages=*/false);
    EXPECT_EQ(stagingDirectory(), m_folder.url("library"));

    m_task->setTemporaryDirectory(m_folder.url("staging"));
    EXPECT_EQ(stagingDirectory(), m_folder.url("staging"));
}

TEST_F(Installing, WithNeitherDirectoryThereIsNoStagingDirectory) {
    makeTask(asset("a.pdf"), /*stages=*/false);
    RecordedLog log;

    EXPECT_FALSE(m_task->_subtaskTargetDirectoryWithInstalltDirectory_error(std::nullopt));

    EXPECT_EQ(log.lines(), (Lines{"default TemporaryDirectory: start {installDirectory: 0, "
                                  "temporaryDirectory: 0}",
                                  "debug TemporaryDiretory: Target URL available: (null)"}));
}

TEST_F(Installing, WhatAnEarlierRunLeftIsDeletedFilesAndFoldersAlike) {
    m_folder.write("staging/a.epub/OPS/a", "left");
    makeTask(asset("a.epub"), /*stages=*/true);
    RecordedLog log;

    EXPECT_EQ(stagingDirectory(), m_folder.url("staging"));

    EXPECT_EQ(names("staging"), Names{});
    EXPECT_EQ(log.lines().back(), "default TemporaryDirectory: Deleted existig temporary file: " +
                                      text("staging/a.epub"));
    EXPECT_FALSE(m_error);
}

TEST_F(Installing, TheCandidateHasTheNameOfTheURLAndNotOfTheSource) {
    m_folder.write("staging/source.pdf", "1");
    m_folder.write("staging/URL.pdf", "2");
    const auto source = asset("source.pdf");
    source->setUrl(m_folder.url("URL.pdf"));
    makeTask(source, /*stages=*/true);

    EXPECT_TRUE(stagingDirectory());

    EXPECT_EQ(names("staging"), Names{"source.pdf"});
}

TEST_F(Installing, ADanglingLinkIsNotReachableAndStays) {
    std::filesystem::create_symlink("nowhere", m_folder / "staging/a.pdf");
    makeTask(asset("a.pdf"), /*stages=*/true);

    EXPECT_EQ(stagingDirectory(), m_folder.url("staging"));

    EXPECT_EQ(names("staging"), Names{"a.pdf"});
}

TEST_F(Installing, WhatCannotBeDeletedFailsTheInstallBeforeAnyCopy) {
    m_folder.write("staging/a.pdf", "left");
    makeTask(asset("a.pdf"), /*stages=*/true);
    refuse(RefusingFileSystem::Act::Remove);
    RecordedLog log;

    EXPECT_FALSE(execute());

    EXPECT_EQ(m_error, makePOSIXError(EIO, m_folder.url("staging/a.pdf")));
    EXPECT_EQ(m_folder.read("staging/a.pdf"), "left");
    EXPECT_EQ(Lines(log.lines().begin() + 2, log.lines().end()),
              (Lines{"error TemporaryDirectory: Failed to delete temporary file: " +
                         text("staging/a.pdf"),
                     "error Invalid target url for copying: " + text("library") +
                         " error: " + logText(*m_error)}));
}

TEST_F(Installing, ASourceThatNamesAFolderAboveDeletesNothing) {
    for (const char* path : {"/", "/..", "/some/.", "/some/.."}) {
        makeTask(recordAt(URL::fileURLWithPath(path)), /*stages=*/true);

        EXPECT_FALSE(execute()) << path;
        EXPECT_EQ(names(""), (Names{"library", "staging"})) << path;
    }
}

// Failures

TEST_F(Installing, WithoutATargetDirectoryItIsAFaultAndTheStagedCopyGoes) {
    makeTask(asset("a.pdf"), /*stages=*/true);
    RecordedLog log;

    EXPECT_FALSE(m_task->executeWithTargetDirectory_error(std::nullopt, &m_error));

    EXPECT_EQ(log.lines()[0], "fault Executing install task without targetDirectory");
    EXPECT_EQ(log.lines()[1],
              "default Install: start {targetDirectory: 0, temporaryDirectory: 1} "
              "targetDirectory: (null) temporaryDirectory: " +
                  text("staging"));
    EXPECT_EQ(log.lines().back(), "default Removed temporary file");
    EXPECT_EQ(names("staging"), Names{});
    EXPECT_EQ(m_folder.read("a.pdf"), "content");
}

TEST_F(Installing, WithoutAnyDirectoryItFailsAtStaging) {
    makeTask(asset("a.pdf"), /*stages=*/false);
    RecordedLog log;

    EXPECT_FALSE(m_task->executeWithTargetDirectory_error(std::nullopt, &m_error));

    EXPECT_EQ(log.lines().back(), "error Invalid target url for copying: (null) error: (null)");
    EXPECT_EQ(m_folder.read("a.pdf"), "content");
}

TEST_F(Installing, AFailedCopyPassesItsErrorOutAndLeavesWhatItMade) {
    m_folder.write("bad.epub", ZipBuilder{}.stored("a", "1").stored("../evil", "2").bytes());
    makeTask(recordAt(m_folder.url("bad.epub")), /*stages=*/true);
    RecordedLog log;

    EXPECT_FALSE(execute());

    EXPECT_EQ(m_error, makePOSIXError(EPERM, m_folder.url("bad.epub")));
    EXPECT_EQ(names("staging/bad.epub"), Names{"a"});
    EXPECT_EQ(names("library"), Names{});
    EXPECT_EQ(log.lines().back(), "error Failed copy. source: " + text("bad.epub") + " target: " +
                                      text("library") + " error: " + logText(*m_error));
}

TEST_F(Installing, TheSubtaskAlwaysGetsAPlaceForItsError) {
    m_folder.write("staging/a.epub", "");
    const AssetPtr source = recordAt(m_folder.url("none.epub"));
    makeTask(source, /*stages=*/true);
    RecordedLog log;

    EXPECT_FALSE(m_task->executeWithTargetDirectory_error(m_folder.url("library")));

    EXPECT_EQ(log.lines().back(),
              "error Failed copy. source: " + text("none.epub") + " target: " + text("library") +
                  " error: " +
                  logText(makeFileError(PVFileErrorCode::NoSuchFile, m_folder.url("none.epub"))));
}

TEST_F(Installing, ACopyThatCannotBeStampedIsInstalledAllTheSame) {
    const auto source = asset("a.epub");
    source->setTitle("Title");
    makeTask(source, /*stages=*/false);
    m_task->setTemporaryDirectory(m_folder.url("staging"));
    RecordedLog log;

    EXPECT_TRUE(execute());

    // A record without an asset ID has no attributes to write.
    EXPECT_EQ(names("library"), Names{"a.epub"});
    EXPECT_FALSE(m_error);
    const std::string line =
        "error Failure when adding size and insertion date to moved asset. error: " +
        logText(makeNoIdentityError());
    EXPECT_EQ(std::count(log.lines().begin(), log.lines().end(), line), 1);
}

TEST_F(Installing, AFailedMoveDeletesTheStagedCopyAndLeavesTheSource) {
    m_folder.write("library/a.pdf", "old");
    makeTask(asset("a.pdf"), /*stages=*/true);
    RecordedLog log;

    EXPECT_FALSE(execute());

    EXPECT_EQ(m_error, makeFileError(PVFileErrorCode::FileExists, m_folder.url("library/a.pdf")));
    EXPECT_EQ(names("staging"), Names{});
    EXPECT_EQ(m_folder.read("a.pdf"), "content");
    EXPECT_EQ(m_folder.read("library/a.pdf"), "old");
    EXPECT_EQ(Lines(log.lines().end() - 2, log.lines().end()),
              (Lines{"error Failed move -- Cleaning Up: " + text("staging/a.pdf") +
                         " error: " + logText(*m_error),
                     "default Removed temporary file"}));
}

TEST_F(Installing, WithoutACopyAFailedMoveDeletesTheSource) {
    m_folder.write("library/a.pdf", "old");
    makeTask(asset("a.pdf"), /*stages=*/false);
    m_task->setTemporaryDirectory(m_folder.url("staging"));

    EXPECT_FALSE(execute());

    EXPECT_EQ(names(""), (Names{"library", "staging"}));
    EXPECT_EQ(m_folder.read("library/a.pdf"), "old");
}

TEST_F(Installing, AStagedCopyThatCannotBeDeletedIsLoggedWithTheMovesErrorPassedOut) {
    m_folder.write("library/a.pdf", "old");
    makeTask(asset("a.pdf"), /*stages=*/true);
    refuse(RefusingFileSystem::Act::Remove);
    RecordedLog log;

    EXPECT_FALSE(execute());

    EXPECT_EQ(m_error, makeFileError(PVFileErrorCode::FileExists, m_folder.url("library/a.pdf")));
    EXPECT_EQ(log.lines().back(),
              "error Failed to remove temporary file: " + text("staging/a.pdf") +
                  " error: " + logText(makePOSIXError(EIO, m_folder.url("staging/a.pdf"))));
}

TEST_F(Installing, ACancelReachesTheSubtask) {
    makeTask(asset("a.pdf", std::string(3 << 20, 'x')), /*stages=*/true);
    m_task->setProgressHandler([this](const AssetPtr&) { m_task->cancel(); });

    EXPECT_FALSE(execute());

    EXPECT_EQ(m_error, makeCancelledError(m_folder.url("a.pdf")));
    EXPECT_EQ(names("library"), Names{});
}

}  // namespace
}  // namespace parvel::testing
