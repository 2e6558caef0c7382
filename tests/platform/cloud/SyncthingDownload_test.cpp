#include <atomic>
#include <cerrno>
#include <filesystem>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "tests/support/SyncthingRoot.h"

namespace parvel::testing {
namespace {

using std::chrono::milliseconds;
using std::chrono::steady_clock;
using ::testing::IsEmpty;

/// What may leave the folder, and what has to come first.
class SyncthingDownload : public SyncthingRoot {
protected:
    SyncthingDownload() { m_folder.write("root/p.epub/mimetype", ""); }

    void servePackage(const std::string& index, const std::vector<std::string>& needed = {}) {
        serve({{"/rest/db/file", okReply(index)}, {"/rest/db/need", okReply(neededJson(needed))}});
    }
    bool fetch(std::string_view name = "root/p.epub") {
        const auto begin = steady_clock::now();
        const bool isFetched = m_store.fetchContent(m_folder.url(name), &m_error);
        m_took = std::chrono::ceil<milliseconds>(steady_clock::now() - begin);
        return isFetched;
    }
    void expectTimedOut(std::string_view name = "root/p.epub") {
        EXPECT_EQ(m_error, makePOSIXError(ETIMEDOUT, m_folder.url(name)));
        EXPECT_LT(m_took, milliseconds(4000));
    }

    std::optional<Error> m_error;
};

TEST_F(SyncthingDownload, AnItemThatDoesNotComeInTimeFails) {
    servePackage(kInStep, {"p.epub/x"});

    EXPECT_FALSE(fetch());

    expectTimedOut();
    EXPECT_GE(m_took, milliseconds(1500));
}

TEST_F(SyncthingDownload, AFileUnderItsNameIsAllHereWhateverTheClientSays) {
    serveFile(indexJson(sideJson("[]"), sideJson(kOne)));

    EXPECT_TRUE(m_store.isAllHere(m_folder.url("root/a.epub")));
    EXPECT_TRUE(fetch("root/a.epub"));
    EXPECT_THAT(requests(), IsEmpty());
}

TEST_F(SyncthingDownload, ALinkIsAllHereAsALink) {
    std::filesystem::create_symlink("nowhere", m_folder / "root/l.epub");
    serveFile(kInStep);

    EXPECT_TRUE(fetch("root/l.epub"));
}

TEST_F(SyncthingDownload, APackageOfWhichNothingIsNeededIsAllHere) {
    for (const std::string& index : {kInStep, indexJson(sideJson(kOne), sideJson(kTwo)),
                                     indexJson(sideJson(kOne, "ignored"), sideJson(kOne))}) {
        servePackage(index);

        EXPECT_TRUE(fetch()) << index;
    }
}

TEST_F(SyncthingDownload, APackageThatTheIndexDoesNotHoldYetIsAllHere) {
    serve({{"/rest/db/file", "HTTP/1.0 404 Not Found\r\n\r\n"},
           {"/rest/db/need", okReply(neededJson({}))}});

    EXPECT_TRUE(fetch());
}

TEST_F(SyncthingDownload, APackageIsNotAllHereAfterAnUnclearAnswer) {
    for (const std::string& index : {std::string("{}"), kInStep + "x", std::string()}) {
        servePackage(index);

        EXPECT_FALSE(m_store.isAllHere(m_folder.url("root/p.epub"))) << index;
    }
    serve({{"/rest/db/file", okReply(kInStep)}, {"/rest/db/need", "HTTP/1.0 500 No\r\n\r\n"}});
    EXPECT_FALSE(fetch());
    expectTimedOut();
}

TEST_F(SyncthingDownload, APackageIsNotAllHereWhileTheClientIsSilent) {
    serveRaw([](StandInConnection& connection) { connection.waitForEnd(); });

    EXPECT_FALSE(fetch());

    expectTimedOut();
}

TEST_F(SyncthingDownload, APackageIsAllHereWhereNoClientRuns) {
    servePackage(kInStep, {"p.epub/x"});
    m_server.reset();

    EXPECT_TRUE(fetch());
}

TEST_F(SyncthingDownload, APackageWithAPartOnItsWayIsNotAllHereWhereNoClientRuns) {
    m_folder.write("root/p.epub/.syncthing.x.tmp", "half");

    EXPECT_FALSE(fetch());

    expectTimedOut();
    EXPECT_LT(m_took, milliseconds(1000));
}

TEST_F(SyncthingDownload, APackageThatComesAsAWholeIsAwaitedToItsLastPart) {
    std::atomic<int> questions{0};
    serveRaw([&](StandInConnection& connection) {
        std::string request;
        connection.readLine(request);
        for (std::string line; connection.readLine(line) && line != "\r";) {
        }
        if (request.starts_with("GET /rest/db/need")) {
            const bool isLast = ++questions > 2;
            if (isLast)
                m_folder.write("root/q.epub/x", "content");
            connection.send(okReply(neededJson(isLast ? std::vector<std::string>{}
                                                      : std::vector<std::string>{"q.epub/x"})));
            return;
        }
        // The folder comes first, as soon as somebody asks for it.
        const bool stands = std::filesystem::exists(m_folder / "root/q.epub");
        m_folder.write("root/q.epub/mimetype", "");
        connection.send(okReply(stands ? kInStep : indexJson(sideJson("[]"), sideJson(kOne))));
    });

    EXPECT_TRUE(fetch("root/q.epub"));

    EXPECT_TRUE(std::filesystem::exists(m_folder / "root/q.epub/x"));
}

}  // namespace
}  // namespace parvel::testing
