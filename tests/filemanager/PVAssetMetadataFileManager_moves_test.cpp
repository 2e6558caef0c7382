#include <gtest/gtest.h>

#include "tests/support/ManagedFolder.h"
#include "tests/support/RecordedLog.h"

namespace parvel::testing {
namespace {

using Lines = std::vector<std::string>;

std::string text(const URL& url) {
    return url.absoluteString();
}

struct MoveOptions {
    bool replace = false;
    bool renameIfCollision = false;
    bool useAssetIDFileName = false;
};

class Moves : public ManagedFolder {
protected:
    AssetPtr moveTo(const AssetPtr& moved, const std::optional<URL>& target, bool replace = false) {
        return m_manager->moveAsset_toURL_replaceExisting_error(moved, target, replace, &m_error);
    }
    AssetPtr moveInto(const AssetPtr& moved, const URL& directory, MoveOptions options = {}) {
        return m_manager
            ->moveAsset_toDirectory_replaceExisting_renameIfCollision_useAssetIDFileName_error(
                moved, directory, options.replace, options.renameIfCollision,
                options.useAssetIDFileName, &m_error);
    }
};

TEST_F(Moves, AnAssetMovedToItsOwnPlaceIsTheSameRecordWithoutALogLine) {
    const auto book = asset("a.epub");
    RecordedLog log;

    EXPECT_EQ(moveTo(book, m_folder.url("./x/../a.epub")), book);

    EXPECT_EQ(log.lines(), Lines{});
    EXPECT_EQ(names(), Names{"a.epub"});
}

TEST_F(Moves, NoTargetGivesNoneAndLeavesTheError) {
    m_error = makeNoIdentityError();

    EXPECT_FALSE(moveTo(asset("a.epub"), std::nullopt));

    EXPECT_EQ(m_error, makeNoIdentityError());
    EXPECT_EQ(names(), Names{"a.epub"});
}

TEST_F(Moves, ARecordWithoutURLNamesNothingToMove) {
    EXPECT_FALSE(moveTo(nullptr, m_folder.url("a.epub")));

    EXPECT_EQ(m_error, makeMissingURLError());
}

TEST_F(Moves, AMovedAssetsRecordHasTheNewURLAndTheOldOneItsOwn) {
    const auto book = asset("a.epub");
    RecordedLog log;

    const AssetPtr moved = moveTo(book, m_folder.url("b.epub"));

    ASSERT_TRUE(moved);
    EXPECT_EQ(moved->url(), m_folder.url("b.epub"));
    EXPECT_EQ(book->url(), m_folder.url("a.epub"));
    EXPECT_EQ(names(), Names{"b.epub"});
    EXPECT_EQ(log.lines(), Lines{"default Rename: Move without replacement. source: " +
                                 text(m_folder.url("a.epub")) +
                                 " target: " + text(m_folder.url("b.epub")) + " error: (null)"});
}

TEST_F(Moves, AFailedMoveGivesThePlatformsErrorAndTheSameLogLine) {
    const auto book = asset("a.epub", "1");
    m_folder.write("b.epub", "2");
    RecordedLog log;

    EXPECT_FALSE(moveTo(book, m_folder.url("b.epub")));

    EXPECT_EQ(m_error, makeFileError(PVFileErrorCode::FileExists, m_folder.url("b.epub")));
    EXPECT_EQ(m_folder.read("a.epub"), "1");
    EXPECT_EQ(m_folder.read("b.epub"), "2");
    EXPECT_EQ(
        log.lines(),
        Lines{"default Rename: Move without replacement. source: " + text(m_folder.url("a.epub")) +
              " target: " + text(m_folder.url("b.epub")) + " error: " + logText(*m_error)});
}

TEST_F(Moves, WithoutAPlaceForTheErrorTheLogPrintsNone) {
    const auto book = asset("a.epub");
    m_folder.write("b.epub", "2");
    RecordedLog log;

    EXPECT_FALSE(m_manager->moveAsset_toURL_replaceExisting_error(
        book, m_folder.url("b.epub"), /*replaceExisting=*/false, nullptr));

    ASSERT_EQ(log.lines().size(), 1U);
    EXPECT_TRUE(log.lines()[0].ends_with(" error: (null)"));
}

TEST_F(Moves, AReplacingMovePutsTheAssetInTheExistingOnesPlace) {
    const auto book = asset("a.epub", "1");
    m_folder.write("b.epub", "2");
    RecordedLog log;

    const AssetPtr moved = moveTo(book, m_folder.url("b.epub"), /*replace=*/true);

    ASSERT_TRUE(moved);
    EXPECT_EQ(m_folder.read("b.epub"), "1");
    EXPECT_EQ(names(), Names{"b.epub"});
    EXPECT_EQ(log.lines(), Lines{"default Rename: Replacing possibly existing file. source: " +
                                 text(m_folder.url("a.epub")) +
                                 " target: " + text(m_folder.url("b.epub")) + " error: (null)"});
}

TEST_F(Moves, AReplacingMoveToAFreePlaceSucceeds) {
    EXPECT_TRUE(moveTo(asset("a.epub"), m_folder.url("b.epub"), /*replace=*/true));

    EXPECT_EQ(names(), Names{"b.epub"});
}

TEST_F(Moves, ABookMovesIntoADirectoryUnderItsOwnName) {
    const URL library = makeFolder("library");
    const auto book = asset("a.epub");
    RecordedLog log;

    const AssetPtr moved = moveInto(book, library);

    ASSERT_TRUE(moved);
    EXPECT_EQ(moved->url(), m_folder.url("library/a.epub"));
    EXPECT_EQ(names("library"), Names{"a.epub"});
    ASSERT_EQ(log.lines().size(), 2U);
    EXPECT_EQ(log.lines()[0], "debug Rename: Start");
    EXPECT_TRUE(log.lines()[1].starts_with("default Rename: Move without replacement."));
}

TEST_F(Moves, ACollidingBookIsNotCountedUp) {
    const URL library = makeFolder("library");
    m_folder.write("library/a.epub", "2");

    EXPECT_FALSE(moveInto(asset("a.epub"), library, {.renameIfCollision = true}));

    EXPECT_EQ(m_error, makeFileError(PVFileErrorCode::FileExists, m_folder.url("library/a.epub")));
    EXPECT_EQ(names("library"), Names{"a.epub"});
}

TEST_F(Moves, ABookIsNamedAfterANumericStoreID) {
    const auto book = asset("a.epub");
    const Value storeID("4711");
    book->setStoreID(&storeID);

    EXPECT_TRUE(moveInto(book, makeFolder("library"), {.useAssetIDFileName = true}));

    EXPECT_EQ(names("library"), Names{"4711.epub"});
}

TEST_F(Moves, AStoreIDStoredAsANumberIsItsDecimalText) {
    asset("a.epub");
    const Dictionary dictionary{{"path", m_folder / "a.epub"},
                                {"itemId", Number::signedInteger(4711)}};
    const auto book = PVMutableAssetMetadata::initWithURL_dictionary_validate(
        std::nullopt, &dictionary, /*validate=*/false);

    EXPECT_TRUE(moveInto(book, makeFolder("library"), {.useAssetIDFileName = true}));

    EXPECT_EQ(names("library"), Names{"4711.epub"});
}

TEST_F(Moves, ABookWithoutPositiveStoreIDIsNamedAfterItsGeneratedID) {
    for (const char* storeID : {"0", "no number", "-4"}) {
        const auto book = asset("a.epub");
        const Value value(storeID);
        book->setStoreID(&value);
        book->setGeneratedID("GENERATED");
        const URL library = makeFolder(std::string("library") + storeID);

        EXPECT_TRUE(moveInto(book, library, {.useAssetIDFileName = true}));

        EXPECT_EQ(names(std::string("library") + storeID), Names{"GENERATED.epub"});
    }
}

TEST_F(Moves, ABookWithoutUsableNameFailsWith259AndNoURL) {
    const auto book = asset("a.epub");
    const URL library = makeFolder("library");
    RecordedLog log;

    EXPECT_FALSE(moveInto(book, library, {.useAssetIDFileName = true}));

    EXPECT_EQ(m_error, makeFileError(PVFileErrorCode::Corrupt, std::nullopt));
    EXPECT_EQ(log.lines(), (Lines{"debug Rename: Start", "error Failed to rename imported book"}));
    EXPECT_EQ(names("library"), Names{});
}

TEST_F(Moves, AnIDThatIsNoSingleNameIsNoFileName) {
    const URL library = makeFolder("library");
    for (const std::string& id :
         std::vector<std::string>{"", ".", "..", "../out", "a/b", "/etc", std::string("a\0b", 3)}) {
        const auto book = asset("a.epub");
        book->setGeneratedID(id);
        EXPECT_FALSE(moveInto(book, library, {.useAssetIDFileName = true})) << id;
        EXPECT_EQ(m_error, makeFileError(PVFileErrorCode::Corrupt, std::nullopt));
    }
    const auto book = asset("a.epub");
    const Value climbing("1/../../x");
    book->setStoreID(&climbing);
    EXPECT_FALSE(moveInto(book, library, {.useAssetIDFileName = true}));
    EXPECT_EQ(names(), (Names{"a.epub", "library"}));
}

TEST_F(Moves, ACollidingPDFIsCountedUp) {
    const URL library = makeFolder("library");
    m_folder.write("library/Guide.pdf", "2");
    m_folder.write("library/Guide 1.pdf", "2");
    const auto guide = asset("Guide.pdf");
    RecordedLog log;

    const AssetPtr moved = moveInto(guide, library, {.renameIfCollision = true});

    ASSERT_TRUE(moved);
    EXPECT_EQ(moved->url(), m_folder.url("library/Guide 2.pdf"));
    ASSERT_EQ(log.lines().size(), 4U);
    EXPECT_EQ(log.lines()[0], "debug Rename: Start");
    EXPECT_EQ(log.lines()[1],
              "default Duplicate name encountered during renaming. Appending count to file 1");
    EXPECT_EQ(log.lines()[2],
              "default Duplicate name encountered during renaming. Appending count to file 2");
}

TEST_F(Moves, ACollidingPDFFailsOrReplacesWithoutCounting) {
    const URL library = makeFolder("library");
    m_folder.write("library/Guide.pdf", "2");

    EXPECT_FALSE(moveInto(asset("Guide.pdf", "1"), library));
    EXPECT_EQ(m_error,
              makeFileError(PVFileErrorCode::FileExists, m_folder.url("library/Guide.pdf")));

    EXPECT_TRUE(moveInto(asset("Guide.pdf", "1"), library, {.replace = true}));
    EXPECT_EQ(m_folder.read("library/Guide.pdf"), "1");
    EXPECT_EQ(names("library"), Names{"Guide.pdf"});
}

TEST_F(Moves, AnAssetIDNameIsForBooksAlone) {
    const auto guide = asset("Guide.pdf");
    guide->setGeneratedID("ID");

    EXPECT_TRUE(moveInto(guide, makeFolder("library"), {.useAssetIDFileName = true}));

    EXPECT_EQ(names("library"), Names{"Guide.pdf"});
}

/// Says that every name up to a count is taken.
class CrowdedService : public ForwardingFileSystemService {
public:
    explicit CrowdedService(int taken)
        : ForwardingFileSystemService(FileSystemService::makeDefault()), m_taken(taken) {}
    bool itemExistsAtPath(const std::string& path) override {
        lastTested = path;
        return m_taken-- > 0;
    }
    std::string lastTested;

private:
    int m_taken;
};

TEST_F(Moves, CountingEndsAt9999WithThatNameTakenOrNot) {
    const auto service = std::make_shared<CrowdedService>(1 << 20);
    m_manager->setFileManager(service);
    const URL library = makeFolder("library");

    const AssetPtr moved = moveInto(asset("Guide.pdf"), library, {.renameIfCollision = true});

    ASSERT_TRUE(moved);
    EXPECT_EQ(names("library"), Names{"Guide 9999.pdf"});
}

/// Takes the name between the test and the move, once.
class CompetingService : public ForwardingFileSystemService {
public:
    CompetingService() : ForwardingFileSystemService(FileSystemService::makeDefault()) {}
    bool moveItem(const URL& source, const URL& destination, ErrorOut error) override {
        if (!std::exchange(m_hasCompeted, true))
            std::ofstream(destination.path()) << "competitor";
        return ForwardingFileSystemService::moveItem(source, destination, error);
    }

private:
    bool m_hasCompeted = false;
};

TEST_F(Moves, ACompetitorThatTookTheNameSendsTheCountOn) {
    m_manager->setFileManager(std::make_shared<CompetingService>());
    const URL library = makeFolder("library");
    RecordedLog log;

    const AssetPtr moved =
        moveInto(asset("Guide.pdf", "mine"), library, {.renameIfCollision = true});

    ASSERT_TRUE(moved);
    EXPECT_EQ(m_folder.read("library/Guide.pdf"), "competitor");
    EXPECT_EQ(m_folder.read("library/Guide 1.pdf"), "mine");
    ASSERT_EQ(log.lines().size(), 4U);
    EXPECT_TRUE(log.lines()[1].starts_with("default Rename: Move without replacement."));
    EXPECT_TRUE(log.lines()[2].starts_with("default Duplicate name"));
    EXPECT_TRUE(log.lines()[3].starts_with("default Rename: Move without replacement."));
}

TEST_F(Moves, ATryThatWasMadeAgainLeavesNoErrorBesideTheResult) {
    m_manager->setFileManager(std::make_shared<CompetingService>());
    RecordedLog log;

    EXPECT_TRUE(moveInto(asset("Guide.pdf"), makeFolder("library"), {.renameIfCollision = true}));

    EXPECT_FALSE(m_error);
    EXPECT_FALSE(log.lines()[1].ends_with("error: (null)"));
    EXPECT_TRUE(log.lines()[3].ends_with("error: (null)"));
}

TEST_F(Moves, AFreeNameDoesNotChange) {
    EXPECT_EQ(m_manager->nonCollidingNameForFileName_inDestPath("a.pdf", m_folder.path()), "a.pdf");
}

TEST_F(Moves, ATakenNameIsCountedToTheFirstThatIsFree) {
    m_folder.write("a.pdf", "");
    m_folder.write("a 1.pdf", "");

    EXPECT_EQ(m_manager->nonCollidingNameForFileName_inDestPath("a.pdf", m_folder.path()),
              "a 2.pdf");
}

TEST_F(Moves, ATakenNameWithoutExtensionGetsATrailingDot) {
    m_folder.write("notes", "");

    EXPECT_EQ(m_manager->nonCollidingNameForFileName_inDestPath("notes", m_folder.path()),
              "notes 1.");
}

TEST_F(Moves, CountingANameHasNoLimit) {
    m_manager->setFileManager(std::make_shared<CrowdedService>(12001));

    EXPECT_EQ(m_manager->nonCollidingNameForFileName_inDestPath("a.pdf", m_folder.path()),
              "a 12001.pdf");
}

TEST_F(Moves, APlacedAssetGetsSizeInsertionDateAndAttributes) {
    const auto book = asset("a.epub");
    book->setGeneratedID("ID");
    const Date before = Date::now();

    const AssetPtr stamped = m_manager->updateWithKeyAttributesAssetMetadata_error(book, &m_error);

    ASSERT_TRUE(stamped);
    EXPECT_GT(stamped->allocatedSize(), 0U);
    EXPECT_GE(stamped->insertionDate().secondsSinceReferenceDate + 1,
              before.secondsSinceReferenceDate);
    EXPECT_TRUE(stamped->dictionaryRepresentation()->contains("PVInsertionDate"));
    EXPECT_FALSE(book->_hasAllocatedSize());
    EXPECT_FALSE(m_error);
    const auto attributes = m_manager->extendedAttributesForAsset_error(stamped);
    ASSERT_TRUE(attributes);
    EXPECT_EQ(*attributes, (Dictionary{{"com.kestrel.Folium.assetID", "ID"}}));
}

TEST_F(Moves, AnAssetThatHasItsSizeIsKeptAndItsAttributesWritten) {
    const auto book = asset("a.epub");
    book->setGeneratedID("ID");
    book->setAllocatedSize(0);

    EXPECT_EQ(m_manager->updateWithKeyAttributesAssetMetadata_error(book, &m_error), book);

    EXPECT_EQ(m_manager->extendedAttributesForAsset_error(book)->size(), 1U);
}

TEST_F(Moves, AStampedRecordComesBackAlsoWhenItsAttributesCouldNotBeWritten) {
    const auto book = asset("a.epub");

    const AssetPtr stamped = m_manager->updateWithKeyAttributesAssetMetadata_error(book, &m_error);

    ASSERT_TRUE(stamped);
    EXPECT_TRUE(stamped->_hasAllocatedSize());
    EXPECT_EQ(m_error, makeNoIdentityError());
}

TEST_F(Moves, AStaleErrorIsClearedByAStampThatSucceeds) {
    const auto book = asset("a.epub");
    book->setGeneratedID("ID");
    m_error = makeMissingURLError();

    EXPECT_TRUE(m_manager->updateWithKeyAttributesAssetMetadata_error(book, &m_error));

    EXPECT_FALSE(m_error);
}

TEST_F(Moves, AMissingFileIsStampedWithNoSizeAndSaysWhy) {
    const auto book =
        PVAssetMetadata::metadataWithURL_dictionary(m_folder.url("gone.epub"), nullptr);
    book->setGeneratedID("ID");
    RecordedLog log;

    const AssetPtr stamped = m_manager->updateWithKeyAttributesAssetMetadata_error(book, &m_error);

    ASSERT_TRUE(stamped);
    EXPECT_EQ(stamped->allocatedSize(), 0U);
    EXPECT_EQ(m_error, makePOSIXError(ENOENT, m_folder.url("gone.epub")));
    EXPECT_EQ(log.lines(), Lines{"error Failed to state file for directory"});
}

}  // namespace
}  // namespace parvel::testing
