#include "parvel/platform/ResourceQueries.h"

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <filesystem>

#include "tests/support/TemporaryDirectory.h"

namespace parvel::testing {
namespace {

class ResourceQueriesTest : public ::testing::Test {
protected:
    std::optional<DirectoryRelationship> relationship(const URL& directory, const URL& item) {
        return ResourceQueries::host().relationship(directory, item, &m_error);
    }
    void expectNoSuchFile(const URL& url) {
        EXPECT_EQ(m_error, makeFileError(PVFileErrorCode::NoSuchFile, url));
    }

    ResourceQueries& m_queries = ResourceQueries::host();
    TemporaryDirectory m_folder;
    std::optional<Error> m_error;
};

TEST_F(ResourceQueriesTest, AFileAndAFolderAreReachable) {
    m_folder.write("a", "");

    EXPECT_TRUE(m_queries.isReachable(m_folder.url("a"), &m_error));
    EXPECT_TRUE(m_queries.isReachable(m_folder.url(""), &m_error));
    EXPECT_FALSE(m_error);
}

TEST_F(ResourceQueriesTest, ADanglingLinkIsNotReachable) {
    std::filesystem::create_symlink("nowhere", m_folder / "link");

    EXPECT_FALSE(m_queries.isReachable(m_folder.url("link"), &m_error));
    expectNoSuchFile(m_folder.url("link"));
}

TEST_F(ResourceQueriesTest, AURLOfAnotherSchemeIsNotReachable) {
    const URL url = *URL::fromString("https://example.org/");

    EXPECT_FALSE(m_queries.isReachable(url, &m_error));
    expectNoSuchFile(url);
}

TEST_F(ResourceQueriesTest, ALoopOfLinksIsAPOSIXError) {
    std::filesystem::create_symlink("link", m_folder / "link");

    EXPECT_FALSE(m_queries.isReachable(m_folder.url("link"), &m_error));
    EXPECT_EQ(m_error, makePOSIXError(ELOOP, m_folder.url("link")));
}

TEST_F(ResourceQueriesTest, TellsFoldersFromFilesThroughLinks) {
    m_folder.write("folder/file", "");
    std::filesystem::create_symlink("folder", m_folder / "link");

    EXPECT_EQ(m_queries.isDirectory(m_folder.url("folder")), true);
    EXPECT_EQ(m_queries.isDirectory(m_folder.url("link")), true);
    EXPECT_EQ(m_queries.isDirectory(m_folder.url("folder/file")), false);
}

TEST_F(ResourceQueriesTest, AMissingItemIsNeitherFolderNorFile) {
    EXPECT_EQ(m_queries.isDirectory(m_folder.url("a"), &m_error), std::nullopt);
    expectNoSuchFile(m_folder.url("a"));
}

TEST_F(ResourceQueriesTest, TheAllocatedSizeCountsBlocksOfTheLinksTarget) {
    const std::string path = m_folder.write("a", std::string(10'000, 'x'));
    std::filesystem::create_symlink("a", m_folder / "link");
    ::sync();
    struct stat status;
    ASSERT_EQ(::stat(path.c_str(), &status), 0);

    const std::optional<std::uint64_t> size = m_queries.totalAllocatedSize(m_folder.url("link"));
    EXPECT_EQ(size, static_cast<std::uint64_t>(status.st_blocks) * 512);
    EXPECT_GE(size.value_or(0), 10'000U);
}

TEST_F(ResourceQueriesTest, ASparseFileAllocatesNothing) {
    const std::string path = m_folder.write("a", "");
    ASSERT_EQ(::truncate(path.c_str(), 1 << 20), 0);

    EXPECT_EQ(m_queries.totalAllocatedSize(m_folder.url("a")), 0U);
}

TEST_F(ResourceQueriesTest, AMissingItemHasNoAllocatedSize) {
    EXPECT_EQ(m_queries.totalAllocatedSize(m_folder.url("a"), &m_error), std::nullopt);
    expectNoSuchFile(m_folder.url("a"));
}

TEST_F(ResourceQueriesTest, AFolderContainsItemsAtAnyDepth) {
    m_folder.write("library/shelf/book", "");

    EXPECT_EQ(relationship(m_folder.url("library"), m_folder.url("library/shelf")),
              DirectoryRelationship::Contains);
    EXPECT_EQ(relationship(m_folder.url("library"), m_folder.url("library/shelf/book")),
              DirectoryRelationship::Contains);
}

TEST_F(ResourceQueriesTest, TheRootContainsEverything) {
    m_folder.write("a", "");

    EXPECT_EQ(relationship(URL::fileURLWithPath("/"), m_folder.url("a")),
              DirectoryRelationship::Contains);
}

TEST_F(ResourceQueriesTest, AFolderIsTheSameAsItselfThroughALink) {
    m_folder.write("library/a", "");
    std::filesystem::create_symlink("library", m_folder / "link");

    EXPECT_EQ(relationship(m_folder.url("library"), m_folder.url("link")),
              DirectoryRelationship::Same);
}

TEST_F(ResourceQueriesTest, TheParentAndASiblingAreOther) {
    m_folder.write("library/a", "");
    m_folder.write("library2/a", "");

    EXPECT_EQ(relationship(m_folder.url("library"), m_folder.url("")),
              DirectoryRelationship::Other);
    EXPECT_EQ(relationship(m_folder.url("library"), m_folder.url("library2/a")),
              DirectoryRelationship::Other);
}

TEST_F(ResourceQueriesTest, ALinkedLibraryContainsItsItems) {
    m_folder.write("library/a", "");
    std::filesystem::create_symlink("library", m_folder / "link");

    EXPECT_EQ(relationship(m_folder.url("link"), m_folder.url("library/a")),
              DirectoryRelationship::Contains);
    EXPECT_EQ(relationship(m_folder.url("library"), m_folder.url("link/a")),
              DirectoryRelationship::Contains);
}

TEST_F(ResourceQueriesTest, ALinkedItemLiesWhereItsTargetLies) {
    m_folder.write("elsewhere/book", "");
    m_folder.write("library/a", "");
    std::filesystem::create_symlink("../elsewhere/book", m_folder / "library/book");

    EXPECT_EQ(relationship(m_folder.url("library"), m_folder.url("library/book")),
              DirectoryRelationship::Other);
    EXPECT_EQ(relationship(m_folder.url("elsewhere"), m_folder.url("library/book")),
              DirectoryRelationship::Contains);
}

TEST_F(ResourceQueriesTest, TheRelationshipToAMissingItemFailsWithItsURL) {
    EXPECT_EQ(relationship(m_folder.url(""), m_folder.url("a")), std::nullopt);
    expectNoSuchFile(m_folder.url("a"));

    EXPECT_EQ(relationship(m_folder.url("b"), m_folder.url("")), std::nullopt);
    expectNoSuchFile(m_folder.url("b"));
}

}  // namespace
}  // namespace parvel::testing
