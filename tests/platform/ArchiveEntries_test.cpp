#include "parvel/platform/linux/ArchiveEntries.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/mman.h>
#include <unistd.h>

#include <cerrno>
#include <fstream>

#include "parvel/platform/linux/FileDescriptor.h"
#include "tests/support/ZipBuilder.h"

namespace parvel::testing {
namespace {

constexpr std::uint64_t directoryBudget = 32 << 20;
constexpr std::size_t beyondOneRead = 300 << 10;

/// Content of which no two places are alike.
std::string mixed(std::size_t size) {
    std::string content(size, '\0');
    for (std::size_t at = 0; at < size; ++at)
        content[at] = static_cast<char>(at * at >> 5 ^ at >> 9);
    return content;
}

/// The read calls that the thread has made; none where nobody counts them.
std::optional<std::uint64_t> readCalls() {
    std::ifstream counts("/proc/thread-self/io");
    for (std::string name; counts >> name;) {
        std::uint64_t count = 0;
        counts >> count;
        if (name == "syscr:")
            return count;
    }
    return std::nullopt;
}

class ArchiveEntriesTest : public ::testing::Test {
protected:
    void open(const std::string& bytes) {
        ASSERT_EQ(::ftruncate(m_file.get(), 0), 0);
        overwrite(0, bytes);
        m_entries = host::ArchiveEntries::open(m_file.get(), bytes.size(), directoryBudget,
                                               [this] { return m_interruption; });
    }
    void open(const ZipBuilder& archive) { open(archive.bytes()); }
    void overwrite(std::size_t offset, std::string_view bytes) {
        ASSERT_EQ(::pwrite(m_file.get(), bytes.data(), bytes.size(), static_cast<off_t>(offset)),
                  static_cast<ssize_t>(bytes.size()));
    }

    /// Delivers an entry into m_content and m_pieces.
    int deliver(std::uint64_t index) {
        m_content.clear();
        m_pieces = 0;
        host::ZipEntry entry;
        EXPECT_TRUE(m_entries->describe(index, entry));
        return m_entries->deliver(index, entry, [this](Data::Bytes piece) {
            m_content.append(piece.begin(), piece.end());
            return ++m_pieces == m_lastPiece ? ECANCELED : 0;
        });
    }

    host::FileDescriptor m_file{::memfd_create("archive", MFD_CLOEXEC)};
    int m_interruption = 0;
    std::unique_ptr<host::ArchiveEntries> m_entries;
    std::string m_content;
    int m_pieces = 0;
    int m_lastPiece = 0;
};

TEST_F(ArchiveEntriesTest, ListsTheEntriesInTheDirectorysOrder) {
    open(ZipBuilder{}.stored("b", "1").deflated("a/c", "23").stored("folder/", ""));

    ASSERT_EQ(m_entries->count(), 3U);
    EXPECT_EQ(m_entries->name(0), "b");
    EXPECT_EQ(m_entries->name(1), "a/c");
    EXPECT_EQ(m_entries->name(2), "folder/");
    host::ZipEntry entry;
    ASSERT_TRUE(m_entries->describe(1, entry));
    EXPECT_EQ(entry.size, 2U);
}

TEST_F(ArchiveEntriesTest, DeliversStoredAndInflatedContentAtOnce) {
    const std::string content = mixed(5000);
    open(ZipBuilder{}.stored("a", content).deflated("b", content).stored("c", ""));

    EXPECT_EQ(deliver(0), 0);
    EXPECT_TRUE(m_content == content);
    EXPECT_EQ(m_pieces, 1);
    EXPECT_EQ(deliver(1), 0);
    EXPECT_TRUE(m_content == content);
    EXPECT_EQ(m_pieces, 1);
    EXPECT_EQ(deliver(2), 0);
    EXPECT_EQ(m_content, "");
}

TEST_F(ArchiveEntriesTest, EntriesThatStandTogetherTakeOneRead) {
    ZipBuilder archive;
    for (int index = 0; index < 20; ++index)
        archive.stored(std::to_string(index), mixed(10000));
    open(archive);
    const std::optional<std::uint64_t> before = readCalls();
    const std::optional<std::uint64_t> after = readCalls();
    if (!before || !after || *after == *before)
        GTEST_SKIP() << "read calls are not counted here";

    for (std::uint64_t index = 0; index < 20; ++index)
        EXPECT_EQ(deliver(index), 0);

    EXPECT_EQ(*readCalls() - *after, 1 + (*after - *before));
}

TEST_F(ArchiveEntriesTest, AStoredEntryBeyondOneReadComesInPieces) {
    const std::string large = mixed(3 * beyondOneRead);
    open(ZipBuilder{}.stored("a", "1").stored("large", large).stored("z", "26"));

    EXPECT_EQ(deliver(0), 0);
    EXPECT_EQ(deliver(1), 0);
    EXPECT_TRUE(m_content == large);
    EXPECT_GT(m_pieces, 1);
    EXPECT_EQ(deliver(2), 0);
    EXPECT_EQ(m_content, "26");
}

TEST_F(ArchiveEntriesTest, TheLastPieceOfAStoredEntryWithAWrongChecksumIsNotGiven) {
    const std::string large = mixed(2 * beyondOneRead);
    open(ZipBuilder{}.entry({.name = "a", .content = large, .crc = 1}));

    EXPECT_EQ(deliver(0), EBADMSG);

    EXPECT_LT(m_content.size(), large.size());
}

TEST_F(ArchiveEntriesTest, TheSinksAnswerEndsTheDelivery) {
    open(ZipBuilder{}
             .stored("a", mixed(3 * beyondOneRead))
             .deflated("b", "1")
             .deflated("c", mixed(9 << 20)));
    m_lastPiece = 1;

    for (const std::uint64_t index : {0U, 1U, 2U}) {
        EXPECT_EQ(deliver(index), ECANCELED);
        EXPECT_EQ(m_pieces, 1);
    }
}

TEST_F(ArchiveEntriesTest, EntriesComeInAnyOrderAndAgain) {
    const std::string content = mixed(beyondOneRead / 2);
    open(ZipBuilder{}
             .stored("a", "first")
             .deflated("b", content)
             .stored("c", content)
             .deflated("d", "last"));

    for (const std::uint64_t index : {3U, 0U, 2U, 1U, 2U, 0U}) {
        EXPECT_EQ(deliver(index), 0);
        EXPECT_TRUE(m_content == (index == 0 ? "first" : index == 3 ? "last" : content)) << index;
    }
}

TEST_F(ArchiveEntriesTest, ALongLocalHeaderIsReadToItsEnd) {
    open(ZipBuilder{}
             .entry({.name = "a", .content = "one", .localExtra = std::string(100, 'e')})
             .entry({.name = "b",
                     .content = "two",
                     .deflate = true,
                     .localExtra = std::string(100, 'e')}));

    EXPECT_EQ(deliver(0), 0);
    EXPECT_EQ(m_content, "one");
    EXPECT_EQ(deliver(1), 0);
    EXPECT_EQ(m_content, "two");
}

TEST_F(ArchiveEntriesTest, WhereADoubtComesUpTheEntryAndThoseBehindItAreLibzips) {
    const std::string bytes = ZipBuilder{}.stored("a", "one").deflated("b", "two").bytes();
    open(bytes);
    overwrite(bytes.find("PK\x03\x04"), "damaged");

    EXPECT_EQ(deliver(0), 0);
    EXPECT_EQ(m_content, "one");
    EXPECT_EQ(deliver(1), 0);
    EXPECT_EQ(m_content, "two");
}

TEST_F(ArchiveEntriesTest, AFileCutShortMeanwhileStillGivesWhatStandsBefore) {
    const std::string content = mixed(beyondOneRead / 3);
    const std::string bytes =
        ZipBuilder{}.stored("a", content).stored("b", content).deflated("c", content).bytes();
    open(bytes);
    ASSERT_EQ(::ftruncate(m_file.get(), static_cast<off_t>(content.size() + 1000)), 0);
    // The directory has to be there for libzip.
    const std::size_t directory = bytes.find("PK\x01\x02");
    overwrite(directory, std::string_view(bytes).substr(directory));

    EXPECT_EQ(deliver(0), 0);
    EXPECT_TRUE(m_content == content);
    EXPECT_EQ(deliver(1), EBADMSG);
    EXPECT_EQ(deliver(2), EBADMSG);
}

TEST_F(ArchiveEntriesTest, AFileCutShortWithinAStoredEntryIsBad) {
    const std::string bytes = ZipBuilder{}.stored("a", mixed(4 * beyondOneRead)).bytes();
    open(bytes);
    ASSERT_EQ(::ftruncate(m_file.get(), beyondOneRead), 0);

    EXPECT_EQ(deliver(0), EBADMSG);

    EXPECT_EQ(m_pieces, 1);
}

TEST_F(ArchiveEntriesTest, ADirectoryTooLargeToBeKeptIsReadByLibzip) {
    ZipBuilder archive;
    for (int index = 0; index < 5000; ++index)
        archive.stored(std::string(200, 'n') + std::to_string(index), "1");
    open(archive);

    ASSERT_EQ(m_entries->count(), 5000U);
    EXPECT_EQ(m_entries->name(4999), std::string(200, 'n') + "4999");
    EXPECT_EQ(deliver(4999), 0);
    EXPECT_EQ(m_content, "1");
}

TEST_F(ArchiveEntriesTest, ANameWithANulIsGivenAsLibzipGivesIt) {
    const std::string name("a\0b", 3);
    open(ZipBuilder{}.stored(name, "1"));

    ASSERT_EQ(m_entries->count(), 1U);
    EXPECT_NE(m_entries->name(0), name);
    EXPECT_EQ(deliver(0), 0);
    EXPECT_EQ(m_content, "1");
}

TEST_F(ArchiveEntriesTest, AnInterruptionEndsTheOpeningAndLibzipsLaterOne) {
    m_interruption = ECANCELED;
    open(ZipBuilder{}.stored("a", "1"));
    EXPECT_FALSE(m_entries);

    m_interruption = 0;
    open(ZipBuilder{}.deflated("large", mixed(9 << 20)));
    m_interruption = ECANCELED;
    EXPECT_EQ(deliver(0), ECANCELED);
}

}  // namespace
}  // namespace parvel::testing
