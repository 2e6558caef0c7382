#include <gtest/gtest.h>

#include "tests/support/RecordedLog.h"
#include "tests/support/RecordingFileSystem.h"
#include "tests/support/Records.h"
#include "tests/support/RepeatedText.h"
#include "tests/support/ScriptedCoordinator.h"
#include "tests/support/SynchronisedFolder.h"

namespace parvel::testing {
namespace {

using Lines = std::vector<std::string>;

class ReplacingInCloud : public SynchronisedFolder {
protected:
    AssetPtr replace(const AssetPtr& asset, const AssetPtr& newVersion) {
        return m_manager->replaceUbiquitousAsset_withAsset_error(asset, newVersion, &m_error);
    }
};

TEST_F(ReplacingInCloud, ANewVersionTakesThePlaceAndItsOwnName) {
    const auto old = asset("cloud/Old Title.epub", "old");
    const auto newVersion = asset("new.epub", "new");
    newVersion->setTitle("New Title");
    m_error = makeNoIdentityError();

    const AssetPtr replaced = replace(old, newVersion);

    ASSERT_TRUE(replaced);
    EXPECT_EQ(replaced->url(), inCloud("New Title.epub"));
    EXPECT_EQ(replaced->title(), "New Title");
    EXPECT_FALSE(m_error);
    EXPECT_EQ(booksInCloud(), Names{"New Title.epub"});
    EXPECT_EQ(m_folder.read("cloud/New Title.epub"), "new");
}

TEST_F(ReplacingInCloud, ANewVersionOfTheSameNameStaysWhereItIs) {
    const auto old = asset("cloud/Book.epub", "old");
    const auto newVersion = asset("Book.epub", "new");

    const AssetPtr replaced = replace(old, newVersion);

    ASSERT_TRUE(replaced);
    EXPECT_EQ(replaced->url(), inCloud("Book.epub"));
    EXPECT_EQ(booksInCloud(), Names{"Book.epub"});
}

TEST_F(ReplacingInCloud, AReplacedVersionWhoseNewNameIsTakenStaysUnderTheOldOne) {
    const auto old = asset("cloud/Old.epub", "old");
    m_folder.write("cloud/New.epub", "other");
    const auto newVersion = asset("New.epub", "new");

    EXPECT_FALSE(replace(old, newVersion));

    EXPECT_EQ(m_error, makeFileError(PVFileErrorCode::FileExists, inCloud("New.epub")));
    EXPECT_EQ(m_folder.read("cloud/Old.epub"), "new");
    EXPECT_EQ(m_folder.read("cloud/New.epub"), "other");
}

TEST_F(ReplacingInCloud, AFailedReplacementLeavesBothAndSaysWhy) {
    const auto old = asset("cloud/Book.epub", "old");
    const auto gone =
        PVAssetMetadata::metadataWithURL_dictionary(m_folder.url("gone.epub"), nullptr);

    EXPECT_FALSE(replace(old, gone));

    EXPECT_EQ(m_error, makeFileError(PVFileErrorCode::NoSuchFile, m_folder.url("gone.epub")));
    EXPECT_EQ(m_folder.read("cloud/Book.epub"), "old");
}

TEST_F(ReplacingInCloud, NobodyNeedsToAskForTheError) {
    const auto old = asset("cloud/Book.epub", "old");
    const auto gone =
        PVAssetMetadata::metadataWithURL_dictionary(m_folder.url("gone.epub"), nullptr);

    EXPECT_TRUE(m_manager->replaceUbiquitousAsset_withAsset_error(old, asset("Book.epub", "new")));
    EXPECT_EQ(m_folder.read("cloud/Book.epub"), "new");
    EXPECT_FALSE(m_manager->replaceUbiquitousAsset_withAsset_error(old, gone));
    EXPECT_EQ(m_folder.read("cloud/Book.epub"), "new");
}

TEST_F(ReplacingInCloud, AnOverlongNameIsCutToFitTheDisk) {
    const auto newVersion = asset("new.epub");
    newVersion->setTitle(repeatedText("漢", 300));

    EXPECT_TRUE(replace(asset("cloud/Book.epub"), newVersion));

    EXPECT_EQ(booksInCloud()[0].size(), 248U);
}

using Calls = std::vector<ScriptedCoordinator::Call>;

class CoordinatedReplacement : public ReplacingInCloud {
protected:
    CoordinatedReplacement() { m_manager->setFileCoordinator(m_coordinator); }

    std::shared_ptr<ScriptedCoordinator> m_coordinator = std::make_shared<ScriptedCoordinator>();
};

TEST_F(CoordinatedReplacement, BothStepsOfAReplacementAreCoordinatedOnTheSynchronisedAsset) {
    const auto old = asset("cloud/Old.epub", "old");

    EXPECT_TRUE(replace(old, asset("New.epub")));

    EXPECT_EQ(m_coordinator->calls, (Calls{{*old->url(), WritingIntent::ForReplacing},
                                           {*old->url(), WritingIntent::ForMoving}}));
}

TEST_F(CoordinatedReplacement, ACoordinatorWithoutURLFailsTheReplacement) {
    m_coordinator->handed[1] = std::nullopt;
    const auto old = asset("cloud/Old.epub", "old");
    RecordedLog log;

    EXPECT_FALSE(replace(old, asset("New.epub")));

    EXPECT_EQ(m_error, makeMissingURLError());
    EXPECT_EQ(log.lines(),
              Lines{"error replaceUbiquitousAsset: Failed due to nil newURL provided."});
    EXPECT_EQ(m_coordinator->calls.size(), 1U);
    EXPECT_EQ(m_folder.read("cloud/Old.epub"), "old");
}

TEST_F(CoordinatedReplacement, ANameThatStaysNeedsOneStep) {
    const auto old = asset("cloud/Book.epub", "old");

    EXPECT_TRUE(replace(old, asset("Book.epub", "new")));

    EXPECT_EQ(m_coordinator->calls, (Calls{{*old->url(), WritingIntent::ForReplacing}}));
    EXPECT_TRUE(m_coordinator->moves.empty());
}

TEST_F(CoordinatedReplacement, TheSecondStepTellsTheNewPlace) {
    const auto old = asset("cloud/Old.epub", "old");

    EXPECT_TRUE(replace(old, asset("New.epub")));

    EXPECT_EQ(m_coordinator->moves,
              (std::vector<std::pair<URL, URL>>{{*old->url(), inCloud("New.epub")}}));
}

TEST_F(CoordinatedReplacement, TheGivenServiceReplacesAndMoves) {
    const auto service = std::make_shared<RecordingFileSystem>();
    m_manager->setFileManager(service);

    EXPECT_TRUE(replace(asset("cloud/Old.epub"), asset("New.epub")));

    EXPECT_EQ(service->calls,
              (Lines{"replace " + inCloud("Old.epub").path() + " by " + (m_folder / "New.epub") +
                         " options 0 asking for the place",
                     "move " + inCloud("Old.epub").path() + " to " + inCloud("New.epub").path()}));
}

TEST_F(CoordinatedReplacement, WhatNamesNoItemFailsBeforeAnyStep) {
    const auto book = asset("cloud/Book.epub");
    RecordedLog log;

    for (const AssetPtr& missing : {AssetPtr(), AssetPtr(emptyRecord())}) {
        m_error.reset();
        EXPECT_FALSE(replace(missing, book));
        EXPECT_EQ(m_error, makeMissingURLError());

        m_error.reset();
        EXPECT_FALSE(replace(book, missing));
        EXPECT_EQ(m_error, makeMissingURLError());
    }
    EXPECT_TRUE(m_coordinator->calls.empty());
    EXPECT_EQ(log.lines(), Lines{});
    EXPECT_EQ(booksInCloud(), Names{"Book.epub"});
}

TEST_F(CoordinatedReplacement, ThePlaceThatTheCoordinatorTellsIsReplacedAndLeftForTheName) {
    m_folder.write("cloud/Moved.epub", "old");
    m_coordinator->handed[1] = inCloud("Moved.epub");
    const auto old = PVAssetMetadata::metadataWithURL_dictionary(inCloud("Book.epub"), nullptr);

    const AssetPtr replaced = replace(old, asset("Book.epub", "new"));

    ASSERT_TRUE(replaced);
    EXPECT_EQ(replaced->url(), inCloud("Book.epub"));
    EXPECT_EQ(booksInCloud(), Names{"Book.epub"});
    EXPECT_EQ(m_folder.read("cloud/Book.epub"), "new");
}

TEST_F(CoordinatedReplacement, TheSecondStepDoesNotAskForThePlaceAgain) {
    m_coordinator->handed[2] = std::nullopt;

    EXPECT_TRUE(replace(asset("cloud/Old.epub"), asset("New.epub")));

    EXPECT_EQ(booksInCloud(), Names{"New.epub"});
}

/// Puts a replacement somewhere else than asked, and tells where.
class RelocatingService : public ForwardingFileSystemService {
public:
    explicit RelocatingService(URL place)
        : ForwardingFileSystemService(FileSystemService::makeDefault()),
          m_place(std::move(place)) {}
    bool replaceItem(const URL& existing, const URL& replacement, ReplaceOptions options,
                     std::optional<URL>* resulting, ErrorOut error) override {
        *resulting = m_place;
        return ForwardingFileSystemService::replaceItem(existing, replacement, options, nullptr,
                                                        error) &&
               ForwardingFileSystemService::moveItem(existing, m_place, error);
    }

private:
    URL m_place;
};

TEST_F(CoordinatedReplacement, TheResultingPlaceIsWhatIsMovedToTheName) {
    m_manager->setFileManager(std::make_shared<RelocatingService>(inCloud("Other.epub")));

    const AssetPtr replaced = replace(asset("cloud/Book.epub", "old"), asset("Book.epub", "new"));

    ASSERT_TRUE(replaced);
    EXPECT_EQ(replaced->url(), inCloud("Book.epub"));
    EXPECT_EQ(booksInCloud(), Names{"Book.epub"});
    EXPECT_EQ(m_coordinator->calls.size(), 2U);
}

TEST_F(CoordinatedReplacement, AResultingPlaceThatIsTheNameNeedsOneStep) {
    m_manager->setFileManager(std::make_shared<RelocatingService>(inCloud("New.epub")));

    EXPECT_TRUE(replace(asset("cloud/Old.epub", "old"), asset("New.epub", "new")));

    EXPECT_EQ(booksInCloud(), Names{"New.epub"});
    EXPECT_EQ(m_coordinator->calls.size(), 1U);
}

TEST_F(CoordinatedReplacement, AFirstStepThatIsRefusedIsTheErrorAndTouchesNothing) {
    m_coordinator->refusedCall = 1;
    const auto old = asset("cloud/Old.epub", "old");

    EXPECT_FALSE(replace(old, asset("New.epub", "new")));

    EXPECT_EQ(m_error, makePOSIXError(EDEADLK, *old->url()));
    EXPECT_EQ(m_folder.read("cloud/Old.epub"), "old");
    EXPECT_EQ(m_coordinator->calls.size(), 1U);
}

TEST_F(CoordinatedReplacement, ASecondStepThatIsRefusedLeavesTheNewVersionInTheOldPlace) {
    m_coordinator->refusedCall = 2;
    const auto old = asset("cloud/Old.epub", "old");

    EXPECT_FALSE(replace(old, asset("New.epub", "new")));

    EXPECT_EQ(m_error, makePOSIXError(EDEADLK, *old->url()));
    EXPECT_EQ(booksInCloud(), Names{"Old.epub"});
    EXPECT_EQ(m_folder.read("cloud/Old.epub"), "new");
}

TEST_F(CoordinatedReplacement, ACoordinationErrorDoesNotHideTheReplacementsOwn) {
    m_coordinator->failingCall = 1;
    const auto gone =
        PVAssetMetadata::metadataWithURL_dictionary(m_folder.url("gone.epub"), nullptr);

    EXPECT_FALSE(replace(asset("cloud/Old.epub"), gone));

    EXPECT_EQ(m_error, makeFileError(PVFileErrorCode::NoSuchFile, m_folder.url("gone.epub")));
}

TEST_F(CoordinatedReplacement, ACoordinationErrorBehindAGoodReplacementEndsTheCall) {
    m_coordinator->failingCall = 1;
    const auto old = asset("cloud/Old.epub", "old");

    EXPECT_FALSE(replace(old, asset("New.epub", "new")));

    EXPECT_EQ(m_error, makePOSIXError(EDEADLK, *old->url()));
    EXPECT_EQ(m_folder.read("cloud/Old.epub"), "new");
    EXPECT_EQ(m_coordinator->calls.size(), 1U);
}

}  // namespace
}  // namespace parvel::testing
