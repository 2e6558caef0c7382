#include <fstream>
#include <utility>

#include <gtest/gtest.h>

#include "tests/support/RecordedLog.h"
#include "tests/support/RecordingFileSystem.h"
#include "tests/support/RefusingServices.h"
#include "tests/support/RepeatedText.h"
#include "tests/support/ScriptedCoordinator.h"
#include "tests/support/SynchronisedFolder.h"
#include "tests/support/TranslatingLocaliser.h"

namespace parvel::testing {
namespace {

using Lines = std::vector<std::string>;

class MovingInAndOut : public SynchronisedFolder {
protected:
    AssetPtr setUbiquitous(bool ubiquitous, const AssetPtr& moved, const URL& directory,
                           bool replace = false) {
        return m_manager->setUbiquitous_asset_intoDirectory_replace_error(
            ubiquitous, moved, directory, replace, &m_error);
    }
    /// Of a replacement: no result, the error as it was, no line.
    void expectNoReport(const AssetPtr& book) {
        m_error = makeNoIdentityError();
        RecordedLog log;

        EXPECT_FALSE(setUbiquitous(true, book, cloud(), /*replace=*/true));

        EXPECT_EQ(m_error, makeNoIdentityError());
        EXPECT_EQ(log.lines(), Lines{});
    }
    std::shared_ptr<RecordingFileSystem> recordCalls() {
        auto service = std::make_shared<RecordingFileSystem>();
        m_manager->setFileManager(service);
        return service;
    }
    std::shared_ptr<ScriptedCoordinator> scriptCoordinator() {
        auto coordinator = std::make_shared<ScriptedCoordinator>();
        m_manager->setFileCoordinator(coordinator);
        return coordinator;
    }
};

/// Takes the name in the synchronised folder between the test and the move, once.
class CompetingCloudService : public ForwardingFileSystemService {
public:
    CompetingCloudService() : ForwardingFileSystemService(FileSystemService::makeDefault()) {}
    bool setUbiquitous(bool ubiquitous, const URL& source, const URL& destination,
                       ErrorOut error) override {
        if (!std::exchange(m_hasCompeted, true))
            std::ofstream(destination.path()) << "competitor";
        return ForwardingFileSystemService::setUbiquitous(ubiquitous, source, destination, error);
    }

private:
    bool m_hasCompeted = false;
};

TEST_F(MovingInAndOut, ACompetitorThatTookTheNameSendsTheCountOn) {
    m_manager->setFileManager(std::make_shared<CompetingCloudService>());

    const AssetPtr moved = setUbiquitous(true, asset("Guide.epub", "mine"), cloud());

    ASSERT_TRUE(moved);
    EXPECT_FALSE(m_error);
    EXPECT_EQ(booksInCloud(), (Names{"Guide 1.epub", "Guide.epub"}));
    EXPECT_EQ(m_folder.read("cloud/Guide.epub"), "competitor");
    EXPECT_EQ(m_folder.read("cloud/Guide 1.epub"), "mine");
}

TEST_F(MovingInAndOut, ABookGoesInUnderItsSanitisedTitle) {
    const auto book = asset("a.epub");
    book->setTitle("My: Book?");

    const AssetPtr moved = setUbiquitous(true, book, cloud());

    ASSERT_TRUE(moved);
    EXPECT_EQ(moved->url(), inCloud("My Book.epub"));
    EXPECT_EQ(booksInCloud(), Names{"My Book.epub"});
    EXPECT_FALSE(m_error);
}

TEST_F(MovingInAndOut, ABookWhoseNameIsTakenIsCountedUp) {
    m_folder.write("cloud/Book.epub", "2");

    EXPECT_TRUE(setUbiquitous(true, asset("Book.epub"), cloud()));

    EXPECT_EQ(booksInCloud(), (Names{"Book 1.epub", "Book.epub"}));
}

TEST_F(MovingInAndOut, ABookComesOutAgain) {
    EXPECT_TRUE(setUbiquitous(false, asset("cloud/Book.epub"), makeFolder("local")));

    EXPECT_EQ(booksInCloud(), Names{});
    EXPECT_EQ(names("local"), Names{"Book.epub"});
}

TEST_F(MovingInAndOut, AFolderThatNobodySynchronisesTakesNoBookIn) {
    const URL local = makeFolder("local");

    EXPECT_FALSE(setUbiquitous(true, asset("a.epub"), local));

    EXPECT_EQ(m_error, makePOSIXError(ENOTSUP, m_folder.url("local/a.epub")));
    EXPECT_EQ(names("local"), Names{});
}

TEST_F(MovingInAndOut, ABookThatIsNotDownloadedDoesNotComeOut) {
    m_folder.write("cloud/Book.epub.nextcloud", " ");
    const auto book = PVAssetMetadata::metadataWithURL_dictionary(inCloud("Book.epub"), nullptr);

    EXPECT_FALSE(setUbiquitous(false, book, makeFolder("local")));

    EXPECT_EQ(m_error, makePOSIXError(ETIMEDOUT, inCloud("Book.epub")));
    EXPECT_EQ(booksInCloud(), Names{"Book.epub.nextcloud"});
}

TEST_F(MovingInAndOut, AnOverlongNameIsCutToFitTheDisk) {
    const auto book = asset("a.epub");
    book->setTitle(repeatedText("漢", 300));

    EXPECT_TRUE(setUbiquitous(true, book, cloud()));
    EXPECT_EQ(booksInCloud()[0].size(), 248U);
}

TEST_F(MovingInAndOut, AnEmptyNameIsNoneAndLeavesTheError) {
    const TranslatingLocaliser localiser("DEFAULT_UBIQUITY_FILENAME=unknown", "");
    const auto service = recordCalls();
    m_error = makeNoIdentityError();
    const auto nameless = asset("!!!");
    for (const bool replace : {false, true}) {
        RecordedLog log;

        EXPECT_FALSE(setUbiquitous(true, nameless, cloud(), replace));

        EXPECT_EQ(m_error, makeNoIdentityError());
        EXPECT_EQ(log.lines(), Lines{});
    }
    EXPECT_EQ(service->calls, Lines{});
}

TEST_F(MovingInAndOut, TheGivenServiceMovesWithoutCoordinationAndWithTheGivenFlag) {
    for (const bool ubiquitous : {true, false}) {
        const auto service = recordCalls();
        const auto coordinator = scriptCoordinator();

        EXPECT_TRUE(setUbiquitous(ubiquitous, asset("a.epub"), cloud()));

        const std::string target = inCloud(ubiquitous ? "a.epub" : "a 1.epub").path();
        EXPECT_EQ(service->calls.back(),
                  (ubiquitous ? "in " : "out ") + (m_folder / "a.epub") + " to " + target);
        EXPECT_EQ(coordinator->calls.size(), 0U);
    }
}

TEST_F(MovingInAndOut, ASuccessLeavesTheErrorAsItWasAndIsNotLogged) {
    m_error = makeNoIdentityError();
    const auto book = asset("a.epub");
    RecordedLog log;

    EXPECT_TRUE(setUbiquitous(true, book, cloud()));

    EXPECT_EQ(m_error, makeNoIdentityError());
    EXPECT_EQ(log.lines(), Lines{});
}

TEST_F(MovingInAndOut, AFailedMoveIsNotLoggedAndNobodyNeedsToAskForItsError) {
    const auto book = asset("a.epub");
    RecordedLog log;

    EXPECT_FALSE(m_manager->setUbiquitous_asset_intoDirectory_replace_error(
        true, book, makeFolder("local"), /*replace=*/false, nullptr));

    EXPECT_EQ(log.lines(), Lines{});
    EXPECT_EQ(m_folder.read("a.epub"), "content");
}

TEST_F(MovingInAndOut, NoRecordIsRefusedWithItsReason) {
    RecordedLog log;

    EXPECT_FALSE(setUbiquitous(true, nullptr, cloud()));

    EXPECT_EQ(m_error, makeCorruptAssetError("PVAssetMetadata is nil"));
    EXPECT_EQ(log.lines(), Lines{"error setUbiquitous: Failed to migrate asset: (null) error: " +
                                 logText(*m_error)});
}

TEST_F(MovingInAndOut, ARecordWithoutURLIsRefusedAsUnknown) {
    const Dictionary dictionary{{"itemName", "Title"}, {"PVDisplayName", "Name"}};
    const auto book = PVAssetMetadata::metadataWithURL_dictionary(std::nullopt, &dictionary);
    RecordedLog log;

    EXPECT_FALSE(setUbiquitous(true, book, cloud()));

    EXPECT_EQ(m_error, makeCorruptAssetError("Unknown"));
    EXPECT_EQ(log.lines(), Lines{"error setUbiquitous: Failed to migrate asset: Title error: " +
                                 logText(*m_error)});
}

TEST_F(MovingInAndOut, WithoutAPlaceForTheErrorARefusalLogsNone) {
    RecordedLog log;

    EXPECT_FALSE(m_manager->setUbiquitous_asset_intoDirectory_replace_error(
        true, nullptr, cloud(), /*replace=*/false, nullptr));

    EXPECT_EQ(log.lines(),
              Lines{"error setUbiquitous: Failed to migrate asset: (null) error: (null)"});
}

TEST_F(MovingInAndOut, AReplacementReportsNothingAlsoWhenItSucceeds) {
    m_folder.write("cloud/Book.epub", "old");
    RecordedLog log;

    EXPECT_FALSE(setUbiquitous(true, asset("Book.epub", "new"), cloud(), /*replace=*/true));

    EXPECT_FALSE(m_error);
    EXPECT_EQ(m_folder.read("cloud/Book.epub"), "new");
    EXPECT_EQ(names(), Names{"cloud"});
    EXPECT_EQ(log.lines(), Lines{});
}

TEST_F(MovingInAndOut, AReplacementKeepsWhatTheNewVersionLacks) {
    const auto old = asset("cloud/Book.epub", "old");
    old->setGeneratedID("ID");
    ASSERT_TRUE(m_manager->setExtendedAttributesForAsset_error(old));

    setUbiquitous(true, asset("Book.epub", "new"), cloud(), /*replace=*/true);

    EXPECT_EQ(m_manager->extendedAttributesForAsset_error(old)->size(), 1U);
}

TEST_F(MovingInAndOut, AReplacementOfNothingMovesTheAssetIn) {
    EXPECT_FALSE(setUbiquitous(true, asset("Book.epub", "new"), cloud(), /*replace=*/true));

    EXPECT_EQ(m_folder.read("cloud/Book.epub"), "new");
    EXPECT_EQ(names(), Names{"cloud"});
}

TEST_F(MovingInAndOut, AReplacementIsCoordinatedOnTheTarget) {
    const auto service = recordCalls();
    const auto coordinator = scriptCoordinator();
    const auto book = asset("a.epub");
    book->setTitle("My: Book");

    EXPECT_FALSE(setUbiquitous(true, book, cloud(), /*replace=*/true));

    EXPECT_EQ(coordinator->calls, (std::vector<ScriptedCoordinator::Call>{
                                      {inCloud("My Book.epub"), WritingIntent::ForReplacing}}));
    EXPECT_EQ(service->calls, Lines{"replace " + inCloud("My Book.epub").path() + " by " +
                                    (m_folder / "a.epub") + " options 0"});
}

TEST_F(MovingInAndOut, AReplacementTakesThePlaceThatTheCoordinatorTells) {
    m_folder.write("cloud/Moved.epub", "old");
    const auto coordinator = scriptCoordinator();
    coordinator->handed[1] = inCloud("Moved.epub");

    EXPECT_FALSE(setUbiquitous(true, asset("Book.epub", "new"), cloud(), /*replace=*/true));

    EXPECT_EQ(booksInCloud(), Names{"Moved.epub"});
    EXPECT_EQ(m_folder.read("cloud/Moved.epub"), "new");
}

TEST_F(MovingInAndOut, AReplacementWithoutAPlaceDoesAndReportsNothing) {
    const auto service = recordCalls();
    const auto coordinator = scriptCoordinator();
    coordinator->handed[1] = std::nullopt;

    expectNoReport(asset("Book.epub"));

    EXPECT_EQ(service->calls, Lines{});
}

TEST_F(MovingInAndOut, ACoordinationThatFailsIsNotReported) {
    const auto coordinator = scriptCoordinator();
    coordinator->refusedCall = 1;

    expectNoReport(asset("Book.epub"));

    EXPECT_EQ(booksInCloud(), Names{});
}

TEST_F(MovingInAndOut, AReplacementThatFailsIsNotReported) {
    m_manager->setFileManager(
        std::make_shared<RefusingFileSystem>([](auto, const URL&) { return true; }));

    expectNoReport(asset("Book.epub"));

    EXPECT_EQ(m_folder.read("Book.epub"), "content");
}

}  // namespace
}  // namespace parvel::testing
