#include "parvel/platform/linux/cloud/SyncthingClient.h"

#include <sys/fsuid.h>

#include <atomic>
#include <filesystem>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "parvel/platform/linux/cloud/SyncedPlace.h"
#include "tests/support/SyncthingRoot.h"

namespace parvel::testing {
namespace {

using std::chrono::milliseconds;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

/// What this thread makes meanwhile belongs to another user, where it may say so.
class StrangerScope {
public:
    StrangerScope() : m_own(static_cast<uid_t>(setfsuid(kStranger))) {}
    ~StrangerScope() { setfsuid(m_own); }
    StrangerScope(const StrangerScope&) = delete;
    StrangerScope& operator=(const StrangerScope&) = delete;

    [[nodiscard]] static bool isInForce() {
        return static_cast<uid_t>(setfsuid(kStranger)) == kStranger;
    }

private:
    static constexpr uid_t kStranger = 65'533;
    uid_t m_own;
};

using SyncthingStatus = SyncthingRoot;

TEST_F(SyncthingStatus, TheNewestVersionIsCurrent) {
    serveFile(kInStep);

    EXPECT_EQ(status(), DownloadingStatus::Current);
    EXPECT_THAT(requests(), ElementsAre("GET /rest/db/file?folder=my%20books&file=a.epub"));
    EXPECT_EQ(header(), "Host: localhost\rX-API-Key: key-123\r");
}

TEST_F(SyncthingStatus, AnOlderVersionIsDownloaded) {
    serveFile(indexJson(sideJson(kOne), sideJson(kTwo)));

    EXPECT_EQ(status(), DownloadingStatus::Downloaded);
}

TEST_F(SyncthingStatus, AFileThatTheIndexDoesNotHoldYetIsDownloaded) {
    serve({{"/rest/db/file", "HTTP/1.0 404 Not Found\r\n\r\nNo such object in the index\n"}});

    EXPECT_EQ(status(), DownloadingStatus::Downloaded);
    EXPECT_EQ(reason(), "the client does not know the item yet");
}

TEST_F(SyncthingStatus, WhatThisDeviceHasNoVersionOfIsNotDownloaded) {
    for (const std::string& local : {sideJson("[]"), sideJson("null"), sideJson(kOne, "deleted")}) {
        serveFile(indexJson(local, sideJson(kOne)));

        EXPECT_EQ(status(), DownloadingStatus::NotDownloaded) << local;
        EXPECT_EQ(reason(), "the client lists the item and has not brought it yet");
    }
}

TEST_F(SyncthingStatus, WhatTheClientLeavesOutIsNotDownloaded) {
    for (const char* flag : {"ignored", "invalid"}) {
        serveFile(indexJson(sideJson(kOne, flag), sideJson(kOne)));

        EXPECT_EQ(status(), DownloadingStatus::NotDownloaded) << flag;
        EXPECT_EQ(reason(), "the client leaves the item out");
    }
}

TEST_F(SyncthingStatus, AFileMadeAnewWhereOneWasDeletedIsDownloaded) {
    serveFile(indexJson(sideJson(kOne, "deleted"), sideJson(kOne, "deleted")));

    EXPECT_EQ(status(), DownloadingStatus::Downloaded);
    EXPECT_EQ(reason(), "the client does not know the item yet");
}

TEST_F(SyncthingStatus, AFileThatIsStillToComeIsAPromise) {
    serveFile(indexJson(sideJson("[]"), sideJson(kOne)));

    EXPECT_TRUE(m_store.isPromisedItemReachable(m_folder.url("root/b.epub"), nullptr));
    EXPECT_EQ(status("root/b.epub"), DownloadingStatus::NotDownloaded);
}

TEST_F(SyncthingStatus, ADeletedFileIsNoPromise) {
    serveFile(indexJson(sideJson(kOne, "deleted"), sideJson(kOne, "deleted")));
    std::optional<Error> error;

    EXPECT_FALSE(m_store.isPromisedItemReachable(m_folder.url("root/b.epub"), &error));

    EXPECT_EQ(error, makeFileError(PVFileErrorCode::NoSuchFile, m_folder.url("root/b.epub")));
}

TEST_F(SyncthingStatus, APackageIsNotDownloadedWhileAMemberIsNeeded) {
    m_folder.write("root/p.epub/mimetype", "");
    serve({{"/rest/db/file", okReply(kInStep)},
           {"/rest/db/need", okReply(neededJson({"x", "p.epub/OPS/book.opf"}))}});

    EXPECT_EQ(status("root/p.epub"), DownloadingStatus::NotDownloaded);
}

TEST_F(SyncthingStatus, APackageOfWhichNothingIsNeededIsCurrent) {
    m_folder.write("root/p.epub/mimetype", "");
    serve({{"/rest/db/file", okReply(kInStep)},
           {"/rest/db/need", okReply(neededJson({"p.epub2/x", "p.epu"}))}});

    EXPECT_EQ(status("root/p.epub"), DownloadingStatus::Current);
}

TEST_F(SyncthingStatus, APackageThatOnlyLosesAMemberIsHere) {
    m_folder.write("root/p.epub/mimetype", "");
    serve({{"/rest/db/file", okReply(kInStep)},
           {"/rest/db/need", okReply(neededJson({"p.epub/old"}, /*deleted=*/true))}});

    EXPECT_EQ(status("root/p.epub"), DownloadingStatus::Current);
}

TEST_F(SyncthingStatus, TheNextPagesOfWhatIsNeededAreReadToo) {
    m_folder.write("root/p.epub/mimetype", "");
    serve({{"/rest/db/file", okReply(kInStep)},
           {"/rest/db/need?folder=my%20books&perpage=1000&page=1 ",
            okReply(neededJson(std::vector<std::string>(1000, "x")))},
           {"/rest/db/need?folder=my%20books&perpage=1000&page=2 ",
            okReply(neededJson({"p.epub/y"}))}});

    EXPECT_EQ(status("root/p.epub"), DownloadingStatus::NotDownloaded);
}

TEST_F(SyncthingStatus, AFolderThatNeedsWithoutEndGivesNoStatusOfPackages) {
    m_folder.write("root/p.epub/mimetype", "");
    serve({{"/rest/db/file", okReply(kInStep)},
           {"/rest/db/need", okReply(neededJson(std::vector<std::string>(1000, "x")))}});

    EXPECT_EQ(status("root/p.epub"), std::nullopt);
}

TEST_F(SyncthingStatus, AWrongAnswerGivesNoStatus) {
    std::string deep(100'000, '[');
    for (const std::string& reply :
         {okReply("{}"), okReply("[]"), okReply("null"), okReply("{\"local\": 1}"),
          okReply(kInStep.substr(1)), okReply(kInStep + "x"), okReply(deep),
          okReply(indexJson("{}", sideJson(kOne))),
          okReply(indexJson(sideJson("3"), sideJson(kOne))),
          std::string("HTTP/1.0 403 Forbidden\r\n\r\n"), std::string("nonsense"),
          std::string("HTTP/1.0 200 OK\r\nContent-Length: 5\r\n\r\n") + kInStep,
          std::string("HTTP/1.0 200 OK\r\ncontent-length: 99999999999999999999\r\n\r\n{}"),
          std::string("HTTP/1.0 2\r\n\r\n"), std::string("HTTP/1.")}) {
        serve({{"/rest/db/file", reply}});

        EXPECT_EQ(status(), std::nullopt) << reply.substr(0, 200);
        EXPECT_EQ(reason(), "the client's answer is not understood") << reply.substr(0, 200);
    }
}

TEST_F(SyncthingStatus, AnAnswerWithoutEndGivesNoStatus) {
    serveRaw([](StandInConnection& connection) {
        connection.send("HTTP/1.0 200 OK\r\n\r\n");
        while (connection.send(std::string(65'536, ' '))) {
        }
    });

    EXPECT_EQ(status(), std::nullopt);
}

TEST_F(SyncthingStatus, ASilentClientGivesNoStatusWithinTheWait) {
    serveRaw([](StandInConnection& connection) { connection.waitForEnd(); });

    EXPECT_EQ(status(), std::nullopt);
    EXPECT_LT(m_took, milliseconds(1500));
}

TEST_F(SyncthingStatus, AClientThatDripsItsAnswerGivesNoStatusWithinTheWait) {
    serveRaw([](StandInConnection& connection) {
        while (connection.send("x"))
            std::this_thread::sleep_for(milliseconds(20));
    });

    EXPECT_EQ(status(), std::nullopt);
    EXPECT_LT(m_took, milliseconds(1500));
}

TEST_F(SyncthingStatus, AClientThatClosesLeavesWhatTheDiskShows) {
    serveRaw([](StandInConnection&) {});

    EXPECT_EQ(status(), DownloadingStatus::Downloaded);
}

TEST_F(SyncthingStatus, AClientThatDoesNotRunLeavesWhatTheDiskShows) {
    serveFile(kInStep);
    m_server.reset();

    EXPECT_EQ(status(), DownloadingStatus::Downloaded);
    EXPECT_EQ(reason(), "the client does not run");
}

TEST_F(SyncthingStatus, WithoutAConfigurationWhatTheDiskShowsCounts) {
    EXPECT_EQ(status(), DownloadingStatus::Downloaded);
    EXPECT_EQ(reason(), "the client's configuration has no such folder");
}

TEST_F(SyncthingStatus, ADamagedConfigurationIsNone) {
    for (const char* text : {"", "<configuration", "<configuration/>", "<a><folder/></a>"}) {
        m_folder.write("config/syncthing/config.xml", text);

        EXPECT_EQ(status(), DownloadingStatus::Downloaded) << text;
    }
}

TEST_F(SyncthingStatus, TheKeyIsNotSentToAnotherMachineNorOverTLS) {
    serveFile(kInStep);
    const std::string port = ":" + std::to_string(m_server->port());
    for (const std::string& address :
         {"192.0.2.1" + port, "example.org" + port, "[2001:db8::1]" + port,
          std::string("127.0.0.1"), std::string("127.0.0.1:x"), std::string("127.0.0.1:0"),
          std::string("/run/syncthing")}) {
        configure(address);

        EXPECT_EQ(status(), DownloadingStatus::Downloaded) << address;
    }
    configure("", "tls=\"true\"");
    EXPECT_EQ(status(), DownloadingStatus::Downloaded);
    EXPECT_EQ(m_server->connections(), 0);
}

TEST_F(SyncthingStatus, AnInterfaceThatListensEverywhereIsAskedOnTheLoopback) {
    serveFile(kInStep);
    const std::string port = ":" + std::to_string(m_server->port());
    for (const std::string& address : {"0.0.0.0" + port, port, "localhost" + port}) {
        configure(address);

        EXPECT_EQ(status(), DownloadingStatus::Current) << address;
    }
}

TEST_F(SyncthingStatus, AKeyThatWouldBreakItsHeaderIsNotSent) {
    m_apiKey = "a&#13;&#10;X: b";
    serveFile(kInStep);

    EXPECT_EQ(status(), DownloadingStatus::Downloaded);
    EXPECT_EQ(m_server->connections(), 0);
}

TEST_F(SyncthingStatus, AFolderInTheHomeMayBeWrittenWithATilde) {
    const EnvironmentValue home("HOME", m_folder.path().string());
    m_path = "~/root";
    serveFile(kInStep);

    EXPECT_EQ(status(), DownloadingStatus::Current);
}

TEST_F(SyncthingStatus, AFolderBelowAndALinkToItArePathsInTheSameFolder) {
    m_folder.write("root/deep/ü b.epub", "content");
    std::filesystem::create_directory_symlink("root/deep", m_folder / "link");
    serveFile(kInStep);

    EXPECT_EQ(status("link/ü b.epub"), DownloadingStatus::Current);
    EXPECT_THAT(requests(), ElementsAre("GET /rest/db/file?folder=my%20books&file="
                                        "deep%2F%C3%BC%20b.epub"));
}

TEST_F(SyncthingStatus, AKeyIsNotSentToAnotherUsersProgram) {
    std::atomic<bool> isAsked{false};
    {
        const StrangerScope stranger;
        if (!stranger.isInForce())
            GTEST_SKIP() << "only the system's own user can make a socket of another's";
        m_server.emplace([&](StandInConnection& connection) {
            std::string line;
            isAsked = connection.readLine(line);
        });
    }
    configure();

    EXPECT_EQ(status(), DownloadingStatus::Downloaded);
    EXPECT_EQ(reason(), "the client does not run");
    m_server.reset();
    EXPECT_FALSE(isAsked);
}

TEST_F(SyncthingStatus, AMarkOfAnotherNameIsTheOneThatTheConfigurationNames) {
    m_folder.write("books/.kept", "");
    m_folder.write("books/deep/a.epub", "content");
    m_folder.write("bare/a.epub", "content");
    m_folder.write("config/syncthing/config.xml",
                   "<configuration><folder id=\"1\" path=\"/nowhere\">"
                   "<markerName>.kept</markerName></folder><folder id=\"2\" path=\"" +
                       (m_folder / "bare") +
                       "\"><markerName>.kept</markerName></folder><folder id=\"3\" path=\"" +
                       (m_folder / "books") +
                       "\"><markerName>.kept</markerName></folder></configuration>");

    const auto report = m_store.report(m_folder.url("books/deep/a.epub"), nullptr);

    ASSERT_TRUE(report);
    EXPECT_EQ(report->client, "Syncthing");
    EXPECT_EQ(report->root, m_folder / "books");
    EXPECT_EQ(report->mark, ".kept");
    EXPECT_EQ(m_store.isUbiquitous(m_folder.url("bare/a.epub"), nullptr), false);
    EXPECT_EQ(host::markedRootAbove(m_folder / "books/deep"), m_folder / "books");
}

TEST_F(SyncthingStatus, AMarkOfAnotherNameIsNoneWithoutTheConfiguration) {
    m_folder.write("books/.kept", "");

    EXPECT_EQ(m_store.isUbiquitous(m_folder.url("books/a.epub"), nullptr), false);
}

TEST_F(SyncthingStatus, APackageWithAPartOnItsWayIsNotDownloaded) {
    m_folder.write("root/p.epub/OPS/.syncthing.book.opf.tmp", "half");

    EXPECT_EQ(status("root/p.epub"), DownloadingStatus::NotDownloaded);
}

}  // namespace
}  // namespace parvel::testing
