#include "parvel/iotasks/PVCrateAssetMetadataIOTask.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cerrno>
#include <cmath>
#include <filesystem>
#include <thread>

#include "tests/support/EpubBuilder.h"
#include "tests/support/ManagedFolder.h"
#include "tests/support/RecordedLog.h"
#include "tests/support/ScriptedArchiveCopier.h"
#include "tests/support/TestRounds.h"

namespace parvel::testing {
namespace {

using Lines = std::vector<std::string>;

class CrateCopies : public ManagedFolder {
protected:
    CrateCopies() : m_target(makeFolder("target")) {}

    /// A record of a zipped book with two files of 30 and 10 bytes.
    MutableAssetPtr zippedBook(const std::string& name = "Book.epub") {
        m_folder.write(name, ZipBuilder{}
                                 .deflated("OPS/a", std::string(30, 'a'))
                                 .stored("b", std::string(10, 'b'))
                                 .bytes());
        return recordOf(name);
    }
    MutableAssetPtr recordOf(const std::string& name) {
        return PVAssetMetadata::metadataWithURL_dictionary(m_folder.url(name), nullptr);
    }
    void makeTask(const AssetPtr& source) {
        m_task = PVCrateAssetMetadataIOTask::initWithSourceMetadata_manager(source, m_manager);
    }
    void keepProgress() {
        m_task->setProgressHandler(
            [this](const AssetPtr& record) { m_progress.push_back(record->percentComplete()); });
    }
    AssetPtr execute() { return m_task->executeWithTargetDirectory_error(m_target, &m_error); }
    [[nodiscard]] static std::string text(const URL& url) { return url.absoluteString(); }
    [[nodiscard]] std::string startLine() const {
        return "default CrateCopy: start: targetDirectory: " + text(m_target);
    }

    URL m_target;
    std::shared_ptr<PVCrateAssetMetadataIOTask> m_task;
    std::vector<double> m_progress;
};

TEST_F(CrateCopies, AZippedBookBecomesAFolderOfItsNameWithTheExtensionInLowerCase) {
    makeTask(zippedBook("My Book.EPUB"));

    const AssetPtr copy = execute();

    ASSERT_TRUE(copy);
    EXPECT_EQ(copy->url(), m_folder.url("target/My Book.epub"));
    EXPECT_EQ(m_folder.read("target/My Book.epub/OPS/a"), std::string(30, 'a'));
    EXPECT_EQ(m_folder.read("target/My Book.epub/b"), std::string(10, 'b'));
    EXPECT_FALSE(m_error);
}

TEST_F(CrateCopies, AnExpandedBookIsCopiedAsItIs) {
    m_folder.write("Book.epub/OPS/a", "1");
    m_folder.write("Book.epub/mimetype", "2");
    makeTask(recordOf("Book.epub"));

    const AssetPtr copy = execute();

    ASSERT_TRUE(copy);
    EXPECT_EQ(copy->url(), m_folder.url("target/Book.epub"));
    EXPECT_EQ(copy->percentComplete(), 1.0);
    EXPECT_EQ(names("target/Book.epub"), (Names{"OPS", "mimetype"}));
    EXPECT_EQ(m_folder.read("Book.epub/OPS/a"), "1");
}

TEST_F(CrateCopies, LogsTheStepsOfAnExpansion) {
    makeTask(zippedBook());
    RecordedLog log;

    ASSERT_TRUE(execute());

    EXPECT_EQ(log.lines(), (Lines{startLine(), "debug CrateCopy: files in archive {count: 2}",
                                  "debug CrateCopy: starting copy {isZip: 1}",
                                  "debug CrateCopy: end success: 1"}));
}

TEST_F(CrateCopies, LogsTheStepsOfATreesCopy) {
    m_folder.write("Book.epub/a", "1");
    makeTask(recordOf("Book.epub"));
    RecordedLog log;

    ASSERT_TRUE(execute());

    EXPECT_EQ(log.lines(), (Lines{startLine(), "debug CrateCopy: files in directory {count: 1}",
                                  "debug CrateCopy: starting copy {isZip: 0}",
                                  "debug CrateCopy: end success: 1"}));
}

TEST_F(CrateCopies, ProgressIsTheShareOfTheFilesFinished) {
    const auto source = zippedBook();
    source->setTitle("Title");
    makeTask(source);
    AssetPtr told;
    m_task->setProgressHandler([&](const AssetPtr& record) {
        told = record;
        m_progress.push_back(record->percentComplete());
    });

    ASSERT_TRUE(execute());

    EXPECT_EQ(m_progress, (std::vector<double>{0.75, 1.0}));
    EXPECT_EQ(m_task->totalBytes(), 40U);
    EXPECT_EQ(m_task->bytesSoFar(), 40U);
    EXPECT_EQ(told->title(), "Title");
    EXPECT_EQ(told->url(), source->url());
    EXPECT_EQ(source->percentComplete(), 0);
}

TEST_F(CrateCopies, ProgressOfATreeIsTheShareOfTheFilesFinishedToo) {
    m_folder.write("Tree.epub/a", std::string(10, 'a'));
    m_folder.write("Tree.epub/OPS/b", std::string(10, 'b'));
    m_folder.write("Tree.epub/OPS/c", std::string(20, 'c'));
    makeTask(recordOf("Tree.epub"));
    keepProgress();

    ASSERT_TRUE(execute());

    EXPECT_EQ(m_task->totalBytes(), 40U);
    EXPECT_EQ(m_task->bytesSoFar(), 40U);
    ASSERT_EQ(m_progress.size(), 3U);
    EXPECT_TRUE(std::is_sorted(m_progress.begin(), m_progress.end()));
    EXPECT_EQ(m_progress[2], 1.0);
}

TEST_F(CrateCopies, WithoutAPlaceForTheErrorACancelledAndAFailedCopyAreNoneAlone) {
    makeTask(zippedBook());
    m_task->setProgressHandler([this](const AssetPtr&) { m_task->cancel(); });
    EXPECT_FALSE(m_task->executeWithTargetDirectory_error(m_target));

    makeTask(recordOf("Book.epub"));
    EXPECT_FALSE(m_task->executeWithTargetDirectory_error(m_target));
}

TEST_F(CrateCopies, BytesAreSummedWithoutAHandlerToo) {
    makeTask(zippedBook());

    ASSERT_TRUE(execute());

    EXPECT_EQ(m_task->bytesSoFar(), 40U);
}

TEST_F(CrateCopies, ABookOfEmptyFilesTellsNoNumber) {
    m_folder.write("Book.epub/a", "");
    makeTask(recordOf("Book.epub"));
    keepProgress();

    ASSERT_TRUE(execute());

    ASSERT_EQ(m_progress.size(), 1U);
    EXPECT_TRUE(std::isnan(m_progress[0]));
}

TEST_F(CrateCopies, TheResultIsCompleteWithItsMIMETypeTrimmedOfLineBreaks) {
    const auto source = zippedBook();
    source->setMimeType("\r\n application/\nepub+zip \n\r\n");
    makeTask(source);

    const AssetPtr copy = execute();

    ASSERT_TRUE(copy);
    EXPECT_EQ(copy->percentComplete(), 1.0);
    ASSERT_TRUE(copy->mimeType());
    EXPECT_EQ(*copy->mimeType(), Value(" application/\nepub+zip "));
}

TEST_F(CrateCopies, AMIMETypeOfLineBreaksAloneIsEmptyAndAnAbsentOneStaysAbsent) {
    const auto source = zippedBook();
    source->setMimeType("\n\n");
    makeTask(source);
    EXPECT_EQ(*execute()->mimeType(), Value(""));

    makeTask(zippedBook("other.epub"));
    EXPECT_FALSE(execute()->mimeType());
}

TEST_F(CrateCopies, TheCopyIsOfTheSourceURLAndNotOfTheURL) {
    const auto source = zippedBook("imported.epub");
    source->setUrl(m_folder.url("elsewhere.epub"));
    makeTask(source);

    EXPECT_TRUE(execute());

    EXPECT_EQ(names("target"), Names{"imported.epub"});
}

TEST_F(CrateCopies, AMissingSourceIsLoggedWithTheRecordsURL) {
    const auto source = recordOf("none.epub");
    source->setUrl(m_folder.url("url.epub"));
    makeTask(source);
    RecordedLog log;

    EXPECT_FALSE(execute());

    EXPECT_EQ(m_error, makeFileError(PVFileErrorCode::NoSuchFile, m_folder.url("none.epub")));
    EXPECT_EQ(log.lines(),
              (Lines{startLine(),
                     "default Failed to stat source URL information. sourceMetadataURL: " +
                         text(m_folder.url("url.epub")) + " error: " + logText(*m_error),
                     "debug CrateCopy: end success: 0"}));
}

TEST_F(CrateCopies, ARecordWithoutSourceFailsAndLeavesTheError) {
    makeTask(nullptr);
    m_error = makeNoIdentityError();
    RecordedLog log;

    EXPECT_FALSE(execute());

    EXPECT_EQ(m_error, makeNoIdentityError());
    EXPECT_EQ(log.lines().back(), "debug CrateCopy: end success: 0");
}

TEST_F(CrateCopies, AnExistingPackageIsAFatalErrorAndIsNotTouched) {
    makeTask(zippedBook("Book.EPUB"));
    m_folder.write("target/Book.epub/old", "old");
    RecordedLog log;

    EXPECT_FALSE(execute());

    const URL url = *m_task->sourceMetadata()->url();
    EXPECT_EQ(m_error, makePOSIXError(EEXIST, url));
    EXPECT_EQ(m_task->crateError(), m_error);
    EXPECT_EQ(names("target/Book.epub"), Names{"old"});
    ASSERT_EQ(log.lines().size(), 6U);
    EXPECT_EQ(log.lines()[3], "error Crate extraction: Encountered faltal posix error: 17 url: " +
                                  text(url) + " crateError: " + logText(*m_error));
    EXPECT_EQ(log.lines()[4], "default CrateCopy: Error: 17 sourceMetadataURL: " + text(url) +
                                  " crateError: " + logText(*m_error));
    EXPECT_EQ(log.lines()[5], "debug CrateCopy: end success: 0");
}

TEST_F(CrateCopies, AHostileEntryIsAFileErrorAndWhatWasMadeStays) {
    m_folder.write("Book.epub", ZipBuilder{}.stored("a", "1").stored("../evil", "2").bytes());
    makeTask(recordOf("Book.epub"));
    RecordedLog log;

    EXPECT_FALSE(execute());

    EXPECT_EQ(m_error, makePOSIXError(EPERM, m_folder.url("Book.epub")));
    EXPECT_EQ(names("target"), Names{"Book.epub"});
    EXPECT_EQ(names("target/Book.epub"), Names{"a"});
    EXPECT_EQ(log.lines()[3], "default Crate extraction: File Error: 1 path: " +
                                  (m_folder / "target/Book.epub/../evil") +
                                  " errString: Operation not permitted");
}

TEST_F(CrateCopies, AFileErrorsCodeIsErrnoAndItsTextThatOfTheCopiersNumber) {
    makeTask(zippedBook());
    const ScriptedArchiveCopierFactory factory;
    factory.copier->script = [&] {
        errno = EIO;
        EXPECT_EQ(factory.copier->callbacks->fileError(*factory.copier, "a/path", ENOSPC), 2);
        return 9;
    };
    RecordedLog log;

    EXPECT_FALSE(execute());

    EXPECT_EQ(m_error, makePOSIXError(EIO, m_folder.url("Book.epub")));
    EXPECT_EQ(log.lines()[3],
              "default Crate extraction: File Error: 5 path: a/path errString: No space left on "
              "device");
    EXPECT_EQ(log.lines()[4],
              "default CrateCopy: Error: 9 sourceMetadataURL: " + text(m_folder.url("Book.epub")) +
                  " crateError: " + logText(*m_error));
}

TEST_F(CrateCopies, TheLastOfSeveralErrorsIsTheOne) {
    makeTask(zippedBook());
    const ScriptedArchiveCopierFactory factory;
    factory.copier->script = [&] {
        errno = EIO;
        (void)factory.copier->callbacks->fileError(*factory.copier, "a", EIO);
        errno = ENOSPC;
        factory.copier->callbacks->fatalError(*factory.copier);
        return 1;
    };

    EXPECT_FALSE(execute());

    EXPECT_EQ(m_error, makePOSIXError(ENOSPC, m_folder.url("Book.epub")));
}

TEST_F(CrateCopies, AFailureWithoutAnErrorTakesTheCallersErrorAway) {
    makeTask(zippedBook());
    m_error = makeNoIdentityError();
    const ScriptedArchiveCopierFactory factory;
    factory.copier->script = [] { return 3; };
    RecordedLog log;

    EXPECT_FALSE(execute());

    EXPECT_FALSE(m_error);
    EXPECT_EQ(log.lines()[3], "default CrateCopy: Error: 3 sourceMetadataURL: " +
                                  text(m_folder.url("Book.epub")) + " crateError: (null)");
}

TEST_F(CrateCopies, TheOptionToExpandIsGivenForAnArchiveAlone) {
    const ScriptedArchiveCopierFactory factory;
    makeTask(zippedBook());
    EXPECT_TRUE(execute());
    EXPECT_EQ(factory.copier->options, (Dictionary{{"extractPKZip", Number::boolean(true)}}));
    EXPECT_EQ(factory.copier->copiedTo, m_folder / "target/Book.epub");

    m_folder.write("Tree.epub/a", "");
    makeTask(recordOf("Tree.epub"));
    EXPECT_TRUE(execute());
    EXPECT_EQ(factory.copier->options, Dictionary());
}

TEST_F(CrateCopies, TheTotalIsWhatTheCopierCounts) {
    makeTask(zippedBook());
    const ScriptedArchiveCopierFactory factory;
    factory.copier->count = {7, 1000};
    keepProgress();
    factory.copier->script = [&] {
        factory.copier->callbacks->fileFinished(*factory.copier, "a", ArchiveObjectType::File, 250);
        return 0;
    };
    RecordedLog log;

    EXPECT_TRUE(execute());

    EXPECT_EQ(m_task->totalBytes(), 1000U);
    EXPECT_EQ(m_progress, std::vector{0.25});
    EXPECT_EQ(log.lines()[1], "debug CrateCopy: files in archive {count: 7}");
}

TEST_F(CrateCopies, ACancelSetsItsFlagBeforeTheCopiers) {
    makeTask(zippedBook());
    const ScriptedArchiveCopierFactory factory;
    bool wasSet = false;
    factory.copier->onCancel = [&] { wasSet = m_task->isCancelled(); };
    factory.copier->script = [&] {
        m_task->cancel();
        return ECANCELED;
    };
    RecordedLog log;

    EXPECT_FALSE(execute());

    EXPECT_TRUE(wasSet);
    EXPECT_EQ(m_error, makeCancelledError(m_folder.url("Book.epub")));
    EXPECT_EQ(log.lines()[3],
              "default CrateCopy: Cancelled sourceMetadataURL: " + text(m_folder.url("Book.epub")));
}

TEST_F(CrateCopies, ACancelledCopyThatFailsOtherwiseIsACancellation) {
    makeTask(zippedBook());
    m_folder.write("target/Book.epub", "old");
    m_task->cancel();

    EXPECT_FALSE(execute());

    EXPECT_EQ(m_error, makeCancelledError(m_folder.url("Book.epub")));
}

TEST_F(CrateCopies, ACancelInTheCopyLeavesItInPart) {
    makeTask(zippedBook());
    m_task->setProgressHandler([this](const AssetPtr&) { m_task->cancel(); });

    EXPECT_FALSE(execute());

    EXPECT_EQ(m_error, makeCancelledError(m_folder.url("Book.epub")));
    EXPECT_EQ(names("target/Book.epub"), Names{"OPS"});
}

TEST_F(CrateCopies, ACancelBeforehandOnlySetsTheFlag) {
    makeTask(zippedBook());
    m_task->cancel();

    EXPECT_TRUE(m_task->isCancelled());
    EXPECT_TRUE(execute());

    EXPECT_FALSE(m_error);
}

TEST_F(CrateCopies, ACancelAfterwardsIsHarmless) {
    makeTask(zippedBook());
    EXPECT_FALSE(m_task->copier());
    ASSERT_TRUE(execute());
    EXPECT_TRUE(m_task->copier());

    m_task->cancel();

    EXPECT_TRUE(m_task->isCancelled());
}

TEST_F(CrateCopies, NoTargetDirectoryFails) {
    makeTask(zippedBook());
    RecordedLog log;

    EXPECT_FALSE(m_task->executeWithTargetDirectory_error(std::nullopt, &m_error));

    EXPECT_EQ(m_error, makePOSIXError(ENOENT, m_folder.url("Book.epub")));
    EXPECT_EQ(log.lines()[0], "default CrateCopy: start: targetDirectory: (null)");
}

TEST_F(CrateCopies, AnotherThreadsCancelEndsTheCopyOrComesTooLate) {
    ZipBuilder archive;
    for (int index = 0; index < 30; ++index)
        archive.deflated(std::to_string(index), std::string(50000, 'x'));
    m_folder.write("Book.epub", archive.bytes());
    const AssetPtr source = recordOf("Book.epub");

    for (std::size_t round = 0; round < testRounds(30); ++round) {
        std::filesystem::remove_all(m_folder / "target/Book.epub");
        m_error.reset();
        makeTask(source);
        keepProgress();
        std::thread other([this, round] {
            std::this_thread::sleep_for(std::chrono::microseconds(round * 89 % 3000));
            m_task->cancel();
        });

        const AssetPtr copy = execute();
        other.join();

        EXPECT_EQ(copy == nullptr, m_error == makeCancelledError(m_folder.url("Book.epub")));
        EXPECT_TRUE(!copy || names("target/Book.epub").size() == 30);
    }
}

}  // namespace
}  // namespace parvel::testing
