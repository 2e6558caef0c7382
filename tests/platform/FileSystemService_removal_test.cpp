#include <fcntl.h>
#include <sys/fsuid.h>
#include <sys/stat.h>
#include <unistd.h>

#include <filesystem>

#include <gtest/gtest.h>

#include "tests/support/ServicedFolder.h"

namespace parvel::testing {
namespace {

namespace fs = std::filesystem;

using RemovedItem = ServicedFolder;

TEST_F(RemovedItem, AFolderOfAnyDepthIsRemoved) {
    constexpr int depth = 3000;
    std::string path = m_folder / "deep";
    fs::create_directory(path);
    const int start = open(path.c_str(), O_RDONLY | O_DIRECTORY);
    int folder = start;
    for (int i = 0; i < depth; ++i) {
        ASSERT_EQ(mkdirat(folder, "d", 0700), 0);
        const int below = openat(folder, "d", O_RDONLY | O_DIRECTORY);
        close(folder);
        folder = below;
    }
    close(folder);

    EXPECT_TRUE(m_service->removeItem(m_folder.url("deep"), &m_error));

    EXPECT_FALSE(m_error);
    EXPECT_EQ(namesIn(m_folder.path()), Names{});
}

TEST_F(RemovedItem, RemovingDoesNotFollowALinkOutOfTheItem) {
    m_folder.write("outside/kept", "1");
    fs::create_directory(m_folder / "a");
    fs::create_directory_symlink(m_folder / "outside", m_folder / "a/link");

    EXPECT_TRUE(m_service->removeItem(m_folder.url("a")));

    EXPECT_EQ(m_folder.read("outside/kept"), "1");
    EXPECT_EQ(namesIn(m_folder.path()), Names{"outside"});
}

TEST_F(RemovedItem, RemovingALinkLeavesItsTarget) {
    m_folder.write("target", "t");
    fs::create_symlink("target", m_folder / "link");

    EXPECT_TRUE(m_service->removeItem(m_folder.url("link")));

    EXPECT_EQ(namesIn(m_folder.path()), Names{"target"});
}

TEST_F(RemovedItem, APackageOfFoldersThatForbidChangesIsRemovedByItsOwner) {
    m_folder.write("a/b/c", "1");
    fs::permissions(m_folder / "a/b", fs::perms{0});
    fs::permissions(m_folder / "a", fs::perms{0500});
    // The system's first user may do anything; another one, here nobody, has to be let in.
    constexpr uid_t nobody = 65534;
    for (const char* name : {"", "a", "a/b", "a/b/c"})
        (void)!chown((m_folder / name).c_str(), nobody, nobody);
    setfsuid(geteuid() == 0 ? nobody : geteuid());

    const bool isRemoved = m_service->removeItem(m_folder.url("a"), &m_error);
    setfsuid(geteuid());

    EXPECT_TRUE(isRemoved);
    EXPECT_EQ(namesIn(m_folder.path()), Names{});
}

TEST_F(RemovedItem, RemovingNothingIsAnError) {
    EXPECT_FALSE(m_service->removeItem(m_folder.url("a"), &m_error));

    EXPECT_EQ(m_error, generalError(PVFileErrorCode::NoSuchFile, m_folder.url("a")));
}

}  // namespace
}  // namespace parvel::testing
