#include "parvel/platform/linux/cloud/SyncthingClient.h"

#include <sys/fsuid.h>

#include <atomic>
#include <filesystem>
#include <map>
#include <mutex>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "parvel/platform/linux/cloud/HostCloudStore.h"
#include "parvel/platform/linux/cloud/SyncedPlace.h"
#include "tests/support/EnvironmentValue.h"
#include "tests/support/StandInServer.h"
#include "tests/support/TemporaryDirectory.h"

namespace parvel::testing {
namespace {

using std::chrono::milliseconds;
using std::chrono::steady_clock;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

/// One side of an item in the index. `flags` is none of deleted, ignored and invalid by default.
std::string sideJson(const std::string& counters, const std::string& set = "") {
    const auto flag = [&set](const std::string& name) {
        return "\"" + name + "\": " + (name == set ? "true" : "false");
    };
    return "{" + flag("deleted") + "," + flag("ignored") + "," + flag("invalid") +
           ", \"version\": " + counters + "}";
}

std::string indexJson(const std::string& local, const std::string& global) {
    return "{\"availability\": [], \"global\": " + global + ", \"local\": " + local + "}";
}

std::string neededJson(const std::vector<std::string>& names, bool deleted = false) {
    std::string items;
    for (const std::string& name : names)
        items += std::string(items.empty() ? "" : ",") + "{\"name\": \"" + name +
                 "\", \"deleted\": " + (deleted ? "true" : "false") + "}";
    return "{\"page\": 1, \"progress\": [], \"queued\": [" + items + "], \"rest\": []}";
}

std::string okReply(const std::string& body) {
    return "HTTP/1.0 200 OK\r\nContent-Type: application/json\r\nContent-Length: " +
           std::to_string(body.size()) + "\r\n\r\n" + body;
}

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

const std::string kOne = "[\"ABC:1\"]";
const std::string kTwo = "[\"ABC:1\", \"DEF:7\"]";
const std::string kInStep = indexJson(sideJson(kOne), sideJson(kOne));

/// A root with Syncthing's mark, whose REST interface a stand-in serves.
class SyncthingStatus : public ::testing::Test {
protected:
    SyncthingStatus() {
        m_folder.write("root/.stfolder/x", "");
        m_folder.write("root/a.epub", "content");
    }

    /// The configuration names the stand-in's address, unless another is given.
    void configure(const std::string& address = "", const std::string& guiAttributes = "") {
        m_folder.write(
            "config/syncthing/config.xml",
            "<configuration version=\"36\"><folder id=\"other\" path=\"/nowhere\"/>" +
                ("<folder id=\"my books\" path=\"" + m_path + "\"/>") + "<gui enabled=\"true\" " +
                guiAttributes + "><address>" +
                (address.empty() ? "127.0.0.1:" + std::to_string(m_server->port()) : address) +
                "</address><apikey>" + m_apiKey + "</apikey></gui></configuration>");
    }
    void serveRaw(StandInServer::Serve serve) {
        m_server.emplace(std::move(serve));
        configure();
    }
    /// Gives each request its reply, by the start of the resource that it asks for.
    void serve(std::map<std::string, std::string> replies) {
        serveRaw([this, replies = std::move(replies)](StandInConnection& connection) {
            std::string request;
            connection.readLine(request);
            std::string header;
            for (std::string line; connection.readLine(line) && line != "\r";)
                header += line;
            {
                const std::lock_guard lock(m_mutex);
                m_requests.push_back(request.substr(0, request.find_last_of(' ')));
                m_header = header;
            }
            for (const auto& [start, reply] : replies)
                if (request.starts_with("GET " + start))
                    connection.send(reply);
        });
    }
    std::vector<std::string> requests() {
        const std::lock_guard lock(m_mutex);
        return m_requests;
    }
    std::string header() {
        const std::lock_guard lock(m_mutex);
        return m_header;
    }
    void serveFile(const std::string& body) { serve({{"/rest/db/file", okReply(body)}}); }

    std::optional<DownloadingStatus> status(std::string_view name = "root/a.epub") {
        std::optional<DownloadingStatus> result = DownloadingStatus::NotDownloaded;
        const auto begin = steady_clock::now();
        EXPECT_TRUE(m_store.downloadingStatus(m_folder.url(name), result, nullptr));
        m_took = std::chrono::ceil<milliseconds>(steady_clock::now() - begin);
        return result;
    }
    std::string reason(std::string_view name = "root/a.epub") {
        return m_store.report(m_folder.url(name), nullptr).value().reason;
    }

    TemporaryDirectory m_folder;
    EnvironmentValue m_state{"XDG_STATE_HOME", m_folder / "state"};
    EnvironmentValue m_config{"XDG_CONFIG_HOME", m_folder / "config"};
    std::string m_path = m_folder / "root";
    std::string m_apiKey = "key-123";
    host::HostCloudStore m_store{host::CloudWaits{milliseconds(400), milliseconds(0),
                                                  milliseconds(1500), milliseconds(60'000)}};
    milliseconds m_took{0};
    std::mutex m_mutex;  ///< of the next two
    std::vector<std::string> m_requests;
    std::string m_header;
    std::optional<StandInServer> m_server;
};

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
    ASSERT_TRUE(error);
    EXPECT_EQ(error->code(), 4);
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

/// What may leave the folder, and what has to come first.
class SyncthingDownload : public SyncthingStatus {
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
        ASSERT_TRUE(m_error);
        EXPECT_EQ(m_error->domain(), PVPOSIXErrorDomain);
        EXPECT_EQ(m_error->code(), ETIMEDOUT);
        EXPECT_EQ(*m_error->url(), m_folder.url(name));
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
