#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <filesystem>

#include "parvel/platform/ZipArchive.h"
#include "parvel/platform/linux/FileDescriptor.h"
#include "tests/support/TemporaryDirectory.h"
#include "tests/support/ZipBuilder.h"

namespace parvel::testing {
namespace {

constexpr std::uint64_t megabyte = 1 << 20;

class ZipReaderTest : public ::testing::Test {
protected:
    std::unique_ptr<ZipArchive> open(std::string_view name = "a.zip") {
        return ZipReader::host().open(m_folder.url(name), &m_error);
    }
    std::unique_ptr<ZipArchive> open(const ZipBuilder& builder) {
        m_folder.write("a.zip", builder.bytes());
        return open();
    }
    /// The entry's content; none too when the archive does not open, which is a failure.
    std::optional<std::string> read(const ZipBuilder& builder, std::string_view name,
                                    std::uint64_t limit = megabyte) {
        const std::unique_ptr<ZipArchive> archive = open(builder);
        EXPECT_TRUE(archive);
        return archive ? read(*archive, name, limit) : std::nullopt;
    }
    static std::optional<std::string> read(ZipArchive& archive, std::string_view name,
                                           std::uint64_t limit = megabyte) {
        const std::optional<Data> data = archive.readEntry(name, limit);
        std::vector<std::uint8_t> storage;
        return data ? std::optional(std::string(data->text(storage))) : std::nullopt;
    }
    void expectOpenError(std::string_view domain, std::int64_t code, const URL& url) {
        ASSERT_TRUE(m_error);
        EXPECT_EQ(m_error->domain(), domain);
        EXPECT_EQ(m_error->code(), code);
        ASSERT_TRUE(m_error->url());
        EXPECT_EQ(*m_error->url(), url);
    }
    void expectNoArchive(const ZipBuilder& builder) {
        EXPECT_FALSE(open(builder));
        expectOpenError(PVFileErrorDomain, 259, m_folder.url("a.zip"));
    }

    TemporaryDirectory m_folder;
    std::optional<Error> m_error;
};

TEST_F(ZipReaderTest, ReadsStoredAndDeflatedEntries) {
    const ZipBuilder builder =
        ZipBuilder{}.stored("mimetype", "application/epub+zip").deflated("a/b", "aaaaaaaaaaaaaa");

    EXPECT_EQ(read(builder, "mimetype"), "application/epub+zip");
    EXPECT_EQ(read(builder, "a/b"), "aaaaaaaaaaaaaa");
}

TEST_F(ZipReaderTest, ReadsEmptyEntries) {
    const ZipBuilder builder = ZipBuilder{}.stored("a", "").deflated("b", "").entry(
        {.name = "c", .deflate = true, .rawData = ""});

    EXPECT_EQ(read(builder, "a"), "");
    EXPECT_EQ(read(builder, "b"), "");
    EXPECT_EQ(read(builder, "c"), "");
}

TEST_F(ZipReaderTest, MatchesNamesExactly) {
    const ZipBuilder builder = ZipBuilder{}.stored("META-INF/container.xml", "x").stored("a b", "");

    EXPECT_EQ(read(builder, "meta-inf/container.xml"), std::nullopt);
    EXPECT_EQ(read(builder, "/META-INF/container.xml"), std::nullopt);
    EXPECT_EQ(read(builder, "META-INF//container.xml"), std::nullopt);
    EXPECT_EQ(read(builder, "container.xml"), std::nullopt);
    EXPECT_EQ(read(builder, std::string_view("a\0b", 3)), std::nullopt);
    EXPECT_EQ(read(builder, ""), std::nullopt);
}

TEST_F(ZipReaderTest, MatchesNamesThatAreNoUTF8ByTheirBytes) {
    EXPECT_EQ(read(ZipBuilder{}.stored("\x81.opf", "x"), "\x81.opf"), "x");
    EXPECT_EQ(read(ZipBuilder{}.stored("\x81.opf", "x").comment("full reader"), "\x81.opf"), "x");
}

TEST_F(ZipReaderTest, TheFirstOfDuplicatesWins) {
    const ZipBuilder builder = ZipBuilder{}.stored("a", "first").stored("a", "second");

    EXPECT_EQ(read(builder, "a"), "first");
    EXPECT_EQ(read(ZipBuilder(builder).comment("full reader"), "a"), "first");
}

TEST_F(ZipReaderTest, ReadsAnEntryBehindADataDescriptor) {
    const ZipBuilder builder =
        ZipBuilder{}.entry({.name = "a", .content = "text", .deflate = true, .descriptor = true});

    EXPECT_EQ(read(builder, "a"), "text");
}

TEST_F(ZipReaderTest, ReadsAnEntryBehindALongLocalExtraField) {
    std::string extra("\x99\x99\xE8\x03", 4);
    extra += std::string(1000, 'e');

    EXPECT_EQ(read(ZipBuilder{}.entry({.name = "a", .content = "text", .localExtra = extra}), "a"),
              "text");
}

TEST_F(ZipReaderTest, ReadsEntriesOfALargeDirectory) {
    ZipBuilder builder;
    for (int i = 0; i < 20'000; ++i)
        builder.stored(std::string(60, 'n') + std::to_string(i), std::to_string(i));

    const std::unique_ptr<ZipArchive> archive = open(builder);
    ASSERT_TRUE(archive);
    EXPECT_EQ(read(*archive, std::string(60, 'n') + "0"), "0");
    EXPECT_EQ(read(*archive, std::string(60, 'n') + "19999"), "19999");
    EXPECT_EQ(read(*archive, "none"), std::nullopt);
}

TEST_F(ZipReaderTest, ReadsAnArchiveWithAComment) {
    EXPECT_EQ(read(ZipBuilder{}.stored("a", "x").comment("PK\x05\x06 is no end record"), "a"), "x");
}

TEST_F(ZipReaderTest, ReadsZip64Archives) {
    EXPECT_EQ(read(ZipBuilder{}.stored("a", "x").zip64(), "a"), "x");
    EXPECT_EQ(read(ZipBuilder{}.entry({.name = "a", .content = "x", .zip64 = true}).zip64(), "a"),
              "x");
}

TEST_F(ZipReaderTest, ReadsAnArchiveWithoutEntriesAsEmpty) {
    EXPECT_EQ(read(ZipBuilder{}, "a"), std::nullopt);
}

TEST_F(ZipReaderTest, RefusesAJunkPrefix) {
    expectNoArchive(ZipBuilder{}.stored("a", "x").prefix("junk"));
}

TEST_F(ZipReaderTest, ReadsBehindAPrefixThatTheOffsetsCount) {
    EXPECT_EQ(read(ZipBuilder{}.stored("a", "x").prefix(std::string(500, '#'), true), "a"), "x");
}

TEST_F(ZipReaderTest, RefusesAnEndRecordThatCountsMoreEntriesThanThereAre) {
    expectNoArchive(ZipBuilder{}.stored("a", "x").count(65535));
    expectNoArchive(ZipBuilder{}.stored("a", "x").count(2));
    expectNoArchive(ZipBuilder{}.stored("a", "x").zip64().count(1ULL << 60));
}

TEST_F(ZipReaderTest, RefusesADirectoryThatIsNotWhereTheEndRecordSays) {
    expectNoArchive(ZipBuilder{}.stored("a", "x").directoryOffsetError(1));
    expectNoArchive(ZipBuilder{}.stored("a", "x").directorySizeError(1));
    expectNoArchive(ZipBuilder{}.stored("a", "x").directorySizeError(-1));
}

TEST_F(ZipReaderTest, RefusesOneDiskOfMany) {
    expectNoArchive(ZipBuilder{}.stored("a", "x").diskNumber(1));
}

TEST_F(ZipReaderTest, AnEncryptedEntryIsNone) {
    const ZipEntryPlan plan = {.name = "a", .content = "x", .flags = 1};

    EXPECT_EQ(read(ZipBuilder{}.entry(plan), "a"), std::nullopt);
    EXPECT_EQ(read(ZipBuilder{}.entry(plan).comment("full reader"), "a"), std::nullopt);
}

TEST_F(ZipReaderTest, AnEntryOfAnUnknownMethodIsNone) {
    const ZipEntryPlan plan = {.name = "a", .content = "x", .method = 12};

    EXPECT_EQ(read(ZipBuilder{}.entry(plan), "a"), std::nullopt);
    EXPECT_EQ(read(ZipBuilder{}.entry(plan).comment("full reader"), "a"), std::nullopt);
}

TEST_F(ZipReaderTest, LinksAndFoldersAreNone) {
    const ZipBuilder builder = ZipBuilder{}
                                   .link("link", "target")
                                   .stored("folder/", "")
                                   .entry({.name = "folder", .externalAttributes = 040755U << 16});

    EXPECT_EQ(read(builder, "link"), std::nullopt);
    EXPECT_EQ(read(builder, "folder/"), std::nullopt);
    EXPECT_EQ(read(builder, "folder"), std::nullopt);
}

TEST_F(ZipReaderTest, ALinksModeMeansNothingOfAnotherSystem) {
    EXPECT_EQ(
        read(ZipBuilder{}.entry(
                 {.name = "a", .content = "x", .madeBy = 20, .externalAttributes = 0120777U << 16}),
             "a"),
        "x");
}

TEST_F(ZipReaderTest, AnEntryOverTheLimitIsNone) {
    const ZipBuilder builder = ZipBuilder{}.stored("a", "1234").deflated("b", "1234");

    EXPECT_EQ(read(builder, "a", 4), "1234");
    EXPECT_EQ(read(builder, "a", 3), std::nullopt);
    EXPECT_EQ(read(builder, "b", 4), "1234");
    EXPECT_EQ(read(builder, "b", 3), std::nullopt);
}

TEST_F(ZipReaderTest, AWrongChecksumIsNone) {
    const ZipBuilder builder = ZipBuilder{}
                                   .entry({.name = "a", .content = "x", .crc = 1})
                                   .entry({.name = "b", .content = "x", .deflate = true, .crc = 1})
                                   .entry({.name = "c", .crc = 1});

    EXPECT_EQ(read(builder, "a"), std::nullopt);
    EXPECT_EQ(read(builder, "b"), std::nullopt);
    EXPECT_EQ(read(builder, "c"), std::nullopt);
}

TEST_F(ZipReaderTest, AWrongSizeIsNone) {
    for (const std::uint64_t size : {0U, 19U, 21U, 1U << 30}) {
        const ZipBuilder builder =
            ZipBuilder{}
                .entry({.name = "a", .content = std::string(20, 'x'), .size = size})
                .entry(
                    {.name = "b", .content = std::string(20, 'x'), .deflate = true, .size = size});

        EXPECT_EQ(read(builder, "a", 2ULL << 30), std::nullopt) << size;
        EXPECT_EQ(read(builder, "b", 2ULL << 30), std::nullopt) << size;
    }
}

TEST_F(ZipReaderTest, ACompressedSizeBeyondTheFileIsNone) {
    EXPECT_EQ(read(ZipBuilder{}.entry(
                       {.name = "a", .content = "x", .compressedSize = 1U << 30, .size = 1U << 30}),
                   "a", 2ULL << 30),
              std::nullopt);
}

TEST_F(ZipReaderTest, ABrokenDeflateStreamIsNone) {
    EXPECT_EQ(
        read(ZipBuilder{}.entry(
                 {.name = "a", .content = "text", .deflate = true, .rawData = "\xFF\xFF\xFF\xFF"}),
             "a"),
        std::nullopt);
}

TEST_F(ZipReaderTest, ReadsWhatDeflateCompressesBest) {
    const std::string zeros(megabyte, '\0');

    EXPECT_EQ(read(ZipBuilder{}.deflated("a", zeros), "a"), zeros);
}

TEST_F(ZipReaderTest, AClaimThatDeflateCannotGiveIsNone) {
    const std::string stream = deflatedBytes("x");
    const auto plan = [&](std::uint64_t size) {
        return ZipEntryPlan{.name = "a", .content = "x", .deflate = true, .size = size};
    };

    EXPECT_EQ(read(ZipBuilder{}.entry(plan(stream.size() * 1032 + 1)), "a"), std::nullopt);
    EXPECT_EQ(read(ZipBuilder{}.entry(plan(1ULL << 31)), "a", ~0ULL), std::nullopt);
}

TEST_F(ZipReaderTest, ReadsAnEntryTooLargeForOnePiece) {
    const std::string content(33 * megabyte, 'x');
    const std::unique_ptr<ZipArchive> archive =
        open(ZipBuilder{}
                 .deflated("a", content)
                 .stored("b", content)
                 .entry({.name = "c", .content = content, .deflate = true, .crc = 1}));

    ASSERT_TRUE(archive);
    EXPECT_TRUE(read(*archive, "a", 64 * megabyte) == content);
    EXPECT_TRUE(read(*archive, "b", 64 * megabyte) == content);
    EXPECT_EQ(read(*archive, "c", 64 * megabyte), std::nullopt);
    EXPECT_EQ(read(*archive, "a", 32 * megabyte), std::nullopt);
}

TEST_F(ZipReaderTest, AnEntryWhoseFileWasCutShortMeanwhileIsNone) {
    const std::unique_ptr<ZipArchive> archive =
        open(ZipBuilder{}.stored("a", std::string(100'000, 'x')));
    ASSERT_TRUE(archive);
    ASSERT_EQ(::truncate((m_folder / "a.zip").c_str(), 50'000), 0);

    EXPECT_EQ(read(*archive, "a"), std::nullopt);
}

TEST_F(ZipReaderTest, KeepsReadingTheFileThatItOpened) {
    const std::unique_ptr<ZipArchive> archive = open(ZipBuilder{}.stored("a", "old"));
    std::filesystem::remove(m_folder / "a.zip");
    m_folder.write("a.zip", ZipBuilder{}.stored("a", "new").bytes());

    ASSERT_TRUE(archive);
    EXPECT_EQ(read(*archive, "a"), "old");
}

TEST_F(ZipReaderTest, FollowsALinkToTheArchive) {
    m_folder.write("a.zip", ZipBuilder{}.stored("a", "x").bytes());
    std::filesystem::create_symlink("a.zip", m_folder / "link.zip");

    const std::unique_ptr<ZipArchive> archive = open("link.zip");
    ASSERT_TRUE(archive);
    EXPECT_EQ(read(*archive, "a"), "x");
}

TEST_F(ZipReaderTest, AMissingFileIsNoSuchFile) {
    EXPECT_FALSE(open("none.zip"));
    expectOpenError(PVFileErrorDomain, 4, m_folder.url("none.zip"));
}

TEST_F(ZipReaderTest, AFolderIsAPOSIXError) {
    EXPECT_FALSE(open(""));
    expectOpenError(PVPOSIXErrorDomain, EISDIR, m_folder.url(""));
}

TEST_F(ZipReaderTest, AFIFODoesNotBlockAndIsNoArchive) {
    ASSERT_EQ(::mkfifo((m_folder / "a.zip").c_str(), 0600), 0);

    EXPECT_FALSE(open());
    expectOpenError(PVFileErrorDomain, 259, m_folder.url("a.zip"));
}

TEST_F(ZipReaderTest, AFileThatIsNoArchiveIsCorrupt) {
    for (const std::string& bytes : {std::string(), std::string("PK"), std::string(9000, 'x'),
                                     std::string("PK\x05\x06"), std::string("%PDF-1.4")}) {
        m_folder.write("a.zip", bytes);

        EXPECT_FALSE(open());
        expectOpenError(PVFileErrorDomain, 259, m_folder.url("a.zip"));
    }
}

TEST_F(ZipReaderTest, AHugeSparseFileThatClaimsAsManyEntriesIsNoArchive) {
    const std::string end = ZipBuilder{}.zip64().count(1ULL << 31).bytes();
    std::string path = m_folder.write("a.zip", "");
    ASSERT_EQ(::truncate(path.c_str(), 200LL << 30), 0);
    const host::FileDescriptor file(::open(path.c_str(), O_WRONLY | O_CLOEXEC));
    const auto size = static_cast<std::uint64_t>(200LL << 30);
    std::string lie = end;
    for (std::size_t byte = 0; byte < 8; ++byte) {
        lie[40 + byte] = static_cast<char>(size >> 8 * byte);      // the directory's size
        lie[56 + 8 + byte] = static_cast<char>(size >> 8 * byte);  // the record's place
    }
    ASSERT_EQ(::pwrite(file.get(), lie.data(), lie.size(), 200LL << 30),
              static_cast<ssize_t>(lie.size()));

    EXPECT_FALSE(open());
    expectOpenError(PVFileErrorDomain, 259, m_folder.url("a.zip"));
}

TEST_F(ZipReaderTest, ATailFullOfEndRecordsIsNoArchive) {
    std::string trailer;
    for (int i = 0; i < 1000; ++i)
        trailer += ZipBuilder{}.bytes();

    expectNoArchive(ZipBuilder{}.stored("a", "x").trailer(trailer));
}

}  // namespace
}  // namespace parvel::testing
