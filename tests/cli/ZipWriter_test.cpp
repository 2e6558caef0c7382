#include "cli/ZipWriter.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/mman.h>
#include <unistd.h>

#include <cerrno>

#include "parvel/platform/ZipArchive.h"
#include "parvel/platform/linux/FileDescriptor.h"
#include "tests/support/TemporaryDirectory.h"

namespace parvel::testing {
namespace {

constexpr std::uint64_t largestArchive = 0xFFFFFFFE;
constexpr std::size_t localHeaderSize = 30;
constexpr std::size_t directoryHeaderSize = 46;
constexpr std::size_t endRecordSize = 22;

bool goOn(std::uint64_t /*bytesRead*/) {
    return true;
}

/// An archive that is written as "a.zip".
class ZipWriting : public ::testing::Test {
protected:
    ZipWriting()
        : m_file(::open((m_folder / "a.zip").c_str(), O_RDWR | O_CREAT | O_CLOEXEC, 0600)) {}

    [[nodiscard]] host::FileDescriptor source(std::string_view content) const {
        return host::FileDescriptor(
            ::open(m_folder.write("source", content).c_str(), O_RDONLY | O_CLOEXEC));
    }
    int addDeflated(std::string_view name, std::string_view content) {
        return m_writer.addDeflated(name, source(content).get(), goOn);
    }
    [[nodiscard]] std::string archive() const { return m_folder.read("a.zip"); }
    /// The entry's content, as a reader of archives gives it.
    [[nodiscard]] std::optional<std::string> read(std::string_view name) const {
        const auto zip = ZipReader::host().open(m_folder.url("a.zip"));
        const auto data = zip ? zip->readEntry(name, std::uint64_t{1} << 30) : std::nullopt;
        std::vector<std::uint8_t> storage;
        return data ? std::optional(std::string(data->text(storage))) : std::nullopt;
    }
    /// The number of that many bytes at the place.
    [[nodiscard]] static std::uint64_t number(const std::string& bytes, std::size_t at,
                                              std::size_t size) {
        std::uint64_t value = 0;
        for (std::size_t i = size; i > 0; --i)
            value = value << 8 | static_cast<unsigned char>(bytes.at(at + i - 1));
        return value;
    }

    TemporaryDirectory m_folder;
    host::FileDescriptor m_file;
    cli::ZipWriter m_writer{m_file.get()};
};

/// Memory that is there only as far as it is touched.
class LargeMemory {
public:
    explicit LargeMemory(std::size_t size)
        : m_size(size),
          m_bytes(::mmap(nullptr, size, PROT_READ, MAP_PRIVATE | MAP_ANONYMOUS | MAP_NORESERVE, -1,
                         0)) {}
    ~LargeMemory() {
        if (isThere())
            ::munmap(m_bytes, m_size);
    }
    LargeMemory(const LargeMemory&) = delete;
    LargeMemory& operator=(const LargeMemory&) = delete;

    [[nodiscard]] bool isThere() const { return m_bytes != MAP_FAILED; }
    [[nodiscard]] std::string_view bytes() const {
        return {static_cast<const char*>(m_bytes), m_size};
    }

private:
    std::size_t m_size;
    void* m_bytes;
};

TEST_F(ZipWriting, AStoredEntryStandsFirstAsItIsWithoutExtraFields) {
    ASSERT_EQ(m_writer.addStored("mimetype", "application/epub+zip"), 0);
    ASSERT_EQ(m_writer.finish(), 0);

    const std::string bytes = archive();
    EXPECT_EQ(bytes.substr(0, 4), "PK\x03\x04");
    EXPECT_EQ(number(bytes, 8, 2), 0U) << "stored";
    EXPECT_EQ(number(bytes, 18, 4), 20U);
    EXPECT_EQ(number(bytes, 22, 4), 20U);
    EXPECT_EQ(number(bytes, 28, 2), 0U) << "no extra field";
    EXPECT_EQ(bytes.substr(localHeaderSize, 28), "mimetypeapplication/epub+zip");
}

TEST_F(ZipWriting, ADeflatedEntrySaysItsSizesBeforeItsDataAndHasNoDescriptor) {
    const std::string content(100'000, 'x');
    ASSERT_EQ(addDeflated("a", content), 0);
    ASSERT_EQ(m_writer.finish(), 0);

    const std::string bytes = archive();
    EXPECT_EQ(number(bytes, 6, 2), 0U) << "no flags";
    EXPECT_EQ(number(bytes, 8, 2), 8U);
    EXPECT_EQ(number(bytes, 22, 4), content.size());
    const std::size_t packed = number(bytes, 18, 4);
    EXPECT_LT(packed, content.size() / 100);
    EXPECT_EQ(bytes.substr(localHeaderSize + 1 + packed, 4), "PK\x01\x02");
    EXPECT_EQ(read("a"), content);
}

TEST_F(ZipWriting, TheDirectorySaysTheSameAndHasNoExtraFieldsNorComments) {
    ASSERT_EQ(m_writer.addStored("first", "1"), 0);
    ASSERT_EQ(m_writer.addStored("second", "22"), 0);
    ASSERT_EQ(m_writer.finish(), 0);

    const std::string bytes = archive();
    const std::size_t start = 2 * localHeaderSize + 11 + 3;
    const std::size_t size = 2 * directoryHeaderSize + 11;
    ASSERT_EQ(bytes.size(), start + size + endRecordSize);
    const std::size_t second = start + directoryHeaderSize + 5;
    EXPECT_EQ(bytes.substr(second + 6, 24), bytes.substr(localHeaderSize + 6 + 4, 24));
    EXPECT_EQ(number(bytes, second + 30, 4), 0U) << "no extra field and no comment";
    EXPECT_EQ(number(bytes, second + 42, 4), localHeaderSize + 6);
    const std::size_t end = start + size;
    EXPECT_EQ(number(bytes, end + 10, 2), 2U);
    EXPECT_EQ(number(bytes, end + 12, 4), size);
    EXPECT_EQ(number(bytes, end + 16, 4), start);
    EXPECT_EQ(number(bytes, end + 20, 2), 0U);
}

TEST_F(ZipWriting, TheSameEntriesGiveTheSameBytes) {
    const auto write = [this](const char* name) {
        const host::FileDescriptor file(
            ::open((m_folder / name).c_str(), O_RDWR | O_CREAT | O_CLOEXEC, 0600));
        cli::ZipWriter writer(file.get());
        EXPECT_EQ(writer.addStored("mimetype", "application/epub+zip"), 0);
        EXPECT_EQ(writer.addDeflated("OPS/text", source(std::string(300'000, 'y')).get(), goOn), 0);
        EXPECT_EQ(writer.finish(), 0);
        return m_folder.read(name);
    };

    EXPECT_EQ(write("1"), write("2"));
}

TEST_F(ZipWriting, NamesThatAreNoASCIIAreMarkedAsUTF8) {
    ASSERT_EQ(m_writer.addStored("ascii", ""), 0);
    ASSERT_EQ(m_writer.addStored("gr\xC3\xBC\xC3\x9F", "x"), 0);
    ASSERT_EQ(m_writer.finish(), 0);

    const std::string bytes = archive();
    EXPECT_EQ(number(bytes, 6, 2), 0U);
    EXPECT_EQ(number(bytes, localHeaderSize + 5 + 6, 2), 0x0800U);
    EXPECT_EQ(read("gr\xC3\xBC\xC3\x9F"), "x");
}

TEST_F(ZipWriting, ANameThatIsNoUTF8IsRefusedAndLeavesNothing) {
    for (const char* name : {"\xFF", "a\xC3", "\xC0\xAF", "\xED\xA0\x80"}) {
        EXPECT_EQ(m_writer.addStored(name, "x"), EILSEQ) << name;
        EXPECT_EQ(addDeflated(name, "x"), EILSEQ) << name;
    }
    EXPECT_EQ(archive(), "");
}

TEST_F(ZipWriting, ANameTakesAtMost65535Bytes) {
    ASSERT_EQ(m_writer.addStored(std::string(65'535, 'n'), "x"), 0);
    EXPECT_EQ(m_writer.addStored(std::string(65'536, 'n'), "x"), EFBIG);
    ASSERT_EQ(m_writer.finish(), 0);

    EXPECT_EQ(number(archive(), 26, 2), 65'535U);
    EXPECT_EQ(read(std::string(65'535, 'n')), "x");
}

TEST_F(ZipWriting, EmptyEntriesAndAnEmptyArchiveAreWhole) {
    ASSERT_EQ(m_writer.finish(), 0);
    EXPECT_EQ(archive().size(), endRecordSize);

    cli::ZipWriter writer(m_file.get());
    ASSERT_EQ(writer.addStored("stored", ""), 0);
    ASSERT_EQ(writer.addDeflated("deflated", source("").get(), goOn), 0);
    ASSERT_EQ(writer.finish(), 0);
    EXPECT_EQ(read("stored"), "");
    EXPECT_EQ(read("deflated"), "");
}

TEST_F(ZipWriting, ALargeEntryComesBackWhole) {
    std::string content;
    for (std::uint32_t state = 1; content.size() < (std::size_t{24} << 20);) {
        state = state * 1664525 + 1013904223;
        content.append(1 + (state >> 28), static_cast<char>(state >> 20));
    }
    ASSERT_EQ(addDeflated("large", content), 0);
    ASSERT_EQ(m_writer.addStored("behind", "it"), 0);
    ASSERT_EQ(m_writer.finish(), 0);

    EXPECT_TRUE(read("large") == content);
    EXPECT_EQ(read("behind"), "it");
}

TEST_F(ZipWriting, ASourceIsTakenFromWhereItStands) {
    const host::FileDescriptor file = source("beforeafter");
    ASSERT_EQ(::lseek(file.get(), 6, SEEK_SET), 6);

    ASSERT_EQ(m_writer.addDeflated("a", file.get(), goOn), 0);
    ASSERT_EQ(m_writer.finish(), 0);

    EXPECT_EQ(read("a"), "after");
}

TEST_F(ZipWriting, ASourceThatCanNotBeReadIsTheReadsError) {
    const host::FileDescriptor folder(
        ::open(m_folder.path().c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));

    EXPECT_EQ(m_writer.addDeflated("a", folder.get(), goOn), EISDIR);
}

TEST_F(ZipWriting, AnArchiveThatCanNotBeWrittenIsTheWritesError) {
    cli::ZipWriter writer(-1);

    EXPECT_EQ(writer.addStored("a", "x"), EBADF);
    EXPECT_EQ(writer.finish(), EBADF);
}

TEST_F(ZipWriting, TakesNoMoreEntriesThanTheFormatCountsWithoutExtension) {
    for (int count = 0; count < 65'534; ++count)
        ASSERT_EQ(m_writer.addStored("n", ""), 0);

    EXPECT_EQ(m_writer.addStored("n", ""), EFBIG);
    ASSERT_EQ(m_writer.finish(), 0);
    const std::string bytes = archive();
    EXPECT_EQ(number(bytes, bytes.size() - 12, 2), 65'534U);
    EXPECT_EQ(read("n"), "");
}

TEST_F(ZipWriting, AnEntryBeyondFourGigabytesIsRefusedBeforeItIsRead) {
    const LargeMemory memory(largestArchive + 1);
    if (!memory.isThere())
        GTEST_SKIP() << "no address space of 4 GB here";

    EXPECT_EQ(m_writer.addStored("a", memory.bytes()), EFBIG);
    EXPECT_LE(archive().size(), localHeaderSize + 1);
}

TEST_F(ZipWriting, AnArchiveEndsBeforeFourGigabytesItsDirectoryIncluded) {
    const host::FileDescriptor nowhere(::open("/dev/null", O_WRONLY | O_CLOEXEC));
    const std::size_t around = localHeaderSize + directoryHeaderSize + endRecordSize + 2;
    const LargeMemory memory(largestArchive - around + 1);
    if (!memory.isThere())
        GTEST_SKIP() << "no address space of 4 GB here";
    cli::ZipWriter full(nowhere.get());

    ASSERT_EQ(full.addStored("a", memory.bytes()), 0);

    EXPECT_EQ(full.addStored("b", memory.bytes().substr(0, 256)), EFBIG);
    EXPECT_EQ(full.finish(), EFBIG);
}

}  // namespace
}  // namespace parvel::testing
