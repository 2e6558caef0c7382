#include "parvel/platform/FileCoordinator.h"

#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

#include <atomic>
#include <chrono>
#include <filesystem>
#include <fstream>
#include <latch>
#include <string>
#include <thread>

#include <gtest/gtest.h>

#include "tests/support/TemporaryDirectory.h"

namespace parvel::testing {
namespace {

namespace fs = std::filesystem;

/// Lock files in a folder of the test's own.
class Coordination : public ::testing::Test {
protected:
    void SetUp() override {
        if (const char* runtime = getenv("XDG_RUNTIME_DIR"))
            m_saved = runtime;
        setenv("XDG_RUNTIME_DIR", m_folder.path().c_str(), 1);
    }
    void TearDown() override {
        if (m_saved)
            setenv("XDG_RUNTIME_DIR", m_saved->c_str(), 1);
        else
            unsetenv("XDG_RUNTIME_DIR");
    }

    TemporaryDirectory m_folder;
    std::shared_ptr<FileCoordinator> m_coordinator = FileCoordinator::makeDefault();
    std::optional<Error> m_error;

private:
    std::optional<std::string> m_saved;
};

TEST_F(Coordination, TheAccessorGetsTheURLOnceOnThisThread) {
    const URL book = URL::fileURLWithPath(m_folder.write("a.epub", "1"));
    int calls = 0;

    EXPECT_TRUE(m_coordinator->coordinateWriting(
        book, WritingIntent::ForReplacing, &m_error,
        [&, thread = std::this_thread::get_id()](const std::optional<URL>& url) {
            ++calls;
            EXPECT_EQ(url, book);
            EXPECT_EQ(std::this_thread::get_id(), thread);
        }));

    EXPECT_EQ(calls, 1);
    EXPECT_FALSE(m_error);
}

TEST_F(Coordination, AnItemThatDoesNotExistYetIsHandedAsItIs) {
    const URL book = m_folder.url("new.epub");
    std::optional<URL> handed;

    EXPECT_TRUE(m_coordinator->coordinateWriting(book, WritingIntent::ForReplacing, nullptr,
                                                 [&](const auto& url) { handed = url; }));

    EXPECT_EQ(handed, book);
}

TEST_F(Coordination, AnItemWhoseFolderIsGoneGivesNoURL) {
    bool wasCalled = false;

    EXPECT_TRUE(m_coordinator->coordinateWriting(
        m_folder.url("gone/a.epub"), WritingIntent::ForMoving, nullptr, [&](const auto& url) {
            wasCalled = true;
            EXPECT_FALSE(url);
        }));

    EXPECT_TRUE(wasCalled);
}

TEST_F(Coordination, AWriteWithinAWriteOfTheSameItemDoesNotWait) {
    const URL book = URL::fileURLWithPath(m_folder.write("a.epub", "1"));
    int calls = 0;

    m_coordinator->coordinateWriting(book, WritingIntent::ForReplacing, nullptr, [&](const auto&) {
        m_coordinator->coordinateWriting(book, WritingIntent::ForMoving, nullptr,
                                         [&](const auto&) { ++calls; });
    });

    EXPECT_EQ(calls, 1);
}

TEST_F(Coordination, ThreadsTakeTurnsAlsoThroughALinkedFolder) {
    fs::create_directory(m_folder / "real");
    fs::create_directory_symlink("real", m_folder / "linked");
    m_folder.write("real/a.epub", "1");
    std::atomic<int> inside{0};
    std::atomic<int> collisions{0};
    std::vector<std::thread> threads;

    for (int i = 0; i < 4; ++i) {
        threads.emplace_back([&, i] {
            const auto coordinator = FileCoordinator::makeDefault();
            const URL book = m_folder.url(i % 2 ? "real/a.epub" : "linked/a.epub");
            for (int round = 0; round < 50; ++round) {
                coordinator->coordinateWriting(book, WritingIntent::ForReplacing, nullptr,
                                               [&](const auto&) {
                                                   if (++inside != 1)
                                                       ++collisions;
                                                   --inside;
                                               });
            }
        });
    }
    for (std::thread& thread : threads)
        thread.join();

    EXPECT_EQ(collisions, 0);
}

/// Until a lock of this host has somebody who waits for it.
void awaitBlockedLock() {
    for (int tries = 0; tries < 1000; ++tries) {
        std::ifstream locks("/proc/locks");
        for (std::string line; std::getline(locks, line);) {
            if (line.find("-> OFDLCK") != std::string::npos)
                return;
        }
        std::this_thread::sleep_for(std::chrono::milliseconds(5));
    }
    ADD_FAILURE() << "nobody waits";
}

TEST_F(Coordination, AWaiterIsHandedThePlaceToWhichTheItemMoved) {
    const URL book = URL::fileURLWithPath(m_folder.write("a.epub", "1"));
    const URL moved = m_folder.url("b.epub");
    std::latch isHeld(1);
    std::optional<URL> handed;
    std::thread waiter([&] {
        isHeld.wait();
        FileCoordinator::makeDefault()->coordinateWriting(
            book, WritingIntent::ForReplacing, nullptr, [&](const auto& url) { handed = url; });
    });

    m_coordinator->coordinateWriting(book, WritingIntent::ForMoving, nullptr, [&](const auto&) {
        isHeld.count_down();
        awaitBlockedLock();
        fs::rename(book.path(), moved.path());
        m_coordinator->itemDidMove(book, moved);
    });
    waiter.join();

    EXPECT_EQ(handed, moved);
}

TEST_F(Coordination, WhoeverComesAfterTheMoveIsHandedThePlaceThatItAsksFor) {
    const URL book = URL::fileURLWithPath(m_folder.write("a.epub", "1"));
    const URL moved = m_folder.url("b.epub");
    m_coordinator->coordinateWriting(book, WritingIntent::ForMoving, nullptr, [&](const auto&) {
        fs::rename(book.path(), moved.path());
        m_coordinator->itemDidMove(book, moved);
    });
    std::optional<URL> handed;

    m_coordinator->coordinateWriting(book, WritingIntent::ForReplacing, nullptr,
                                     [&](const auto& url) { handed = url; });

    EXPECT_EQ(handed, book);
}

TEST_F(Coordination, AnItemThatStandsAtItsPlaceAgainMakesAnOlderMoveUntrue) {
    const URL book = URL::fileURLWithPath(m_folder.write("a.epub", "1"));
    const URL moved = m_folder.url("b.epub");
    m_coordinator->coordinateWriting(book, WritingIntent::ForMoving, nullptr, [&](const auto&) {
        fs::rename(book.path(), moved.path());
        m_coordinator->itemDidMove(book, moved);
    });
    m_folder.write("a.epub", "another");
    m_coordinator->coordinateWriting(book, WritingIntent::ForReplacing, nullptr,
                                     [](const auto&) {});
    fs::remove(book.path());
    std::optional<URL> handed;

    m_coordinator->coordinateWriting(book, WritingIntent::ForReplacing, nullptr,
                                     [&](const auto& url) { handed = url; });

    EXPECT_EQ(handed, book);
}

TEST_F(Coordination, AKilledHolderLeavesNoLockBehind) {
    const URL book = URL::fileURLWithPath(m_folder.write("a.epub", "1"));
    int ready[2];
    ASSERT_EQ(pipe(ready), 0);
    const pid_t holder = fork();
    if (holder == 0) {
        FileCoordinator::makeDefault()->coordinateWriting(book, WritingIntent::ForMoving, nullptr,
                                                          [&](const auto&) {
                                                              (void)!write(ready[1], "x", 1);
                                                              pause();
                                                          });
        _exit(0);
    }
    char byte = 0;
    ASSERT_EQ(read(ready[0], &byte, 1), 1);

    kill(holder, SIGKILL);
    waitpid(holder, nullptr, 0);
    int calls = 0;
    EXPECT_TRUE(m_coordinator->coordinateWriting(book, WritingIntent::ForMoving, nullptr,
                                                 [&](const auto&) { ++calls; }));

    EXPECT_EQ(calls, 1);
    close(ready[0]);
    close(ready[1]);
}

TEST_F(Coordination, AFolderThatOthersMayWriteIsNotUsedForLocks) {
    fs::create_directory(m_folder / "parvel-coord");
    fs::permissions(m_folder / "parvel-coord", fs::perms::all);
    const URL book = URL::fileURLWithPath(m_folder.write("a.epub", "1"));

    EXPECT_TRUE(m_coordinator->coordinateWriting(book, WritingIntent::ForReplacing, &m_error,
                                                 [](const auto&) {}));

    EXPECT_TRUE(fs::is_empty(m_folder / "parvel-coord"));
}

TEST_F(Coordination, AProcessThatWasNotToldOfTheSessionMeetsTheOthersThere) {
    const fs::path session = "/run/user/" + std::to_string(geteuid());
    if (!fs::is_directory(session))
        GTEST_SKIP() << "no session here: " << session.string() << " is missing";
    const URL book = URL::fileURLWithPath(m_folder.write("a.epub", "1"));
    unsetenv("XDG_RUNTIME_DIR");

    m_coordinator->coordinateWriting(book, WritingIntent::ForReplacing, nullptr, [&](const auto&) {
        EXPECT_FALSE(fs::is_empty(session / "parvel-coord"));
    });
}

TEST_F(Coordination, ALockFileGoesWithItsHolder) {
    const URL book = URL::fileURLWithPath(m_folder.write("a.epub", "1"));

    m_coordinator->coordinateWriting(book, WritingIntent::ForReplacing, nullptr, [&](const auto&) {
        EXPECT_FALSE(fs::is_empty(m_folder / "parvel-coord"));
    });

    EXPECT_TRUE(fs::is_empty(m_folder / "parvel-coord"));
}

}  // namespace
}  // namespace parvel::testing
