#include "parvel/platform/CloudStore.h"

#include <gtest/gtest.h>

#include <filesystem>

#include "tests/support/TemporaryDirectory.h"

namespace parvel::testing {
namespace {

constexpr const char* nextcloudJournal = ".sync_0123456789ab.db";

class CloudStoreTest : public ::testing::Test {
protected:
    std::optional<bool> isUbiquitous(std::string_view name) {
        return m_store.isUbiquitous(m_folder.url(name), &m_error);
    }
    std::optional<DownloadingStatus> status(std::string_view name) {
        std::optional<DownloadingStatus> result = DownloadingStatus::Current;
        EXPECT_TRUE(m_store.downloadingStatus(m_folder.url(name), result, &m_error));
        return result;
    }
    void expectNoSuchFile(const URL& url) {
        EXPECT_EQ(m_error, makeFileError(PVFileErrorCode::NoSuchFile, url));
    }

    CloudStore& m_store = CloudStore::host();
    TemporaryDirectory m_folder;
    std::optional<Error> m_error;
};

TEST_F(CloudStoreTest, APlainFolderIsNoSynchronisedStorage) {
    m_folder.write("a.epub", "");

    EXPECT_EQ(isUbiquitous("a.epub"), false);
    EXPECT_FALSE(m_error);
}

TEST_F(CloudStoreTest, SyncthingsMarkMakesAFolderSynchronised) {
    m_folder.write("root/.stfolder/x", "");
    m_folder.write("root/books/a.epub", "");

    EXPECT_EQ(isUbiquitous("root/a.epub"), true);
    EXPECT_EQ(isUbiquitous("root/books/a.epub"), true);
    EXPECT_EQ(isUbiquitous("root"), false);
}

TEST_F(CloudStoreTest, NextcloudsJournalMakesAFolderSynchronised) {
    m_folder.write(std::string("root/") + nextcloudJournal, "");
    m_folder.write("older/._sync_89ab.db", "");

    EXPECT_EQ(isUbiquitous("root/a.epub"), true);
    EXPECT_EQ(isUbiquitous("older/a.epub"), true);
}

TEST_F(CloudStoreTest, ANameLikeAJournalsIsNone) {
    m_folder.write("a/.sync_0123456789a.db", "");
    m_folder.write("a/.sync_0123456789az.db", "");
    m_folder.write("a/.sync_0123456789ab.db-wal", "");
    m_folder.write("a/sync_0123456789ab.db", "");

    EXPECT_EQ(isUbiquitous("a/a.epub"), false);
}

TEST_F(CloudStoreTest, ALinkedFolderIsWhatItLeadsTo) {
    m_folder.write("root/.stfolder", "");
    std::filesystem::create_symlink("root", m_folder / "link");

    EXPECT_EQ(isUbiquitous("link/a.epub"), true);
}

TEST_F(CloudStoreTest, ALinkOutsideToASynchronisedItemIsNotSynchronised) {
    m_folder.write("root/.stfolder", "");
    m_folder.write("root/a.epub", "");
    std::filesystem::create_symlink("root/a.epub", m_folder / "a.epub");

    EXPECT_EQ(isUbiquitous("a.epub"), false);
}

TEST_F(CloudStoreTest, AMissingFolderCannotBeTold) {
    EXPECT_EQ(isUbiquitous("none/a.epub"), std::nullopt);
    expectNoSuchFile(m_folder.url("none/a.epub"));
}

TEST_F(CloudStoreTest, AnItemOrItsPlaceholderIsReachableAsAPromise) {
    m_folder.write("a.epub", "");
    m_folder.write("b.epub.nextcloud", " ");

    EXPECT_TRUE(m_store.isPromisedItemReachable(m_folder.url("a.epub"), &m_error));
    EXPECT_TRUE(m_store.isPromisedItemReachable(m_folder.url("b.epub"), &m_error));
    EXPECT_FALSE(m_error);
}

TEST_F(CloudStoreTest, AMissingItemIsNotReachableEvenAsAPromise) {
    EXPECT_FALSE(m_store.isPromisedItemReachable(m_folder.url("a.epub"), &m_error));
    expectNoSuchFile(m_folder.url("a.epub"));
}

TEST_F(CloudStoreTest, AnItemOutsideHasNoStatus) {
    m_folder.write("a.epub", "");

    EXPECT_EQ(status("a.epub"), std::nullopt);
}

TEST_F(CloudStoreTest, AnExistingSynchronisedItemIsDownloaded) {
    m_folder.write("root/.stfolder", "");
    m_folder.write("root/a.pdf", "");
    m_folder.write("root/b.epub/OPS/book.opf", "");

    EXPECT_EQ(status("root/a.pdf"), DownloadingStatus::Downloaded);
    EXPECT_EQ(status("root/b.epub"), DownloadingStatus::Downloaded);
}

TEST_F(CloudStoreTest, APlaceholderIsNotDownloaded) {
    m_folder.write(std::string("root/") + nextcloudJournal, "");
    m_folder.write("root/a.epub.nextcloud", " ");

    EXPECT_EQ(status("root/a.epub"), DownloadingStatus::NotDownloaded);
}

TEST_F(CloudStoreTest, APackageWithAPlaceholderInsideIsNotDownloaded) {
    m_folder.write(std::string("root/") + nextcloudJournal, "");
    m_folder.write("root/a.epub/META-INF/container.xml.nextcloud", " ");

    EXPECT_EQ(status("root/a.epub"), DownloadingStatus::NotDownloaded);
}

TEST_F(CloudStoreTest, APackagesLinksAreNotFollowedForPlaceholders) {
    m_folder.write(std::string("root/") + nextcloudJournal, "");
    m_folder.write("root/a.epub/mimetype", "");
    m_folder.write("elsewhere/x.nextcloud", " ");
    std::filesystem::create_symlink("../../elsewhere", m_folder / "root/a.epub/link");

    EXPECT_EQ(status("root/a.epub"), DownloadingStatus::Downloaded);
}

TEST_F(CloudStoreTest, AFolderNamedLikeAPlaceholderIsNone) {
    m_folder.write(std::string("root/") + nextcloudJournal, "");
    m_folder.write("root/a.epub/x.nextcloud/file", "");

    EXPECT_EQ(status("root/a.epub"), DownloadingStatus::Downloaded);
}

TEST_F(CloudStoreTest, APackageTooDeepToBeWalkedIsNotDownloaded) {
    m_folder.write("root/.stfolder", "");
    std::string path = "root/a.epub/";
    for (int i = 0; i < 100; ++i)
        path += "d/";
    m_folder.write(path + "file", "");

    EXPECT_EQ(status("root/a.epub"), DownloadingStatus::NotDownloaded);
}

TEST_F(CloudStoreTest, AMissingItemFailsTheStatusQuery) {
    std::optional<DownloadingStatus> result = DownloadingStatus::Current;

    EXPECT_FALSE(m_store.downloadingStatus(m_folder.url("a.epub"), result, &m_error));
    EXPECT_EQ(result, std::nullopt);
    expectNoSuchFile(m_folder.url("a.epub"));
}

TEST_F(CloudStoreTest, APlaceholderStandsForAnItemThatIsNotThere) {
    m_folder.write("a.epub.nextcloud", " ");

    EXPECT_EQ(m_store.placeholderFile(m_folder.url("a.epub")), m_folder.url("a.epub.nextcloud"));
}

TEST_F(CloudStoreTest, AnExistingOrMissingItemHasNoPlaceholder) {
    m_folder.write("a.epub", "");
    m_folder.write("a.epub.nextcloud", " ");

    EXPECT_EQ(m_store.placeholderFile(m_folder.url("a.epub")), std::nullopt);
    EXPECT_EQ(m_store.placeholderFile(m_folder.url("b.epub")), std::nullopt);
}

TEST_F(CloudStoreTest, TheReportNamesTheFirstMarkedFolderAbove) {
    m_folder.write("root/.stfolder/x", "");
    m_folder.write(std::string("root/inner/") + nextcloudJournal, "");
    m_folder.write("root/inner/a.epub", "");

    const auto inner = cloudReportForURL(m_folder.url("root/inner/a.epub"), &m_error);
    const auto outer = cloudReportForURL(m_folder.url("root/inner"), &m_error);

    ASSERT_TRUE(inner && outer);
    EXPECT_FALSE(m_error);
    EXPECT_EQ(inner->client, "Nextcloud");
    EXPECT_EQ(inner->root, m_folder / "root/inner");
    EXPECT_EQ(inner->mark, nextcloudJournal);
    EXPECT_EQ(outer->client, "Syncthing");
    EXPECT_EQ(outer->root, m_folder / "root");
    EXPECT_EQ(outer->mark, ".stfolder");
}

TEST_F(CloudStoreTest, TheReportNamesTheRootByItsOwnPathWhereALinkLeadsIntoIt) {
    m_folder.write("root/.stfolder/x", "");
    m_folder.write("root/books/a.epub", "");
    std::filesystem::create_symlink("root/books", m_folder / "books");

    const auto report = cloudReportForURL(m_folder.url("books/a.epub"), &m_error);

    ASSERT_TRUE(report);
    EXPECT_EQ(report->root, m_folder / "root");
}

TEST_F(CloudStoreTest, TheReportOfAPlainFolderHasNoRoot) {
    m_folder.write("a.epub", "");

    const auto report = cloudReportForURL(m_folder.url("a.epub"), &m_error);

    ASSERT_TRUE(report);
    EXPECT_FALSE(m_error);
    EXPECT_FALSE(report->isUbiquitous);
    EXPECT_EQ(report->root, "");
}

TEST_F(CloudStoreTest, AMissingItemsReportHasAnErrorBesideIt) {
    m_folder.write("root/.stfolder/x", "");

    const auto report = cloudReportForURL(m_folder.url("root/a.epub"), &m_error);

    ASSERT_TRUE(report);
    EXPECT_TRUE(report->isUbiquitous);
    expectNoSuchFile(m_folder.url("root/a.epub"));
}

TEST_F(CloudStoreTest, ThereIsNoReportOfAnUnreachableFolder) {
    EXPECT_FALSE(cloudReportForURL(m_folder.url("absent/a.epub"), &m_error));

    expectNoSuchFile(m_folder.url("absent/a.epub"));
}

}  // namespace
}  // namespace parvel::testing
