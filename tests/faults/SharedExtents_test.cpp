// On a file system where files can share their blocks, a copy takes none of its own.

#include <sys/statvfs.h>
#include <unistd.h>

#include <cerrno>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <vector>

#include <gtest/gtest.h>

#include "parvel/platform/CopyService.h"
#include "tests/faults/MountedFileSystem.h"
#include "tests/support/RepeatedText.h"

namespace parvel::testing {
namespace {

constexpr std::uint64_t kMiB = 1 << 20;

std::uint64_t freeBytes(const std::string& folder) {
    ::sync();
    struct statvfs room {};
    EXPECT_EQ(::statvfs(folder.c_str(), &room), 0);
    return std::uint64_t{room.f_bfree} * room.f_frsize;
}

void write(const std::string& path, const std::string& content) {
    std::ofstream(path, std::ios::binary) << content;
}

std::string read(const std::string& path) {
    std::ifstream file(path, std::ios::binary);
    return {std::istreambuf_iterator<char>(file), {}};
}

class SharedExtents : public ::testing::Test {
protected:
    void SetUp() override {
        std::string reason;
        const auto folder = mountedFileSystem("btrfs", reason);
        if (!folder)
            GTEST_SKIP() << reason;
        m_folder = *folder + "/shared";
        std::filesystem::create_directory(m_folder);
    }
    void TearDown() override {
        if (!m_folder.empty())
            std::filesystem::remove_all(m_folder);
    }

    std::string m_folder;
};

TEST_F(SharedExtents, ACopyTakesNoRoomAndTellsItsProgress) {
    const std::string content = repeatedText("a book of many pages ", 2'000'000) + "end";
    write(m_folder + "/source", content);
    const std::uint64_t before = freeBytes(m_folder);
    std::vector<std::uint64_t> progress;

    const int result =
        CopyService::host().copy(m_folder + "/source", m_folder + "/copy", [&](const auto& report) {
            if (report.operation == CopyOperation::Data && report.stage == CopyStage::Progress)
                progress.push_back(report.bytesCopied.value_or(0));
            return CopyAnswer::Continue;
        });

    EXPECT_EQ(result, 0);
    EXPECT_EQ(progress, (std::vector<std::uint64_t>{16 * kMiB, 32 * kMiB, content.size()}));
    EXPECT_TRUE(read(m_folder + "/copy") == content);
    EXPECT_LT(before, freeBytes(m_folder) + 4 * kMiB);
}

TEST_F(SharedExtents, ACopyStopsBetweenTwoPieces) {
    write(m_folder + "/source", std::string(40 * kMiB, 'x'));

    const int result = CopyService::host().copy(
        m_folder + "/source", m_folder + "/copy", [](const CopyReport& report) {
            return report.stage == CopyStage::Progress ? CopyAnswer::Quit : CopyAnswer::Continue;
        });

    EXPECT_EQ(result, -1);
    EXPECT_EQ(errno, ECANCELED);
    EXPECT_EQ(std::filesystem::file_size(m_folder + "/copy"), 16 * kMiB);
}

TEST_F(SharedExtents, AFileOfAFewBytesOrNoneIsCopied) {
    write(m_folder + "/source", "few");
    write(m_folder + "/empty", "");

    EXPECT_EQ(CopyService::host().copy(m_folder + "/source", m_folder + "/copy", nullptr), 0);
    EXPECT_EQ(CopyService::host().copy(m_folder + "/empty", m_folder + "/none", nullptr), 0);

    EXPECT_EQ(read(m_folder + "/copy"), "few");
    EXPECT_EQ(std::filesystem::file_size(m_folder + "/none"), 0U);
}

}  // namespace
}  // namespace parvel::testing
