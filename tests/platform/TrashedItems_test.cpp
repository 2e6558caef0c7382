#include <stdlib.h>

#include <filesystem>
#include <regex>

#include <gtest/gtest.h>

#include "parvel/platform/FileSystemService.h"
#include "parvel/platform/TrashedItems.h"
#include "tests/support/EnvironmentValue.h"
#include "tests/support/TemporaryDirectory.h"

namespace parvel::testing {
namespace {

/// A home trash of the test's own; what lies in other volumes' trash folders is passed over.
class TrashedItems : public ::testing::Test {
protected:
    void trash(const std::string& name) {
        m_folder.write(name, name);
        ASSERT_TRUE(m_service->trashItem(m_folder.url(name), nullptr));
    }
    /// Those of this test's folder: name in the trash, path below the folder before.
    [[nodiscard]] std::vector<std::pair<std::string, std::string>> items() const {
        const std::string begin = m_folder.path().string() + "/";
        std::vector<std::pair<std::string, std::string>> found;
        for (const TrashedItem& item : trashedItems()) {
            if (item.place.path().starts_with(begin))
                found.emplace_back(item.place.lastPathComponent(),
                                   item.original.path().substr(begin.size()));
        }
        return found;
    }
    void writeInfo(const std::string& name, const std::string& text) const {
        m_folder.write("data/Trash/files/" + name, "stray");
        m_folder.write("data/Trash/info/" + name + ".trashinfo", text);
    }

    TemporaryDirectory m_folder;
    const EnvironmentValue m_dataHome{"XDG_DATA_HOME", m_folder / "data"};
    std::shared_ptr<FileSystemService> m_service = FileSystemService::makeDefault();
};

using Pairs = std::vector<std::pair<std::string, std::string>>;

TEST_F(TrashedItems, AreListedWithTheirOldPathsInTheOrderInWhichTheyWent) {
    trash("b.epub");
    trash("shelf/ü b%20.epub");
    trash("other/b.epub");

    EXPECT_EQ(items(), (Pairs{{"b.epub", "b.epub"},
                              {"ü b%20.epub", "shelf/ü b%20.epub"},
                              {"b.2.epub", "other/b.epub"}}));
}

TEST_F(TrashedItems, HaveTheLocalTimeAtWhichTheyWent) {
    trash("b.epub");

    ASSERT_FALSE(trashedItems().empty());
    EXPECT_TRUE(std::regex_match(trashedItems().back().trashedAt,
                                 std::regex("\\d{4}-\\d\\d-\\d\\dT\\d\\d:\\d\\d:\\d\\d")));
}

TEST_F(TrashedItems, AreStillListedAfterARenameInTheTrash) {
    trash("b.epub");
    ASSERT_TRUE(m_service->moveItem(m_folder.url("data/Trash/files/b.epub"),
                                    m_folder.url("data/Trash/files/Title.epub")));

    EXPECT_EQ(items(), (Pairs{{"Title.epub", "b.epub"}}));
}

TEST_F(TrashedItems, AreListedNoMoreOnceTheyHaveLeft) {
    trash("b.epub");
    ASSERT_TRUE(
        m_service->moveItem(m_folder.url("data/Trash/files/b.epub"), m_folder.url("b.epub")));

    EXPECT_EQ(items(), Pairs());
    EXPECT_FALSE(std::filesystem::exists(m_folder / "data/Trash/info/b.epub.trashinfo"));
}

TEST_F(TrashedItems, OfOthersAreLeftOut) {
    writeInfo("a.epub", "[Trash Info]\nPath=/a.epub\nDeletionDate=2001-01-01T00:00:00\n");

    EXPECT_EQ(items(), Pairs());
}

TEST_F(TrashedItems, WithDamagedInfoFilesAreLeftOut) {
    const std::string end = "\nDeletionDate=2001-01-01T00:00:00\nX-ParvelFoundation=1\n";
    writeInfo("header.epub", "Path=/header.epub" + end);
    writeInfo("path.epub", "[Trash Info]" + end);
    writeInfo("relative.epub", "[Trash Info]\nPath=relative.epub" + end);
    writeInfo("nul.epub", "[Trash Info]\nPath=/nul%00.epub" + end);
    writeInfo("long.epub", "[Trash Info]\nPath=/" + std::string(100000, 'x') + end);
    m_folder.write("data/Trash/info/absent.epub.trashinfo",
                   "[Trash Info]\nPath=/absent.epub" + end);
    std::filesystem::create_directory(m_folder / "data/Trash/info/folder.trashinfo");

    EXPECT_EQ(items(), Pairs());
}

}  // namespace
}  // namespace parvel::testing
