#include <vector>

#include <gtest/gtest.h>

#include "parvel/metadata/PVAssetMetadata.h"
#include "parvel/platform/ResourceQueries.h"
#include "parvel/platform/Service.h"
#include "tests/support/ForwardingCloudStore.h"
#include "tests/support/RecordedLog.h"
#include "tests/support/Records.h"

namespace parvel::testing {
namespace {

URL libraryFile(std::string_view name) {
    return URL::fileURLWithPath("/library").appendingPathComponent(name);
}

MutableAssetPtr libraryAsset(std::string_view name) {
    return recordOver({{"path", libraryFile(name).path()}});
}

// Cloud-synchronised storage.

class AnsweringCloudStore : public ForwardingCloudStore {
public:
    std::optional<bool> ubiquitous;
    std::optional<Error> failure;
    std::vector<URL> asked;

    std::optional<bool> isUbiquitous(const URL& url, ErrorOut error) override {
        asked.push_back(url);
        assign(error, failure);
        return ubiquitous;
    }
};

class RecordInCloud : public ::testing::Test {
protected:
    AnsweringCloudStore m_store;
    RecordedLog m_log;
};

TEST_F(RecordInCloud, IsUbiquitousWhereTheHostSaysSo) {
    m_store.ubiquitous = true;

    EXPECT_TRUE(libraryAsset("a.epub")->isUbiquitous());
    EXPECT_EQ(m_store.asked, std::vector{libraryFile("a.epub")});
    EXPECT_TRUE(m_log.lines().empty());
}

TEST_F(RecordInCloud, IsNotUbiquitousWhereTheHostSaysSo) {
    m_store.ubiquitous = false;

    EXPECT_FALSE(libraryAsset("a.epub")->isUbiquitous());
    EXPECT_TRUE(m_log.lines().empty());
}

TEST_F(RecordInCloud, LogsAFailedQueryAndIsNotUbiquitous) {
    m_store.failure = makePOSIXError(5, libraryFile("a.epub"));

    EXPECT_FALSE(libraryAsset("a.epub")->isUbiquitous());
    EXPECT_EQ(m_log.lines(),
              std::vector{"error Failed to query ubiquitous state. url: file:///library/a.epub "
                          "error: " +
                          logText(*m_store.failure)});
}

TEST_F(RecordInCloud, LogsAQueryWithoutURLAndIsNotUbiquitous) {
    EXPECT_FALSE(emptyRecord()->isUbiquitous());
    EXPECT_EQ(m_log.lines(),
              std::vector<std::string>{
                  "error Failed to query ubiquitous state. url: (null) error: (null)"});
}

// The disk.

class AnsweringResourceQueries : public ResourceQueries {
public:
    std::optional<bool> directory;
    std::optional<DirectoryRelationship> relation;
    std::vector<URL> asked;

    bool isReachable(const URL&, ErrorOut) override { return false; }
    std::optional<bool> isDirectory(const URL& url, ErrorOut error) override {
        asked.push_back(url);
        if (!directory)
            assign(error, makePOSIXError(5, url));
        return directory;
    }
    std::optional<std::uint64_t> totalAllocatedSize(const URL&, ErrorOut) override {
        return std::nullopt;
    }
    std::optional<DirectoryRelationship> relationship(const URL& folder, const URL& item,
                                                      ErrorOut error) override {
        asked = {folder, item};
        if (!relation)
            assign(error, makePOSIXError(5, item));
        return relation;
    }
};

class RecordOnDisk : public ::testing::Test {
protected:
    AnsweringResourceQueries m_queries;
    Service<ResourceQueries>::Replacement m_replacement{m_queries};
    RecordedLog m_log;
};

TEST_F(RecordOnDisk, IsACompressedBookWhereItIsNoDirectory) {
    m_queries.directory = false;

    EXPECT_EQ(libraryAsset("a.epub")->isCompressedBookWithError(), true);
    EXPECT_EQ(m_queries.asked, std::vector{libraryFile("a.epub")});
}

TEST_F(RecordOnDisk, IsNoCompressedBookWhereItIsADirectory) {
    m_queries.directory = true;

    EXPECT_EQ(libraryAsset("a.folium")->isCompressedBookWithError(), false);
    EXPECT_TRUE(m_log.lines().empty());
}

TEST_F(RecordOnDisk, IsNoCompressedBookWhereItIsNoBookAndIsNotAskedFor) {
    EXPECT_EQ(libraryAsset("a.m4a")->isCompressedBookWithError(), false);
    EXPECT_EQ(libraryAsset("a.pdf")->isCompressedBookWithError(), false);
    EXPECT_TRUE(m_queries.asked.empty());
    EXPECT_TRUE(m_log.lines().empty());
}

TEST_F(RecordOnDisk, LogsAFailedDirectoryQueryAndGivesNone) {
    EXPECT_EQ(libraryAsset("a.epub")->isCompressedBookWithError(), std::nullopt);
    EXPECT_EQ(m_log.lines(), std::vector<std::string>{"error Failed to get directory status"});
}

// Deliberate.
TEST_F(RecordOnDisk, NeverWritesTheErrorOfAFailedDirectoryQuery) {
    const Error stale = makeCancelledError(libraryFile("stale"));
    std::optional<Error> error = stale;

    static_cast<void>(libraryAsset("a.epub")->isCompressedBookWithError(&error));

    EXPECT_EQ(error, stale);
}

TEST_F(RecordOnDisk, LogsADirectoryQueryWithoutURLAndGivesNone) {
    const MutableAssetPtr record = emptyRecord();
    record->setAssetType(PVAssetTypeEPub);

    EXPECT_EQ(record->isCompressedBookWithError(), std::nullopt);
    EXPECT_EQ(m_log.lines(), std::vector<std::string>{"error Failed to get directory status"});
}

TEST_F(RecordOnDisk, IsInADirectoryThatContainsIt) {
    m_queries.relation = DirectoryRelationship::Contains;
    const URL directory = URL::fileURLWithPath("/library");

    EXPECT_TRUE(libraryAsset("a.epub")->isInDirectory(directory));
    EXPECT_EQ(m_queries.asked, (std::vector{directory, libraryFile("a.epub")}));
}

TEST_F(RecordOnDisk, IsNotInItself) {
    m_queries.relation = DirectoryRelationship::Same;

    EXPECT_FALSE(libraryAsset("a.epub")->isInDirectory(libraryFile("a.epub")));
}

TEST_F(RecordOnDisk, IsNotInAnUnrelatedDirectory) {
    m_queries.relation = DirectoryRelationship::Other;

    EXPECT_FALSE(libraryAsset("a.epub")->isInDirectory(URL::fileURLWithPath("/other")));
}

TEST_F(RecordOnDisk, IsNotInADirectoryWhenTheQueryFailsAndSaysNothing) {
    EXPECT_FALSE(libraryAsset("a.epub")->isInDirectory(URL::fileURLWithPath("/library")));
    EXPECT_TRUE(m_log.lines().empty());
}

TEST_F(RecordOnDisk, IsInNoDirectoryWithoutURL) {
    m_queries.relation = DirectoryRelationship::Contains;

    EXPECT_FALSE(emptyRecord()->isInDirectory(URL::fileURLWithPath("/library")));
}

}  // namespace
}  // namespace parvel::testing
