#include <filesystem>

#include <gtest/gtest.h>

#include "tests/support/EpubBuilder.h"
#include "tests/support/ManagedFolder.h"
#include "tests/support/ReadOnlyAttributes.h"
#include "tests/support/RecordedLog.h"
#include "tests/support/RecordingFileSystem.h"
#include "tests/support/Records.h"
#include "tests/support/ScriptedCoordinator.h"

namespace parvel::testing {
namespace {

using Lines = std::vector<std::string>;

class Reconciling : public ManagedFolder {
protected:
    std::vector<AssetPtr> missing(const std::vector<URL>& urls,
                                  const std::vector<AssetPtr>& assets = {}) {
        return m_manager->assetsForURLs_missingFromAssets_error(urls, assets, &m_error);
    }
    [[nodiscard]] MutableAssetPtr recordOf(const std::string& name) const {
        return PVAssetMetadata::metadataWithURL_dictionary(m_folder.url(name), nullptr);
    }
};

TEST_F(Reconciling, RecordsWhoseItemIsGoneOrThatHaveNoURLAreOrphans) {
    const auto present = asset("a.epub");
    const auto gone = recordOf("b.epub");
    const Dictionary dictionary{{"itemName", "T"}};
    const auto headless = PVAssetMetadata::metadataWithURL_dictionary(std::nullopt, &dictionary);
    m_error = makeNoIdentityError();
    RecordedLog log;

    const auto orphans = m_manager->orphanAssetsInAssets_error({gone, present, headless}, &m_error);

    EXPECT_EQ(orphans, (std::vector<AssetPtr>{gone, headless}));
    EXPECT_EQ(m_error, makeNoIdentityError());
    EXPECT_EQ(log.lines(),
              (Lines{"default OrphanAssets: start {assets: 3}",
                     "default OrphanAssets: Found Orphan: " + logText(m_folder.url("b.epub")),
                     "debug OrphanAsset: Asset available: " + logText(m_folder.url("a.epub")),
                     "default OrphanAssets: Found Orphan: (null)"}));
}

TEST_F(Reconciling, NoRecordIsAnOrphanToo) {
    RecordedLog log;

    EXPECT_EQ(m_manager->orphanAssetsInAssets_error({nullptr}).size(), 1U);

    EXPECT_EQ(log.lines().back(), "default OrphanAssets: Found Orphan: (null)");
}

TEST_F(Reconciling, OrphansComeBackAsTheRecordsThatWereGiven) {
    const std::vector<AssetPtr> gone{recordOf("c.epub"), recordOf("a.epub"), recordOf("b.epub")};

    EXPECT_EQ(m_manager->orphanAssetsInAssets_error(gone), gone);
}

TEST_F(Reconciling, EmptyInputsGiveEmptyListsAndLeaveTheError) {
    m_error = makeNoIdentityError();
    RecordedLog log;

    EXPECT_TRUE(m_manager->orphanAssetsInAssets_error({}, &m_error).empty());
    EXPECT_TRUE(missing({}).empty());

    EXPECT_EQ(m_error, makeNoIdentityError());
    EXPECT_EQ(log.lines(), (Lines{"default OrphanAssets: start {assets: 0}",
                                  "default MissingAssets: start {urls: 0, assets: 0}"}));
}

TEST_F(Reconciling, AURLWithoutRecordIsInspectedAndStamped) {
    const URL url = EpubBuilder{}
                        .opf(opfText("<dc:title>T</dc:title><dc:creator>A</dc:creator>"))
                        .zip(m_folder / "a.epub");
    RecordedLog log;

    const auto missing = m_manager->assetsForURLs_missingFromAssets_error({url}, {}, &m_error);

    ASSERT_EQ(missing.size(), 1U);
    EXPECT_EQ(missing[0]->title(), "T");
    EXPECT_TRUE(missing[0]->_hasAllocatedSize());
    EXPECT_FALSE(m_error);
    EXPECT_EQ(log.lines()[0], "default MissingAssets: start {urls: 1, assets: 0}");
    EXPECT_EQ(log.lines()[1], "default MissingAssets: Found missing asset: " + logText(url));
    EXPECT_EQ(m_manager->extendedAttributesForAsset_error(missing[0])->size(), 3U);
}

TEST_F(Reconciling, TwoSpellingsOfOnePlaceMatch) {
    const auto book = asset("dir/Book.epub");
    RecordedLog log;

    const auto missing = m_manager->assetsForURLs_missingFromAssets_error(
        {m_folder.url("dir/./Book.epub")}, {book}, &m_error);

    EXPECT_TRUE(missing.empty());
    EXPECT_EQ(log.lines()[1],
              "debug MissingAssets: Asset available: " + logText(m_folder.url("dir/Book.epub")));
}

TEST_F(Reconciling, AURLThatCanNotBeInspectedIsSkippedAndTheOthersComeBack) {
    const URL broken = URL::fileURLWithPath(m_folder.write("b.epub", "no zip"));
    const URL sound = EpubBuilder{}.zip(m_folder / "a.epub");
    RecordedLog log;

    const auto missing =
        m_manager->assetsForURLs_missingFromAssets_error({broken, sound}, {}, &m_error);

    ASSERT_EQ(missing.size(), 1U);
    EXPECT_EQ(missing[0]->url(), sound);
    EXPECT_FALSE(m_error);
    EXPECT_TRUE(std::find(log.lines().begin(), log.lines().end(),
                          "error MissingAsset: Failed to inspect url: " + logText(broken)) !=
                log.lines().end());
}

TEST_F(Reconciling, TheLastStepsErrorIsKept) {
    const URL broken = URL::fileURLWithPath(m_folder.write("b.epub", "no zip"));

    EXPECT_TRUE(m_manager->assetsForURLs_missingFromAssets_error({broken}, {}, &m_error).empty());

    EXPECT_EQ(m_error, makeFileError(PVFileErrorCode::Corrupt, broken));
}

TEST_F(Reconciling, ARecordMayBeSpelledTheOtherWayToo) {
    asset("dir/Book.epub");
    m_error = makeNoIdentityError();

    EXPECT_TRUE(
        missing({m_folder.url("dir/Book.epub")}, {recordOf("other/../dir//Book.epub")}).empty());

    EXPECT_EQ(m_error, makeNoIdentityError());
}

TEST_F(Reconciling, AMissingAssetIsInspectedUnderTheSpellingThatWasGiven) {
    EpubBuilder{}.zip(m_folder / "a.epub");
    const URL spelled = m_folder.url("./a.epub");
    RecordedLog log;

    const auto found = missing({spelled});

    ASSERT_EQ(found.size(), 1U);
    EXPECT_EQ(found[0]->url(), spelled);
    EXPECT_EQ(log.lines()[1],
              "default MissingAssets: Found missing asset: " + logText(m_folder.url("a.epub")));
    EXPECT_EQ(log.lines()[2], "debug Getting metadata: " + logText(spelled));
}

TEST_F(Reconciling, AFailedInspectionIsLoggedUnderTheSpellingThatWasGiven) {
    const URL spelled = m_folder.url("./a.epub");
    RecordedLog log;

    EXPECT_TRUE(missing({spelled}).empty());

    EXPECT_EQ(log.lines()[1],
              "default MissingAssets: Found missing asset: " + logText(m_folder.url("a.epub")));
    EXPECT_EQ(log.lines().back(), "error MissingAsset: Failed to inspect url: " + logText(spelled));
}

TEST_F(Reconciling, RecordsWithoutURLNameNothing) {
    const URL book = EpubBuilder{}.zip(m_folder / "a.epub");
    RecordedLog log;

    EXPECT_EQ(missing({book}, {emptyRecord(), nullptr}).size(), 1U);

    EXPECT_EQ(log.lines()[0], "default MissingAssets: start {urls: 1, assets: 2}");
}

TEST_F(Reconciling, MissingAssetsComeBackInTheOrderOfTheirURLs) {
    const URL second = EpubBuilder{}.zip(m_folder / "b.epub");
    const URL first = EpubBuilder{}.zip(m_folder / "a.epub");
    const auto known = asset("known.epub");

    const auto found = missing({second, *known->url(), first}, {known});

    ASSERT_EQ(found.size(), 2U);
    EXPECT_EQ(found[0]->url(), second);
    EXPECT_EQ(found[1]->url(), first);
}

/// The folder as the current directory.
class ReconcilingHere : public Reconciling {
protected:
    ReconcilingHere() { std::filesystem::current_path(m_folder.path()); }
    ~ReconcilingHere() override { std::filesystem::current_path(m_before); }

private:
    std::filesystem::path m_before = std::filesystem::current_path();
};

TEST_F(ReconcilingHere, ARelativeURLMeetsTheAbsoluteOneOfTheSamePlace) {
    const auto absolute = asset("a.epub");
    const auto relative =
        PVAssetMetadata::metadataWithURL_dictionary(URL::fileURLWithPath("b.epub"), nullptr);
    RecordedLog log;

    EXPECT_TRUE(
        missing({URL::fileURLWithPath("a.epub"), m_folder.url("b.epub")}, {absolute, relative})
            .empty());

    const std::string available = "debug MissingAssets: Asset available: ";
    EXPECT_EQ(log.lines(), (Lines{"default MissingAssets: start {urls: 2, assets: 2}",
                                  available + logText(m_folder.url("a.epub")),
                                  available + logText(m_folder.url("b.epub"))}));
}

TEST_F(ReconcilingHere, ARelativeURLIsInspectedAsItIs) {
    EpubBuilder{}.zip(m_folder / "a.epub");

    const auto found = missing({URL::fileURLWithPath("a.epub")});

    ASSERT_EQ(found.size(), 1U);
    EXPECT_EQ(found[0]->url(), URL::fileURLWithPath("a.epub"));
}

TEST_F(Reconciling, AMissingAssetWhoseAttributesCanNotBeWrittenComesBackWithTheError) {
    const ReadOnlyAttributes attributes;
    const URL book = EpubBuilder{}.zip(m_folder / "a.epub");

    const auto found = missing({book});

    ASSERT_EQ(found.size(), 1U);
    EXPECT_TRUE(found[0]->_hasAllocatedSize());
    EXPECT_EQ(m_error, makePOSIXError(EROFS, book));
}

TEST_F(Reconciling, TheManagersOwnServicesAreNotAsked) {
    const auto service = std::make_shared<RecordingFileSystem>();
    const auto coordinator = std::make_shared<ScriptedCoordinator>();
    m_manager->setFileManager(service);
    m_manager->setFileCoordinator(coordinator);

    EXPECT_EQ(missing({EpubBuilder{}.zip(m_folder / "a.epub")}).size(), 1U);

    EXPECT_EQ(service->calls, Lines{});
    EXPECT_TRUE(coordinator->calls.empty());
}

TEST_F(Reconciling, NobodyNeedsToAskForTheErrors) {
    const URL broken = URL::fileURLWithPath(m_folder.write("b.epub", "no zip"));
    const URL sound = EpubBuilder{}.zip(m_folder / "a.epub");

    EXPECT_EQ(m_manager->assetsForURLs_missingFromAssets_error({broken, sound}, {}).size(), 1U);
}

}  // namespace
}  // namespace parvel::testing
