#include <gtest/gtest.h>

#include "tests/support/MovedAssets.h"
#include "tests/support/RecordedLog.h"
#include "tests/support/RecordingFileSystem.h"
#include "tests/support/Records.h"
#include "tests/support/RefusingServices.h"

namespace parvel::testing {
namespace {

using Lines = std::vector<std::string>;

std::string text(const URL& url) {
    return url.absoluteString();
}

class MovingAssets : public MovedAssets {
protected:
    std::shared_ptr<RecordingFileSystem> recordCalls() {
        auto service = std::make_shared<RecordingFileSystem>();
        m_manager->setFileManager(service);
        return service;
    }
    void refuseEverything() {
        m_manager->setFileManager(
            std::make_shared<RefusingFileSystem>([](auto, const URL&) { return true; }));
    }
};

TEST_F(MovingAssets, AnAssetMovedToItsOwnPlaceIsTheSameRecordWithoutALogLine) {
    const auto book = asset("a.epub");
    RecordedLog log;

    EXPECT_EQ(moveTo(book, m_folder.url("./x/../a.epub")), book);

    EXPECT_EQ(log.lines(), Lines{});
    EXPECT_EQ(names(), Names{"a.epub"});
}

TEST_F(MovingAssets, ThePlaceOfARecordMayBeSpelledTheOtherWayToo) {
    asset("a.epub");
    const AssetPtr book =
        PVAssetMetadata::metadataWithURL_dictionary(m_folder.url("x/..//./a.epub"), nullptr);

    EXPECT_EQ(moveTo(book, m_folder.url("a.epub")), book);

    EXPECT_EQ(names(), Names{"a.epub"});
}

TEST_F(MovingAssets, NoTargetGivesNoneAndLeavesTheError) {
    m_error = makeNoIdentityError();
    RecordedLog log;

    EXPECT_FALSE(moveTo(asset("a.epub"), std::nullopt));
    EXPECT_FALSE(moveTo(emptyRecord(), std::nullopt, /*replace=*/true));

    EXPECT_EQ(log.lines(), Lines{});

    EXPECT_EQ(m_error, makeNoIdentityError());
    EXPECT_EQ(names(), Names{"a.epub"});
}

TEST_F(MovingAssets, AnAssetIsNotReplacedByItself) {
    const auto service = recordCalls();
    const auto book = asset("a.epub");

    EXPECT_EQ(moveTo(book, m_folder.url("a.epub"), /*replace=*/true), book);

    EXPECT_EQ(service->calls, Lines{});
}

TEST_F(MovingAssets, WhatNamesNoItemFailsWithTheSameLogLines) {
    const URL target = m_folder.url("a.epub");
    const std::string end =
        " source: (null) target: " + text(target) + " error: " + logText(makeMissingURLError());
    for (const AssetPtr& moved : {AssetPtr(), AssetPtr(emptyRecord())}) {
        m_error.reset();
        RecordedLog log;

        EXPECT_FALSE(moveTo(moved, target));
        EXPECT_FALSE(moveTo(moved, target, /*replace=*/true));

        EXPECT_EQ(m_error, makeMissingURLError());
        EXPECT_EQ(log.lines(), (Lines{"default Rename: Move without replacement." + end,
                                      "default Rename: Replacing possibly existing file." + end}));
    }
}

TEST_F(MovingAssets, TheGivenServiceMakesTheMove) {
    const auto service = recordCalls();

    EXPECT_TRUE(moveTo(asset("a.epub"), m_folder.url("b.epub")));

    EXPECT_EQ(service->calls,
              Lines{"move " + (m_folder / "a.epub") + " to " + (m_folder / "b.epub")});
}

TEST_F(MovingAssets, AReplacementKeepsTheNewItemsMetadataAlone) {
    const auto service = recordCalls();
    const auto book = asset("a.epub");
    m_folder.write("b.epub", "2");

    EXPECT_TRUE(moveTo(book, m_folder.url("b.epub"), /*replace=*/true));

    EXPECT_EQ(service->calls, Lines{"replace " + (m_folder / "b.epub") + " by " +
                                    (m_folder / "a.epub") + " options 1"});
}

TEST_F(MovingAssets, ASuccessLeavesTheErrorAndTheLogPrintsWhatStandsThere) {
    m_error = makeNoIdentityError();
    const auto book = asset("a.epub");
    const std::string end = " error: " + logText(makeNoIdentityError());
    RecordedLog log;

    const AssetPtr moved = moveTo(book, m_folder.url("b.epub"));
    EXPECT_TRUE(moveTo(moved, m_folder.url("c.epub"), /*replace=*/true));

    EXPECT_EQ(m_error, makeNoIdentityError());
    ASSERT_EQ(log.lines().size(), 2U);
    EXPECT_TRUE(log.lines()[0].ends_with(end));
    EXPECT_TRUE(log.lines()[1].ends_with(end));
}

TEST_F(MovingAssets, AMovedAssetsRecordHasTheNewURLAndTheOldOneItsOwn) {
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

TEST_F(MovingAssets, AFailedMoveGivesThePlatformsErrorAndTheSameLogLine) {
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

TEST_F(MovingAssets, AFailedReplacementGivesThePlatformsErrorAndTheSameLogLine) {
    const auto book = asset("a.epub", "1");
    m_folder.write("b.epub", "2");
    refuseEverything();
    RecordedLog log;

    EXPECT_FALSE(moveTo(book, m_folder.url("b.epub"), /*replace=*/true));

    EXPECT_EQ(m_error, makePOSIXError(EIO, m_folder.url("a.epub")));
    EXPECT_EQ(m_folder.read("a.epub"), "1");
    EXPECT_EQ(m_folder.read("b.epub"), "2");
    EXPECT_EQ(log.lines(), Lines{"default Rename: Replacing possibly existing file. source: " +
                                 text(m_folder.url("a.epub")) + " target: " +
                                 text(m_folder.url("b.epub")) + " error: " + logText(*m_error)});
}

TEST_F(MovingAssets, WithoutAPlaceForTheErrorTheLogPrintsNone) {
    const auto book = asset("a.epub");
    refuseEverything();
    for (const bool replace : {false, true}) {
        RecordedLog log;

        EXPECT_FALSE(m_manager->moveAsset_toURL_replaceExisting_error(book, m_folder.url("b.epub"),
                                                                      replace, nullptr));

        ASSERT_EQ(log.lines().size(), 1U);
        EXPECT_TRUE(log.lines()[0].ends_with(" error: (null)"));
    }
}

TEST_F(MovingAssets, AReplacingMovePutsTheAssetInTheExistingOnesPlace) {
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

TEST_F(MovingAssets, AReplacingMoveToAFreePlaceSucceeds) {
    EXPECT_TRUE(moveTo(asset("a.epub"), m_folder.url("b.epub"), /*replace=*/true));

    EXPECT_EQ(names(), Names{"b.epub"});
}

TEST_F(MovingAssets, ABookMovesIntoADirectoryUnderItsOwnName) {
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

TEST_F(MovingAssets, ACollidingBookIsNotCountedUp) {
    const URL library = makeFolder("library");
    m_folder.write("library/a.epub", "2");

    EXPECT_FALSE(moveInto(asset("a.epub"), library, {.renameIfCollision = true}));

    EXPECT_EQ(m_error, makeFileError(PVFileErrorCode::FileExists, m_folder.url("library/a.epub")));
    EXPECT_EQ(names("library"), Names{"a.epub"});
}

TEST_F(MovingAssets, ABookReplacesItsNamesakeIfAsked) {
    const URL library = makeFolder("library");
    m_folder.write("library/a.epub", "2");

    EXPECT_TRUE(moveInto(asset("a.epub", "1"), library, {.replace = true}));

    EXPECT_EQ(m_folder.read("library/a.epub"), "1");
    EXPECT_EQ(names("library"), Names{"a.epub"});
}

TEST_F(MovingAssets, AnAssetOfNoKnownKindIsMovedLikeABook) {
    const URL library = makeFolder("library");
    m_folder.write("library/a.txt", "2");

    EXPECT_FALSE(moveInto(asset("a.txt"), library, {.renameIfCollision = true}));

    EXPECT_EQ(m_error, makeFileError(PVFileErrorCode::FileExists, m_folder.url("library/a.txt")));
}

TEST_F(MovingAssets, ABookMovedIntoItsOwnFolderIsTheSameRecord) {
    const auto book = asset("library/a.epub");
    RecordedLog log;

    EXPECT_EQ(moveInto(book, m_folder.url("library"), {.replace = true}), book);

    EXPECT_EQ(log.lines(), Lines{"debug Rename: Start"});
}

TEST_F(MovingAssets, ABookIsNamedAfterANumericStoreID) {
    const auto book = asset("a.epub");
    const Value storeID("4711");
    book->setStoreID(&storeID);

    EXPECT_TRUE(moveInto(book, makeFolder("library"), {.useAssetIDFileName = true}));

    EXPECT_EQ(names("library"), Names{"4711.epub"});
}

TEST_F(MovingAssets, AStoreIDStoredAsANumberIsItsDecimalText) {
    asset("a.epub");
    const Dictionary dictionary{{"path", m_folder / "a.epub"},
                                {"itemId", Number::signedInteger(4711)}};
    const auto book = PVMutableAssetMetadata::initWithURL_dictionary_validate(
        std::nullopt, &dictionary, /*validate=*/false);

    EXPECT_TRUE(moveInto(book, makeFolder("library"), {.useAssetIDFileName = true}));

    EXPECT_EQ(names("library"), Names{"4711.epub"});
}

TEST_F(MovingAssets, ABookWithoutPositiveStoreIDIsNamedAfterItsGeneratedID) {
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

TEST_F(MovingAssets, AStoreIDThatBeginsWithANumberIsTakenWhole) {
    const auto book = asset("a.epub");
    const Value storeID("4711-b");
    book->setStoreID(&storeID);
    book->setGeneratedID("GENERATED");

    EXPECT_TRUE(moveInto(book, makeFolder("library"), {.useAssetIDFileName = true}));

    EXPECT_EQ(names("library"), Names{"4711-b.epub"});
}

TEST_F(MovingAssets, AnIDNamesAnItemWithoutExtensionWithNoDot) {
    const auto book = asset("a");
    book->setGeneratedID("GENERATED");

    EXPECT_TRUE(moveInto(book, makeFolder("library"), {.useAssetIDFileName = true}));

    EXPECT_EQ(names("library"), Names{"GENERATED"});
}

TEST_F(MovingAssets, AnIDOfARecordWithoutURLIsANameWithNothingToMove) {
    const URL library = makeFolder("library");
    const auto headless = recordOver({{"PVGeneratedItemId", "GENERATED"}});
    RecordedLog log;

    EXPECT_FALSE(moveInto(headless, library, {.useAssetIDFileName = true}));

    EXPECT_EQ(m_error, makeMissingURLError());
    ASSERT_EQ(log.lines().size(), 2U);
    EXPECT_NE(log.lines()[1].find(text(m_folder.url("library/GENERATED"))), std::string::npos);
}

TEST_F(MovingAssets, WhatNamesNoItemIsABookWithoutName) {
    for (const AssetPtr& moved : {AssetPtr(), AssetPtr(emptyRecord())}) {
        m_error.reset();
        RecordedLog log;

        EXPECT_FALSE(moveInto(moved, m_folder.url("library")));

        EXPECT_EQ(m_error, makeFileError(PVFileErrorCode::Corrupt, std::nullopt));
        EXPECT_EQ(log.lines(),
                  (Lines{"debug Rename: Start", "error Failed to rename imported book"}));
    }
}

TEST_F(MovingAssets, APDFWithoutURLIsNoneAndLeavesTheError) {
    const auto guide = emptyRecord();
    guide->setAssetType(PVAssetTypePDF);
    m_error = makeNoIdentityError();
    RecordedLog log;

    EXPECT_FALSE(moveInto(guide, m_folder.url("library"), {.renameIfCollision = true}));

    EXPECT_EQ(m_error, makeNoIdentityError());
    EXPECT_EQ(log.lines(), Lines{"debug Rename: Start"});
}

TEST_F(MovingAssets, ABookWithoutUsableNameFailsWith259AndNoURL) {
    const auto book = asset("a.epub");
    const URL library = makeFolder("library");
    RecordedLog log;

    EXPECT_FALSE(moveInto(book, library, {.useAssetIDFileName = true}));

    EXPECT_EQ(m_error, makeFileError(PVFileErrorCode::Corrupt, std::nullopt));
    EXPECT_EQ(log.lines(), (Lines{"debug Rename: Start", "error Failed to rename imported book"}));
    EXPECT_EQ(names("library"), Names{});
}

TEST_F(MovingAssets, AnIDThatIsNoSingleNameIsNoFileName) {
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

TEST_F(MovingAssets, AnAssetIDNameIsForBooksAlone) {
    const auto guide = asset("Guide.pdf");
    guide->setGeneratedID("ID");

    EXPECT_TRUE(moveInto(guide, makeFolder("library"), {.useAssetIDFileName = true}));

    EXPECT_EQ(names("library"), Names{"Guide.pdf"});
}

}  // namespace
}  // namespace parvel::testing
