#include <gtest/gtest.h>
#include <sys/stat.h>
#include <sys/xattr.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <filesystem>
#include <thread>
#include <vector>

#include "parvel/platform/CopyService.h"
#include "tests/support/TemporaryDirectory.h"
#include "tests/support/TestRounds.h"

namespace parvel::testing {
namespace {

constexpr std::size_t copyPiece = 1 << 20;

struct ToldStep {
    CopyOperation operation;
    CopyStage stage;
    std::uint64_t copied;
    friend bool operator==(const ToldStep&, const ToldStep&) = default;
};

class CopyServiceTest : public ::testing::Test {
protected:
    /// Copies "source" to "copy" below the folder; gives 0, or errno where the result is -1.
    int copy(const CopyService::StatusCallback& callback) {
        const int result =
            CopyService::host().copy(m_folder / "source", m_folder / "copy", callback);
        EXPECT_TRUE(result == 0 || result == -1);
        return result == 0 ? 0 : errno;
    }
    /// The same, with every report kept; quits at the report of that number.
    int copyAndKeepReports(std::size_t quitAt = SIZE_MAX) {
        return copy([this, quitAt](const CopyReport& report) {
            m_reports.push_back({report.operation, report.stage, report.bytesCopied.value()});
            return m_reports.size() > quitAt ? CopyAnswer::Quit : CopyAnswer::Continue;
        });
    }
    [[nodiscard]] bool exists(const char* name) const {
        return std::filesystem::exists(std::filesystem::symlink_status(m_folder / name));
    }

    TemporaryDirectory m_folder;
    std::vector<ToldStep> m_reports;
};

TEST_F(CopyServiceTest, CopiesDataAndAttributesButNotTheMode) {
    const std::string source = m_folder.write("source", "content");
    if (::setxattr(source.c_str(), "user.parvel", "value", 5, 0) != 0)
        GTEST_SKIP() << "no extended attributes here";
    ::chmod(source.c_str(), 0711);

    EXPECT_EQ(copy(nullptr), 0);

    EXPECT_EQ(m_folder.read("copy"), "content");
    char value[6] = "";
    EXPECT_EQ(::getxattr((m_folder / "copy").c_str(), "user.parvel", value, 5), 5);
    EXPECT_STREQ(value, "value");
    struct stat status {};
    ASSERT_EQ(::stat((m_folder / "copy").c_str(), &status), 0);
    EXPECT_EQ(status.st_mode & 0111, 0U);
}

TEST_F(CopyServiceTest, ReportsEveryPieceOfTheDataAndThenTheAttributes) {
    m_folder.write("source", std::string(2 * copyPiece + 1, 'x'));

    EXPECT_EQ(copyAndKeepReports(), 0);

    const std::vector<ToldStep> expected = {
        {CopyOperation::Data, CopyStage::Start, 0},
        {CopyOperation::Data, CopyStage::Progress, copyPiece},
        {CopyOperation::Data, CopyStage::Progress, 2 * copyPiece},
        {CopyOperation::Data, CopyStage::Progress, 2 * copyPiece + 1},
        {CopyOperation::Data, CopyStage::Finish, 2 * copyPiece + 1},
        {CopyOperation::Attributes, CopyStage::Start, 2 * copyPiece + 1},
        {CopyOperation::Attributes, CopyStage::Finish, 2 * copyPiece + 1}};
    EXPECT_EQ(m_reports, expected);
    EXPECT_EQ(m_folder.read("copy"), m_folder.read("source"));
}

TEST_F(CopyServiceTest, AnEmptyFileMakesNoProgress) {
    m_folder.write("source", "");

    EXPECT_EQ(copyAndKeepReports(), 0);

    ASSERT_EQ(m_reports.size(), 4U);
    EXPECT_EQ(m_reports[1], (ToldStep{CopyOperation::Data, CopyStage::Finish, 0}));
    EXPECT_EQ(m_folder.read("copy"), "");
}

TEST_F(CopyServiceTest, AQuitAtAnyReportEndsTheCopyAndLeavesWhatWasMade) {
    const std::string content(2 * copyPiece, 'x');
    m_folder.write("source", content);
    ASSERT_EQ(copyAndKeepReports(), 0);
    const std::size_t count = m_reports.size();

    for (std::size_t at = 0; at < count; ++at) {
        std::filesystem::remove(m_folder / "copy");
        m_reports.clear();

        EXPECT_EQ(copyAndKeepReports(at), ECANCELED) << at;

        ASSERT_EQ(m_reports.size(), at + 1);
        EXPECT_EQ(m_folder.read("copy"), content.substr(0, m_reports.back().copied)) << at;
    }
}

TEST_F(CopyServiceTest, ATakenNameFailsWithoutAReport) {
    m_folder.write("source", "new");
    m_folder.write("copy", "old");

    EXPECT_EQ(copyAndKeepReports(), EEXIST);

    EXPECT_TRUE(m_reports.empty());
    EXPECT_EQ(m_folder.read("copy"), "old");
}

TEST_F(CopyServiceTest, ADanglingLinkTakesTheNameToo) {
    m_folder.write("source", "new");
    std::filesystem::create_symlink("nowhere", m_folder / "copy");

    EXPECT_EQ(copy(nullptr), EEXIST);

    EXPECT_FALSE(exists("nowhere"));
}

TEST_F(CopyServiceTest, ASourceOrAFolderThatIsMissingFails) {
    EXPECT_EQ(copy(nullptr), ENOENT);
    EXPECT_FALSE(exists("copy"));

    m_folder.write("source", "");
    EXPECT_EQ(CopyService::host().copy(m_folder / "source", m_folder / "none/copy", nullptr), -1);
    EXPECT_EQ(errno, ENOENT);
}

TEST_F(CopyServiceTest, AnEmptyDestinationFails) {
    m_folder.write("source", "");

    EXPECT_EQ(CopyService::host().copy(m_folder / "source", "", nullptr), -1);
    EXPECT_EQ(errno, ENOENT);
}

TEST_F(CopyServiceTest, FollowsTheSourcesLink) {
    m_folder.write("target", "content");
    std::filesystem::create_symlink("target", m_folder / "source");

    EXPECT_EQ(copy(nullptr), 0);

    EXPECT_TRUE(
        std::filesystem::is_regular_file(std::filesystem::symlink_status(m_folder / "copy")));
    EXPECT_EQ(m_folder.read("copy"), "content");
}

TEST_F(CopyServiceTest, OfAFolderMakesTheFolderAlone) {
    m_folder.write("source/member", "content");

    EXPECT_EQ(copyAndKeepReports(), 0);

    EXPECT_TRUE(std::filesystem::is_directory(m_folder / "copy"));
    EXPECT_TRUE(std::filesystem::is_empty(m_folder / "copy"));
    const std::vector<ToldStep> expected = {{CopyOperation::Attributes, CopyStage::Start, 0},
                                            {CopyOperation::Attributes, CopyStage::Finish, 0}};
    EXPECT_EQ(m_reports, expected);
}

TEST_F(CopyServiceTest, ATakenFolderNameFails) {
    m_folder.write("source/member", "");
    m_folder.write("copy/other", "");

    EXPECT_EQ(copy(nullptr), EEXIST);
}

TEST_F(CopyServiceTest, RefusesAPipeWithoutWaitingForIt) {
    ASSERT_EQ(::mkfifo((m_folder / "source").c_str(), 0600), 0);

    EXPECT_EQ(copy(nullptr), EOPNOTSUPP);

    EXPECT_FALSE(exists("copy"));
}

TEST_F(CopyServiceTest, AFileThatGrowsMeanwhileIsADataErrorEvenIfItsReportSaysContinue) {
    m_folder.write("source", std::string(copyPiece, 'x'));

    EXPECT_EQ(copy([this](const CopyReport& report) {
                  m_reports.push_back({report.operation, report.stage, *report.bytesCopied});
                  if (report.stage == CopyStage::Progress)
                      m_folder.write("source", std::string(2 * copyPiece, 'x'));
                  return CopyAnswer::Continue;
              }),
              EIO);

    ASSERT_FALSE(m_reports.empty());
    EXPECT_EQ(m_reports.back().operation, CopyOperation::Data);
    EXPECT_EQ(m_reports.back().stage, CopyStage::Error);
}

TEST_F(CopyServiceTest, AFileThatIsCutShortMeanwhileIsADataError) {
    const std::string source = m_folder.write("source", std::string(2 * copyPiece, 'x'));

    EXPECT_EQ(copy([&](const CopyReport&) {
                  EXPECT_EQ(::truncate(source.c_str(), copyPiece), 0);
                  return CopyAnswer::Continue;
              }),
              EIO);
}

TEST_F(CopyServiceTest, AttributesThatAppearBeforeTheyAreCopiedAreCopied) {
    const std::string source = m_folder.write("source", "content");
    if (::setxattr(source.c_str(), "user.first", "1", 1, 0) != 0)
        GTEST_SKIP() << "no extended attributes here";

    EXPECT_EQ(copy([&](const CopyReport& report) {
                  if (report.operation == CopyOperation::Attributes)
                      ::setxattr(source.c_str(), "user.second", "2", 1, 0);
                  return CopyAnswer::Continue;
              }),
              0);

    char value = 0;
    EXPECT_EQ(::getxattr((m_folder / "copy").c_str(), "user.second", &value, 1), 1);
    EXPECT_EQ(value, '2');
}

TEST_F(CopyServiceTest, AttributesThatComeGoAndGrowMeanwhileDoNotFailTheCopy) {
    const std::string source = m_folder.write("source", "content");
    if (::setxattr(source.c_str(), "user.first", "1", 1, 0) != 0)
        GTEST_SKIP() << "no extended attributes here";
    std::atomic<bool> isOver = false;
    std::thread other([&] {
        const std::string large(900, 'x');
        while (!isOver) {
            ::setxattr(source.c_str(), "user.second", "2", 1, 0);
            ::setxattr(source.c_str(), "user.third.with.a.longer.name", large.data(), large.size(),
                       0);
            ::setxattr(source.c_str(), "user.second", large.data(), large.size(), 0);
            ::removexattr(source.c_str(), "user.third.with.a.longer.name");
            ::removexattr(source.c_str(), "user.second");
        }
    });

    for (std::size_t round = 0; round < testRounds(50); ++round) {
        EXPECT_EQ(copy(nullptr), 0) << round;
        char value = 0;
        EXPECT_EQ(::getxattr((m_folder / "copy").c_str(), "user.first", &value, 1), 1);
        std::filesystem::remove(m_folder / "copy");
    }
    isOver = true;
    other.join();
}

TEST_F(CopyServiceTest, AFileThatHidesItsSizeIsNoEmptyFile) {
    EXPECT_EQ(CopyService::host().copy("/proc/self/status", m_folder / "copy", nullptr), -1);
    EXPECT_EQ(errno, EIO);
}

TEST_F(CopyServiceTest, CopiesFromAnotherFileSystem) {
    char pattern[] = "/dev/shm/parvel-XXXXXX";
    struct stat here {};
    struct stat there {};
    const int file = ::mkstemp(pattern);
    if (file < 0)
        GTEST_SKIP() << "no /dev/shm here";
    const std::string content(3 * copyPiece + 7, 'y');
    EXPECT_EQ(::write(file, content.data(), content.size()), static_cast<ssize_t>(content.size()));
    ::close(file);

    const int result = CopyService::host().copy(pattern, m_folder / "copy", nullptr);
    const bool isElsewhere = ::stat(pattern, &there) == 0 &&
                             ::stat(m_folder.path().c_str(), &here) == 0 &&
                             here.st_dev != there.st_dev;
    ::unlink(pattern);

    if (!isElsewhere)
        GTEST_SKIP() << "/dev/shm lies on the same file system";
    EXPECT_EQ(result, 0);
    EXPECT_EQ(m_folder.read("copy"), content);
}

}  // namespace
}  // namespace parvel::testing
