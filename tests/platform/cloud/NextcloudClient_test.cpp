#include "parvel/platform/linux/cloud/NextcloudClient.h"

#include <atomic>
#include <filesystem>
#include <mutex>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "parvel/platform/linux/cloud/HostCloudStore.h"
#include "tests/support/EnvironmentValue.h"
#include "tests/support/StandInServer.h"
#include "tests/support/TemporaryDirectory.h"

namespace parvel::testing {
namespace {

using std::chrono::milliseconds;
using std::chrono::steady_clock;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

constexpr const char* kJournal = "root/.sync_0123456789ab.db";
constexpr const char* kHello = "VERSION:3.7.3:1.1\n";

/// A root with the journal of Nextcloud's client, whose socket a stand-in serves.
class NextcloudStatus : public ::testing::Test {
protected:
    NextcloudStatus() {
        std::filesystem::create_directory(m_folder / "Nextcloud");
        m_folder.write(kJournal, "");
        m_folder.write("root/a.epub", "content");
    }

    /// Speaks the client's lines: tells its folder, answers VERSION, and hands everything else to
    /// the function.
    void serve(std::function<void(StandInConnection&, const std::string&)> answer) {
        m_server.emplace(m_folder / "Nextcloud/socket",
                         [this, answer = std::move(answer)](StandInConnection& connection) {
                             connection.send("REGISTER_PATH:" + m_registered + "\n");
                             for (std::string line; connection.readLine(line);) {
                                 remember(line);
                                 if (line == "VERSION:")
                                     connection.send(kHello);
                                 else
                                     answer(connection, line);
                             }
                         });
    }
    void serveRaw(StandInServer::Serve serve) {
        m_server.emplace(m_folder / "Nextcloud/socket", std::move(serve));
    }
    /// Answers every question with that status.
    void serveStatus(const std::string& status) {
        serve([status](StandInConnection& connection, const std::string& line) {
            connection.send("STATUS:" + status + line.substr(line.find(':')) + "\n");
        });
    }
    void remember(const std::string& line) {
        const std::lock_guard lock(m_mutex);
        m_lines.push_back(line);
    }
    std::vector<std::string> lines() {
        const std::lock_guard lock(m_mutex);
        return m_lines;
    }

    std::optional<DownloadingStatus> status(std::string_view name = "root/a.epub") {
        std::optional<DownloadingStatus> result = DownloadingStatus::NotDownloaded;
        const auto begin = steady_clock::now();
        EXPECT_TRUE(m_store.downloadingStatus(m_folder.url(name), result, nullptr));
        m_took = std::chrono::ceil<milliseconds>(steady_clock::now() - begin);
        return result;
    }

    TemporaryDirectory m_folder;
    std::string m_registered = m_folder / "root";
    EnvironmentValue m_runtime{"XDG_RUNTIME_DIR", m_folder.path().string()};
    host::HostCloudStore m_store{host::CloudWaits{milliseconds(300), milliseconds(10'000),
                                                  milliseconds(2000), milliseconds(60'000)}};
    milliseconds m_took{0};
    std::mutex m_mutex;  ///< of m_lines
    std::vector<std::string> m_lines;
    std::optional<StandInServer> m_server;
};

TEST_F(NextcloudStatus, AnItemInStepIsCurrent) {
    serveStatus("OK");

    EXPECT_EQ(status(), DownloadingStatus::Current);
    EXPECT_THAT(lines(),
                ElementsAre("VERSION:", "RETRIEVE_FILE_STATUS:" + (m_folder / "root/a.epub")));
}

TEST_F(NextcloudStatus, ASharedItemInStepIsCurrent) {
    serveStatus("OK+SWM");

    EXPECT_EQ(status(), DownloadingStatus::Current);
}

TEST_F(NextcloudStatus, AnItemThatIsNotInStepIsDownloaded) {
    for (const char* word : {"SYNC", "NOP", "IGNORE", "ERROR"}) {
        serveStatus(word);

        EXPECT_EQ(status(), DownloadingStatus::Downloaded) << word;
        m_server.reset();
        std::filesystem::remove(m_folder / "Nextcloud/socket");
    }
}

TEST_F(NextcloudStatus, AWordThatNobodyKnowsGivesNoStatus) {
    serveStatus("FINE");

    EXPECT_EQ(status(), std::nullopt);
}

TEST_F(NextcloudStatus, APackageIsAskedForAsOneItem) {
    m_folder.write("root/p.epub/mimetype", "");
    serveStatus("OK");

    EXPECT_EQ(status("root/p.epub"), DownloadingStatus::Current);
}

TEST_F(NextcloudStatus, AnAnswerMayComeInPieces) {
    serveRaw([this](StandInConnection& connection) {
        const std::string all = "REGISTER_PATH:" + m_registered + "\n" + kHello +
                                "STATUS:OK:" + (m_folder / "root/a.epub") + "\n";
        for (const char byte : all)
            connection.send({&byte, 1});
        connection.waitForEnd();
    });

    EXPECT_EQ(status(), DownloadingStatus::Current);
}

TEST_F(NextcloudStatus, UnknownLinesAndOtherItemsAnswersArePassedOver) {
    serve([this](StandInConnection& connection, const std::string&) {
        connection.send("UPDATE_VIEW:" + m_registered + "\nGET_STRINGS:BEGIN\n\nSTATUS\nSTATUS:\n" +
                        "STATUS:SYNC:" + (m_folder / "root/b.epub") + "\n" +
                        "STATUS:OK:" + (m_folder / "root/a.epub") + "\n");
    });

    EXPECT_EQ(status(), DownloadingStatus::Current);
}

TEST_F(NextcloudStatus, ASilentClientGivesNoStatusWithinTheWait) {
    serveRaw([](StandInConnection& connection) { connection.waitForEnd(); });

    EXPECT_EQ(status(), std::nullopt);
    EXPECT_LT(m_took, milliseconds(1500));
}

TEST_F(NextcloudStatus, ASilentClientIsLeftAloneForAWhile) {
    serveRaw([](StandInConnection& connection) { connection.waitForEnd(); });
    EXPECT_EQ(status(), std::nullopt);

    EXPECT_EQ(status(), std::nullopt);
    EXPECT_LT(m_took, milliseconds(200));
    EXPECT_EQ(m_server->connections(), 1);
}

TEST_F(NextcloudStatus, AClientThatFallsSilentAfterItsGreetingGivesNoStatus) {
    serve([](StandInConnection&, const std::string&) {});

    EXPECT_EQ(status(), std::nullopt);
    EXPECT_LT(m_took, milliseconds(1500));
}

TEST_F(NextcloudStatus, AClientThatClosesLeavesWhatTheDiskShows) {
    serveRaw([this](StandInConnection& connection) {
        connection.send("REGISTER_PATH:" + m_registered + "\n" + kHello + "STATUS:OK:");
    });

    EXPECT_EQ(status(), DownloadingStatus::Downloaded);
}

TEST_F(NextcloudStatus, AClientThatDoesNotRunLeavesWhatTheDiskShows) {
    EXPECT_EQ(status(), DownloadingStatus::Downloaded);

    serveStatus("OK");
    m_server.reset();  // its socket stays behind
    EXPECT_TRUE(std::filesystem::exists(m_folder / "Nextcloud/socket"));
    EXPECT_EQ(status(), DownloadingStatus::Downloaded);
}

TEST_F(NextcloudStatus, WithoutARuntimeFolderNobodyIsAsked) {
    const EnvironmentValue none("XDG_RUNTIME_DIR", "");
    serveStatus("OK");

    EXPECT_EQ(status(), DownloadingStatus::Downloaded);
    EXPECT_EQ(m_server->connections(), 0);
}

TEST_F(NextcloudStatus, AClientThatKeepsOtherFoldersLeavesWhatTheDiskShows) {
    std::filesystem::create_directory(m_folder / "other");
    m_registered = m_folder / "other";
    serveStatus("OK");

    EXPECT_EQ(status(), DownloadingStatus::Downloaded);
    EXPECT_THAT(lines(), ElementsAre("VERSION:"));
}

TEST_F(NextcloudStatus, TheClientsOwnNameOfTheFolderIsUsed) {
    std::filesystem::create_directory_symlink("root", m_folder / "link");
    m_registered = m_folder / "link";
    serveStatus("OK");

    EXPECT_EQ(status(), DownloadingStatus::Current);
    EXPECT_THAT(lines(),
                ElementsAre("VERSION:", "RETRIEVE_FILE_STATUS:" + (m_folder / "link/a.epub")));
}

TEST_F(NextcloudStatus, ANameIsSentInComposedForm) {
    m_folder.write("root/u\u0308.epub", "content");
    serveStatus("OK");

    EXPECT_EQ(status("root/u\u0308.epub"), DownloadingStatus::Current);
    EXPECT_THAT(lines(),
                ElementsAre("VERSION:", "RETRIEVE_FILE_STATUS:" + (m_folder / "root/\u00fc.epub")));
}

TEST_F(NextcloudStatus, ANameThatNoLineCanCarryIsNotSent) {
    serveStatus("OK");
    for (const std::string_view name : {"root/a\nb.epub", "root/a.epub ", "root/\xff.epub"}) {
        m_folder.write(name, "content");

        EXPECT_EQ(status(name), DownloadingStatus::Downloaded) << name;
    }
    EXPECT_THAT(lines(), ElementsAre("VERSION:", "VERSION:", "VERSION:"));
}

TEST_F(NextcloudStatus, ALineWithoutEndGivesNoStatus) {
    serveRaw([](StandInConnection& connection) {
        while (connection.send(std::string(65'536, 'x'))) {
        }
    });

    EXPECT_EQ(status(), std::nullopt);
}

TEST_F(NextcloudStatus, LinesWithoutEndGiveNoStatus) {
    serveRaw([](StandInConnection& connection) {
        while (connection.send("UPDATE_VIEW:/x\nUPDATE_VIEW:/y\n")) {
        }
    });

    EXPECT_EQ(status(), std::nullopt);
    EXPECT_LT(m_took, milliseconds(1500));
}

TEST_F(NextcloudStatus, APlaceholderIsNotDownloadedWhateverTheClientSays) {
    m_folder.write("root/b.epub.nextcloud", " ");
    serveStatus("OK");

    EXPECT_EQ(status("root/b.epub"), DownloadingStatus::NotDownloaded);
    EXPECT_THAT(lines(), IsEmpty());
}

TEST_F(NextcloudStatus, NobodyIsAskedAboutAnItemOutside) {
    m_folder.write("a.epub", "content");
    serveStatus("OK");

    EXPECT_EQ(status("a.epub"), std::nullopt);
    EXPECT_EQ(m_server->connections(), 0);
}

TEST_F(NextcloudStatus, AReportSaysWhoKeepsTheItemAndWhy) {
    serveStatus("SYNC");

    const auto report = m_store.report(m_folder.url("root/a.epub"), nullptr);

    ASSERT_TRUE(report);
    EXPECT_TRUE(report->isUbiquitous);
    EXPECT_EQ(report->client, "Nextcloud");
    EXPECT_EQ(report->root, m_folder / "root");
    EXPECT_EQ(report->status, DownloadingStatus::Downloaded);
    EXPECT_EQ(report->reason, "the client is still busy with the item");
}

/// The download of what is not on this device.
class NextcloudDownload : public NextcloudStatus {
protected:
    bool fetch(std::string_view name) {
        const auto begin = steady_clock::now();
        const bool isFetched = m_store.fetchContent(m_folder.url(name), &m_error);
        m_took = std::chrono::ceil<milliseconds>(steady_clock::now() - begin);
        return isFetched;
    }
    void expectTimedOut(std::string_view name) {
        EXPECT_EQ(m_error, makePOSIXError(ETIMEDOUT, m_folder.url(name)));
    }

    std::optional<Error> m_error;
};

TEST_F(NextcloudDownload, APlaceholderIsDownloadedByTheClient) {
    m_folder.write("root/b.epub.nextcloud", " ");
    serve([this](StandInConnection&, const std::string&) {
        std::this_thread::sleep_for(milliseconds(150));
        m_folder.write("root/b.part", "content");
        std::filesystem::rename(m_folder / "root/b.part", m_folder / "root/b.epub");
        std::filesystem::remove(m_folder / "root/b.epub.nextcloud");
    });

    EXPECT_TRUE(fetch("root/b.epub"));

    EXPECT_FALSE(m_error);
    EXPECT_EQ(m_folder.read("root/b.epub"), "content");
    const std::string path = m_folder / "root/b.epub";
    EXPECT_THAT(lines(), ElementsAre("VERSION:", "MAKE_AVAILABLE_LOCALLY:" + path + "\x1e" + path +
                                                     ".nextcloud"));
}

TEST_F(NextcloudDownload, APackageIsHereOnceNoPlaceholderIsLeftInIt) {
    m_folder.write("root/p.epub/mimetype", "x");
    m_folder.write("root/p.epub/OPS/a.nextcloud", " ");
    m_folder.write("root/p.epub/OPS/b.nextcloud", " ");
    serve([this](StandInConnection& connection, const std::string& line) {
        if (line.starts_with("RETRIEVE")) {
            connection.send("STATUS:OK" + line.substr(line.find(':')) + "\n");
            return;
        }
        for (const char* name : {"root/p.epub/OPS/a", "root/p.epub/OPS/b"}) {
            std::this_thread::sleep_for(milliseconds(100));
            m_folder.write(name, "content");
            std::filesystem::remove(m_folder / (std::string(name) + ".nextcloud"));
        }
    });

    EXPECT_TRUE(fetch("root/p.epub"));
    EXPECT_TRUE(std::filesystem::exists(m_folder / "root/p.epub/OPS/b"));
}

TEST_F(NextcloudDownload, AFileThatIsHereIsNotAskedFor) {
    serveStatus("SYNC");

    EXPECT_TRUE(fetch("root/a.epub"));
    EXPECT_THAT(lines(), IsEmpty());
}

TEST_F(NextcloudDownload, APackageThatTheClientIsBusyWithIsAwaited) {
    m_folder.write("root/p.epub/mimetype", "x");
    std::atomic<int> questions{0};
    serve([&](StandInConnection& connection, const std::string& line) {
        const bool isDone = ++questions > 3;
        if (isDone)
            m_folder.write("root/p.epub/last", "content");
        connection.send((isDone ? "STATUS:OK" : "STATUS:SYNC") + line.substr(line.find(':')) +
                        "\n");
    });

    EXPECT_TRUE(fetch("root/p.epub"));

    EXPECT_TRUE(std::filesystem::exists(m_folder / "root/p.epub/last"));
    const std::string question = "RETRIEVE_FILE_STATUS:" + (m_folder / "root/p.epub");
    EXPECT_THAT(lines(),
                ElementsAre("VERSION:", question, "VERSION:", question, question, question));
}

TEST_F(NextcloudDownload, APackageIsNotAllHereAfterAnUnclearAnswer) {
    m_folder.write("root/p.epub/mimetype", "x");
    serveStatus("FINE");

    EXPECT_FALSE(m_store.isAllHere(m_folder.url("root/p.epub")));
    EXPECT_FALSE(fetch("root/p.epub"));

    expectTimedOut("root/p.epub");
    EXPECT_LT(m_took, milliseconds(4000));
}

TEST_F(NextcloudDownload, APackageIsAllHereWhereTheClientDoesNotRunOrIsDone) {
    m_folder.write("root/p.epub/mimetype", "x");
    EXPECT_TRUE(fetch("root/p.epub"));

    for (const char* word : {"OK", "NOP", "IGNORE", "ERROR"}) {
        serveStatus(word);
        EXPECT_TRUE(fetch("root/p.epub")) << word;
        m_server.reset();
        std::filesystem::remove(m_folder / "Nextcloud/socket");
    }
}

TEST_F(NextcloudDownload, AClientThatClosesOverAPackageFailsAtOnce) {
    m_folder.write("root/p.epub/mimetype", "x");
    serveRaw([this](StandInConnection& connection) {
        connection.send("REGISTER_PATH:" + m_registered + "\n" + kHello);
        std::string line;
        for (int count = 0; count < 2 && connection.readLine(line); ++count) {
        }
        connection.send("STATUS:SYNC" + line.substr(line.find(':')) + "\n");
    });

    EXPECT_FALSE(fetch("root/p.epub"));

    expectTimedOut("root/p.epub");
    EXPECT_LT(m_took, milliseconds(1500));
}

TEST_F(NextcloudDownload, WhatDoesNotComeInTimeFails) {
    m_folder.write("root/b.epub.nextcloud", " ");
    serve([](StandInConnection&, const std::string&) {});

    EXPECT_FALSE(fetch("root/b.epub"));

    expectTimedOut("root/b.epub");
    EXPECT_GE(m_took, milliseconds(2000));
    EXPECT_LT(m_took, milliseconds(4000));
    EXPECT_TRUE(std::filesystem::exists(m_folder / "root/b.epub.nextcloud"));
}

TEST_F(NextcloudDownload, WithoutItsClientAPlaceholderFailsAtOnce) {
    m_folder.write("root/b.epub.nextcloud", " ");

    EXPECT_FALSE(fetch("root/b.epub"));

    expectTimedOut("root/b.epub");
    EXPECT_LT(m_took, milliseconds(1000));
}

TEST_F(NextcloudDownload, AClientThatClosesInBetweenFailsAtOnce) {
    m_folder.write("root/b.epub.nextcloud", " ");
    serveRaw([this](StandInConnection& connection) {
        connection.send("REGISTER_PATH:" + m_registered + "\n" + kHello);
        std::string line;
        connection.readLine(line);
        connection.readLine(line);
    });

    EXPECT_FALSE(fetch("root/b.epub"));

    expectTimedOut("root/b.epub");
    EXPECT_LT(m_took, milliseconds(1500));
}

}  // namespace
}  // namespace parvel::testing
