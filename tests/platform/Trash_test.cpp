#include <stdlib.h>
#include <sys/stat.h>

#include <filesystem>
#include <regex>

#include <gtest/gtest.h>

#include "parvel/platform/FileSystemService.h"
#include "tests/support/EnvironmentValue.h"
#include "tests/support/TemporaryDirectory.h"

namespace parvel::testing {
namespace {

namespace fs = std::filesystem;

/// A home trash of the test's own, on the file system of its items.
class Trash : public ::testing::Test {
protected:
    [[nodiscard]] fs::path trash(const std::string& name) const {
        return m_folder.path() / "data/Trash" / name;
    }

    TemporaryDirectory m_folder;
    const EnvironmentValue m_dataHome{"XDG_DATA_HOME", m_folder / "data"};
    std::shared_ptr<FileSystemService> m_service = FileSystemService::makeDefault();
    std::optional<URL> m_resulting;
    std::optional<Error> m_error;
};

TEST_F(Trash, ATrashedItemLiesInTheHomeTrashWithItsInfoFile) {
    m_folder.write("Ein Buch ü.epub", "book");

    EXPECT_TRUE(m_service->trashItem(m_folder.url("Ein Buch ü.epub"), &m_resulting, &m_error));

    EXPECT_EQ(m_resulting, m_folder.url("data/Trash/files/Ein Buch ü.epub"));
    EXPECT_EQ(m_folder.read("data/Trash/files/Ein Buch ü.epub"), "book");
    EXPECT_FALSE(fs::exists(m_folder / "Ein Buch ü.epub"));
    const std::string info = m_folder.read("data/Trash/info/Ein Buch ü.epub.trashinfo");
    const std::regex expected("\\[Trash Info\\]\nPath=" + m_folder.path().string() +
                              "/Ein%20Buch%20%C3%BC\\.epub\n"
                              "DeletionDate=\\d{4}-\\d\\d-\\d\\dT\\d\\d:\\d\\d:\\d\\d\n"
                              "X-ParvelFoundation=1\n");
    EXPECT_TRUE(std::regex_match(info, expected)) << info;
    struct stat status {};
    ASSERT_EQ(stat(trash("info/Ein Buch ü.epub.trashinfo").c_str(), &status), 0);
    EXPECT_EQ(status.st_mode & 0777, 0600U);
}

TEST_F(Trash, AnItemOfANameThatIsInTheTrashGetsANumber) {
    for (const char* content : {"1", "2", "3"}) {
        m_folder.write("Guide.pdf", content);
        ASSERT_TRUE(m_service->trashItem(m_folder.url("Guide.pdf"), &m_resulting));
    }

    EXPECT_EQ(m_resulting, m_folder.url("data/Trash/files/Guide.3.pdf"));
    EXPECT_EQ(m_folder.read("data/Trash/files/Guide.pdf"), "1");
    EXPECT_EQ(m_folder.read("data/Trash/files/Guide.2.pdf"), "2");
    EXPECT_TRUE(fs::exists(trash("info/Guide.3.pdf.trashinfo")));
}

TEST_F(Trash, AnItemWithoutInfoFileInTheTrashIsNotOverwritten) {
    m_folder.write("data/Trash/files/a.pdf", "stray");
    m_folder.write("a.pdf", "mine");

    EXPECT_TRUE(m_service->trashItem(m_folder.url("a.pdf"), &m_resulting));

    EXPECT_EQ(m_resulting, m_folder.url("data/Trash/files/a.2.pdf"));
    EXPECT_EQ(m_folder.read("data/Trash/files/a.pdf"), "stray");
    EXPECT_FALSE(fs::exists(trash("info/a.pdf.trashinfo")));
}

TEST_F(Trash, TrashingNothingIsAnErrorAndLeavesNoInfoFile) {
    EXPECT_FALSE(m_service->trashItem(m_folder.url("a.pdf"), &m_resulting, &m_error));

    EXPECT_EQ(m_error, makeFileError(PVFileErrorCode::NoSuchFile, m_folder.url("a.pdf")));
    EXPECT_FALSE(m_resulting);
    EXPECT_FALSE(fs::exists(trash("info/a.pdf.trashinfo")));
}

TEST_F(Trash, ARenameWithinTheTrashTakesTheInfoFileAlong) {
    m_folder.write("a.pdf", "1");
    ASSERT_TRUE(m_service->trashItem(m_folder.url("a.pdf"), &m_resulting));

    EXPECT_TRUE(m_service->moveItem(*m_resulting, m_folder.url("data/Trash/files/Title.pdf")));

    EXPECT_TRUE(fs::exists(trash("files/Title.pdf")));
    EXPECT_TRUE(fs::exists(trash("info/Title.pdf.trashinfo")));
    EXPECT_FALSE(fs::exists(trash("info/a.pdf.trashinfo")));
}

TEST_F(Trash, AFailedRenameWithinTheTrashLeavesItemAndInfoFile) {
    m_folder.write("a.pdf", "1");
    ASSERT_TRUE(m_service->trashItem(m_folder.url("a.pdf"), &m_resulting));
    m_folder.write("data/Trash/files/b.pdf", "2");

    EXPECT_FALSE(
        m_service->moveItem(*m_resulting, m_folder.url("data/Trash/files/b.pdf"), &m_error));

    EXPECT_EQ(m_error,
              makeFileError(PVFileErrorCode::FileExists, m_folder.url("data/Trash/files/b.pdf")));
    EXPECT_EQ(m_folder.read("data/Trash/files/a.pdf"), "1");
    EXPECT_TRUE(fs::exists(trash("info/a.pdf.trashinfo")));
    EXPECT_FALSE(fs::exists(trash("info/b.pdf.trashinfo")));
}

TEST_F(Trash, ARenameOntoItsOwnNameWithinTheTrashFailsAndTouchesNothing) {
    m_folder.write("a.pdf", "1");
    ASSERT_TRUE(m_service->trashItem(m_folder.url("a.pdf"), &m_resulting));

    EXPECT_FALSE(m_service->moveItem(*m_resulting, *m_resulting, &m_error));

    EXPECT_EQ(m_error, makeFileError(PVFileErrorCode::FileExists, *m_resulting));
    EXPECT_EQ(m_folder.read("data/Trash/files/a.pdf"), "1");
    EXPECT_TRUE(fs::exists(trash("info/a.pdf.trashinfo")));
}

TEST_F(Trash, ARenameIntoAFolderThatDoesNotExistInTheTrashFails) {
    m_folder.write("a.pdf", "1");
    ASSERT_TRUE(m_service->trashItem(m_folder.url("a.pdf"), &m_resulting));

    EXPECT_FALSE(
        m_service->moveItem(*m_resulting, m_folder.url("data/Trash/files/Name/pdf"), &m_error));

    EXPECT_EQ(m_error, makeFileError(PVFileErrorCode::NoSuchFile,
                                     m_folder.url("data/Trash/files/Name/pdf")));
    EXPECT_TRUE(fs::exists(trash("files/a.pdf")));
    EXPECT_TRUE(fs::exists(trash("info/a.pdf.trashinfo")));
}

TEST_F(Trash, ANameAtTheLimitStillGetsAnInfoFile) {
    const std::string name = std::string(240, 'x') + ".epub";
    m_folder.write(name, "1");

    EXPECT_TRUE(m_service->trashItem(m_folder.url(name), &m_resulting, &m_error));

    EXPECT_EQ(m_resulting->lastPathComponent().size(), 245U);
    EXPECT_TRUE(
        fs::exists(trash("info/" + std::string(m_resulting->lastPathComponent()) + ".trashinfo")));
}

TEST_F(Trash, AnItemOfAnotherFileSystemGoesToThatVolumesOwnTrash) {
    std::string pattern = "/dev/shm/parvel-XXXXXX";
    struct stat memory {};
    struct stat parent {};
    if (stat("/dev/shm", &memory) != 0 || stat("/dev", &parent) != 0 ||
        memory.st_dev == parent.st_dev || !mkdtemp(pattern.data()))
        GTEST_SKIP() << "no memory file system";
    const std::string item = pattern + "/a.pdf";
    std::ofstream(item) << "1";
    const bool hadTrash = fs::exists("/dev/shm/.Trash-" + std::to_string(geteuid()));

    EXPECT_TRUE(m_service->trashItem(URL::fileURLWithPath(item), &m_resulting, &m_error));

    const fs::path volume = "/dev/shm/.Trash-" + std::to_string(geteuid());
    EXPECT_EQ(fs::path(m_resulting->path()).parent_path(), volume / "files");
    const fs::path info =
        volume / "info" / (std::string(m_resulting->lastPathComponent()) + ".trashinfo");
    std::ifstream file(info);
    const std::string text{std::istreambuf_iterator<char>(file), {}};
    EXPECT_NE(text.find("\nPath=" + item.substr(sizeof("/dev/shm")) + "\n"), std::string::npos)
        << text;
    fs::remove(m_resulting->path());
    fs::remove(info);
    if (!hadTrash)
        fs::remove_all(volume);
    fs::remove_all(pattern);
}

}  // namespace
}  // namespace parvel::testing
