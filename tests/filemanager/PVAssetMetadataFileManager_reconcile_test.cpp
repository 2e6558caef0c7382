#include <gtest/gtest.h>

#include "tests/support/EpubBuilder.h"
#include "tests/support/ManagedFolder.h"
#include "tests/support/RecordedLog.h"

namespace parvel::testing {
namespace {

class Reconciling : public ManagedFolder {
protected:
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
              (std::vector<std::string>{
                  "default OrphanAssets: start {assets: 3}",
                  "default OrphanAssets: Found Orphan: " + logText(m_folder.url("b.epub")),
                  "debug OrphanAsset: Asset available: " + logText(m_folder.url("a.epub")),
                  "default OrphanAssets: Found Orphan: (null)"}));
}

TEST_F(Reconciling, EmptyInputsGiveEmptyLists) {
    EXPECT_TRUE(m_manager->orphanAssetsInAssets_error({}).empty());
    EXPECT_TRUE(m_manager->assetsForURLs_missingFromAssets_error({}, {}).empty());
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

}  // namespace
}  // namespace parvel::testing
