#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/mman.h>
#include <unistd.h>
#include <zip.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <random>
#include <tuple>

#include "parvel/platform/linux/ArchiveEntries.h"
#include "parvel/platform/linux/FileDescriptor.h"
#include "parvel/platform/linux/LibzipArchive.h"
#include "parvel/platform/linux/PlainZip.h"
#include "tests/support/TestRounds.h"
#include "tests/support/ZipBuilder.h"

namespace parvel::testing {
namespace {

constexpr std::uint64_t entryLimit = 64 << 20;

/// How often the two readers met.
struct Tally {
    int plainArchives = 0;
    int sureContents = 0;
    int sureNones = 0;
    int deliveries = 0;
};

std::string described(const std::optional<Data>& data) {
    std::vector<std::uint8_t> storage;
    return data ? "content " + std::string(data->text(storage)) : "none";
}

/// What an archive's entry delivers: its content, or the errno value.
std::string delivered(auto& archive, std::uint64_t index, const host::ZipEntry& entry) {
    std::string content = "content ";
    const int error = archive.deliver(index, entry, [&content](Data::Bytes piece) {
        content.append(piece.begin(), piece.end());
        return 0;
    });
    return error == 0 ? content : "error " + std::to_string(error);
}

/// What is listed and delivered in turn must be what libzip lists and delivers.
void expectSameEntries(int file, std::uint64_t size, host::LibzipArchive& full,
                       const std::string& what, Tally& tally) {
    const std::unique_ptr<host::ArchiveEntries> entries = host::ArchiveEntries::open(
        file, size, host::LibzipArchive::readingBudget, [] { return 0; });
    ASSERT_TRUE(entries) << what;
    ASSERT_EQ(entries->count(), full.entryCount()) << what;
    for (std::uint64_t index = 0; index < entries->count(); ++index) {
        const std::optional<std::string_view> name = entries->name(index);
        ASSERT_TRUE(name && full.name(index)) << what << ": " << index;
        ASSERT_EQ(*name, full.name(index)) << what;
        host::ZipEntry entry;
        host::ZipEntry other;
        ASSERT_TRUE(entries->describe(index, entry) && full.describe(index, other)) << what;
        ASSERT_EQ(std::tie(entry.size, entry.compressedSize, entry.crc, entry.method,
                           entry.externalAttributes, entry.hostSystem, entry.isEncrypted),
                  std::tie(other.size, other.compressedSize, other.crc, other.method,
                           other.externalAttributes, other.hostSystem, other.isEncrypted))
            << what << ": " << *name;
        if (!host::canBeDelivered(entry, entryLimit))
            continue;
        ++tally.deliveries;
        ASSERT_EQ(delivered(*entries, index, entry), delivered(full, index, other))
            << what << ": " << *name;
    }
}

/// Whatever the plain reader answers of the open archive must be libzip's answer.
void expectAgreement(int file, std::uint64_t size, const std::vector<std::string>& names,
                     const std::string& what, Tally& tally) {
    const std::unique_ptr<host::PlainZip> plain = host::PlainZip::open(file, size);
    if (!plain)
        return;
    ++tally.plainArchives;
    const std::unique_ptr<host::LibzipArchive> full = host::LibzipArchive::open(file, size);
    ASSERT_TRUE(full) << what << ": libzip refuses what is read as plain";
    for (const std::string& name : names) {
        std::optional<Data> content;
        if (plain->readEntry(name, entryLimit, content) != host::PlainZip::Answer::Sure)
            continue;
        ++(content ? tally.sureContents : tally.sureNones);
        ASSERT_EQ(described(content), described(full->readEntry(name, entryLimit)))
            << what << ": " << name;
    }
    expectSameEntries(file, size, *full, what, tally);
}

class ZipAgreementTest : public ::testing::Test {
protected:
    void expectAgreementOn(const std::string& bytes, const std::string& what) {
        ASSERT_EQ(::ftruncate(m_file.get(), 0), 0);
        ASSERT_EQ(::pwrite(m_file.get(), bytes.data(), bytes.size(), 0),
                  static_cast<ssize_t>(bytes.size()));
        expectAgreement(m_file.get(), bytes.size(), m_names, what, m_tally);
    }

    host::FileDescriptor m_file{::memfd_create("archive", MFD_CLOEXEC)};
    std::vector<std::string> m_names = {
        "mimetype", "META-INF/container.xml", "OPS/b.opf", "none", "link", "folder", "\xC3\xA9"};
    Tally m_tally;
};

/// Small archives of many kinds, well-formed and lying.
std::vector<ZipBuilder> sampleArchives() {
    const std::string text = "<container><rootfile full-path='OPS/b.opf'/></container>";
    const ZipBuilder book = ZipBuilder{}
                                .stored("mimetype", "application/epub+zip")
                                .deflated("META-INF/container.xml", text + text)
                                .deflated("OPS/b.opf", "<package/>");
    const auto with = [&](ZipEntryPlan plan) {
        plan.name = plan.name.empty() ? "OPS/b.opf" : plan.name;
        plan.content = "content of the entry";
        return ZipBuilder{}.stored("mimetype", "x").entry(plan);
    };
    return {
        book,
        ZipBuilder{},
        ZipBuilder(book).comment("a comment"),
        ZipBuilder(book).comment(ZipBuilder{}.bytes()),
        ZipBuilder(book).zip64(),
        ZipBuilder(book).zip64().comment("c"),
        ZipBuilder(book).prefix("junk"),
        ZipBuilder(book).prefix("junk", true),
        ZipBuilder(book).prefix(book.bytes(), true),
        ZipBuilder(book).prefix(book.bytes()),
        ZipBuilder(book).trailer("junk"),
        ZipBuilder(book).trailer(ZipBuilder{}.bytes()),
        ZipBuilder(book).count(2),
        ZipBuilder(book).count(65535),
        ZipBuilder(book).zip64().count(70'000),
        ZipBuilder(book).directorySizeError(-46),
        ZipBuilder(book).directoryOffsetError(-1),
        ZipBuilder(book).diskNumber(1),
        ZipBuilder(book).link("link", "mimetype").stored("folder/", ""),
        ZipBuilder(book).deflated("mimetype", "second"),
        ZipBuilder(book).stored("none/inner.epub", book.bytes()),
        with({.deflate = true, .descriptor = true}),
        with({.zip64 = true}),
        with({.deflate = true, .zip64 = true}),
        with({.flags = 1}),
        with({.flags = 1 << 11}),
        with({.name = "\xC3\xA9", .flags = 1 << 11}),
        with({.name = "\xE9", .flags = 1 << 11}),
        with({.name = "\xC3\xA9"}),
        with({.name = "a\x01", .flags = 1 << 11}),
        with({.flags = 1 << 11, .comment = "\xE9"}),
        with({.method = 9}),
        with({.method = 99}),
        with({.method = 8}),
        with({.crc = 7}),
        with({.size = 5}),
        with({.size = 5'000'000}),
        with({.compressedSize = 5}),
        with({.compressedSize = 500}),
        with({.offset = 500}),
        with({.offset = 0}),
        with({.rawData = ""}),
        with({.deflate = true, .rawData = ""}),
        with({.deflate = true, .size = 0}),
        with({.extra = std::string("\x75\x70\x04\0abcd", 8)}),
        with({.extra = std::string("\x01\x99\x04\0abcd", 8)}),
        with({.extra = std::string("\x99\x99\x09\0abcd", 8)}),
        with({.extra = std::string("\0\0\0", 3)}),
        with({.extra = "ab"}),
        with({.localExtra = std::string(300, 'e')}),
        with({.localName = "another name"}),
        with({.name = "folder", .externalAttributes = 040755U << 16}),
        with({.madeBy = 0x1314, .externalAttributes = 0120777U << 16}),
        with({.madeBy = 20, .externalAttributes = 0120777U << 16}),
        with({.comment = "comment of the entry"}),
    };
}

TEST_F(ZipAgreementTest, AnswersAsLibzipOnWellFormedAndLyingArchives) {
    int number = 0;
    for (const ZipBuilder& builder : sampleArchives())
        expectAgreementOn(builder.bytes(), "archive " + std::to_string(number++));

    EXPECT_GE(m_tally.plainArchives, 20);
    EXPECT_GE(m_tally.sureContents, 40);
}

TEST_F(ZipAgreementTest, AnswersAsLibzipWhateverByteIsChanged) {
    int number = 0;
    for (const ZipBuilder& builder : sampleArchives()) {
        const std::string original = builder.bytes();
        for (std::size_t i = 0; i < original.size() && !HasFatalFailure(); ++i)
            for (const int change : {0x01, 0x80, 0xFF}) {
                std::string bytes = original;
                bytes[i] = static_cast<char>(bytes[i] ^ change);
                expectAgreementOn(bytes, "archive " + std::to_string(number) + ", byte " +
                                             std::to_string(i) + " ^ " + std::to_string(change));
            }
        ++number;
    }

    EXPECT_GE(m_tally.plainArchives, 5000);
    EXPECT_GE(m_tally.sureContents, 5000);
    EXPECT_GE(m_tally.deliveries, 5000);
}

TEST_F(ZipAgreementTest, AnswersAsLibzipWhereverTheFileIsCut) {
    int number = 0;
    for (const ZipBuilder& builder : sampleArchives()) {
        const std::string bytes = builder.bytes();
        for (std::size_t length = 0; length < bytes.size() && !HasFatalFailure(); ++length)
            expectAgreementOn(bytes.substr(0, length), "archive " + std::to_string(number) +
                                                           " cut at " + std::to_string(length));
        ++number;
    }
}

TEST_F(ZipAgreementTest, AnswersAsLibzipOnArchivesDamagedAtRandom) {
    std::mt19937 random(1);
    const std::vector<ZipBuilder> archives = sampleArchives();
    for (std::size_t round = 0; round < testRounds(3000) && !HasFatalFailure(); ++round) {
        std::string bytes = archives[random() % archives.size()].bytes();
        const unsigned changes = 1 + random() % 4;
        for (unsigned i = 0; i < changes; ++i) {
            // The records at the end are the most telling ones.
            const std::size_t range =
                random() % 2 ? bytes.size() : std::min<std::size_t>(bytes.size(), 200);
            const std::size_t place = bytes.size() - 1 - random() % range;
            constexpr unsigned char telling[] = {0, 1, 8, 22, 46, 127, 128, 255};
            bytes[place] = static_cast<char>(random() % 2 ? telling[random() % 8] : random());
        }
        expectAgreementOn(bytes, "round " + std::to_string(round));
    }
}

/// An archive whose offsets count the bytes that will stand before it.
std::string archiveFor(std::size_t offset, const std::string& content) {
    return ZipBuilder{}
        .stored("mimetype", content)
        .prefix(std::string(offset, '#'), true)
        .bytes()
        .substr(offset);
}

TEST_F(ZipAgreementTest, AnArchiveHiddenBeforeTheFirstEntryIsLeftToLibzip) {
    const std::string hidden = archiveFor(0, "hidden" + std::string(1000, 'h'));
    const std::string padding(5000, 'p');

    expectAgreementOn(
        ZipBuilder{}.prefix(hidden, true).stored("mimetype", "x").stored("p", padding).bytes(),
        "hidden archive");
    EXPECT_EQ(m_tally.plainArchives, 0);
}

TEST_F(ZipAgreementTest, AnArchiveHiddenInAnEntryIsNotTakenForTheWhole) {
    const std::string name = "inner";
    const std::string padding(5000, 'p');

    expectAgreementOn(ZipBuilder{}
                          .stored(name, archiveFor(30 + name.size(), "hidden"))
                          .stored("mimetype", "x")
                          .stored("p", padding)
                          .bytes(),
                      "archive in an entry");
    EXPECT_EQ(m_tally.plainArchives, 1);
    EXPECT_EQ(m_tally.sureContents, 1);
}

/// The names of the first thousand entries, as far as libzip opens the file.
std::vector<std::string> namesIn(const std::string& path) {
    std::vector<std::string> names = {"none"};
    zip_t* archive = zip_open(path.c_str(), ZIP_RDONLY, nullptr);
    if (!archive)
        return names;
    const zip_int64_t count = std::min<zip_int64_t>(zip_get_num_entries(archive, 0), 1000);
    for (zip_int64_t i = 0; i < count; ++i)
        names.emplace_back(zip_get_name(archive, static_cast<zip_uint64_t>(i), ZIP_FL_ENC_RAW));
    zip_discard(archive);
    return names;
}

TEST(ZipAgreement, AnswersAsLibzipOnTheCorpus) {
    const char* corpus = std::getenv("PARVEL_CORPUS");
    if (!corpus)
        GTEST_SKIP() << "PARVEL_CORPUS names no folder";

    Tally tally;
    for (const auto& item : std::filesystem::recursive_directory_iterator(corpus)) {
        if (!item.is_regular_file())
            continue;
        const host::FileDescriptor file(::open(item.path().c_str(), O_RDONLY | O_CLOEXEC));
        ASSERT_TRUE(file);
        expectAgreement(file.get(), item.file_size(), namesIn(item.path()), item.path(), tally);
    }
    EXPECT_GT(tally.plainArchives, 0);
}

}  // namespace
}  // namespace parvel::testing
