#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <cerrno>
#include <filesystem>

#include "parvel/platform/linux/FileDescriptor.h"
#include "parvel/platform/linux/LibzipArchive.h"
#include "tests/support/AbsentLibrary.h"
#include "tests/support/ArchiveCopying.h"

namespace parvel::testing {
namespace {

using Finished = RecordingCopierCallbacks::Finished;

class ExpandingArchives : public ArchiveCopying {};

mode_t modeOf(const std::string& path) {
    struct stat status {};
    return ::stat(path.c_str(), &status) == 0 ? status.st_mode & 07777 : 0;
}

TEST_F(ExpandingArchives, MakesEveryFileWithItsContent) {
    const std::string text(100000, 'x');

    EXPECT_EQ(expand(ZipBuilder{}
                         .stored("mimetype", "application/epub+zip")
                         .deflated("OPS/text/a.xhtml", text)
                         .deflated("OPS/b", "")
                         .stored("c", "")),
              0);

    EXPECT_EQ(read("mimetype"), "application/epub+zip");
    EXPECT_EQ(read("OPS/text/a.xhtml"), text);
    EXPECT_EQ(names(), (Names{"OPS", "OPS/b", "OPS/text", "OPS/text/a.xhtml", "c", "mimetype"}));
    EXPECT_TRUE(m_callbacks.fatal.empty());
    EXPECT_TRUE(m_callbacks.failed.empty());
}

TEST_F(ExpandingArchives, TellsEveryFinishedFileInTheArchivesOrder) {
    EXPECT_EQ(expand(ZipBuilder{}.stored("z", "123").stored("folder/", "").deflated("a/b", "1")),
              0);

    const std::vector<Finished> expected = {{copyPath("z"), ArchiveObjectType::File, 3},
                                            {copyPath("a/b"), ArchiveObjectType::File, 1}};
    EXPECT_EQ(m_callbacks.finished, expected);
}

TEST_F(ExpandingArchives, CountsTheFilesAndTheirClaimedSizes) {
    writeSource(ZipBuilder{}.stored("z", "123").stored("folder/", "").deflated("a/b", "1"));

    EXPECT_EQ(m_copier->countArchive(sourcePath()), (ArchiveCopier::Count{2, 4}));
}

TEST_F(ExpandingArchives, CountsNothingInWhatIsNoArchive) {
    m_folder.write("source", "no archive");

    EXPECT_EQ(m_copier->countArchive(sourcePath()), ArchiveCopier::Count());
    EXPECT_EQ(m_copier->countArchive(m_folder / "none"), ArchiveCopier::Count());
}

TEST_F(ExpandingArchives, ACountThatOverflowsStaysAtTheLimit) {
    writeSource(ZipBuilder{}
                    .entry({.name = "a", .size = UINT64_MAX - 1, .zip64 = true})
                    .entry({.name = "b", .size = UINT64_MAX - 1, .zip64 = true}));

    EXPECT_GE(m_copier->countArchive(sourcePath()).bytes, UINT64_MAX - 1);
}

TEST_F(ExpandingArchives, MakesFilesAndFoldersThatAreTheirOwnersAlone) {
    EXPECT_EQ(expand(ZipBuilder{}.stored("folder/", "").stored("other/a", "")), 0);

    EXPECT_EQ(modeOf(copyPath("")), 0700U);
    EXPECT_EQ(modeOf(copyPath("folder")), 0700U);
    EXPECT_EQ(modeOf(copyPath("other")), 0700U);
    EXPECT_EQ(modeOf(copyPath("other/a")), 0600U);
}

TEST_F(ExpandingArchives, AFolderMayComeAfterItsFilesAndTwice) {
    EXPECT_EQ(
        expand(
            ZipBuilder{}.stored("a/b", "1").stored("a/", "").stored("a/", "").stored("a/c", "2")),
        0);

    EXPECT_EQ(names(), (Names{"a", "a/b", "a/c"}));
}

TEST_F(ExpandingArchives, AnEntryWithAFoldersModeIsAFolder) {
    EXPECT_EQ(expand(ZipBuilder{}
                         .entry({.name = "a", .externalAttributes = 0040755U << 16})
                         .stored("a/b", "1")),
              0);

    EXPECT_EQ(names(), (Names{"a", "a/b"}));
}

TEST_F(ExpandingArchives, AnArchiveWithoutEntriesIsAnEmptyFolder) {
    EXPECT_EQ(expand(ZipBuilder{}), 0);

    EXPECT_EQ(names(), Names());
    EXPECT_TRUE(std::filesystem::is_directory(copyPath("")));
}

TEST_F(ExpandingArchives, LargeEntriesComeInPieces) {
    std::string content(9 << 20, 'x');
    for (std::size_t at = 0; at < content.size(); at += 4096)
        content[at] = static_cast<char>(at >> 12);

    EXPECT_EQ(expand(ZipBuilder{}.stored("stored", content).deflated("deflated", content)), 0);

    EXPECT_TRUE(read("stored") == content);
    EXPECT_TRUE(read("deflated") == content);
}

TEST_F(ExpandingArchives, ExpandsZip64AndDataDescriptors) {
    EXPECT_EQ(expand(ZipBuilder{}
                         .entry({.name = "a", .content = "123", .deflate = true, .zip64 = true})
                         .entry({.name = "b", .content = "45", .flags = 8, .descriptor = true})
                         .zip64()),
              0);

    EXPECT_EQ(read("a"), "123");
    EXPECT_EQ(read("b"), "45");
}

TEST_F(ExpandingArchives, NamesAreTakenAsTheyAreStored) {
    const std::string name = "caf\xE9 \\ C:%2e%2e";

    EXPECT_EQ(expand(ZipBuilder{}.stored(name, "1")), 0);

    EXPECT_EQ(read(name), "1");
}

TEST_F(ExpandingArchives, WhatWasCountedIsExpanded) {
    writeSource(ZipBuilder{}.stored("a", "1"));

    EXPECT_EQ(m_copier->countArchive(sourcePath()).files, 1U);
    EXPECT_EQ(expandSource(), 0);

    EXPECT_EQ(read("a"), "1");
}

TEST_F(ExpandingArchives, AnArchiveThatWasReplacedAfterItWasCountedIsReadAnew) {
    writeSource(ZipBuilder{}.stored("a", "1"));
    EXPECT_EQ(m_copier->countArchive(sourcePath()).files, 1U);
    m_folder.write("new", ZipBuilder{}.stored("b", "2").bytes());
    std::filesystem::rename(m_folder / "new", sourcePath());

    EXPECT_EQ(expandSource(), 0);

    EXPECT_EQ(names(), Names{"b"});
}

TEST_F(ExpandingArchives, AnArchiveThatWasRewrittenAfterItWasCountedIsReadAnew) {
    writeSource(ZipBuilder{}.stored("a", "1"));
    EXPECT_EQ(m_copier->countArchive(sourcePath()).files, 1U);
    writeSource(ZipBuilder{}.stored("b", "2").stored("c", "3"));

    EXPECT_EQ(expandSource(), 0);

    EXPECT_EQ(names(), (Names{"b", "c"}));
}

TEST_F(ExpandingArchives, AnArchiveThatIsGoneAfterItWasCountedIsFatal) {
    writeSource(ZipBuilder{}.stored("a", "1"));
    EXPECT_EQ(m_copier->countArchive(sourcePath()).files, 1U);
    std::filesystem::remove(sourcePath());

    EXPECT_EQ(expandSource(), ENOENT);

    EXPECT_EQ(m_callbacks.fatal, std::vector{ENOENT});
}

TEST_F(ExpandingArchives, AnotherArchiveThanTheCountedOneIsReadItself) {
    m_folder.write("other", ZipBuilder{}.stored("a", "1").bytes());
    EXPECT_EQ(m_copier->countArchive(m_folder / "other").files, 1U);

    EXPECT_EQ(expand(ZipBuilder{}.stored("b", "2")), 0);

    EXPECT_EQ(names(), Names{"b"});
}

TEST_F(ExpandingArchives, MoreThanTheLastSyncIsLeftComesWholeToo) {
    ZipBuilder archive;
    for (int index = 0; index < 50; ++index)
        archive.deflated(std::to_string(index), std::string(std::size_t{1} << 20, 'x'));

    EXPECT_EQ(expand(archive), 0);

    EXPECT_EQ(names().size(), 50U);
    EXPECT_EQ(m_callbacks.finished.size(), 50U);
    EXPECT_EQ(read("49"), std::string(std::size_t{1} << 20, 'x'));
}

TEST_F(ExpandingArchives, AnOpeningThatIsInterruptedGivesNoArchive) {
    writeSource(ZipBuilder{}.stored("a", "1"));
    const host::FileDescriptor file(::open(sourcePath().c_str(), O_RDONLY | O_CLOEXEC));
    const std::uint64_t size = std::filesystem::file_size(sourcePath());
    const std::uint64_t budget = host::LibzipArchive::readingBudget;

    EXPECT_FALSE(host::LibzipArchive::open(file.get(), size, budget, [] { return ECANCELED; }));
    EXPECT_TRUE(host::LibzipArchive::open(file.get(), size, budget, [] { return 0; }));
}

TEST_F(ExpandingArchives, WithoutLibzipThereIsNoArchive) {
    writeSource(ZipBuilder{}.stored("a", "1"));
    const host::FileDescriptor file(::open(sourcePath().c_str(), O_RDONLY | O_CLOEXEC));

    EXPECT_FALSE(host::LibzipArchive::open(file.get(), std::filesystem::file_size(sourcePath()),
                                           host::LibzipArchive::readingBudget, nullptr,
                                           absentLibrary<host::Libzip>()));
}

TEST_F(ExpandingArchives, AnExistingDestinationIsFatalAndStaysAsItIs) {
    m_folder.write("copy/old", "old");

    EXPECT_EQ(expand(ZipBuilder{}.stored("new", "new")), EEXIST);

    EXPECT_EQ(m_callbacks.fatal, std::vector{EEXIST});
    EXPECT_EQ(names(), Names{"old"});
}

TEST_F(ExpandingArchives, ADanglingLinkAtTheDestinationIsNotFollowed) {
    std::filesystem::create_symlink("elsewhere", copyPath(""));

    EXPECT_EQ(expand(ZipBuilder{}.stored("new", "new")), EEXIST);

    EXPECT_FALSE(std::filesystem::exists(m_folder / "elsewhere"));
}

TEST_F(ExpandingArchives, WhatIsNoArchiveIsFatalAndNothingIsMade) {
    m_folder.write("source", "no archive");

    EXPECT_EQ(expandSource(), EBADMSG);

    EXPECT_EQ(m_callbacks.fatal, std::vector{EBADMSG});
    EXPECT_FALSE(std::filesystem::exists(copyPath("")));
}

TEST_F(ExpandingArchives, AMissingArchiveOrTargetFolderIsFatal) {
    EXPECT_EQ(expandSource(), ENOENT);

    writeSource(ZipBuilder{}.stored("a", ""));
    EXPECT_EQ(m_copier->copy(sourcePath(), m_folder / "none/copy", expanding()), ENOENT);
    EXPECT_EQ(m_copier->copy(sourcePath(), "", expanding()), ENOENT);
    EXPECT_EQ(m_callbacks.fatal, (std::vector{ENOENT, ENOENT, ENOENT}));
}

TEST_F(ExpandingArchives, AFolderIsNoArchive) {
    m_folder.write("source/a", "");

    EXPECT_EQ(expandSource(), EISDIR);
}

TEST_F(ExpandingArchives, WithoutCallbacksAFailureStillEndsTheCopy) {
    m_copier->setCallbacks(nullptr);

    EXPECT_EQ(expand(ZipBuilder{}.stored("a", "1").stored("a", "2")), EEXIST);
}

}  // namespace
}  // namespace parvel::testing
