#include <filesystem>

#include <gtest/gtest.h>

#include "parvel/platform/FileSystemService.h"
#include "parvel/platform/Rehearsal.h"
#include "tests/support/EnvironmentValue.h"
#include "tests/support/ForwardingCloudStore.h"
#include "tests/support/TemporaryDirectory.h"

namespace parvel::testing {
namespace {

namespace fs = std::filesystem;

/// Synchronised storage whose client downloads at once, or not at all.
class FetchingCloudStore : public ForwardingCloudStore {
public:
    bool fetchContent(const URL& url, ErrorOut error) override {
        const auto placeholder = placeholderFile(url);
        if (!placeholder)
            return host().fetchContent(url, error);
        ++fetches;
        if (!isOnline)
            return fail(error, makePOSIXError(ETIMEDOUT, url));
        fs::rename(placeholder->path(), url.path());
        fs::resize_file(url.path(), 100);
        return true;
    }

    bool isOnline = true;
    int fetches = 0;
};

/// Placeholders in the root of Nextcloud's client, and moves that meet them.
class CloudMoves : public ::testing::Test {
protected:
    CloudMoves() {
        m_folder.write("root/.sync_0123456789ab.db", "");
        m_folder.write("root/a.epub.nextcloud", " ");
        fs::create_directories(m_folder / "root/below");
        fs::create_directories(m_folder / "local");
    }
    bool move(const std::string& from, const std::string& to) {
        return m_service->moveItem(m_folder.url(from), m_folder.url(to), &m_error);
    }
    [[nodiscard]] bool exists(const std::string& name) const { return fs::exists(m_folder / name); }
    void expectError(std::string_view domain, std::int64_t code, const std::string& name) {
        EXPECT_EQ(m_error, Error(domain, code, {{std::string(PVURLErrorKey), m_folder.url(name)}}));
    }

    TemporaryDirectory m_folder;
    EnvironmentValue m_trash{"XDG_DATA_HOME", m_folder / "data"};
    FetchingCloudStore m_cloud;
    std::shared_ptr<FileSystemService> m_service = FileSystemService::makeDefault();
    std::optional<Error> m_error;
};

TEST_F(CloudMoves, APlaceholderIsRenamedWithinItsRootWithNoDownload) {
    EXPECT_TRUE(move("root/a.epub", "root/below/b.epub"));

    EXPECT_TRUE(exists("root/below/b.epub.nextcloud"));
    EXPECT_FALSE(exists("root/a.epub.nextcloud"));
    EXPECT_EQ(m_cloud.fetches, 0);
}

TEST_F(CloudMoves, APlaceholderTakesNoTakenName) {
    m_folder.write("root/b.epub", "other");
    m_folder.write("root/c.epub.nextcloud", " ");

    EXPECT_FALSE(move("root/a.epub", "root/b.epub"));
    expectError(PVFileErrorDomain, 516, "root/a.epub");
    EXPECT_FALSE(move("root/a.epub", "root/c.epub"));
    EXPECT_TRUE(exists("root/a.epub.nextcloud"));
}

TEST_F(CloudMoves, AnItemTakesNoPlaceholdersName) {
    m_folder.write("local/b.epub", "content");

    EXPECT_TRUE(m_service->itemExistsAtPath(m_folder / "root/a.epub"));
    EXPECT_FALSE(move("local/b.epub", "root/a.epub"));

    expectError(PVFileErrorDomain, 516, "root/a.epub");
    EXPECT_TRUE(exists("local/b.epub"));
}

TEST_F(CloudMoves, APlaceholderIsDownloadedBeforeItLeavesItsRoot) {
    EXPECT_TRUE(move("root/a.epub", "local/b.epub"));

    EXPECT_EQ(fs::file_size(m_folder / "local/b.epub"), 100U);
    EXPECT_FALSE(exists("root/a.epub.nextcloud"));
}

TEST_F(CloudMoves, APlaceholderThatDoesNotComeStaysWhereItIs) {
    m_cloud.isOnline = false;

    EXPECT_FALSE(move("root/a.epub", "local/b.epub"));

    expectError(PVPOSIXErrorDomain, ETIMEDOUT, "root/a.epub");
    EXPECT_TRUE(exists("root/a.epub.nextcloud"));
    EXPECT_FALSE(exists("local/b.epub"));
}

TEST_F(CloudMoves, APlaceholderIsDownloadedBeforeItIsTrashed) {
    std::optional<URL> trashed;

    EXPECT_TRUE(m_service->trashItem(m_folder.url("root/a.epub"), &trashed, &m_error));

    ASSERT_TRUE(trashed);
    EXPECT_EQ(fs::file_size(trashed->path()), 100U);
}

TEST_F(CloudMoves, APlaceholderThatDoesNotComeIsNotTrashed) {
    m_cloud.isOnline = false;
    std::optional<URL> trashed;

    EXPECT_FALSE(m_service->trashItem(m_folder.url("root/a.epub"), &trashed, &m_error));

    expectError(PVPOSIXErrorDomain, ETIMEDOUT, "root/a.epub");
    EXPECT_TRUE(exists("root/a.epub.nextcloud"));
}

TEST_F(CloudMoves, APlaceholderIsDownloadedBeforeItIsCopied) {
    EXPECT_TRUE(
        m_service->copyItem(m_folder.url("root/a.epub"), m_folder.url("local/b.epub"), &m_error));

    EXPECT_EQ(fs::file_size(m_folder / "local/b.epub"), 100U);
    EXPECT_TRUE(exists("root/a.epub"));
}

TEST_F(CloudMoves, APlaceholderIsDownloadedBeforeItIsReplaced) {
    m_folder.write("local/b.epub", "new");

    EXPECT_TRUE(m_service->replaceItem(m_folder.url("root/a.epub"), m_folder.url("local/b.epub"),
                                       ReplaceOptions::Default, nullptr, &m_error));

    EXPECT_EQ(m_folder.read("root/a.epub"), "new");
    EXPECT_FALSE(exists("root/a.epub.nextcloud"));
    EXPECT_EQ(m_cloud.fetches, 1);
}

TEST_F(CloudMoves, APackageWithPlaceholdersInItIsNotReplaced) {
    m_folder.write("root/p.epub/mimetype.nextcloud", " ");
    m_folder.write("local/p.epub/mimetype", "new");

    EXPECT_FALSE(m_service->replaceItem(m_folder.url("root/p.epub"), m_folder.url("local/p.epub"),
                                        ReplaceOptions::Default, nullptr, &m_error));

    expectError(PVPOSIXErrorDomain, ETIMEDOUT, "root/p.epub");
    EXPECT_TRUE(exists("root/p.epub/mimetype.nextcloud"));
    EXPECT_TRUE(exists("local/p.epub/mimetype"));
}

TEST_F(CloudMoves, APlaceholderIsRemovedWithNoDownload) {
    EXPECT_TRUE(m_service->removeItem(m_folder.url("root/a.epub"), &m_error));

    EXPECT_FALSE(exists("root/a.epub.nextcloud"));
    EXPECT_EQ(m_cloud.fetches, 0);
}

TEST_F(CloudMoves, APackageWithPlaceholdersInItIsRenamedWithinItsRoot) {
    m_folder.write("root/p.epub/mimetype.nextcloud", " ");

    EXPECT_TRUE(move("root/p.epub", "root/below/q.epub"));

    EXPECT_TRUE(exists("root/below/q.epub/mimetype.nextcloud"));
}

TEST_F(CloudMoves, SyncthingsPackageThatIsStillComingIsNotRenamed) {
    m_folder.write("other/.stfolder/x", "");
    m_folder.write("other/p.epub/.syncthing.mimetype.tmp", "half");

    EXPECT_FALSE(move("other/p.epub", "other/q.epub"));

    expectError(PVPOSIXErrorDomain, ETIMEDOUT, "other/p.epub");
    EXPECT_TRUE(exists("other/p.epub"));
    EXPECT_FALSE(exists("other/q.epub"));
}

TEST_F(CloudMoves, SyncthingsWholePackageIsRenamed) {
    m_folder.write("other/.stfolder/x", "");
    m_folder.write("other/p.epub/mimetype", "content");

    EXPECT_TRUE(move("other/p.epub", "other/q.epub"));

    EXPECT_TRUE(exists("other/q.epub/mimetype"));
}

TEST_F(CloudMoves, APackageWithPlaceholdersInItDoesNotLeaveItsRoot) {
    m_folder.write("root/p.epub/mimetype.nextcloud", " ");

    EXPECT_FALSE(move("root/p.epub", "local/p.epub"));

    expectError(PVPOSIXErrorDomain, ETIMEDOUT, "root/p.epub");
    EXPECT_TRUE(exists("root/p.epub/mimetype.nextcloud"));
    EXPECT_FALSE(exists("local/p.epub"));
}

TEST_F(CloudMoves, AFileNamedLikeAPlaceholderOutsideOfEveryRootIsNone) {
    m_folder.write("local/b.epub.nextcloud", " ");

    EXPECT_FALSE(move("local/b.epub", "local/c.epub"));

    expectError(PVFileErrorDomain, 4, "local/b.epub");
    EXPECT_TRUE(exists("local/b.epub.nextcloud"));
}

TEST_F(CloudMoves, ARehearsalDownloadsNothing) {
    const Rehearsal rehearsal;

    EXPECT_FALSE(rehearsal.fileManager()->moveItem(m_folder.url("root/a.epub"),
                                                   m_folder.url("local/b.epub"), &m_error));

    expectError(PVPOSIXErrorDomain, ETIMEDOUT, "root/a.epub");
    EXPECT_EQ(m_cloud.fetches, 0);
    EXPECT_TRUE(exists("root/a.epub.nextcloud"));
}

}  // namespace
}  // namespace parvel::testing
