#include "parvel/iotasks/PVCopyAssetMetadataIOTask.h"

#include <gtest/gtest.h>
#include <sys/stat.h>

#include <cmath>
#include <filesystem>
#include <thread>

#include "tests/support/ManagedFolder.h"
#include "tests/support/RecordedLog.h"
#include "tests/support/RefusingSizeQuery.h"
#include "tests/support/ScriptedCopyService.h"
#include "tests/support/TestRounds.h"

namespace parvel::testing {
namespace {

using Lines = std::vector<std::string>;

constexpr std::size_t oneMegabyte = 1 << 20;

class PlainCopies : public ManagedFolder {
protected:
    PlainCopies() : m_target(makeFolder("target")) {}

    void makeTask(const AssetPtr& source) {
        m_task = PVCopyAssetMetadataIOTask::initWithSourceMetadata_manager(source, m_manager);
    }
    void keepProgress() {
        m_task->setProgressHandler(
            [this](const AssetPtr& record) { m_progress.push_back(record->percentComplete()); });
    }
    AssetPtr execute() { return m_task->executeWithTargetDirectory_error(m_target, &m_error); }
    [[nodiscard]] static std::string text(const URL& url) { return url.absoluteString(); }

    URL m_target;
    std::shared_ptr<PVCopyAssetMetadataIOTask> m_task;
    std::vector<double> m_progress;
};

TEST_F(PlainCopies, AFileLandsUnderItsNameWithTheExtensionInLowerCase) {
    const AssetPtr source = asset("My Guide.PDF", "content");
    makeTask(source);
    RecordedLog log;

    const AssetPtr copy = execute();

    ASSERT_TRUE(copy);
    EXPECT_EQ(copy->url(), m_folder.url("target/My Guide.pdf"));
    EXPECT_EQ(source->url(), m_folder.url("My Guide.PDF"));
    EXPECT_EQ(m_folder.read("target/My Guide.pdf"), "content");
    EXPECT_EQ(m_folder.read("My Guide.PDF"), "content");
    EXPECT_FALSE(m_error);
    EXPECT_EQ(log.lines(), Lines{});
}

TEST_F(PlainCopies, NothingElseOfTheRecordChanges) {
    const auto source = asset("a.pdf");
    source->setPercentComplete(0.25);
    source->setTitle("Title");
    makeTask(source);

    const AssetPtr copy = execute();

    ASSERT_TRUE(copy);
    EXPECT_EQ(copy->percentComplete(), 0.25);
    EXPECT_EQ(copy->title(), "Title");
    EXPECT_EQ(copy->sourceURL(), m_folder.url("a.pdf"));
}

TEST_F(PlainCopies, TheCopyIsOfTheSourceURLAndNotOfTheURL) {
    const auto source = asset("imported.pdf", "imported");
    m_folder.write("other.pdf", "other");
    source->setUrl(m_folder.url("other.pdf"));
    makeTask(source);

    const AssetPtr copy = execute();

    ASSERT_TRUE(copy);
    EXPECT_EQ(copy->url(), m_folder.url("target/imported.pdf"));
    EXPECT_EQ(m_folder.read("target/imported.pdf"), "imported");
}

TEST_F(PlainCopies, ProgressIsTheShareOfTheAllocatedSize) {
    makeTask(asset("a.pdf", std::string(3 * oneMegabyte, 'x')));
    keepProgress();
    const auto total =
        ResourceQueries::host().totalAllocatedSize(m_folder.url("a.pdf")).value_or(0);

    ASSERT_TRUE(execute());

    EXPECT_EQ(m_task->totalBytes(), total);
    const auto share = [&](std::size_t megabytes) {
        return static_cast<double>(megabytes * oneMegabyte) / static_cast<double>(total);
    };
    EXPECT_EQ(m_progress, (std::vector<double>{share(1), share(2), share(3)}));
}

TEST_F(PlainCopies, ProgressIsToldWithACopyOfTheSourcesRecord) {
    const auto source = asset("a.pdf");
    source->setTitle("Title");
    makeTask(source);
    AssetPtr told;
    m_task->setProgressHandler([&](const AssetPtr& record) { told = record; });

    ASSERT_TRUE(execute());

    ASSERT_TRUE(told);
    EXPECT_NE(told, source);
    EXPECT_EQ(told->title(), "Title");
    EXPECT_EQ(told->url(), source->url());
    EXPECT_EQ(source->percentComplete(), 0);
}

TEST_F(PlainCopies, ASourceOfNoAllocatedSizeIsDividedByAllTheSame) {
    const AssetPtr source = asset("a.pdf", "");
    ASSERT_EQ(::truncate((m_folder / "a.pdf").c_str(), oneMegabyte), 0);
    if (ResourceQueries::host().totalAllocatedSize(m_folder.url("a.pdf")) != 0U)
        GTEST_SKIP() << "files without blocks have a size here";
    makeTask(source);
    keepProgress();

    ASSERT_TRUE(execute());

    ASSERT_EQ(m_progress.size(), 1U);
    EXPECT_TRUE(std::isinf(m_progress[0]));
}

TEST_F(PlainCopies, NothingOfNothingIsNoNumber) {
    makeTask(asset("a.pdf", ""));
    keepProgress();
    const ScriptedCopyService service([](const CopyService::StatusCallback& callback) {
        EXPECT_EQ(callback({CopyOperation::Data, CopyStage::Progress, 0}), CopyAnswer::Continue);
        return 0;
    });

    ASSERT_TRUE(execute());

    ASSERT_EQ(m_progress.size(), 1U);
    EXPECT_TRUE(std::isnan(m_progress[0]));
}

TEST_F(PlainCopies, OnlyProgressOfTheDataThatCanBeToldIsTold) {
    makeTask(asset("a.pdf"));
    keepProgress();
    const ScriptedCopyService service([](const CopyService::StatusCallback& callback) {
        for (const CopyReport& report : {CopyReport{CopyOperation::Data, CopyStage::Start, 1},
                                         {CopyOperation::Data, CopyStage::Progress, std::nullopt},
                                         {CopyOperation::Data, CopyStage::Finish, 1},
                                         {CopyOperation::Attributes, CopyStage::Start, 1},
                                         {CopyOperation::Attributes, CopyStage::Progress, 1},
                                         {CopyOperation::Attributes, CopyStage::Error, 1}})
            EXPECT_EQ(callback(report), CopyAnswer::Continue);
        return 0;
    });

    EXPECT_TRUE(execute());

    EXPECT_TRUE(m_progress.empty());
    EXPECT_FALSE(m_task->isCancelled());
}

TEST_F(PlainCopies, AMissingSourceFailsBeforeTheCopy) {
    const AssetPtr source = asset("a.pdf");
    std::filesystem::remove(m_folder / "a.pdf");
    makeTask(source);
    RecordedLog log;

    EXPECT_FALSE(execute());

    const URL url = m_folder.url("a.pdf");
    EXPECT_EQ(m_error, makeFileError(PVFileErrorCode::NoSuchFile, url));
    EXPECT_EQ(log.lines(),
              Lines{"error Failed to stat file: " + text(url) + " error: " + logText(*m_error)});
    EXPECT_EQ(names("target"), Names{});
}

TEST_F(PlainCopies, ARecordWithoutSourceFailsAndLeavesTheError) {
    makeTask(PVMutableAssetMetadata::initWithURL_dictionary_validate(std::nullopt, nullptr,
                                                                     /*validate=*/false));
    m_error = makeNoIdentityError();
    RecordedLog log;

    EXPECT_FALSE(execute());
    EXPECT_FALSE(m_task->executeWithTargetDirectory_error(m_target));

    EXPECT_EQ(m_error, makeNoIdentityError());
    EXPECT_EQ(log.lines().back(), "error Failed to stat file: (null) error: (null)");
}

TEST_F(PlainCopies, NoRecordFails) {
    makeTask(nullptr);

    EXPECT_FALSE(execute());
}

TEST_F(PlainCopies, WithoutASizeTheCopyRunsUnwatched) {
    makeTask(asset("a.pdf"));
    keepProgress();
    m_task->cancel();
    const RefusingSizeQuery noSize;
    RecordedLog log;

    EXPECT_TRUE(execute());

    EXPECT_EQ(m_folder.read("target/a.pdf"), "content");
    EXPECT_TRUE(m_progress.empty());
    EXPECT_FALSE(m_error);
    const URL url = m_folder.url("a.pdf");
    EXPECT_EQ(log.lines(), Lines{"error Failed to get total bytes from file: " + text(url) +
                                 " error: " + logText(makePOSIXError(EIO, url))});
}

TEST_F(PlainCopies, ATakenNameIsThePOSIXCodeMinusOne) {
    makeTask(asset("a.PDF", "new"));
    m_folder.write("target/a.pdf", "old");
    RecordedLog log;

    EXPECT_FALSE(execute());

    const URL url = m_folder.url("a.PDF");
    EXPECT_EQ(m_error, makePOSIXError(-1, url));
    EXPECT_EQ(m_folder.read("target/a.pdf"), "old");
    EXPECT_EQ(log.lines(),
              Lines{"error Failed to copy file: " + text(url) + " error: " + logText(*m_error)});
}

TEST_F(PlainCopies, AFailedCopyThatNobodyAsksAboutIsNotLogged) {
    makeTask(asset("a.pdf"));
    m_folder.write("target/a.pdf", "old");
    RecordedLog log;

    EXPECT_FALSE(m_task->executeWithTargetDirectory_error(m_target));

    EXPECT_EQ(log.lines(), Lines{});
}

TEST_F(PlainCopies, NoTargetDirectoryFails) {
    makeTask(asset("a.pdf"));

    EXPECT_FALSE(m_task->executeWithTargetDirectory_error(std::nullopt, &m_error));

    EXPECT_EQ(m_error, makePOSIXError(-1, m_folder.url("a.pdf")));
}

TEST_F(PlainCopies, ACancelInTheCopyLeavesItInPartAndIsNotLogged) {
    makeTask(asset("a.pdf", std::string(3 * oneMegabyte, 'x')));
    m_task->setProgressHandler([this](const AssetPtr&) { m_task->cancel(); });
    RecordedLog log;

    EXPECT_FALSE(execute());

    EXPECT_EQ(m_error, makeCancelledError(m_folder.url("a.pdf")));
    EXPECT_EQ(m_folder.read("target/a.pdf").size(), oneMegabyte);
    EXPECT_EQ(log.lines(), Lines{});
}

TEST_F(PlainCopies, ACancelledCopyThatNobodyAsksAboutIsNoneAndIsNotLogged) {
    makeTask(asset("a.pdf"));
    m_task->cancel();
    RecordedLog log;

    EXPECT_FALSE(m_task->executeWithTargetDirectory_error(m_target));

    EXPECT_EQ(log.lines(), Lines{});
}

TEST_F(PlainCopies, ACancelBeforehandStopsTheCopyAtItsFirstReportWithoutAHandlerToo) {
    makeTask(asset("a.pdf"));
    m_task->cancel();

    EXPECT_TRUE(m_task->isCancelled());
    EXPECT_FALSE(execute());

    EXPECT_EQ(m_error, makeCancelledError(m_folder.url("a.pdf")));
    EXPECT_EQ(m_folder.read("target/a.pdf"), "");
}

TEST_F(PlainCopies, ACancelledCopyThatFailsOtherwiseIsACancellation) {
    makeTask(asset("a.pdf"));
    m_folder.write("target/a.pdf", "old");
    m_task->cancel();

    EXPECT_FALSE(execute());

    EXPECT_EQ(m_error, makeCancelledError(m_folder.url("a.pdf")));
}

TEST_F(PlainCopies, ADataErrorIsReportedAsACancellation) {
    makeTask(asset("a.pdf"));
    keepProgress();
    const ScriptedCopyService service([](const CopyService::StatusCallback& callback) {
        EXPECT_EQ(callback({CopyOperation::Data, CopyStage::Error, 1}), CopyAnswer::Quit);
        return -1;
    });
    RecordedLog log;

    EXPECT_FALSE(execute());

    EXPECT_TRUE(m_task->isCancelled());
    EXPECT_EQ(m_error, makeCancelledError(m_folder.url("a.pdf")));
    EXPECT_EQ(log.lines(), Lines{"default Copy file error"});
    EXPECT_TRUE(m_progress.empty());
}

TEST_F(PlainCopies, ADataErrorWithoutAHandlerIsAFailure) {
    makeTask(asset("a.pdf"));
    const ScriptedCopyService service([](const CopyService::StatusCallback& callback) {
        EXPECT_EQ(callback({CopyOperation::Data, CopyStage::Error, 1}), CopyAnswer::Continue);
        return -1;
    });

    EXPECT_FALSE(execute());

    EXPECT_FALSE(m_task->isCancelled());
    EXPECT_EQ(m_error, makePOSIXError(-1, m_folder.url("a.pdf")));
}

TEST_F(PlainCopies, TheErrorsCodeIsWhatTheCopyReturned) {
    makeTask(asset("a.pdf"));
    const ScriptedCopyService service([](const CopyService::StatusCallback&) { return -7; });

    EXPECT_FALSE(execute());

    EXPECT_EQ(m_error, makePOSIXError(-7, m_folder.url("a.pdf")));
}

TEST_F(PlainCopies, ASourceFolderIsMadeWithoutItsContentAndUnwatched) {
    m_folder.write("a.pdf/member", "content");
    makeTask(PVAssetMetadata::metadataWithURL_dictionary(m_folder.url("a.pdf"), nullptr));
    keepProgress();
    m_task->cancel();

    const AssetPtr copy = execute();

    ASSERT_TRUE(copy);
    EXPECT_EQ(copy->url(), m_folder.url("target/a.pdf"));
    EXPECT_EQ(names("target/a.pdf"), Names{});
    EXPECT_TRUE(m_progress.empty());
    EXPECT_EQ(m_task->totalBytes(), 0U);
}

TEST_F(PlainCopies, AnotherThreadsCancelEndsTheCopyOrComesTooLate) {
    const AssetPtr source = asset("a.pdf", std::string(8 * oneMegabyte, 'x'));
    for (std::size_t round = 0; round < testRounds(30); ++round) {
        std::filesystem::remove(m_folder / "target/a.pdf");
        m_error.reset();
        makeTask(source);
        keepProgress();
        std::thread other([this, round] {
            std::this_thread::sleep_for(std::chrono::microseconds(round * 131 % 5000));
            m_task->cancel();
        });

        const AssetPtr copy = execute();
        other.join();

        EXPECT_EQ(copy == nullptr, m_error == makeCancelledError(m_folder.url("a.pdf")));
        EXPECT_TRUE(!copy || m_folder.read("target/a.pdf").size() == 8 * oneMegabyte);
    }
}

}  // namespace
}  // namespace parvel::testing
