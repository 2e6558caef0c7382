// Moves as an ordinary user makes them, where modes and owners stand in the way.

#include <sys/stat.h>
#include <sys/xattr.h>
#include <unistd.h>

#include <algorithm>
#include <filesystem>

#include <gtest/gtest.h>

#include "parvel/platform/FileSystemService.h"
#include "tests/support/TemporaryDirectory.h"

namespace parvel::testing {
namespace {

namespace fs = std::filesystem;

constexpr uid_t kOrdinaryUser = 65534;

/// Two file systems, and the right of an ordinary user alone where the test's own is root's.
class OrdinaryUsersMoves : public ::testing::Test {
protected:
    void SetUp() override {
        std::string pattern = "/dev/shm/parvel-XXXXXX";
        if (!mkdtemp(pattern.data()))
            GTEST_SKIP() << "no memory file system";
        m_other = pattern;
        own(m_folder.path());
        own(m_other);
    }
    void TearDown() override {
        if (!m_other.empty())
            fs::remove_all(m_other);
    }

    static void own(const fs::path& path) {
        if (geteuid() == 0) {
            ASSERT_EQ(lchown(path.c_str(), kOrdinaryUser, kOrdinaryUser), 0);
        }
    }
    void makeFolder(const char* name) const {
        fs::create_directory(m_folder / name);
        own(m_folder / name);
    }
    /// A package of one file in a folder of its own, whose folders have the mode.
    void makePackage(const fs::path& path, fs::perms mode) {
        fs::create_directories(path / "OPS");
        std::ofstream(path / "OPS/text") << path.filename().string();
        for (const fs::path& item : {path / "OPS/text", path / "OPS", path})
            own(item);
        fs::permissions(path / "OPS", mode);
        fs::permissions(path, mode);
    }
    template <class Act>
    bool asOrdinaryUser(Act act) {
        const uid_t user = geteuid();
        if (user == 0) {
            EXPECT_EQ(seteuid(kOrdinaryUser), 0);
        }
        const bool result = act();
        EXPECT_EQ(seteuid(user), 0);
        return result;
    }
    static fs::perms modeOf(const fs::path& path) { return fs::status(path).permissions(); }
    static std::vector<std::string> namesIn(const fs::path& folder) {
        std::vector<std::string> names;
        for (const auto& entry : fs::directory_iterator(folder))
            names.push_back(entry.path().filename().string());
        std::sort(names.begin(), names.end());
        return names;
    }
    static URL url(const fs::path& path) { return URL::fileURLWithPath(path.string()); }

    TemporaryDirectory m_folder;
    fs::path m_other;
    std::shared_ptr<FileSystemService> m_service = FileSystemService::makeDefault();
    std::optional<Error> m_error;
};

using Names = std::vector<std::string>;

TEST_F(OrdinaryUsersMoves, APackageThatForbidsChangesMovesAcrossFileSystems) {
    makePackage(m_folder.path() / "a.epub", fs::perms{0555});

    EXPECT_TRUE(asOrdinaryUser([&] {
        return m_service->moveItem(m_folder.url("a.epub"), url(m_other / "b.epub"), &m_error);
    }));

    EXPECT_FALSE(m_error);
    EXPECT_EQ(namesIn(m_folder.path()), Names{});
    EXPECT_EQ(namesIn(m_other), Names{"b.epub"});
    EXPECT_EQ(modeOf(m_other / "b.epub"), fs::perms{0555});
    EXPECT_EQ(modeOf(m_other / "b.epub/OPS"), fs::perms{0555});
    EXPECT_TRUE(fs::exists(m_other / "b.epub/OPS/text"));
}

TEST_F(OrdinaryUsersMoves, APackageThatForbidsChangesMovesToAnotherFolder) {
    makePackage(m_folder.path() / "a.epub", fs::perms{0555});
    makeFolder("to");

    EXPECT_TRUE(asOrdinaryUser([&] {
        return m_service->moveItem(m_folder.url("a.epub"), m_folder.url("to/b.epub"), &m_error);
    }));

    EXPECT_FALSE(m_error);
    EXPECT_EQ(namesIn(m_folder.path()), Names{"to"});
    EXPECT_EQ(namesIn(m_folder / "to"), Names{"b.epub"});
    EXPECT_EQ(modeOf(m_folder / "to/b.epub"), fs::perms{0555});
    EXPECT_TRUE(fs::exists(m_folder / "to/b.epub/OPS/text"));
}

TEST_F(OrdinaryUsersMoves, APackageThatForbidsChangesKeepsItsModeWhereItCannotMove) {
    if (geteuid() != 0)
        GTEST_SKIP() << "only root can make what its user can't change";
    makePackage(m_folder.path() / "a.epub", fs::perms{0555});
    fs::create_directory(m_folder / "to");

    EXPECT_FALSE(asOrdinaryUser([&] {
        return m_service->moveItem(m_folder.url("a.epub"), m_folder.url("to/a.epub"), &m_error);
    }));

    EXPECT_EQ(m_error, makePOSIXError(EACCES, m_folder.url("to/a.epub")));
    EXPECT_EQ(namesIn(m_folder.path()), (Names{"a.epub", "to"}));
    EXPECT_EQ(namesIn(m_folder / "to"), Names{});
    EXPECT_EQ(modeOf(m_folder / "a.epub"), fs::perms{0555});
}

TEST_F(OrdinaryUsersMoves, AnothersPackageThatForbidsChangesStays) {
    if (geteuid() != 0)
        GTEST_SKIP() << "only root can make what its user can't change";
    makePackage(m_folder.path() / "a.epub", fs::perms{0555});
    ASSERT_EQ(chown((m_folder / "a.epub").c_str(), 0, 0), 0);
    makeFolder("to");

    EXPECT_FALSE(asOrdinaryUser([&] {
        return m_service->moveItem(m_folder.url("a.epub"), m_folder.url("to/a.epub"), &m_error);
    }));

    EXPECT_EQ(m_error, makePOSIXError(EACCES, m_folder.url("to/a.epub")));
    EXPECT_EQ(namesIn(m_folder.path()), (Names{"a.epub", "to"}));
    EXPECT_EQ(modeOf(m_folder / "a.epub"), fs::perms{0555});
}

TEST_F(OrdinaryUsersMoves, APackageThatForbidsChangesReplacesAnotherInAnotherFolder) {
    makePackage(m_folder.path() / "new", fs::perms{0555});
    makeFolder("to");
    makePackage(m_folder.path() / "to/old", fs::perms{0555});

    EXPECT_TRUE(asOrdinaryUser([&] {
        return m_service->replaceItem(m_folder.url("to/old"), m_folder.url("new"),
                                      ReplaceOptions::NewMetadataOnly, nullptr, &m_error);
    }));

    EXPECT_FALSE(m_error);
    EXPECT_EQ(namesIn(m_folder.path()), Names{"to"});
    EXPECT_EQ(namesIn(m_folder / "to"), Names{"old"});
    EXPECT_EQ(modeOf(m_folder / "to/old"), fs::perms{0555});
    EXPECT_EQ(m_folder.read("to/old/OPS/text"), "new");
}

TEST_F(OrdinaryUsersMoves, APackageReplacesOneThatForbidsChangesInAnotherFolder) {
    makePackage(m_folder.path() / "new", fs::perms{0755});
    makeFolder("to");
    makePackage(m_folder.path() / "to/old", fs::perms{0555});

    EXPECT_TRUE(asOrdinaryUser([&] {
        return m_service->replaceItem(m_folder.url("to/old"), m_folder.url("new"),
                                      ReplaceOptions::NewMetadataOnly, nullptr, &m_error);
    }));

    EXPECT_FALSE(m_error);
    EXPECT_EQ(namesIn(m_folder.path()), Names{"to"});
    EXPECT_EQ(namesIn(m_folder / "to"), Names{"old"});
    EXPECT_EQ(modeOf(m_folder / "to/old"), fs::perms{0755});
    EXPECT_EQ(m_folder.read("to/old/OPS/text"), "new");
}

TEST_F(OrdinaryUsersMoves, APackageThatForbidsChangesReplacesAnotherAcrossFileSystems) {
    makePackage(m_folder.path() / "new", fs::perms{0555});
    makePackage(m_other / "old", fs::perms{0555});

    EXPECT_TRUE(asOrdinaryUser([&] {
        return m_service->replaceItem(url(m_other / "old"), m_folder.url("new"),
                                      ReplaceOptions::NewMetadataOnly, nullptr, &m_error);
    }));

    EXPECT_FALSE(m_error);
    EXPECT_EQ(namesIn(m_folder.path()), Names{});
    EXPECT_EQ(namesIn(m_other), Names{"old"});
    EXPECT_EQ(modeOf(m_other / "old"), fs::perms{0555});
    std::string text;
    std::ifstream(m_other / "old/OPS/text") >> text;
    EXPECT_EQ(text, "new");
}

TEST_F(OrdinaryUsersMoves, APackageThatCannotBeRemovedKeepsItsPlaceAndModes) {
    if (geteuid() != 0)
        GTEST_SKIP() << "only root can make what its user can't remove";
    makePackage(m_folder.path() / "a.epub", fs::perms{0500});
    ASSERT_EQ(chown((m_folder / "a.epub/OPS").c_str(), 0, 0), 0);
    fs::permissions(m_folder / "a.epub/OPS", fs::perms{0755});
    fs::permissions(m_folder / "a.epub", fs::perms::none);

    EXPECT_FALSE(
        asOrdinaryUser([&] { return m_service->removeItem(m_folder.url("a.epub"), &m_error); }));

    EXPECT_EQ(m_error, makePOSIXError(EACCES, m_folder.url("a.epub")));
    EXPECT_EQ(namesIn(m_folder.path()), Names{"a.epub"});
    EXPECT_EQ(modeOf(m_folder / "a.epub"), fs::perms::none);
    EXPECT_TRUE(fs::exists(m_folder / "a.epub/OPS/text"));
}

TEST_F(OrdinaryUsersMoves, AReplacementThatFailsLeavesTheNewItemAsItWas) {
    if (geteuid() != 0)
        GTEST_SKIP() << "only root can make what its user can't remove";
    const std::string old = m_folder.write("library/old", "1");
    const std::string replacement = m_folder.write("closed/new", "2");
    ASSERT_EQ(setxattr(old.c_str(), "user.kept", "yes", 3, 0), 0);
    fs::permissions(old, fs::perms{0640});
    fs::permissions(replacement, fs::perms{0600});
    for (const char* name : {"library", "library/old", "closed/new"})
        own(m_folder / name);

    // Its own folder, root's, does not let it go.
    EXPECT_FALSE(asOrdinaryUser([&] {
        return m_service->replaceItem(m_folder.url("library/old"), m_folder.url("closed/new"),
                                      ReplaceOptions::Default, nullptr, &m_error);
    }));

    EXPECT_TRUE(m_error);
    EXPECT_EQ(m_folder.read("library/old"), "1");
    EXPECT_EQ(m_folder.read("closed/new"), "2");
    EXPECT_EQ(modeOf(replacement), fs::perms{0600});
    EXPECT_EQ(getxattr(replacement.c_str(), "user.kept", nullptr, 0), -1);
    EXPECT_EQ(namesIn(m_folder.path() / "library"), Names{"old"});
}

}  // namespace
}  // namespace parvel::testing
