#include <stdlib.h>
#include <sys/stat.h>

#include <filesystem>
#include <fstream>

#include <gtest/gtest.h>

#include "tests/support/ServicedFolder.h"

namespace parvel::testing {
namespace {

namespace fs = std::filesystem;

/// A second file system to move to; skipped where the machine has none.
class AcrossFileSystems : public ServicedFolder {
protected:
    void SetUp() override {
        struct stat here {};
        struct stat there {};
        std::string pattern = "/dev/shm/parvel-XXXXXX";
        if (!mkdtemp(pattern.data()))
            GTEST_SKIP() << "no memory file system";
        m_other = pattern;
        ASSERT_EQ(stat(m_other.c_str(), &there), 0);
        ASSERT_EQ(stat(m_folder.path().c_str(), &here), 0);
        if (here.st_dev == there.st_dev)
            GTEST_SKIP() << "only one file system";
    }
    void TearDown() override {
        if (!m_other.empty())
            fs::remove_all(m_other);
    }
    [[nodiscard]] URL otherURL(const char* name) const {
        return URL::fileURLWithPath((m_other / name).string());
    }

    fs::path m_other;
};

TEST_F(AcrossFileSystems, AMovedFolderArrivesWholeAndTheSourceGoes) {
    const std::string file = m_folder.write("a.epub/OPS/x", "content");
    setAttribute(m_folder / "a.epub", "user.com.kestrel.Folium.assetID", "42");
    setAttribute(file, "user.t", "v");

    EXPECT_TRUE(m_service->moveItem(m_folder.url("a.epub"), otherURL("b.epub")));

    EXPECT_EQ(namesIn(m_folder.path()), Names{});
    EXPECT_EQ(namesIn(m_other), Names{"b.epub"});
    EXPECT_EQ(attribute(m_other / "b.epub", "user.com.kestrel.Folium.assetID"), "42");
    EXPECT_EQ(attribute(m_other / "b.epub/OPS/x", "user.t"), "v");
}

TEST_F(AcrossFileSystems, AMoveOntoATakenNameLeavesBothWhole) {
    m_folder.write("a", "1");
    std::ofstream(m_other / "b") << "2";

    EXPECT_FALSE(m_service->moveItem(m_folder.url("a"), otherURL("b"), &m_error));

    EXPECT_EQ(m_error, generalError(PVFileErrorCode::FileExists, otherURL("b")));
    EXPECT_EQ(m_folder.read("a"), "1");
    EXPECT_EQ(namesIn(m_other), Names{"b"});
    EXPECT_EQ(fs::file_size(m_other / "b"), 1U);
}

TEST_F(AcrossFileSystems, AReplacementTakesThePlaceAndTheOldNameGoes) {
    m_folder.write("new/x", "2");
    fs::create_directory(m_other / "old");
    std::ofstream(m_other / "old/y") << "1";

    EXPECT_TRUE(m_service->replaceItem(otherURL("old"), m_folder.url("new"),
                                       ReplaceOptions::NewMetadataOnly));

    EXPECT_EQ(namesIn(m_folder.path()), Names{});
    EXPECT_EQ(namesIn(m_other), Names{"old"});
    EXPECT_EQ(namesIn(m_other / "old"), Names{"x"});
}

TEST_F(AcrossFileSystems, TheDefaultReplacementKeepsWhatTheNewItemLacks) {
    m_folder.write("new", "2");
    std::ofstream(m_other / "old") << "1";
    setAttribute(m_other / "old", "user.kept", "old");

    EXPECT_TRUE(
        m_service->replaceItem(otherURL("old"), m_folder.url("new"), ReplaceOptions::Default));

    EXPECT_EQ(attribute(m_other / "old", "user.kept"), "old");
    EXPECT_EQ(namesIn(m_folder.path()), Names{});
}

}  // namespace
}  // namespace parvel::testing
