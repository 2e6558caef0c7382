#include <cerrno>
#include <filesystem>

#include <gtest/gtest.h>

#include "cli/FolderGuard.h"
#include "tests/support/TemporaryDirectory.h"

namespace parvel::testing {
namespace {

class FolderGuard : public ::testing::Test {
protected:
    bool replace(const std::string& existing) {
        m_folder.write("new.epub", "new");
        return m_guard.replaceItem(m_folder.url(existing), m_folder.url("new.epub"),
                                   ReplaceOptions::Default, nullptr, &m_error);
    }
    bool remove(const std::string& name) {
        return m_guard.removeItem(m_folder.url(name), &m_error);
    }

    TemporaryDirectory m_folder;
    cli::FolderGuard m_guard{FileSystemService::makeDefault()};
    std::optional<Error> m_error;
};

TEST_F(FolderGuard, KeepsAFolderThatIsNoAsset) {
    m_folder.write("books/a.epub", "1");

    EXPECT_FALSE(replace("books"));
    EXPECT_EQ(m_error, makePOSIXError(EISDIR, m_folder.url("books")));
    EXPECT_FALSE(remove("books"));
    EXPECT_EQ(m_error, makePOSIXError(EISDIR, m_folder.url("books")));

    EXPECT_EQ(m_folder.read("books/a.epub"), "1");
    EXPECT_EQ(m_folder.read("new.epub"), "new");
}

TEST_F(FolderGuard, KeepsAFolderNamedAsADocument) {
    m_folder.write("a.pdf/b.epub", "1");

    EXPECT_FALSE(remove("a.pdf"));

    EXPECT_EQ(m_folder.read("a.pdf/b.epub"), "1");
}

TEST_F(FolderGuard, LetsPackagesFilesAndLinksGo) {
    m_folder.write("a.epub/mimetype", "1");
    m_folder.write("books/b.epub", "1");
    m_folder.write("notes.txt", "1");
    std::filesystem::create_symlink("books", m_folder / "link");

    EXPECT_TRUE(replace("a.epub"));
    EXPECT_TRUE(remove("a.epub"));
    EXPECT_TRUE(remove("notes.txt"));
    EXPECT_TRUE(remove("link"));

    EXPECT_EQ(m_folder.read("books/b.epub"), "1");
}

TEST_F(FolderGuard, KeepsWhatALinkInItsPlaceWouldLeadTo) {
    m_folder.write("library/a.epub", "1");
    std::filesystem::create_symlink("library/a.epub", m_folder / "a.epub");

    EXPECT_FALSE(m_guard.replaceItem(m_folder.url("library/a.epub"), m_folder.url("a.epub"),
                                     ReplaceOptions::Default, nullptr, &m_error));
    EXPECT_EQ(m_error, makePOSIXError(EINVAL, m_folder.url("library/a.epub")));

    EXPECT_EQ(m_folder.read("library/a.epub"), "1");
    EXPECT_TRUE(std::filesystem::is_symlink(m_folder / "a.epub"));
}

TEST_F(FolderGuard, PassesOtherErrorsOn) {
    EXPECT_FALSE(remove("absent"));

    EXPECT_EQ(m_error, makeFileError(PVFileErrorCode::NoSuchFile, m_folder.url("absent")));
}

}  // namespace
}  // namespace parvel::testing
