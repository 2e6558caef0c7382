#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <sys/xattr.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <filesystem>

#include "parvel/platform/linux/PackageCopy.h"
#include "tests/support/ArchiveCopying.h"

namespace parvel::testing {
namespace {

class CopyingTrees : public ArchiveCopying {
protected:
    std::string source(const std::string& member, std::string_view content = "") {
        return m_folder.write("source/" + member, content);
    }
    void link(const std::string& target, const std::string& member) {
        std::filesystem::create_directories(
            std::filesystem::path(m_folder / ("source/" + member)).parent_path());
        std::filesystem::create_symlink(target, m_folder / ("source/" + member));
    }
    void expectFailure(const std::string& member, int error) {
        EXPECT_EQ(copyTree(), error);
        EXPECT_EQ(m_callbacks.failed,
                  (std::vector<RecordingCopierCallbacks::Failed>{{copyPath(member), error}}));
        EXPECT_TRUE(m_callbacks.errnoWasSet);
        EXPECT_TRUE(m_callbacks.fatal.empty());
    }
};

TEST_F(CopyingTrees, CopiesAllThatIsInAFolderHiddenItemsToo) {
    source("mimetype", "application/epub+zip");
    source("OPS/text/a", "a");
    source(".hidden/b", "b");
    std::filesystem::create_directory(m_folder / "source/empty");

    EXPECT_EQ(copyTree(), 0);

    EXPECT_EQ(names(), (Names{".hidden", ".hidden/b", "OPS", "OPS/text", "OPS/text/a", "empty",
                              "mimetype"}));
    EXPECT_EQ(read("OPS/text/a"), "a");
    EXPECT_EQ(read(".hidden/b"), "b");
}

TEST_F(CopyingTrees, WhatAnEditMadeForItselfInThePackageIsNeitherCountedNorCopied) {
    source("mimetype", "123");
    source(".parvel-stage-killed/file", "1");
    source(".parvel-stage-name", "1");
    source("OPS/.parvel-stage-name", "4");
    source(".parvel-aside-name", "5");

    const ArchiveCopier::Count count = m_copier->countTree(sourcePath());
    EXPECT_EQ(copyTree(), 0);

    EXPECT_EQ(count, (ArchiveCopier::Count{3, 5}));
    EXPECT_EQ(names(), (Names{".parvel-aside-name", "OPS", "OPS/.parvel-stage-name", "mimetype"}));
    EXPECT_EQ(m_callbacks.finished.size(), 3U);
    EXPECT_TRUE(std::filesystem::exists(m_folder / "source/.parvel-stage-killed/file"));
}

TEST_F(CopyingTrees, TellsFilesAndLinksAndCountsThemAlike) {
    source("folder/a", "123");
    link("a", "folder/b");

    const ArchiveCopier::Count count = m_copier->countTree(sourcePath());
    EXPECT_EQ(copyTree(), 0);

    EXPECT_EQ(count, (ArchiveCopier::Count{2, 3}));
    std::sort(m_callbacks.finished.begin(), m_callbacks.finished.end(),
              [](const auto& left, const auto& right) { return left.path < right.path; });
    const std::vector<RecordingCopierCallbacks::Finished> expected = {
        {copyPath("folder/a"), ArchiveObjectType::File, 3},
        {copyPath("folder/b"), ArchiveObjectType::Link, 0}};
    EXPECT_EQ(m_callbacks.finished, expected);
}

TEST_F(CopyingTrees, KeepsModesAndTimesOfFilesAndFolders) {
    ::chmod(source("folder/a").c_str(), 0640);
    const std::array<timespec, 2> times{timespec{1000, 0}, timespec{2000, 5}};
    ASSERT_EQ(::utimensat(AT_FDCWD, (m_folder / "source/folder/a").c_str(), times.data(), 0), 0);
    ::chmod((m_folder / "source/folder").c_str(), 0550);
    ::chmod(sourcePath().c_str(), 0750);

    EXPECT_EQ(copyTree(), 0);

    struct stat status {};
    ASSERT_EQ(::stat(copyPath("folder/a").c_str(), &status), 0);
    EXPECT_EQ(status.st_mode & 07777, 0640U);
    EXPECT_EQ(status.st_mtim.tv_sec, 2000);
    EXPECT_EQ(status.st_mtim.tv_nsec, 5);
    ASSERT_EQ(::stat(copyPath("folder").c_str(), &status), 0);
    EXPECT_EQ(status.st_mode & 07777, 0550U);
    ASSERT_EQ(::stat(copyPath("").c_str(), &status), 0);
    EXPECT_EQ(status.st_mode & 07777, 0750U);
}

TEST_F(CopyingTrees, KeepsAttributesOfFilesAndFolders) {
    const std::string file = source("folder/a");
    if (::setxattr(file.c_str(), "user.parvel", "1", 1, 0) != 0)
        GTEST_SKIP() << "no extended attributes here";
    ASSERT_EQ(::setxattr(sourcePath().c_str(), "user.parvel", "2", 1, 0), 0);

    EXPECT_EQ(copyTree(), 0);

    char value = 0;
    EXPECT_EQ(::getxattr(copyPath("folder/a").c_str(), "user.parvel", &value, 1), 1);
    EXPECT_EQ(value, '1');
    EXPECT_EQ(::getxattr(copyPath("").c_str(), "user.parvel", &value, 1), 1);
    EXPECT_EQ(value, '2');
}

TEST_F(CopyingTrees, LinksThatStayInsideAreMadeAgainAsTheyAre) {
    source("OPS/a", "a");
    link("OPS/a", "up");
    link("../OPS/./a", "other/down");
    link("nowhere", "dangling");

    EXPECT_EQ(copyTree(), 0);

    EXPECT_EQ(std::filesystem::read_symlink(copyPath("up")), "OPS/a");
    EXPECT_EQ(std::filesystem::read_symlink(copyPath("other/down")), "../OPS/./a");
    EXPECT_EQ(std::filesystem::read_symlink(copyPath("dangling")), "nowhere");
}

TEST_F(CopyingTrees, ALinkThatLeavesThePackageIsRefused) {
    link("../../outside", "folder/link");

    expectFailure("folder/link", ELOOP);
}

TEST(PackageLinks, StayInsideByTheirText) {
    for (const char* target : {"a", "a/b", ".", "./a", "a/./b", "a//b"})
        EXPECT_TRUE(host::linkStaysInside(target, 0)) << target;
    EXPECT_TRUE(host::linkStaysInside("..", 1));
    EXPECT_TRUE(host::linkStaysInside(".././../a", 2));
}

TEST(PackageLinks, LeadOutByTheRootOrByTooManyStepsUp) {
    for (const char* target : {"/", "/a", "..", "../a", "./..", "../"})
        EXPECT_FALSE(host::linkStaysInside(target, 0)) << target;
    EXPECT_FALSE(host::linkStaysInside("../..", 1));
}

TEST(PackageLinks, ThatStepUpBehindANameMightPassAnotherLinkAndCountAsOut) {
    EXPECT_FALSE(host::linkStaysInside("a/../b", 3));
}

TEST_F(CopyingTrees, APipeIsRefusedWithoutWaitingForIt) {
    source("a");
    ASSERT_EQ(::mkfifo((m_folder / "source/pipe").c_str(), 0600), 0);

    expectFailure("pipe", EOPNOTSUPP);
}

TEST_F(CopyingTrees, AnotherAnswerLeavesTheItemOutAndGoesOn) {
    m_callbacks.answer = 0;
    source("a", "a");
    source("z", "z");
    link("/etc", "link");
    ASSERT_EQ(::mkfifo((m_folder / "source/pipe").c_str(), 0600), 0);

    EXPECT_EQ(copyTree(), 0);

    EXPECT_EQ(names(), (Names{"a", "z"}));
    EXPECT_EQ(m_callbacks.failed.size(), 2U);
}

TEST_F(CopyingTrees, ATreeThatIsTooDeepIsRefused) {
    std::string deep = "d";
    for (int depth = 1; depth < 200; ++depth)
        deep += "/d";
    source(deep + "/a");
    EXPECT_EQ(copyTree(), 0);

    std::filesystem::remove_all(copyPath(""));
    source(deep + "/d/a");
    expectFailure(deep + "/d", ELOOP);
}

TEST_F(CopyingTrees, ACopyIntoItsOwnSourceDoesNotCopyItself) {
    source("a", "a");
    source("folder/b", "b");
    const std::string inside = m_folder / "source/folder/copy";

    EXPECT_EQ(m_copier->copy(sourcePath(), inside, Dictionary()), EINVAL);

    EXPECT_FALSE(std::filesystem::exists(inside + "/folder/copy"));
}

TEST_F(CopyingTrees, TheSourcesOwnLinkIsFollowed) {
    m_folder.write("target/a", "a");
    std::filesystem::create_symlink("target", sourcePath());

    EXPECT_EQ(m_copier->countTree(sourcePath()).files, 1U);
    EXPECT_EQ(copyTree(), 0);

    EXPECT_EQ(names(), Names{"a"});
}

TEST_F(CopyingTrees, AnExistingDestinationIsFatalAndStaysAsItIs) {
    source("a", "new");
    m_folder.write("copy/a", "old");

    EXPECT_EQ(copyTree(), EEXIST);

    EXPECT_EQ(m_callbacks.fatal, std::vector{EEXIST});
    EXPECT_EQ(read("a"), "old");
}

TEST_F(CopyingTrees, ASourceThatIsMissingOrNoFolderIsFatal) {
    EXPECT_EQ(copyTree(), ENOENT);
    EXPECT_EQ(m_copier->countTree(sourcePath()), ArchiveCopier::Count());

    m_folder.write("source", "file");
    EXPECT_EQ(copyTree(), ENOTDIR);
    EXPECT_EQ(m_callbacks.fatal, (std::vector{ENOENT, ENOTDIR}));
}

TEST_F(CopyingTrees, AnOptionThatIsFalseIsNone) {
    source("a", "a");

    EXPECT_EQ(m_copier->copy(sourcePath(), copyPath(""),
                             {{std::string(ArchiveCopier::extractPKZip), Number::boolean(false)}}),
              0);

    EXPECT_EQ(names(), Names{"a"});
}

}  // namespace
}  // namespace parvel::testing
