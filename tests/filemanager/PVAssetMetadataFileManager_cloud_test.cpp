#include <fstream>
#include <utility>

#include <gtest/gtest.h>

#include "tests/support/ManagedFolder.h"
#include "tests/support/RecordedLog.h"

namespace parvel::testing {
namespace {

using Lines = std::vector<std::string>;

/// A folder that a client synchronises, by its mark on disk.
class SynchronisedFolder : public ManagedFolder {
protected:
    void SetUp() override {
        setenv("XDG_RUNTIME_DIR", m_locks.path().c_str(), 1);
        makeFolder("cloud/.stfolder");
    }
    void TearDown() override { unsetenv("XDG_RUNTIME_DIR"); }

    AssetPtr setUbiquitous(bool ubiquitous, const AssetPtr& moved, const URL& directory,
                           bool replace = false) {
        return m_manager->setUbiquitous_asset_intoDirectory_replace_error(
            ubiquitous, moved, directory, replace, &m_error);
    }
    [[nodiscard]] URL cloud() const { return m_folder.url("cloud"); }
    [[nodiscard]] Names booksInCloud() const {
        Names all = names("cloud");
        std::erase(all, ".stfolder");
        return all;
    }

    TemporaryDirectory m_locks;
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

TEST_F(SynchronisedFolder, ACompetitorThatTookTheNameSendsTheCountOn) {
    m_manager->setFileManager(std::make_shared<CompetingCloudService>());

    const AssetPtr moved = setUbiquitous(true, asset("Guide.epub", "mine"), cloud());

    ASSERT_TRUE(moved);
    EXPECT_FALSE(m_error);
    EXPECT_EQ(booksInCloud(), (Names{"Guide 1.epub", "Guide.epub"}));
    EXPECT_EQ(m_folder.read("cloud/Guide.epub"), "competitor");
    EXPECT_EQ(m_folder.read("cloud/Guide 1.epub"), "mine");
}

TEST_F(SynchronisedFolder, ABookGoesInUnderItsSanitisedTitle) {
    const auto book = asset("a.epub");
    book->setTitle("My: Book?");

    const AssetPtr moved = setUbiquitous(true, book, cloud());

    ASSERT_TRUE(moved);
    EXPECT_EQ(moved->url(), m_folder.url("cloud/My Book.epub"));
    EXPECT_EQ(booksInCloud(), Names{"My Book.epub"});
    EXPECT_FALSE(m_error);
}

TEST_F(SynchronisedFolder, ABookWhoseNameIsTakenIsCountedUp) {
    m_folder.write("cloud/Book.epub", "2");

    EXPECT_TRUE(setUbiquitous(true, asset("Book.epub"), cloud()));

    EXPECT_EQ(booksInCloud(), (Names{"Book 1.epub", "Book.epub"}));
}

TEST_F(SynchronisedFolder, ABookComesOutAgain) {
    EXPECT_TRUE(setUbiquitous(false, asset("cloud/Book.epub"), makeFolder("local")));

    EXPECT_EQ(booksInCloud(), Names{});
    EXPECT_EQ(names("local"), Names{"Book.epub"});
}

TEST_F(SynchronisedFolder, AFolderThatNobodySynchronisesTakesNoBookIn) {
    const URL local = makeFolder("local");

    EXPECT_FALSE(setUbiquitous(true, asset("a.epub"), local));

    EXPECT_EQ(m_error, makePOSIXError(ENOTSUP, m_folder.url("local/a.epub")));
    EXPECT_EQ(names("local"), Names{});
}

TEST_F(SynchronisedFolder, ABookThatIsNotDownloadedDoesNotComeOut) {
    m_folder.write("cloud/Book.epub.nextcloud", " ");
    const auto book =
        PVAssetMetadata::metadataWithURL_dictionary(m_folder.url("cloud/Book.epub"), nullptr);

    EXPECT_FALSE(setUbiquitous(false, book, makeFolder("local")));

    EXPECT_EQ(m_error, makePOSIXError(ETIMEDOUT, m_folder.url("cloud/Book.epub")));
    EXPECT_EQ(booksInCloud(), Names{"Book.epub.nextcloud"});
}

TEST_F(SynchronisedFolder, AnOverlongNameIsCutToFitTheDisk) {
    const auto book = asset("a.epub");
    String title;
    for (int i = 0; i < 300; ++i)
        title += "漢";
    book->setTitle(title);

    EXPECT_TRUE(setUbiquitous(true, book, cloud()));
    EXPECT_EQ(booksInCloud()[0].size(), 248U);
}

TEST_F(SynchronisedFolder, NoRecordIsRefusedWithItsReason) {
    RecordedLog log;

    EXPECT_FALSE(setUbiquitous(true, nullptr, cloud()));

    EXPECT_EQ(m_error, makeCorruptAssetError("PVAssetMetadata is nil"));
    EXPECT_EQ(log.lines(), Lines{"error setUbiquitous: Failed to migrate asset: (null) error: " +
                                 logText(*m_error)});
}

TEST_F(SynchronisedFolder, ARecordWithoutURLIsRefusedAsUnknown) {
    const Dictionary dictionary{{"itemName", "Title"}, {"PVDisplayName", "Name"}};
    const auto book = PVAssetMetadata::metadataWithURL_dictionary(std::nullopt, &dictionary);
    RecordedLog log;

    EXPECT_FALSE(setUbiquitous(true, book, cloud()));

    EXPECT_EQ(m_error, makeCorruptAssetError("Unknown"));
    EXPECT_EQ(log.lines(), Lines{"error setUbiquitous: Failed to migrate asset: Title error: " +
                                 logText(*m_error)});
}

TEST_F(SynchronisedFolder, WithoutAPlaceForTheErrorARefusalLogsNone) {
    RecordedLog log;

    EXPECT_FALSE(m_manager->setUbiquitous_asset_intoDirectory_replace_error(
        true, nullptr, cloud(), /*replace=*/false, nullptr));

    EXPECT_EQ(log.lines(),
              Lines{"error setUbiquitous: Failed to migrate asset: (null) error: (null)"});
}

TEST_F(SynchronisedFolder, AReplacementReportsNothingAlsoWhenItSucceeds) {
    m_folder.write("cloud/Book.epub", "old");
    RecordedLog log;

    EXPECT_FALSE(setUbiquitous(true, asset("Book.epub", "new"), cloud(), /*replace=*/true));

    EXPECT_FALSE(m_error);
    EXPECT_EQ(m_folder.read("cloud/Book.epub"), "new");
    EXPECT_EQ(names(), Names{"cloud"});
    EXPECT_EQ(log.lines(), Lines{});
}

TEST_F(SynchronisedFolder, AReplacementKeepsWhatTheNewVersionLacks) {
    const auto old = asset("cloud/Book.epub", "old");
    old->setGeneratedID("ID");
    ASSERT_TRUE(m_manager->setExtendedAttributesForAsset_error(old));

    setUbiquitous(true, asset("Book.epub", "new"), cloud(), /*replace=*/true);

    EXPECT_EQ(m_manager->extendedAttributesForAsset_error(old)->size(), 1U);
}

TEST_F(SynchronisedFolder, ANewVersionTakesThePlaceAndItsOwnName) {
    const auto old = asset("cloud/Old Title.epub", "old");
    const auto newVersion = asset("new.epub", "new");
    newVersion->setTitle("New Title");
    m_error = makeNoIdentityError();

    const AssetPtr replaced =
        m_manager->replaceUbiquitousAsset_withAsset_error(old, newVersion, &m_error);

    ASSERT_TRUE(replaced);
    EXPECT_EQ(replaced->url(), m_folder.url("cloud/New Title.epub"));
    EXPECT_EQ(replaced->title(), "New Title");
    EXPECT_FALSE(m_error);
    EXPECT_EQ(booksInCloud(), Names{"New Title.epub"});
    EXPECT_EQ(m_folder.read("cloud/New Title.epub"), "new");
}

TEST_F(SynchronisedFolder, ANewVersionOfTheSameNameStaysWhereItIs) {
    const auto old = asset("cloud/Book.epub", "old");
    const auto newVersion = asset("Book.epub", "new");

    const AssetPtr replaced =
        m_manager->replaceUbiquitousAsset_withAsset_error(old, newVersion, &m_error);

    ASSERT_TRUE(replaced);
    EXPECT_EQ(replaced->url(), m_folder.url("cloud/Book.epub"));
    EXPECT_EQ(booksInCloud(), Names{"Book.epub"});
}

TEST_F(SynchronisedFolder, AReplacedVersionWhoseNewNameIsTakenStaysUnderTheOldOne) {
    const auto old = asset("cloud/Old.epub", "old");
    m_folder.write("cloud/New.epub", "other");
    const auto newVersion = asset("New.epub", "new");

    EXPECT_FALSE(m_manager->replaceUbiquitousAsset_withAsset_error(old, newVersion, &m_error));

    EXPECT_EQ(m_error, makeFileError(PVFileErrorCode::FileExists, m_folder.url("cloud/New.epub")));
    EXPECT_EQ(m_folder.read("cloud/Old.epub"), "new");
    EXPECT_EQ(m_folder.read("cloud/New.epub"), "other");
}

TEST_F(SynchronisedFolder, AFailedReplacementLeavesBothAndSaysWhy) {
    const auto old = asset("cloud/Book.epub", "old");
    const auto gone =
        PVAssetMetadata::metadataWithURL_dictionary(m_folder.url("gone.epub"), nullptr);

    EXPECT_FALSE(m_manager->replaceUbiquitousAsset_withAsset_error(old, gone, &m_error));

    EXPECT_EQ(m_error, makeFileError(PVFileErrorCode::NoSuchFile, m_folder.url("gone.epub")));
    EXPECT_EQ(m_folder.read("cloud/Book.epub"), "old");
}

/// Hands out what a test says, in the order of the calls.
class ScriptedCoordinator : public ForwardingFileCoordinator {
public:
    ScriptedCoordinator() : ForwardingFileCoordinator(FileCoordinator::makeDefault()) {}
    bool coordinateWriting(const URL& url, WritingIntent intent, ErrorOut error,
                           const Accessor& accessor) override {
        calls.emplace_back(url, intent);
        if (calls.size() == failingCall)
            return fail(error, makePOSIXError(EDEADLK, url));
        accessor(calls.size() == callWithoutURL ? std::nullopt : std::optional(url));
        return true;
    }
    std::vector<std::pair<URL, WritingIntent>> calls;
    std::size_t failingCall = 0;
    std::size_t callWithoutURL = 0;
};

TEST_F(SynchronisedFolder, BothStepsOfAReplacementAreCoordinatedOnTheSynchronisedAsset) {
    const auto coordinator = std::make_shared<ScriptedCoordinator>();
    m_manager->setFileCoordinator(coordinator);
    const auto old = asset("cloud/Old.epub", "old");

    EXPECT_TRUE(m_manager->replaceUbiquitousAsset_withAsset_error(old, asset("New.epub")));

    using Call = std::pair<URL, WritingIntent>;
    EXPECT_EQ(coordinator->calls, (std::vector<Call>{{*old->url(), WritingIntent::ForReplacing},
                                                     {*old->url(), WritingIntent::ForMoving}}));
}

TEST_F(SynchronisedFolder, ACoordinatorWithoutURLFailsTheReplacement) {
    const auto coordinator = std::make_shared<ScriptedCoordinator>();
    coordinator->callWithoutURL = 1;
    m_manager->setFileCoordinator(coordinator);
    const auto old = asset("cloud/Old.epub", "old");
    RecordedLog log;

    EXPECT_FALSE(
        m_manager->replaceUbiquitousAsset_withAsset_error(old, asset("New.epub"), &m_error));

    EXPECT_EQ(m_error, makeMissingURLError());
    EXPECT_EQ(log.lines(),
              Lines{"error replaceUbiquitousAsset: Failed due to nil newURL provided."});
    EXPECT_EQ(coordinator->calls.size(), 1U);
    EXPECT_EQ(m_folder.read("cloud/Old.epub"), "old");
}

TEST_F(SynchronisedFolder, ACoordinationThatFailsIsTheError) {
    for (const std::size_t failing : {1, 2}) {
        const auto coordinator = std::make_shared<ScriptedCoordinator>();
        coordinator->failingCall = failing;
        m_manager->setFileCoordinator(coordinator);
        const auto old = asset("cloud/Old.epub", "old");

        EXPECT_FALSE(
            m_manager->replaceUbiquitousAsset_withAsset_error(old, asset("New.epub"), &m_error));

        EXPECT_EQ(m_error, makePOSIXError(EDEADLK, *old->url()));
    }
}

}  // namespace
}  // namespace parvel::testing
