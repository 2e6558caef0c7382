#include "parvel/platform/linux/cloud/DesktopRoots.h"

#include <fcntl.h>
#include <signal.h>
#include <spawn.h>
#include <sys/wait.h>
#include <systemd/sd-bus.h>
#include <unistd.h>

#include <atomic>
#include <chrono>
#include <filesystem>
#include <functional>
#include <thread>

#include <gtest/gtest.h>

#include "parvel/platform/linux/cloud/HostCloudStore.h"
#include "tests/support/AbsentLibrary.h"
#include "tests/support/EnvironmentValue.h"
#include "tests/support/StandInServer.h"
#include "tests/support/TemporaryDirectory.h"

namespace parvel::testing {
namespace {

using std::chrono::milliseconds;
using std::chrono::steady_clock;

constexpr const char* kBusName = "org.example.Sync";
constexpr const char* kObject = "/org/example/Sync";

/// A message bus of the test's own.
class PrivateBus {
public:
    static bool isInstalled() { return ::access("/usr/bin/dbus-daemon", X_OK) == 0; }

    explicit PrivateBus(const std::string& socket) {
        const std::string address = "--address=unix:path=" + socket;
        std::string words[] = {"setpriv",   "--pdeathsig", "KILL",        "dbus-daemon",
                               "--session", "--nofork",    "--nopidfile", address};
        char* arguments[9] = {};
        for (std::size_t i = 0; i < 8; ++i)
            arguments[i] = words[i].data();
        posix_spawn_file_actions_t actions;
        posix_spawn_file_actions_init(&actions);
        posix_spawn_file_actions_addopen(&actions, 2, "/dev/null", O_WRONLY, 0);
        if (::posix_spawnp(&m_process, "setpriv", &actions, nullptr, arguments, environ) != 0)
            m_process = -1;
        posix_spawn_file_actions_destroy(&actions);
        for (int i = 0; i < 500 && !takesConnections(socket); ++i)
            std::this_thread::sleep_for(milliseconds(10));
    }
    ~PrivateBus() {
        if (m_process <= 0)
            return;
        ::kill(m_process, SIGKILL);
        ::waitpid(m_process, nullptr, 0);
    }
    PrivateBus(const PrivateBus&) = delete;
    PrivateBus& operator=(const PrivateBus&) = delete;

private:
    static bool takesConnections(const std::string& socket) {
        host::ClientSocket probe;
        return probe.connectToPath(socket, steady_clock::now() + milliseconds(100)) ==
               host::SocketOutcome::Done;
    }

    pid_t m_process = -1;
};

/// A client on the bus that answers GetManagedObjects with what a function appends; with nothing at
/// all where it gives an empty signature.
class AnnouncingClient {
public:
    using Append = std::function<int(sd_bus_message*)>;

    AnnouncingClient(const std::string& address, Append append) : m_append(std::move(append)) {
        sd_bus_new(&m_bus);
        sd_bus_set_address(m_bus, address.c_str());
        sd_bus_set_bus_client(m_bus, 1);
        sd_bus_start(m_bus);
        sd_bus_add_object(m_bus, nullptr, kObject, &AnnouncingClient::answer, this);
        m_isNamed = sd_bus_request_name(m_bus, kBusName, 0) >= 0;
        m_thread = std::thread([this] {
            while (!m_stops) {
                if (sd_bus_process(m_bus, nullptr) == 0)
                    sd_bus_wait(m_bus, 20'000);
            }
        });
    }
    ~AnnouncingClient() {
        m_stops = true;
        m_thread.join();
        sd_bus_flush_close_unref(m_bus);
    }
    AnnouncingClient(const AnnouncingClient&) = delete;
    AnnouncingClient& operator=(const AnnouncingClient&) = delete;

    [[nodiscard]] bool isNamed() const { return m_isNamed; }
    [[nodiscard]] int calls() const { return m_calls; }

private:
    static int answer(sd_bus_message* call, void* data, sd_bus_error* /*error*/) {
        auto& self = *static_cast<AnnouncingClient*>(data);
        ++self.m_calls;
        sd_bus_message* reply = nullptr;
        sd_bus_message_new_method_return(call, &reply);
        if (self.m_append(reply) >= 0)
            sd_bus_send(nullptr, reply, nullptr);
        sd_bus_message_unref(reply);
        return 1;
    }

    Append m_append;
    sd_bus* m_bus = nullptr;
    bool m_isNamed = false;
    std::atomic<int> m_calls{0};
    std::atomic<bool> m_stops{false};
    std::thread m_thread;
};

int appendAccount(sd_bus_message* reply, const std::string& path) {
    return sd_bus_message_append(reply, "a{oa{sa{sv}}}", 2, "/org/example/Sync", 1,
                                 "org.freedesktop.CloudProviders.Provider", 1, "Name", "s",
                                 "Example", "/org/example/Sync/1", 1,
                                 "org.freedesktop.CloudProviders.Account", 3, "Name", "s",
                                 "Example Drive", "Status", "i", 1, "Path", "s", path.c_str());
}

class DesktopRootsTest : public ::testing::Test {
protected:
    void SetUp() override {
        if (!PrivateBus::isInstalled())
            GTEST_SKIP() << "dbus-daemon is not installed";
        std::filesystem::create_directories(m_folder / "drive/books");
        m_folder.write("drive/books/a.epub", "content");
        m_folder.write("b.epub", "content");
        registerClient(kBusName);
        m_bus.emplace(m_folder / "bus");
    }
    void registerClient(const std::string& busName) const {
        m_folder.write("share/cloud-providers/example.ini",
                       "[Cloud Provider]\nBusName=" + busName + "\nObjectPath=" + kObject + "\n");
    }
    void announce(AnnouncingClient::Append append) {
        m_client.emplace(m_address, std::move(append));
        ASSERT_TRUE(m_client->isNamed());
    }
    void announceDrive() {
        announce(
            [this](sd_bus_message* reply) { return appendAccount(reply, m_folder / "drive"); });
    }
    [[nodiscard]] std::vector<host::DesktopRoot> roots() const {
        return host::desktopRoots(steady_clock::now() + milliseconds(500));
    }

    TemporaryDirectory m_folder;
    std::string m_address = "unix:path=" + (m_folder / "bus");
    EnvironmentValue m_busVariable{"DBUS_SESSION_BUS_ADDRESS", m_address};
    EnvironmentValue m_dataVariable{"XDG_DATA_DIRS",
                                    (m_folder / "none") + ":" + (m_folder / "share")};
    host::HostCloudStore m_store{host::CloudWaits{milliseconds(500), milliseconds(0),
                                                  milliseconds(500), milliseconds(60'000)}};
    std::optional<PrivateBus> m_bus;
    std::optional<AnnouncingClient> m_client;
};

TEST_F(DesktopRootsTest, AnAccountsFolderIsARoot) {
    announceDrive();

    const auto found = roots();

    ASSERT_EQ(found.size(), 1U);
    EXPECT_EQ(found[0].path, m_folder / "drive");
    EXPECT_EQ(found[0].client, "Example Drive");
}

TEST_F(DesktopRootsTest, AnItemBelowIsSynchronisedAndHasNoStatus) {
    announceDrive();
    std::optional<DownloadingStatus> status = DownloadingStatus::Current;

    EXPECT_EQ(m_store.isUbiquitous(m_folder.url("drive/books/a.epub"), nullptr), true);
    EXPECT_TRUE(m_store.downloadingStatus(m_folder.url("drive/books/a.epub"), status, nullptr));
    EXPECT_EQ(status, std::nullopt);
    EXPECT_EQ(m_store.isUbiquitous(m_folder.url("b.epub"), nullptr), false);
}

TEST_F(DesktopRootsTest, TheDesktopIsAskedOnceInAWhile) {
    announceDrive();
    for (int i = 0; i < 5; ++i)
        EXPECT_EQ(m_store.isUbiquitous(m_folder.url("b.epub"), nullptr), false);

    EXPECT_EQ(m_client->calls(), 1);
}

TEST_F(DesktopRootsTest, TheStatusOfAnItemAsksNoDesktop) {
    announceDrive();
    std::optional<DownloadingStatus> status;

    EXPECT_TRUE(m_store.downloadingStatus(m_folder.url("b.epub"), status, nullptr));
    EXPECT_TRUE(m_store.isPromisedItemReachable(m_folder.url("b.epub"), nullptr));
    EXPECT_EQ(m_client->calls(), 0);
}

TEST_F(DesktopRootsTest, TheReportNamesTheAccount) {
    announceDrive();

    const auto report = m_store.report(m_folder.url("drive/books/a.epub"), nullptr);

    ASSERT_TRUE(report);
    EXPECT_TRUE(report->isUbiquitous);
    EXPECT_EQ(report->client, "Example Drive");
    EXPECT_EQ(report->root, m_folder / "drive");
    EXPECT_EQ(report->mark, "");
    EXPECT_EQ(report->reason, "the desktop tells of the folder and of no single items");
}

TEST_F(DesktopRootsTest, AFolderThatCanBeNoRootIsLeftOut) {
    for (const std::string& path :
         {std::string("/"), std::string("//"), std::string(""), std::string("drive"),
          m_folder / "absent", m_folder / "b.epub", "/" + std::string(5000, 'x')}) {
        announce([&path](sd_bus_message* reply) { return appendAccount(reply, path); });

        EXPECT_TRUE(roots().empty()) << path.substr(0, 50);
        m_client.reset();
    }
}

TEST_F(DesktopRootsTest, AnotherInterfacesPathIsNone) {
    announce([this](sd_bus_message* reply) {
        return sd_bus_message_append(reply, "a{oa{sa{sv}}}", 1, "/x", 1, "org.example.Other", 1,
                                     "Path", "s", (m_folder / "drive").c_str());
    });

    EXPECT_TRUE(roots().empty());
}

TEST_F(DesktopRootsTest, APathOfAnotherTypeIsNone) {
    announce([](sd_bus_message* reply) {
        return sd_bus_message_append(reply, "a{oa{sa{sv}}}", 1, "/x", 1,
                                     "org.freedesktop.CloudProviders.Account", 1, "Path", "i", 7);
    });

    EXPECT_TRUE(roots().empty());
}

TEST_F(DesktopRootsTest, AnAnswerOfAnotherFormIsNone) {
    announce([this](sd_bus_message* reply) {
        return sd_bus_message_append(reply, "s", (m_folder / "drive").c_str());
    });

    EXPECT_TRUE(roots().empty());
}

TEST_F(DesktopRootsTest, ASilentClientIsWaitedForOnlyAWhile) {
    announce([](sd_bus_message*) { return -1; });
    const auto begin = steady_clock::now();

    EXPECT_TRUE(roots().empty());

    EXPECT_LT(steady_clock::now() - begin, milliseconds(1500));
}

TEST_F(DesktopRootsTest, AClientThatDoesNotRunIsNotStarted) {
    EXPECT_TRUE(roots().empty());
}

TEST_F(DesktopRootsTest, WithoutLibsystemdThereAreNoRoots) {
    announceDrive();

    EXPECT_TRUE(
        host::desktopRoots(steady_clock::now() + milliseconds(500), absentLibrary<host::Libsystemd>)
            .empty());
    EXPECT_EQ(m_client->calls(), 0);
}

TEST_F(DesktopRootsTest, LibsystemdIsNotLoadedWhereNoClientIsRegistered) {
    std::filesystem::remove_all(m_folder / "share");
    const auto unwanted = []() -> const host::Libsystemd& {
        ADD_FAILURE() << "was asked for";
        return host::Libsystemd::host();
    };

    EXPECT_TRUE(host::desktopRoots(steady_clock::now() + milliseconds(500), unwanted).empty());
}

TEST_F(DesktopRootsTest, WithoutABusThereAreNoRoots) {
    m_bus.reset();

    EXPECT_TRUE(roots().empty());
}

TEST_F(DesktopRootsTest, ASilentBusIsWaitedForOnlyAWhile) {
    m_bus.reset();
    std::filesystem::remove(m_folder / "bus");
    const StandInServer silent(m_folder / "bus",
                               [](StandInConnection& connection) { connection.waitForEnd(); });
    const auto begin = steady_clock::now();

    EXPECT_TRUE(roots().empty());

    EXPECT_LT(steady_clock::now() - begin, milliseconds(1500));
    EXPECT_EQ(silent.connections(), 1);
}

TEST_F(DesktopRootsTest, ARegistrationThatNamesNoClientIsPassedOver) {
    announceDrive();
    for (const char* name : {"", "not a name", "x", ":1.0.."}) {
        registerClient(name);

        EXPECT_TRUE(roots().empty()) << name;
    }
}

}  // namespace
}  // namespace parvel::testing
