#include "parvel/platform/linux/StagingFolder.h"

#include <sys/fsuid.h>
#include <sys/stat.h>
#include <unistd.h>

#include <filesystem>

#include <gtest/gtest.h>

#include "tests/support/TemporaryDirectory.h"

namespace parvel::testing {
namespace {

namespace fs = std::filesystem;

using host::HiddenItem;
using host::StagingFolder;

constexpr uid_t kOtherUser = 65534;

/// A folder that holds the root of synchronised storage, and books below it.
class Staging : public ::testing::Test {
protected:
    void SetUp() override {
        fs::create_directories(m_folder.path() / "synced/books");
        fs::create_directory(m_folder.path() / "synced/.stfolder");
    }

    std::string placeOfStagingFor(const std::string& folder) {
        const auto staging = StagingFolder::makeIn(folder, m_error);
        return staging ? fs::path(staging->path()).parent_path().string() : "none";
    }

    TemporaryDirectory m_folder;
    int m_error = 0;
};

TEST_F(Staging, TheFolderIsMadeBesideTheTargetAndGoesWithItsOwner) {
    const std::string target = m_folder.path() / "plain";
    fs::create_directory(target);

    EXPECT_EQ(placeOfStagingFor(target), target);

    EXPECT_TRUE(fs::is_empty(target));
}

TEST_F(Staging, ForSynchronisedStorageItIsMadeBesideTheRoot) {
    EXPECT_EQ(placeOfStagingFor(m_folder / "synced/books"), m_folder.path());
    EXPECT_EQ(placeOfStagingFor(m_folder / "synced"), m_folder.path());
}

TEST_F(Staging, OfNestedRootsTheOutermostCounts) {
    fs::create_directories(m_folder.path() / "synced/books/inner/.stfolder");

    EXPECT_EQ(placeOfStagingFor(m_folder / "synced/books/inner"), m_folder.path());
}

TEST_F(Staging, WhereNothingCanBeMadeBesideTheRootTheTargetsFolderServes) {
    if (geteuid() != 0)
        GTEST_SKIP() << "only root can become another user";
    const std::string books = m_folder / "synced/books";
    ASSERT_EQ(chown(books.c_str(), kOtherUser, kOtherUser), 0);
    fs::permissions(m_folder.path(), fs::perms{0755});
    setfsuid(kOtherUser);

    const std::string place = placeOfStagingFor(books);
    setfsuid(geteuid());

    EXPECT_EQ(place, books);
}

TEST_F(Staging, WhatNobodyHoldsIsCleared) {
    const std::string target = m_folder.path();
    m_folder.write(".parvel-stage-folder/item/x", "1");
    m_folder.write(".parvel-stage-file", "1");
    fs::create_symlink("nowhere", m_folder / ".parvel-stage-link");
    fs::create_directory(m_folder / ".parvel-stage-closed");
    fs::permissions(m_folder / ".parvel-stage-closed", fs::perms::none);

    EXPECT_EQ(placeOfStagingFor(target), target);

    for (const auto& entry : fs::directory_iterator(target))
        EXPECT_EQ(entry.path().filename(), "synced");
}

TEST_F(Staging, WhatForbidsChangesIsClearedByAnOrdinaryUserToo) {
    if (geteuid() != 0)
        GTEST_SKIP() << "only root can become another user";
    const std::string left = m_folder / ".parvel-stage-left";
    m_folder.write(".parvel-stage-left/item/OPS/text", "1");
    for (const char* name : {"", "/item", "/item/OPS", "/item/OPS/text"})
        ASSERT_EQ(chown((left + name).c_str(), kOtherUser, kOtherUser), 0);
    for (const char* name : {"/item/OPS", "/item", ""})
        fs::permissions(left + name, fs::perms{0555});
    ASSERT_EQ(chown(m_folder.path().c_str(), kOtherUser, kOtherUser), 0);
    ASSERT_EQ(seteuid(kOtherUser), 0);

    const std::string place = placeOfStagingFor(m_folder.path());
    ASSERT_EQ(seteuid(0), 0);

    EXPECT_EQ(place, m_folder.path());
    EXPECT_FALSE(fs::exists(left));
}

TEST_F(Staging, WhatAnotherHoldsStays) {
    const std::string target = m_folder.path();
    const auto held = HiddenItem::makeFolderIn(target, m_error);
    ASSERT_TRUE(held);

    EXPECT_EQ(placeOfStagingFor(target), target);

    EXPECT_TRUE(fs::exists(held->path()));
}

TEST_F(Staging, AFolderIsLookedThroughOnceByAProcess) {
    const std::string target = m_folder.path();
    EXPECT_EQ(placeOfStagingFor(target), target);
    m_folder.write(".parvel-stage-later", "1");

    EXPECT_EQ(placeOfStagingFor(target), target);

    EXPECT_TRUE(fs::exists(m_folder / ".parvel-stage-later"));
}

TEST_F(Staging, AnotherNameIsNotCleared) {
    m_folder.write(".parvel-aside-x", "1");
    m_folder.write("parvel-stage-x", "1");

    EXPECT_EQ(placeOfStagingFor(m_folder.path()), m_folder.path());

    EXPECT_TRUE(fs::exists(m_folder / ".parvel-aside-x"));
    EXPECT_TRUE(fs::exists(m_folder / "parvel-stage-x"));
}

TEST(HiddenItems, OnlyLocksOfThisMachinesFileSystemsAreTrusted) {
    EXPECT_TRUE(host::isLockSeenByAll(0xEF53));
    EXPECT_TRUE(host::isLockSeenByAll(0x01021994));
    // Btrfs, also where the host's type is of 32 bits and has a sign.
    EXPECT_TRUE(host::isLockSeenByAll(0x9123683E));
    EXPECT_TRUE(host::isLockSeenByAll(static_cast<std::int32_t>(0x9123683E)));

    EXPECT_FALSE(host::isLockSeenByAll(0x6969));      // NFS
    EXPECT_FALSE(host::isLockSeenByAll(0xFF534D42));  // SMB
    EXPECT_FALSE(host::isLockSeenByAll(0x65735546));  // FUSE
}

TEST(HiddenItems, AHiddenItemThatWasReleasedStays) {
    const TemporaryDirectory folder;
    const std::string item = folder.write("a", "1");
    std::string path;
    {
        int error = 0;
        auto hidden = HiddenItem::hide(item, error);
        ASSERT_TRUE(hidden);
        path = hidden->path();
        hidden->release();
    }

    EXPECT_TRUE(fs::exists(path));
    EXPECT_FALSE(fs::exists(item));
}

}  // namespace
}  // namespace parvel::testing
