#include <gtest/gtest.h>
#include <sys/statvfs.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <filesystem>

#include "tests/support/ArchiveCopying.h"

namespace parvel::testing {
namespace {

using Failed = RecordingCopierCallbacks::Failed;

constexpr std::uint32_t modeBits = 16;
constexpr std::size_t largeSize = 9 << 20;  // is expanded in pieces

class HostileArchives : public ArchiveCopying {
protected:
    /// Expects that the entry ends the copy with that file error, and nothing stands outside it.
    void expectRefused(ZipEntryPlan entry, int error) {
        const std::string name = entry.name;
        expectRefused(ZipBuilder{}.entry(std::move(entry)), name, error);
    }
    void expectRefused(const ZipBuilder& archive, const std::string& name, int error) {
        std::filesystem::remove_all(copyPath(""));
        m_callbacks.failed.clear();

        EXPECT_EQ(expand(archive), error) << name;

        EXPECT_EQ(m_callbacks.failed,
                  (std::vector<Failed>{{pathAppending(copyPath(""), name), error}}))
            << name;
        EXPECT_TRUE(m_callbacks.errnoWasSet);
        EXPECT_TRUE(m_callbacks.fatal.empty()) << name;
        EXPECT_EQ(namesAround(), (Names{"copy", "source"})) << name;
    }
    [[nodiscard]] Names namesAround() const {
        Names names;
        for (const auto& entry : std::filesystem::directory_iterator(m_folder.path()))
            names.push_back(entry.path().filename().string());
        std::sort(names.begin(), names.end());
        return names;
    }
};

TEST_F(HostileArchives, NamesThatLeaveTheFolderAreRefused) {
    for (const char* name : {"../evil", "/evil", "a/../../evil", "a/../b", "..", ".", "./a", "a/.",
                             "a//b", "//", "/", "a/..", "../", "a/../"})
        expectRefused({.name = name, .content = "evil"}, EPERM);
}

TEST_F(HostileArchives, AnEntryWithoutANameIsRefused) {
    expectRefused({.name = "", .content = "evil"}, EPERM);
}

TEST_F(HostileArchives, NamesThatAreTooLongAreRefused) {
    expectRefused({.name = std::string(256, 'x')}, ENAMETOOLONG);
    expectRefused({.name = "a/" + std::string(256, 'x') + "/b"}, ENAMETOOLONG);
    std::string long4097 = "a";
    while (long4097.size() < 4096)
        long4097 += "/" + std::string(199, 'x');
    expectRefused({.name = long4097}, ENAMETOOLONG);
}

TEST_F(HostileArchives, NamesOf200ComponentsAreTheDeepest) {
    std::string deep = "a";
    for (int count = 1; count < 200; ++count)
        deep += "/a";
    EXPECT_EQ(expand(ZipBuilder{}.stored(deep, "deep")), 0);
    EXPECT_EQ(read(deep), "deep");

    expectRefused({.name = deep + "/a"}, ENAMETOOLONG);
}

TEST_F(HostileArchives, LinksAreRefusedWhatTheirNameAndTargetMayBe) {
    expectRefused(ZipBuilder{}.link("link", "target"), "link", ELOOP);
    expectRefused(ZipBuilder{}.link("link", "/etc/passwd"), "link", ELOOP);
    expectRefused({.name = "link/", .externalAttributes = 0120777U << modeBits}, ELOOP);
}

TEST_F(HostileArchives, DevicesPipesAndSocketsAreRefused) {
    for (const std::uint32_t type : {0010000U, 0020000U, 0060000U, 0140000U})
        expectRefused({.name = "device", .externalAttributes = (type | 0644U) << modeBits},
                      EOPNOTSUPP);
}

TEST_F(HostileArchives, AModeOfAnotherSystemIsNone) {
    EXPECT_EQ(expand(ZipBuilder{}.entry(
                  {.name = "a", .madeBy = 0x0014, .externalAttributes = 0120777U << modeBits})),
              0);

    EXPECT_TRUE(std::filesystem::is_regular_file(std::filesystem::symlink_status(copyPath("a"))));
}

TEST_F(HostileArchives, SetIdBitsAreNotTaken) {
    EXPECT_EQ(expand(ZipBuilder{}.entry({.name = "a", .externalAttributes = 0106777U << modeBits})),
              0);

    EXPECT_EQ(std::filesystem::status(copyPath("a")).permissions(),
              std::filesystem::perms::owner_read | std::filesystem::perms::owner_write);
}

TEST_F(HostileArchives, EncryptedEntriesAreRefused) {
    expectRefused({.name = "a", .content = "secret", .flags = 1}, EACCES);
}

TEST_F(HostileArchives, UnknownMethodsAreRefused) {
    expectRefused({.name = "a", .content = "content", .method = 14}, EOPNOTSUPP);
}

TEST_F(HostileArchives, AWrongChecksumIsRefused) {
    expectRefused({.name = "a", .content = "content", .crc = 1}, EBADMSG);
    expectRefused({.name = "a", .content = "content", .deflate = true, .crc = 1}, EBADMSG);
    const std::string large(largeSize, 'x');
    expectRefused({.name = "a", .content = large, .crc = 1}, EBADMSG);
    expectRefused({.name = "a", .content = large, .deflate = true, .crc = 1}, EBADMSG);
}

TEST_F(HostileArchives, AWrongSizeIsRefused) {
    const std::string content(1000, 'x');
    const std::string large(largeSize, 'x');
    for (const std::uint64_t size : {0U, 999U, 1001U, 5000U}) {
        expectRefused({.name = "a", .content = content, .size = size}, EBADMSG);
        expectRefused({.name = "a", .content = content, .deflate = true, .size = size}, EBADMSG);
    }
    for (const std::uint64_t size : {largeSize - 1, largeSize + 1})
        expectRefused({.name = "a", .content = large, .deflate = true, .size = size}, EBADMSG);
}

TEST_F(HostileArchives, AClaimThatNoStreamCanFulfilIsRefusedBeforeItTakesMemory) {
    const std::string zeros(1 << 20, '\0');
    for (const std::uint64_t size : {std::uint64_t{1} << 32, std::uint64_t{1} << 62, UINT64_MAX})
        expectRefused({.name = "a", .content = zeros, .deflate = true, .size = size, .zip64 = true},
                      EBADMSG);
}

TEST_F(HostileArchives, ABrokenStreamIsRefused) {
    expectRefused({.name = "a",
                   .content = std::string(100, 'x'),
                   .deflate = true,
                   .rawData = "\xFF\xFF\xFF\xFF"},
                  EBADMSG);
    expectRefused({.name = "a",
                   .content = std::string(largeSize, 'x'),
                   .deflate = true,
                   .rawData = std::string(largeSize / 1000, '\xFF')},
                  EBADMSG);
}

TEST_F(HostileArchives, ANamesSecondEntryIsRefusedAndTheFirstStays) {
    expectRefused(ZipBuilder{}.stored("a", "first").stored("a", "second"), "a", EEXIST);

    EXPECT_EQ(read("a"), "first");
}

TEST_F(HostileArchives, AFileIsNoFolderForOthers) {
    expectRefused(ZipBuilder{}.stored("a", "file").stored("a/b", ""), "a/b", ENOTDIR);
    expectRefused(ZipBuilder{}.stored("a", "file").stored("a/", ""), "a/", ENOTDIR);
    expectRefused(ZipBuilder{}.stored("a/b", "").stored("a", "file"), "a", EEXIST);
}

TEST_F(HostileArchives, ALinkPlantedInTheCopyIsNotFollowed) {
    std::filesystem::create_directory(m_folder / "outside");
    m_callbacks.onFinished = [this] {
        std::filesystem::create_symlink("../outside", copyPath("planted"));
    };

    EXPECT_EQ(expand(ZipBuilder{}.stored("first", "").stored("planted/a", "evil")), ELOOP);

    EXPECT_TRUE(std::filesystem::is_empty(m_folder / "outside"));
}

TEST_F(HostileArchives, NamesThatAskForVeryManyFoldersAreABomb) {
    std::string folders;
    for (int depth = 0; depth < 190; ++depth)
        folders += "f/";
    ZipBuilder archive;
    for (int index = 0; index < 600; ++index)
        archive.stored(std::to_string(index) + "/" + folders + "a", "");

    EXPECT_EQ(expand(archive), EBADMSG);

    EXPECT_EQ(m_callbacks.fatal, std::vector<int>{EBADMSG});
    EXPECT_EQ(namesAround(), Names{"source"});
}

TEST_F(HostileArchives, EntriesThatShareTheirBytesAreABomb) {
    const std::string zeros(1 << 20, '\0');
    ZipBuilder archive;
    archive.deflated("0", zeros);
    for (int index = 1; index < 50; ++index)
        archive.entry({.name = std::to_string(index),
                       .content = zeros,
                       .deflate = true,
                       .rawData = "",
                       .compressedSize = deflatedBytes(zeros).size(),
                       .offset = 0});

    EXPECT_EQ(expand(archive), EBADMSG);

    EXPECT_EQ(m_callbacks.fatal, std::vector{EBADMSG});
    EXPECT_EQ(namesAround(), Names{"source"});
}

TEST_F(HostileArchives, MoreThanTheDiskHasRoomForIsRefusedBeforeItIsWritten) {
    struct statvfs room {};
    const bool isKnown = ::statvfs("/dev/shm", &room) == 0;
    const std::uint64_t free = isKnown ? room.f_frsize * room.f_bavail : 0;
    constexpr std::uint64_t mostData = 64 << 20;
    const std::uint64_t size = free + (std::uint64_t{64} << 20);
    const std::uint64_t stored = size / 1032 + 1;
    if (!isKnown || stored > mostData)
        GTEST_SKIP() << "no small enough file system here";
    writeSource(ZipBuilder{}.entry({.name = "a",
                                    .deflate = true,
                                    .rawData = std::string(stored, '\0'),
                                    .size = size,
                                    .zip64 = true}));

    const std::string copy = "/dev/shm/parvel-" + std::to_string(::getpid());
    EXPECT_EQ(m_copier->copy(sourcePath(), copy, expanding()), ENOSPC);

    EXPECT_EQ(m_callbacks.fatal, std::vector{ENOSPC});
    EXPECT_FALSE(std::filesystem::exists(copy));
}

TEST_F(HostileArchives, AnAnswerToStopLeavesWhatWasMadeBefore) {
    EXPECT_EQ(expand(ZipBuilder{}.stored("a", "1").stored("../b", "2").stored("c", "3")), EPERM);

    EXPECT_EQ(names(), Names{"a"});
}

TEST_F(HostileArchives, AnyOtherAnswerLeavesTheFileOutAndGoesOn) {
    m_callbacks.answer = 0;

    EXPECT_EQ(expand(ZipBuilder{}
                         .stored("a", "1")
                         .stored("a", "2")
                         .entry({.name = "damaged", .content = "content", .crc = 1})
                         .entry({.name = "damaged in pieces",
                                 .content = std::string(largeSize, 'x'),
                                 .crc = 1})
                         .stored("c", "3")),
              0);

    EXPECT_EQ(m_callbacks.failed.size(), 3U);
    EXPECT_EQ(names(), (Names{"a", "c"}));
    EXPECT_EQ(read("a"), "1");
}

TEST_F(HostileArchives, ACountThatIsForgedIsNoArchive) {
    EXPECT_EQ(expand(ZipBuilder{}.stored("a", "1").zip64().count(1ULL << 40)), EBADMSG);
    EXPECT_EQ(expand(ZipBuilder{}.stored("a", "1").count(2)), EBADMSG);
}

TEST_F(HostileArchives, DamagedAnywhereNothingLeavesTheFolder) {
    const std::string whole = ZipBuilder{}
                                  .stored("mimetype", "application/epub+zip")
                                  .deflated("OPS/a", std::string(500, 'x'))
                                  .stored("META-INF/", "")
                                  .bytes();
    for (std::size_t at = 0; at < whole.size(); ++at) {
        for (const char damage : {'\xFF', '/'}) {
            std::string bytes = whole;
            bytes[at] = damage;
            m_folder.write("source", bytes);
            std::filesystem::remove_all(copyPath(""));
            m_callbacks = RecordingCopierCallbacks();

            const int result = expandSource();

            EXPECT_EQ(result == 0, m_callbacks.fatal.empty() && m_callbacks.failed.empty());
            for (const std::string& name : namesAround())
                ASSERT_TRUE(name == "copy" || name == "source") << name;
        }
    }
}

}  // namespace
}  // namespace parvel::testing
