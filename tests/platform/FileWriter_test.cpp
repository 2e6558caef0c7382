#include "parvel/platform/FileWriter.h"

#include <gtest/gtest.h>
#include <signal.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <filesystem>

#include "tests/support/AttributeFolder.h"

namespace parvel::testing {
namespace {

class FileWriterTest : public AttributeFolder {
protected:
    bool write(std::string_view name, std::string_view text) {
        return FileWriter::host().writeFile(m_folder.url(name), Data::copyOf(text), &m_error);
    }
    [[nodiscard]] std::size_t countOfItems() const {
        std::size_t count = 0;
        for ([[maybe_unused]] const auto& entry :
             std::filesystem::directory_iterator(m_folder.path()))
            ++count;
        return count;
    }
    [[nodiscard]] mode_t modeOf(std::string_view name) const {
        struct stat status {};
        return ::lstat((m_folder / name).c_str(), &status) == 0 ? status.st_mode & 07777 : 0;
    }

    std::optional<Error> m_error;
};

TEST_F(FileWriterTest, MakesANewFileAndLeavesNothingBesideIt) {
    const std::size_t before = countOfItems();

    EXPECT_TRUE(write("a", "bytes"));

    EXPECT_EQ(m_folder.read("a"), "bytes");
    EXPECT_EQ(countOfItems(), before + 1);
    EXPECT_FALSE(m_error);
}

TEST_F(FileWriterTest, ANewFileHasTheModeOfAnyNewFile) {
    const mode_t mask = ::umask(027);
    const bool isWritten = write("a", "bytes");
    ::umask(mask);

    EXPECT_TRUE(isWritten);
    EXPECT_EQ(modeOf("a"), 0640U);
}

TEST_F(FileWriterTest, WritesAllRangesOfTheBytesInOrder) {
    const std::array parts{Data::copyOf("one "), Data::copyOf("two "), Data::copyOf("three")};

    EXPECT_TRUE(FileWriter::host().writeFile(m_folder.url("a"), Data::joining(parts), &m_error));

    EXPECT_EQ(m_folder.read("a"), "one two three");
}

TEST_F(FileWriterTest, WritesAFileWithoutBytes) {
    m_folder.write("a", "old");

    EXPECT_TRUE(write("a", ""));

    EXPECT_EQ(m_folder.read("a"), "");
}

TEST_F(FileWriterTest, AReplacedFileKeepsItsModeAndAttributes) {
    const URL old = file("a");
    ::chmod((m_folder / "a").c_str(), 0604);
    setStored(old, "user.parvel.kept", "kept");

    EXPECT_TRUE(write("a", "new"));

    EXPECT_EQ(m_folder.read("a"), "new");
    EXPECT_EQ(modeOf("a"), 0604U);
    EXPECT_EQ(stored(old, "user.parvel.kept"), "kept");
}

TEST_F(FileWriterTest, AReaderOfTheOldFileGoesOnReadingIt) {
    std::ifstream old(m_folder.write("a", "old bytes"));

    EXPECT_TRUE(write("a", "new"));

    std::string word;
    old >> word >> word;
    EXPECT_EQ(word, "bytes");
}

TEST_F(FileWriterTest, ALinkIsReplacedAndItsTargetLeftAlone) {
    m_folder.write("target", "target");
    std::filesystem::create_symlink("target", m_folder / "a");

    EXPECT_TRUE(write("a", "new"));

    EXPECT_FALSE(std::filesystem::is_symlink(m_folder / "a"));
    EXPECT_EQ(m_folder.read("a"), "new");
    EXPECT_EQ(m_folder.read("target"), "target");
}

TEST_F(FileWriterTest, AFolderInTheFilesPlaceStays) {
    m_folder.write("a/b", "inside");
    const std::size_t before = countOfItems();

    EXPECT_FALSE(write("a", "new"));

    EXPECT_EQ(m_folder.read("a/b"), "inside");
    EXPECT_EQ(countOfItems(), before);
    EXPECT_EQ(m_error, makePOSIXError(EISDIR, m_folder.url("a")));
}

TEST_F(FileWriterTest, AFileWithoutAFolderIsNoSuchFile) {
    EXPECT_FALSE(write("missing/a", "new"));
    EXPECT_EQ(m_error, makeFileError(PVFileErrorCode::NoSuchFile, m_folder.url("missing/a")));
}

TEST_F(FileWriterTest, AURLOfNoFileIsNoSuchFile) {
    const URL url = *URL::fromString("https://example.org/a");

    EXPECT_FALSE(FileWriter::host().writeFile(url, Data::copyOf("new"), &m_error));
    EXPECT_EQ(m_error, makeFileError(PVFileErrorCode::NoSuchFile, url));
}

/// While it lives, no file can grow beyond the size: what a full disk does to a write.
class FileSizeLimit {
public:
    explicit FileSizeLimit(rlim_t size) {
        ::getrlimit(RLIMIT_FSIZE, &m_previous);
        const struct rlimit limit { size, m_previous.rlim_max };
        m_handler = ::signal(SIGXFSZ, SIG_IGN);
        ::setrlimit(RLIMIT_FSIZE, &limit);
    }
    ~FileSizeLimit() {
        ::setrlimit(RLIMIT_FSIZE, &m_previous);
        ::signal(SIGXFSZ, m_handler);
    }
    FileSizeLimit(const FileSizeLimit&) = delete;
    FileSizeLimit& operator=(const FileSizeLimit&) = delete;

private:
    struct rlimit m_previous {};
    void (*m_handler)(int) = nullptr;
};

TEST_F(FileWriterTest, AWriteThatIsCutShortLeavesTheOldFileAndNothingBesideIt) {
    m_folder.write("a", "old");
    const std::size_t before = countOfItems();
    const std::string large(100'000, 'x');

    bool isWritten = false;
    {
        const FileSizeLimit limit(50'000);
        isWritten = write("a", large);
    }

    EXPECT_FALSE(isWritten);
    EXPECT_EQ(m_error, makePOSIXError(EFBIG, m_folder.url("a")));
    EXPECT_EQ(m_folder.read("a"), "old");
    EXPECT_EQ(countOfItems(), before);
}

}  // namespace
}  // namespace parvel::testing
