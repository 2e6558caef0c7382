#include "parvel/platform/linux/RoomAhead.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <linux/magic.h>
#include <sys/mman.h>
#include <sys/stat.h>
#include <sys/vfs.h>

#include <string>

#include "parvel/platform/CopyService.h"
#include "parvel/platform/linux/FileDescriptor.h"
#include "tests/support/TemporaryDirectory.h"

namespace parvel::testing {
namespace {

constexpr off_t kMegabyte = off_t{1} << 20;

class RoomAheadTest : public ::testing::Test {
protected:
    void SetUp() override {
        struct statfs system {};
        ASSERT_EQ(::statfs(m_folder.path().c_str(), &system), 0);
        if (system.f_type != EXT4_SUPER_MAGIC && system.f_type != XFS_SUPER_MAGIC)
            GTEST_SKIP() << "the file system gains nothing by room found ahead";
    }

    static off_t roomOf(int file) {
        struct stat status {};
        EXPECT_EQ(::fstat(file, &status), 0);
        return status.st_blocks * 512;
    }
    static off_t sizeOf(int file) {
        struct stat status {};
        EXPECT_EQ(::fstat(file, &status), 0);
        return status.st_size;
    }
    [[nodiscard]] off_t room() const { return roomOf(m_file.get()); }
    [[nodiscard]] off_t size() const { return sizeOf(m_file.get()); }

    TemporaryDirectory m_folder;
    host::FileDescriptor m_file{
        ::open((m_folder / "file").c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, 0600)};
};

TEST_F(RoomAheadTest, IsFoundForAPartOfALargeFileWhichStaysEmpty) {
    host::RoomAhead ahead(m_file.get(), 40 * kMegabyte);

    ahead.reached(0);

    EXPECT_GE(room(), 16 * kMegabyte);
    EXPECT_LT(room(), 20 * kMegabyte);
    EXPECT_EQ(size(), 0);
}

TEST_F(RoomAheadTest, IsFoundAgainWhereThePartIsWritten) {
    host::RoomAhead ahead(m_file.get(), 40 * kMegabyte);
    ahead.reached(0);
    const off_t first = room();

    ahead.reached(15 * kMegabyte);
    EXPECT_EQ(room(), first);

    ahead.reached(16 * kMegabyte);
    EXPECT_GE(room(), 32 * kMegabyte);
}

TEST_F(RoomAheadTest, IsNoMoreThanTheFileIsToTake) {
    host::RoomAhead ahead(m_file.get(), 5 * kMegabyte);

    ahead.reached(0);
    ahead.reached(5 * kMegabyte);

    EXPECT_GE(room(), 5 * kMegabyte);
    EXPECT_LT(room(), 6 * kMegabyte);
}

TEST_F(RoomAheadTest, IsNotLookedForInSmallFiles) {
    host::RoomAhead ahead(m_file.get(), kMegabyte);

    ahead.reached(0);

    EXPECT_EQ(room(), 0);
}

TEST_F(RoomAheadTest, IsGivenBackWhereNothingIsWritten) {
    host::RoomAhead ahead(m_file.get(), 40 * kMegabyte);
    ahead.reached(0);

    ahead.giveBack();

    EXPECT_EQ(room(), 0);
}

TEST_F(RoomAheadTest, IsNotKeptByACopyThatIsQuit) {
    const std::string source = m_folder.write("source", std::string(30 << 20, 'x'));
    const std::string copy = m_folder / "copy";
    off_t roomMeanwhile = 0;
    const auto quitAtFirst = [&](const CopyReport& report) {
        if (report.stage != CopyStage::Progress)
            return CopyAnswer::Continue;
        roomMeanwhile = roomOf(host::FileDescriptor(::open(copy.c_str(), O_RDONLY)).get());
        return CopyAnswer::Quit;
    };

    EXPECT_EQ(CopyService::host().copy(source, copy, quitAtFirst), -1);

    const host::FileDescriptor file(::open(copy.c_str(), O_RDONLY | O_CLOEXEC));
    if (sizeOf(file.get()) > 8 * kMegabyte)
        GTEST_SKIP() << "the file system shares what is copied";
    EXPECT_GE(roomMeanwhile, 16 * kMegabyte);
    EXPECT_LT(roomOf(file.get()), 2 * kMegabyte);
}

TEST(RoomAheadInMemory, IsNotLookedFor) {
    const host::FileDescriptor file(::memfd_create("file", MFD_CLOEXEC));
    host::RoomAhead ahead(file.get(), 40 * kMegabyte);

    ahead.reached(0);

    struct stat status {};
    ASSERT_EQ(::fstat(file.get(), &status), 0);
    EXPECT_EQ(status.st_blocks, 0);
}

}  // namespace
}  // namespace parvel::testing
