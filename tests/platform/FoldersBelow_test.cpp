#include "parvel/platform/linux/FoldersBelow.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <cerrno>
#include <filesystem>

#include "tests/support/TemporaryDirectory.h"

namespace parvel::testing {
namespace {

class FoldersBelowTest : public ::testing::Test {
protected:
    /// The path below the root of what is opened for a path, or the errno's name.
    std::string opened(const std::string& path) {
        const int folder = m_folders.open(path);
        if (folder < 0)
            return strerrorname_np(errno);
        const std::filesystem::path place =
            std::filesystem::read_symlink("/proc/self/fd/" + std::to_string(folder));
        return place.lexically_relative(std::filesystem::canonical(m_folder / "root")).string();
    }

    static host::FileDescriptor rootIn(const TemporaryDirectory& folder) {
        std::filesystem::create_directory(folder / "root");
        return host::FileDescriptor(
            ::open((folder / "root").c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC));
    }

    TemporaryDirectory m_folder;
    struct stat m_archive {};
    host::FileDescriptor m_root = rootIn(m_folder);
    host::ArchiveOwner m_owner{m_archive, m_root.get()};
    host::FoldersBelow m_folders{std::move(m_root), m_owner};
};

TEST_F(FoldersBelowTest, TheEmptyPathIsTheFolderThatHoldsAll) {
    EXPECT_EQ(opened(""), ".");
}

TEST_F(FoldersBelowTest, MakesWhatIsMissingForItsOwnerAlone) {
    EXPECT_EQ(opened("a/b/c"), "a/b/c");

    for (const char* path : {"root/a", "root/a/b", "root/a/b/c"}) {
        struct stat status {};
        ASSERT_EQ(::stat((m_folder / path).c_str(), &status), 0) << path;
        EXPECT_EQ(status.st_mode & 07777, 0700U) << path;
    }
}

TEST_F(FoldersBelowTest, OpensWhatIsThere) {
    std::filesystem::create_directories(m_folder / "root/a/b");

    EXPECT_EQ(opened("a/b"), "a/b");
    EXPECT_EQ(opened("a"), "a");
    EXPECT_EQ(opened("a/c"), "a/c");
}

TEST_F(FoldersBelowTest, AFolderAskedForAgainIsOpenStill) {
    const int first = m_folders.open("a");

    EXPECT_EQ(opened("b"), "b");
    EXPECT_EQ(m_folders.open("a"), first);
}

TEST_F(FoldersBelowTest, AnyNumberOfFoldersTakeTurns) {
    for (int round = 0; round < 3; ++round) {
        for (int number = 0; number < 20; ++number) {
            const std::string path = "a/" + std::to_string(number) + "/b";
            EXPECT_EQ(opened(path), path);
        }
    }

    EXPECT_LT(m_folders.open("z"), 40);
}

TEST_F(FoldersBelowTest, ADeepPathIsMadeToItsEnd) {
    std::string deep = "f";
    for (int depth = 1; depth < 200; ++depth)
        deep += "/f";

    EXPECT_EQ(opened(deep), deep);
    EXPECT_EQ(opened(deep), deep);
}

TEST_F(FoldersBelowTest, NoLinkIsFollowed) {
    std::filesystem::create_directory(m_folder / "outside");
    std::filesystem::create_directory(m_folder / "root/a");
    for (const char* link : {"root/link", "root/a/link"})
        std::filesystem::create_symlink(m_folder / "outside", m_folder / link);

    EXPECT_EQ(opened("link"), "ELOOP");
    EXPECT_EQ(opened("link/b"), "ELOOP");
    EXPECT_EQ(opened("a/link/b"), "ELOOP");
    EXPECT_EQ(opened("a"), "a");
    EXPECT_EQ(opened("a/link"), "ELOOP");
    EXPECT_TRUE(std::filesystem::is_empty(m_folder / "outside"));
}

TEST_F(FoldersBelowTest, AFileIsNoFolder) {
    m_folder.write("root/file", "");

    EXPECT_EQ(opened("file"), "ENOTDIR");
    EXPECT_EQ(opened("file/b"), "ENOTDIR");
}

}  // namespace
}  // namespace parvel::testing
