#include "parvel/platform/FileReader.h"

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <filesystem>
#include <fstream>
#include <iterator>

#include "tests/support/TemporaryDirectory.h"

namespace parvel::testing {
namespace {

constexpr std::uint64_t kilobyte = 1024;

class FileReaderTest : public ::testing::Test {
protected:
    std::optional<std::string> readFile(const URL& url, std::uint64_t limit = kilobyte) {
        return textOf(FileReader::host().readFile(url, limit, &m_error));
    }
    std::optional<std::string> readMember(std::string_view path, std::uint64_t limit = kilobyte) {
        return textOf(
            FileReader::host().readMember(m_folder.url("book.epub"), path, limit, &m_error));
    }
    void expectError(std::string_view domain, std::int64_t code, const URL& url) {
        ASSERT_TRUE(m_error);
        EXPECT_EQ(m_error->domain(), domain);
        EXPECT_EQ(m_error->code(), code);
        ASSERT_TRUE(m_error->url());
        EXPECT_EQ(*m_error->url(), url);
    }
    void expectCorrupt(const URL& url) { expectError(PVFileErrorDomain, 259, url); }
    void expectCorruptMember(std::string_view path) {
        EXPECT_FALSE(readMember(path));
        expectCorrupt(m_folder.url("book.epub").appendingPathComponent(path));
    }

    TemporaryDirectory m_folder;
    std::optional<Error> m_error;

private:
    static std::optional<std::string> textOf(const std::optional<Data>& data) {
        if (!data)
            return std::nullopt;
        std::vector<std::uint8_t> storage;
        return std::string(data->text(storage));
    }
};

TEST_F(FileReaderTest, ReadsAWholeFile) {
    m_folder.write("a", "some bytes");

    EXPECT_EQ(readFile(m_folder.url("a")), "some bytes");
    EXPECT_FALSE(m_error);
}

TEST_F(FileReaderTest, ReadsAnEmptyFileAsNoBytes) {
    m_folder.write("a", "");

    EXPECT_EQ(readFile(m_folder.url("a")), "");
}

TEST_F(FileReaderTest, ReadsAFileLargerThanOnePiece) {
    const std::string text(1'000'000, 'x');
    m_folder.write("a", text);

    EXPECT_EQ(readFile(m_folder.url("a"), 2'000'000), text);
}

TEST_F(FileReaderTest, FollowsTheLinkThatAURLNames) {
    m_folder.write("a", "target");
    std::filesystem::create_symlink("a", m_folder / "link");

    EXPECT_EQ(readFile(m_folder.url("link")), "target");
}

TEST_F(FileReaderTest, AMissingFileIsNoSuchFile) {
    EXPECT_FALSE(readFile(m_folder.url("a")));
    expectError(PVFileErrorDomain, 4, m_folder.url("a"));
}

TEST_F(FileReaderTest, AFileOnTheWayIsNoSuchFile) {
    m_folder.write("a", "");

    EXPECT_FALSE(readFile(m_folder.url("a/b")));
    expectError(PVFileErrorDomain, 4, m_folder.url("a/b"));
}

TEST_F(FileReaderTest, AFolderIsAPOSIXError) {
    EXPECT_FALSE(readFile(m_folder.url("")));
    expectError(PVPOSIXErrorDomain, EISDIR, m_folder.url(""));
}

TEST_F(FileReaderTest, AURLOfAnotherSchemeIsNoSuchFile) {
    const URL url = *URL::fromString("https://example.org" + (m_folder / "a"));
    m_folder.write("a", "x");

    EXPECT_FALSE(readFile(url));
    expectError(PVFileErrorDomain, 4, url);
}

TEST_F(FileReaderTest, ReadsAFileOfExactlyTheLimit) {
    m_folder.write("a", std::string(kilobyte, 'x'));

    EXPECT_EQ(readFile(m_folder.url("a")), std::string(kilobyte, 'x'));
}

TEST_F(FileReaderTest, AFileOverTheLimitIsCorrupt) {
    m_folder.write("a", std::string(kilobyte + 1, 'x'));

    EXPECT_FALSE(readFile(m_folder.url("a")));
    expectCorrupt(m_folder.url("a"));
}

TEST_F(FileReaderTest, AHugeSparseFileIsRefusedBeforeMemoryIsTaken) {
    const std::string path = m_folder.write("a", "");
    ASSERT_EQ(::truncate(path.c_str(), 256LL << 30), 0);

    EXPECT_FALSE(readFile(m_folder.url("a"), budget::packageDocument));
    expectCorrupt(m_folder.url("a"));
}

TEST_F(FileReaderTest, ReadsAFileThatSaysItIsEmptyToItsEnd) {
    const URL url = URL::fileURLWithPath("/proc/self/status");

    const std::optional<std::string> text = readFile(url, 1 << 20);
    ASSERT_TRUE(text);
    EXPECT_NE(text->find("\nPid:"), std::string::npos);
}

TEST_F(FileReaderTest, ReadsAFileThatIsManyTimesWhatItSaysToItsEnd) {
    const std::string path = "/proc/crypto";
    std::ifstream file(path);
    const std::string content(std::istreambuf_iterator<char>(file), {});
    if (content.size() <= 8 * kilobyte)
        GTEST_SKIP() << path << " is no long file here";

    EXPECT_EQ(readFile(URL::fileURLWithPath(path), 1024 * kilobyte), content);
    EXPECT_EQ(readFile(URL::fileURLWithPath(path), content.size()), content);
    EXPECT_FALSE(readFile(URL::fileURLWithPath(path), content.size() - 1));
}

TEST_F(FileReaderTest, AFileThatSaysItIsEmptyHasTheLimitToo) {
    const URL url = URL::fileURLWithPath("/proc/self/status");

    EXPECT_FALSE(readFile(url, 10));
    expectCorrupt(url);
}

TEST_F(FileReaderTest, AReadErrorIsNotTheEndOfTheFile) {
    const URL url = URL::fileURLWithPath("/proc/self/mem");

    EXPECT_FALSE(readFile(url));
    expectError(PVPOSIXErrorDomain, EIO, url);
}

TEST_F(FileReaderTest, AFIFODoesNotBlockAndIsCorrupt) {
    ASSERT_EQ(::mkfifo((m_folder / "pipe").c_str(), 0600), 0);

    EXPECT_FALSE(readFile(m_folder.url("pipe")));
    expectCorrupt(m_folder.url("pipe"));
}

TEST_F(FileReaderTest, ADeviceIsCorrupt) {
    const URL url = URL::fileURLWithPath("/dev/zero");

    EXPECT_FALSE(readFile(url));
    expectCorrupt(url);
}

TEST_F(FileReaderTest, ReadsAMemberOfAPackage) {
    m_folder.write("book.epub/OPS/book.opf", "package");

    EXPECT_EQ(readMember("OPS/book.opf"), "package");
}

TEST_F(FileReaderTest, DropsOneLeadingSlashOfAMember) {
    m_folder.write("book.epub/OPS/book.opf", "package");

    EXPECT_EQ(readMember("/OPS/book.opf"), "package");
    expectCorruptMember("//OPS/book.opf");
}

TEST_F(FileReaderTest, FollowsALinkToThePackageItself) {
    m_folder.write("real/a", "member");
    std::filesystem::create_symlink("real", m_folder / "book.epub");

    EXPECT_EQ(readMember("a"), "member");
}

TEST_F(FileReaderTest, AMemberPathMayGoUpAndStayInside) {
    m_folder.write("book.epub/c.png", "cover");
    m_folder.write("book.epub/OPS/x", "");

    EXPECT_EQ(readMember("OPS/../c.png"), "cover");
}

TEST_F(FileReaderTest, AMemberPathThatLeavesThePackageIsCorrupt) {
    m_folder.write("secret", "secret");
    m_folder.write("book.epub/OPS/x", "x");

    expectCorruptMember("../secret");
    expectCorruptMember("OPS/../../secret");
    expectCorruptMember("../book.epub/OPS/x");
}

TEST_F(FileReaderTest, AMissingMemberIsNoSuchFile) {
    m_folder.write("book.epub/x", "");

    EXPECT_FALSE(readMember("a/b"));
    expectError(PVFileErrorDomain, 4, m_folder.url("book.epub/a/b"));
}

TEST_F(FileReaderTest, AMemberOfAMissingPackageIsNoSuchFile) {
    EXPECT_FALSE(readMember("a"));
    expectError(PVFileErrorDomain, 4, m_folder.url("book.epub/a"));
}

TEST_F(FileReaderTest, AMemberOfAPackageThatCanNotBeOpenedHasThatError) {
    std::filesystem::create_symlink("book.epub", m_folder / "book.epub");

    EXPECT_FALSE(readMember("a"));

    expectError(PVPOSIXErrorDomain, ELOOP, m_folder.url("book.epub/a"));
}

TEST_F(FileReaderTest, AMemberOfAURLOfAnotherSchemeIsNoSuchFile) {
    const URL url = *URL::fromString("https://example.com/book.epub");

    EXPECT_FALSE(FileReader::host().readMember(url, "a", kilobyte, &m_error));

    expectError(PVFileErrorDomain, 4, url.appendingPathComponent("a"));
}

TEST_F(FileReaderTest, ALinkInAPackageIsNotFollowed) {
    m_folder.write("book.epub/OPS/x", "inside");
    std::filesystem::create_symlink("OPS/x", m_folder / "book.epub/file");
    std::filesystem::create_symlink("OPS", m_folder / "book.epub/folder");

    expectCorruptMember("file");
    expectCorruptMember("folder/x");
}

TEST_F(FileReaderTest, AMemberThatIsNoFileIsCorrupt) {
    m_folder.write("book.epub/OPS/x", "");

    expectCorruptMember("OPS");
    expectCorruptMember("OPS/.");
    expectCorruptMember("");
    expectCorruptMember("/");
}

TEST_F(FileReaderTest, AFIFOInAPackageDoesNotBlockAndIsCorrupt) {
    m_folder.write("book.epub/x", "");
    ASSERT_EQ(::mkfifo((m_folder / "book.epub/pipe").c_str(), 0600), 0);

    expectCorruptMember("pipe");
}

TEST_F(FileReaderTest, AMemberPathWithANULIsCorrupt) {
    m_folder.write("book.epub/a", "member");

    const std::string_view path("a\0b", 3);
    EXPECT_FALSE(readMember(path));
    ASSERT_TRUE(m_error);
    EXPECT_EQ(m_error->code(), 259);
}

TEST_F(FileReaderTest, AMemberOverTheLimitIsCorrupt) {
    m_folder.write("book.epub/a", std::string(kilobyte + 1, 'x'));

    expectCorruptMember("a");
}

}  // namespace
}  // namespace parvel::testing
