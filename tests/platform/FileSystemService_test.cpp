#include "parvel/platform/FileSystemService.h"

#include <sys/stat.h>

#include <atomic>
#include <filesystem>
#include <thread>

#include <gtest/gtest.h>

#include "tests/support/ServicedFolder.h"
#include "tests/support/TestRounds.h"

namespace parvel::testing {
namespace {

namespace fs = std::filesystem;

using FileSystem = ServicedFolder;

TEST_F(FileSystem, ADanglingLinkOccupiesItsName) {
    fs::create_symlink("nowhere", m_folder / "link");

    EXPECT_TRUE(m_service->itemExistsAtPath(m_folder / "link"));
    EXPECT_FALSE(m_service->itemExistsAtPath(m_folder / "nowhere"));
}

TEST_F(FileSystem, AFileMovesToAFreeName) {
    m_folder.write("a.pdf", "one");

    EXPECT_TRUE(m_service->moveItem(m_folder.url("a.pdf"), m_folder.url("b.pdf"), &m_error));

    EXPECT_EQ(namesIn(m_folder.path()), Names{"b.pdf"});
    EXPECT_EQ(m_folder.read("b.pdf"), "one");
    EXPECT_FALSE(m_error);
}

TEST_F(FileSystem, AFolderMovesWithItsContent) {
    m_folder.write("a.epub/OPS/x", "x");

    EXPECT_TRUE(m_service->moveItem(m_folder.url("a.epub"), m_folder.url("b.epub")));

    EXPECT_EQ(namesIn(m_folder.path()), Names{"b.epub"});
    EXPECT_EQ(m_folder.read("b.epub/OPS/x"), "x");
}

TEST_F(FileSystem, AMoveOntoATakenNameFailsAndLeavesBoth) {
    m_folder.write("a", "one");
    m_folder.write("b", "two");

    EXPECT_FALSE(m_service->moveItem(m_folder.url("a"), m_folder.url("b"), &m_error));

    EXPECT_EQ(m_error, generalError(PVFileErrorCode::FileExists, m_folder.url("b")));
    EXPECT_EQ(m_folder.read("a"), "one");
    EXPECT_EQ(m_folder.read("b"), "two");
}

TEST_F(FileSystem, AMoveOntoADanglingLinkFails) {
    m_folder.write("a", "one");
    fs::create_symlink("nowhere", m_folder / "b");

    EXPECT_FALSE(m_service->moveItem(m_folder.url("a"), m_folder.url("b"), &m_error));

    EXPECT_EQ(m_error, generalError(PVFileErrorCode::FileExists, m_folder.url("b")));
    EXPECT_EQ(namesIn(m_folder.path()), (Names{"a", "b"}));
}

TEST_F(FileSystem, AMoveOfNothingNamesTheMissingItem) {
    EXPECT_FALSE(m_service->moveItem(m_folder.url("a"), m_folder.url("b"), &m_error));

    EXPECT_EQ(m_error, generalError(PVFileErrorCode::NoSuchFile, m_folder.url("a")));
}

TEST_F(FileSystem, AMoveIntoAMissingFolderNamesTheDestination) {
    m_folder.write("a", "one");

    EXPECT_FALSE(m_service->moveItem(m_folder.url("a"), m_folder.url("no/b"), &m_error));

    EXPECT_EQ(m_error, generalError(PVFileErrorCode::NoSuchFile, m_folder.url("no/b")));
    EXPECT_EQ(m_folder.read("a"), "one");
}

TEST_F(FileSystem, ALinkItselfMoves) {
    m_folder.write("target", "t");
    fs::create_symlink("target", m_folder / "link");

    EXPECT_TRUE(m_service->moveItem(m_folder.url("link"), m_folder.url("moved")));

    EXPECT_TRUE(fs::is_symlink(m_folder / "moved"));
    EXPECT_EQ(m_folder.read("target"), "t");
}

TEST_F(FileSystem, ATooLongNameIsThePlatformsError) {
    m_folder.write("a", "one");
    const URL destination = m_folder.url(std::string(300, 'x'));

    EXPECT_FALSE(m_service->moveItem(m_folder.url("a"), destination, &m_error));

    EXPECT_EQ(m_error, makePOSIXError(ENAMETOOLONG, destination));
}

TEST_F(FileSystem, AReplacedFileGivesWayAndTheOldNameGoes) {
    m_folder.write("old", "1");
    m_folder.write("new", "2");
    std::optional<URL> resulting;

    EXPECT_TRUE(m_service->replaceItem(m_folder.url("old"), m_folder.url("new"),
                                       ReplaceOptions::NewMetadataOnly, &resulting, &m_error));

    EXPECT_EQ(namesIn(m_folder.path()), Names{"old"});
    EXPECT_EQ(m_folder.read("old"), "2");
    EXPECT_EQ(resulting, m_folder.url("old"));
    EXPECT_FALSE(m_error);
}

TEST_F(FileSystem, AFolderReplacesAFolderThatIsNotEmpty) {
    m_folder.write("old/a", "1");
    m_folder.write("new/b", "2");

    EXPECT_TRUE(m_service->replaceItem(m_folder.url("old"), m_folder.url("new"),
                                       ReplaceOptions::NewMetadataOnly));

    EXPECT_EQ(namesIn(m_folder.path()), Names{"old"});
    EXPECT_EQ(namesIn(m_folder.path() / "old"), Names{"b"});
}

TEST_F(FileSystem, AFolderReplacesAFileAndAFileAFolder) {
    m_folder.write("file", "1");
    m_folder.write("folder/b", "2");

    EXPECT_TRUE(m_service->replaceItem(m_folder.url("file"), m_folder.url("folder"),
                                       ReplaceOptions::NewMetadataOnly));
    EXPECT_EQ(m_folder.read("file/b"), "2");

    m_folder.write("again", "3");
    EXPECT_TRUE(m_service->replaceItem(m_folder.url("file"), m_folder.url("again"),
                                       ReplaceOptions::NewMetadataOnly));
    EXPECT_EQ(m_folder.read("file"), "3");
    EXPECT_EQ(namesIn(m_folder.path()), Names{"file"});
}

TEST_F(FileSystem, AReplacementOfNothingIsAMove) {
    m_folder.write("new", "2");
    std::optional<URL> resulting;

    EXPECT_TRUE(m_service->replaceItem(m_folder.url("old"), m_folder.url("new"),
                                       ReplaceOptions::Default, &resulting));

    EXPECT_EQ(namesIn(m_folder.path()), Names{"old"});
    EXPECT_EQ(resulting, m_folder.url("old"));
}

TEST_F(FileSystem, AMissingReplacementLeavesTheExistingItem) {
    m_folder.write("old", "1");

    EXPECT_FALSE(m_service->replaceItem(m_folder.url("old"), m_folder.url("new"),
                                        ReplaceOptions::Default, nullptr, &m_error));

    EXPECT_EQ(m_error, generalError(PVFileErrorCode::NoSuchFile, m_folder.url("new")));
    EXPECT_EQ(m_folder.read("old"), "1");
}

TEST_F(FileSystem, AnItemReplacedByItselfStays) {
    m_folder.write("old", "1");

    EXPECT_TRUE(
        m_service->replaceItem(m_folder.url("old"), m_folder.url("old"), ReplaceOptions::Default));

    EXPECT_EQ(m_folder.read("old"), "1");
}

TEST_F(FileSystem, AFolderAndWhatLiesInItDontReplaceEachOther) {
    m_folder.write("a.epub/b.epub", "1");

    EXPECT_FALSE(m_service->replaceItem(m_folder.url("a.epub"), m_folder.url("a.epub/b.epub"),
                                        ReplaceOptions::Default, nullptr, &m_error));
    EXPECT_EQ(m_error, makePOSIXError(EINVAL, m_folder.url("a.epub")));
    EXPECT_FALSE(m_service->replaceItem(m_folder.url("a.epub/b.epub"), m_folder.url("a.epub"),
                                        ReplaceOptions::Default, nullptr, &m_error));

    EXPECT_EQ(m_error, makePOSIXError(EINVAL, m_folder.url("a.epub/b.epub")));
    EXPECT_EQ(m_folder.read("a.epub/b.epub"), "1");
}

TEST_F(FileSystem, ALinkDoesNotReplaceWhatItLeadsTo) {
    m_folder.write("a.epub", "book");
    m_folder.write("b.epub/OPS/x", "x");
    fs::create_symlink("a.epub", m_folder / "toFile");
    fs::create_symlink("b.epub/OPS", m_folder / "intoFolder");
    const auto isReplaced = [&](const char* existing, const char* link) {
        return m_service->replaceItem(m_folder.url(existing), m_folder.url(link),
                                      ReplaceOptions::NewMetadataOnly, nullptr, &m_error);
    };

    EXPECT_FALSE(isReplaced("a.epub", "toFile"));
    EXPECT_EQ(m_error, makePOSIXError(EINVAL, m_folder.url("a.epub")));
    EXPECT_FALSE(isReplaced("b.epub", "intoFolder"));
    EXPECT_EQ(m_error, makePOSIXError(EINVAL, m_folder.url("b.epub")));

    EXPECT_EQ(m_folder.read("a.epub"), "book");
    EXPECT_EQ(m_folder.read("b.epub/OPS/x"), "x");
    EXPECT_EQ(namesIn(m_folder.path()), (Names{"a.epub", "b.epub", "intoFolder", "toFile"}));
}

TEST_F(FileSystem, ALinkReplacesAnotherLinkToTheSameItem) {
    m_folder.write("a.epub", "book");
    fs::create_symlink("a.epub", m_folder / "old");
    fs::create_symlink("./a.epub", m_folder / "new");

    EXPECT_TRUE(m_service->replaceItem(m_folder.url("old"), m_folder.url("new"),
                                       ReplaceOptions::NewMetadataOnly));

    EXPECT_EQ(fs::read_symlink(m_folder / "old"), "./a.epub");
    EXPECT_EQ(namesIn(m_folder.path()), (Names{"a.epub", "old"}));
}

TEST_F(FileSystem, AnotherNameOfTheSameFileGoesWhenItReplaces) {
    m_folder.write("old", "1");
    fs::create_hard_link(m_folder / "old", m_folder / "new");

    EXPECT_TRUE(
        m_service->replaceItem(m_folder.url("old"), m_folder.url("new"), ReplaceOptions::Default));

    EXPECT_EQ(namesIn(m_folder.path()), Names{"old"});
    EXPECT_EQ(m_folder.read("old"), "1");
}

TEST_F(FileSystem, TheDefaultReplacementKeepsTheOldModeAndTheAttributesThatTheNewItemLacks) {
    const std::string old = m_folder.write("old", "1");
    const std::string replacement = m_folder.write("new", "2");
    setAttribute(old, "user.kept", "old");
    setAttribute(old, "user.title", "old title");
    setAttribute(replacement, "user.title", "new title");
    fs::permissions(old, fs::perms{0640});

    EXPECT_TRUE(
        m_service->replaceItem(m_folder.url("old"), m_folder.url("new"), ReplaceOptions::Default));

    EXPECT_EQ(attribute(old, "user.kept"), "old");
    EXPECT_EQ(attribute(old, "user.title"), "new title");
    EXPECT_EQ(fs::status(old).permissions(), fs::perms{0640});
}

TEST_F(FileSystem, AReplacementOfNewMetadataOnlyKeepsNothingOfTheOldItem) {
    const std::string old = m_folder.write("old", "1");
    const std::string replacement = m_folder.write("new", "2");
    setAttribute(old, "user.kept", "old");
    fs::permissions(old, fs::perms{0640});
    fs::permissions(replacement, fs::perms{0600});

    EXPECT_TRUE(m_service->replaceItem(m_folder.url("old"), m_folder.url("new"),
                                       ReplaceOptions::NewMetadataOnly));

    EXPECT_EQ(attribute(old, "user.kept"), "(none)");
    EXPECT_EQ(fs::status(old).permissions(), fs::perms{0600});
}

TEST_F(FileSystem, ACopyKeepsDataAttributesModeAndTime) {
    const std::string source = m_folder.write("a.epub/OPS/x", "content");
    setAttribute(source, "user.t", "v");
    fs::permissions(source, fs::perms{0640});
    const auto time = fs::file_time_type::clock::now() - std::chrono::hours(1000);
    fs::last_write_time(source, time);
    fs::create_symlink("OPS/x", m_folder / "a.epub/link");

    EXPECT_TRUE(m_service->copyItem(m_folder.url("a.epub"), m_folder.url("b.epub"), &m_error));

    const std::string copy = m_folder / "b.epub/OPS/x";
    EXPECT_EQ(m_folder.read("b.epub/OPS/x"), "content");
    EXPECT_EQ(attribute(copy, "user.t"), "v");
    EXPECT_EQ(fs::status(copy).permissions(), fs::perms{0640});
    EXPECT_EQ(fs::last_write_time(copy), time);
    EXPECT_EQ(fs::read_symlink(m_folder / "b.epub/link"), "OPS/x");
    EXPECT_EQ(namesIn(m_folder.path()), (Names{"a.epub", "b.epub"}));
}

TEST_F(FileSystem, ACopyOntoATakenNameFails) {
    m_folder.write("a", "1");
    m_folder.write("b", "2");

    EXPECT_FALSE(m_service->copyItem(m_folder.url("a"), m_folder.url("b"), &m_error));

    EXPECT_EQ(m_error, generalError(PVFileErrorCode::FileExists, m_folder.url("b")));
    EXPECT_EQ(m_folder.read("b"), "2");
}

TEST_F(FileSystem, ACopyOfAPipeIsRefusedAndLeavesNothing) {
    fs::create_directory(m_folder / "a");
    ASSERT_EQ(mkfifo((m_folder / "a/pipe").c_str(), 0600), 0);

    EXPECT_FALSE(m_service->copyItem(m_folder.url("a"), m_folder.url("b"), &m_error));

    EXPECT_EQ(m_error, makePOSIXError(EOPNOTSUPP, m_folder.url("b")));
    EXPECT_EQ(namesIn(m_folder.path()), Names{"a"});
}

TEST_F(FileSystem, AFolderIsNotCopiedIntoItself) {
    m_folder.write("a/b/x", "1");

    EXPECT_FALSE(m_service->copyItem(m_folder.url("a"), m_folder.url("a/b/copy"), &m_error));

    EXPECT_EQ(m_error, makePOSIXError(EINVAL, m_folder.url("a/b/copy")));
    EXPECT_EQ(namesIn(m_folder.path() / "a/b"), Names{"x"});
}

TEST_F(FileSystem, ACopyDropsSetIdBits) {
    const std::string source = m_folder.write("a", "1");
    ASSERT_EQ(chmod(source.c_str(), 06755), 0);

    EXPECT_TRUE(m_service->copyItem(m_folder.url("a"), m_folder.url("b")));

    EXPECT_EQ(fs::status(m_folder / "b").permissions(), fs::perms{0755});
}

TEST_F(FileSystem, AStagingFolderThatNobodyHoldsIsClearedByTheNextOperation) {
    m_folder.write(".parvel-stage-left/item/x", "1");
    m_folder.write("a", "1");

    EXPECT_TRUE(m_service->copyItem(m_folder.url("a"), m_folder.url("b")));

    EXPECT_EQ(namesIn(m_folder.path()), (Names{"a", "b"}));
}

TEST_F(FileSystem, ManyCompetitorsForOneNameLeaveOneWinnerAndTheOthersWhole) {
    constexpr int competitors = 8;
    for (std::size_t round = 0; round < testRounds(20); ++round) {
        const std::string target = "won-" + std::to_string(round);
        std::vector<std::thread> threads;
        std::atomic<int> winners{0};
        for (int i = 0; i < competitors; ++i)
            m_folder.write("from-" + std::to_string(i), std::to_string(i));
        for (int i = 0; i < competitors; ++i) {
            threads.emplace_back([&, i] {
                if (m_service->moveItem(m_folder.url("from-" + std::to_string(i)),
                                        m_folder.url(target)))
                    ++winners;
            });
        }
        for (std::thread& thread : threads)
            thread.join();
        EXPECT_EQ(winners, 1);
        EXPECT_EQ(namesIn(m_folder.path()).size(), competitors + round);
    }
}

TEST_F(FileSystem, AForwardingServicePassesEveryOperationOn) {
    ForwardingFileSystemService service(m_service);
    m_folder.write("a", "1");
    std::optional<URL> resulting;

    EXPECT_TRUE(service.itemExistsAtPath(m_folder / "a"));
    EXPECT_TRUE(service.copyItem(m_folder.url("a"), m_folder.url("b"), nullptr));
    EXPECT_TRUE(service.moveItem(m_folder.url("a"), m_folder.url("c"), nullptr));
    EXPECT_TRUE(service.replaceItem(m_folder.url("c"), m_folder.url("b"), ReplaceOptions::Default,
                                    &resulting, nullptr));
    EXPECT_EQ(resulting, m_folder.url("c"));
    EXPECT_TRUE(service.removeItem(m_folder.url("c"), nullptr));
    EXPECT_FALSE(service.trashItem(m_folder.url("c"), &resulting, &m_error));
    EXPECT_EQ(m_error, generalError(PVFileErrorCode::NoSuchFile, m_folder.url("c")));
}

}  // namespace
}  // namespace parvel::testing
