#include <gtest/gtest.h>

#include <cerrno>
#include <chrono>
#include <filesystem>
#include <thread>

#include "tests/support/ArchiveCopying.h"
#include "tests/support/TestRounds.h"

namespace parvel::testing {
namespace {

using Clock = std::chrono::steady_clock;

class CancellingCopies : public ArchiveCopying {
protected:
    /// Runs the copy, and cancels it from another thread once there is more than `size` of the
    /// file. Gives the result.
    int cancelAtSize(const std::string& member, std::uintmax_t size, const auto& copy) {
        std::thread other([&] {
            std::error_code error;
            for (std::uintmax_t now = 0; error || now <= size;)
                now = std::filesystem::file_size(copyPath(member), error);
            m_copier->cancel();
            m_cancelled = Clock::now();
        });
        const int result = copy();
        m_ended = Clock::now();
        other.join();
        return result;
    }

    Clock::time_point m_cancelled;
    Clock::time_point m_ended;
};

TEST_F(CancellingCopies, ACopyCancelledBeforehandMakesNothingAndTellsNobody) {
    m_copier->cancel();

    EXPECT_EQ(expand(ZipBuilder{}.stored("a", "1")), ECANCELED);

    EXPECT_FALSE(std::filesystem::exists(copyPath("")));
    EXPECT_TRUE(m_callbacks.fatal.empty());
    EXPECT_TRUE(m_callbacks.failed.empty());
}

TEST_F(CancellingCopies, ACancelledExpansionLeavesTheFilesFinishedSoFar) {
    m_callbacks.onFinished = [this] {
        if (m_callbacks.finished.size() == 2)
            m_copier->cancel();
    };

    EXPECT_EQ(expand(ZipBuilder{}.stored("a", "").stored("b", "").stored("c", "")), ECANCELED);

    EXPECT_EQ(names(), (Names{"a", "b"}));
    EXPECT_TRUE(m_callbacks.failed.empty());
}

TEST_F(CancellingCopies, ACancelAfterTheLastFileStillCounts) {
    m_callbacks.onFinished = [this] { m_copier->cancel(); };

    EXPECT_EQ(expand(ZipBuilder{}.stored("a", "")), ECANCELED);
}

TEST_F(CancellingCopies, ACancelledTreeCopyLeavesTheFilesFinishedSoFar) {
    for (const char* name : {"a", "b", "c"})
        m_folder.write(std::string("source/") + name, "");
    m_callbacks.onFinished = [this] { m_copier->cancel(); };

    EXPECT_EQ(copyTree(), ECANCELED);

    EXPECT_EQ(names().size(), 1U);
    EXPECT_TRUE(m_callbacks.failed.empty());
}

TEST_F(CancellingCopies, AnotherThreadEndsTheExpansionWithinALargeEntry) {
    constexpr std::size_t size = 128 << 20;
    writeSource(ZipBuilder{}.deflated("large", std::string(size, 'x')));

    EXPECT_EQ(cancelAtSize("large", 0, [this] { return expandSource(); }), ECANCELED);

    EXPECT_LT(std::filesystem::file_size(copyPath("large")), size);
    EXPECT_LT(m_ended - m_cancelled, std::chrono::milliseconds(500));
    EXPECT_TRUE(m_callbacks.finished.empty());
}

TEST_F(CancellingCopies, AnotherThreadEndsTheTreeCopyWithinALargeFile) {
    constexpr std::size_t size = 256 << 20;
    m_folder.write("source/large", std::string(size, 'x'));

    EXPECT_EQ(cancelAtSize("large", 0, [this] { return copyTree(); }), ECANCELED);

    EXPECT_LT(std::filesystem::file_size(copyPath("large")), size);
    EXPECT_LT(m_ended - m_cancelled, std::chrono::milliseconds(500));
}

TEST_F(CancellingCopies, AtAnyMomentACancelEndsTheCopyOrComesTooLate) {
    ZipBuilder archive;
    for (int index = 0; index < 40; ++index)
        archive.deflated(std::to_string(index), std::string(20000, 'x'));
    writeSource(archive);

    for (std::size_t round = 0; round < testRounds(20); ++round) {
        std::filesystem::remove_all(copyPath(""));
        m_copier = ArchiveCopierFactory::host().makeCopier();
        m_callbacks = RecordingCopierCallbacks();
        m_copier->setCallbacks(&m_callbacks);
        std::thread other([this, round] {
            std::this_thread::sleep_for(std::chrono::microseconds(round * 97 % 4000));
            m_copier->cancel();
        });

        const int result = expandSource();
        other.join();

        EXPECT_TRUE(result == 0 || result == ECANCELED) << result;
        EXPECT_TRUE(result == ECANCELED || m_callbacks.finished.size() == 40);
        EXPECT_TRUE(m_callbacks.failed.empty() && m_callbacks.fatal.empty());
    }
}

}  // namespace
}  // namespace parvel::testing
