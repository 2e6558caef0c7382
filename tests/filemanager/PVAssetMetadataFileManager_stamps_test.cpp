#include <gtest/gtest.h>

#include "tests/support/ManagedFolder.h"
#include "tests/support/ReadOnlyAttributes.h"
#include "tests/support/RecordedLog.h"
#include "tests/support/Records.h"
#include "tests/support/RefusingSizeQuery.h"

namespace parvel::testing {
namespace {

using Lines = std::vector<std::string>;

class StampingAssets : public ManagedFolder {};

TEST_F(StampingAssets, APlacedAssetGetsSizeInsertionDateAndAttributes) {
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

TEST_F(StampingAssets, AnAssetThatHasItsSizeIsKeptAndItsAttributesWritten) {
    const auto book = asset("a.epub");
    book->setGeneratedID("ID");
    book->setAllocatedSize(0);

    EXPECT_EQ(m_manager->updateWithKeyAttributesAssetMetadata_error(book, &m_error), book);

    EXPECT_EQ(m_manager->extendedAttributesForAsset_error(book)->size(), 1U);
}

TEST_F(StampingAssets, AnAssetWithoutSizeGetsANewInsertionDateToo) {
    const auto book = asset("a.epub");
    book->setInsertionDate(Date{1000});

    const AssetPtr stamped = m_manager->updateWithKeyAttributesAssetMetadata_error(book, &m_error);

    ASSERT_TRUE(stamped);
    EXPECT_GT(stamped->insertionDate().secondsSinceReferenceDate, 1000);
    EXPECT_EQ(book->insertionDate(), Date{1000});
}

TEST_F(StampingAssets, AnAssetThatHasItsSizeClearsAStaleErrorToo) {
    const auto book = asset("a.epub");
    book->setGeneratedID("ID");
    book->setAllocatedSize(7);
    m_error = makeMissingURLError();

    EXPECT_EQ(m_manager->updateWithKeyAttributesAssetMetadata_error(book, &m_error), book);

    EXPECT_FALSE(m_error);
}

TEST_F(StampingAssets, AnAssetThatCarriesItsIdentityIsStampedWithoutAnError) {
    const auto book = asset("a.epub");
    book->setGeneratedID("ID");
    ASSERT_TRUE(m_manager->setExtendedAttributesForAsset_error(book));
    book->setTitle("New Title");

    const AssetPtr stamped = m_manager->updateWithKeyAttributesAssetMetadata_error(book, &m_error);

    ASSERT_TRUE(stamped);
    EXPECT_FALSE(m_error);
    EXPECT_EQ(m_manager->extendedAttributesForAsset_error(stamped)->size(), 1U);
}

TEST_F(StampingAssets, AttributesThatCanNotBeWrittenAreTheError) {
    const ReadOnlyAttributes attributes;
    const auto book = asset("a.epub");
    book->setGeneratedID("ID");

    const AssetPtr stamped = m_manager->updateWithKeyAttributesAssetMetadata_error(book, &m_error);

    ASSERT_TRUE(stamped);
    EXPECT_TRUE(stamped->_hasAllocatedSize());
    EXPECT_EQ(m_error, makePOSIXError(EROFS, m_folder.url("a.epub")));
}

/// Tells of no item whether it is a directory.
class BlindQueries : public RefusingSizeQuery {
public:
    std::optional<bool> isDirectory(const URL& url, ErrorOut error) override {
        return fail(error, makePOSIXError(EIO, url));
    }
};

TEST_F(StampingAssets, AnErrorOfTheSizeGivesWayToTheAttributesResult) {
    const BlindQueries queries;
    const auto book = asset("a.epub");
    book->setGeneratedID("ID");
    RecordedLog log;

    const AssetPtr stamped = m_manager->updateWithKeyAttributesAssetMetadata_error(book, &m_error);

    ASSERT_TRUE(stamped);
    EXPECT_TRUE(stamped->_hasAllocatedSize());
    EXPECT_EQ(stamped->allocatedSize(), 0U);
    EXPECT_FALSE(m_error);
    EXPECT_EQ(log.lines(), Lines{"error Failed to state file for directory"});
}

TEST_F(StampingAssets, ARecordWithoutURLIsStampedAndMissesItsURL) {
    const auto headless = emptyRecord();

    const AssetPtr stamped =
        m_manager->updateWithKeyAttributesAssetMetadata_error(headless, &m_error);

    ASSERT_TRUE(stamped);
    EXPECT_TRUE(stamped->_hasAllocatedSize());
    EXPECT_EQ(m_error, makeMissingURLError());
}

TEST_F(StampingAssets, NoRecordIsNoneAndNoError) {
    m_error = makeMissingURLError();

    EXPECT_FALSE(m_manager->updateWithKeyAttributesAssetMetadata_error(nullptr, &m_error));

    EXPECT_FALSE(m_error);
}

TEST_F(StampingAssets, NobodyNeedsToAskForTheError) {
    const AssetPtr stamped = m_manager->updateWithKeyAttributesAssetMetadata_error(asset("a.epub"));

    ASSERT_TRUE(stamped);
    EXPECT_TRUE(stamped->_hasAllocatedSize());
}

TEST_F(StampingAssets, AStampedRecordComesBackAlsoWhenItsAttributesCouldNotBeWritten) {
    const auto book = asset("a.epub");

    const AssetPtr stamped = m_manager->updateWithKeyAttributesAssetMetadata_error(book, &m_error);

    ASSERT_TRUE(stamped);
    EXPECT_TRUE(stamped->_hasAllocatedSize());
    EXPECT_EQ(m_error, makeNoIdentityError());
}

TEST_F(StampingAssets, AStaleErrorIsClearedByAStampThatSucceeds) {
    const auto book = asset("a.epub");
    book->setGeneratedID("ID");
    m_error = makeMissingURLError();

    EXPECT_TRUE(m_manager->updateWithKeyAttributesAssetMetadata_error(book, &m_error));

    EXPECT_FALSE(m_error);
}

TEST_F(StampingAssets, AMissingFileIsStampedWithNoSizeAndSaysWhy) {
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
