#include "parvel/filemanager/PVAssetMetadataFileManager.h"

#include <gtest/gtest.h>

#include "parvel/xattr/PNMetadataXattr.h"
#include "tests/support/AttributeFolder.h"
#include "tests/support/Records.h"

namespace parvel::testing {
namespace {

TEST(FileManager, MakesItsServicesWhereNoneIsGiven) {
    const auto first = PVAssetMetadataFileManager::init();
    const auto second = PVAssetMetadataFileManager::initWithFileManager(nullptr);

    ASSERT_TRUE(first->fileManager() && first->fileCoordinator());
    ASSERT_TRUE(second->fileManager() && second->fileCoordinator());
    EXPECT_NE(first->fileManager(), second->fileManager());
    EXPECT_NE(first->fileCoordinator(), second->fileCoordinator());
}

TEST(FileManager, KeepsTheGivenServiceAndMakesACoordinator) {
    const auto service = FileSystemService::makeDefault();

    const auto manager = PVAssetMetadataFileManager::initWithFileManager(service);

    EXPECT_EQ(manager->fileManager(), service);
    EXPECT_TRUE(manager->fileCoordinator());
}

TEST(FileManager, ReleasesItsServicesWithItself) {
    auto manager = PVAssetMetadataFileManager::init();
    const std::weak_ptr<FileSystemService> service = manager->fileManager();
    const std::weak_ptr<FileCoordinator> coordinator = manager->fileCoordinator();

    manager.reset();

    EXPECT_TRUE(service.expired());
    EXPECT_TRUE(coordinator.expired());
}

TEST(FileManager, ItsServicesCanBeReplaced) {
    const auto manager = PVAssetMetadataFileManager::init();
    const auto service = FileSystemService::makeDefault();
    const auto coordinator = FileCoordinator::makeDefault();

    manager->setFileManager(service);
    manager->setFileCoordinator(coordinator);

    EXPECT_EQ(manager->fileManager(), service);
    EXPECT_EQ(manager->fileCoordinator(), coordinator);
}

TEST(FileManager, HasOneFormatterOfDatesThatReadsItsOwnTextBack) {
    const Date noon{86400.0 * 3000 + 43200};

    const String text = PVAssetMetadataFileManager::stringFromMetadataDate(noon);
    const auto day = PVAssetMetadataFileManager::metadataDateFromString(text);

    ASSERT_TRUE(day);
    EXPECT_EQ(PVAssetMetadataFileManager::stringFromMetadataDate(*day), text);
    EXPECT_EQ(&PVAssetMetadataFileManager::dateFormatter(),
              &PVAssetMetadataFileManager::dateFormatter());
}

TEST(FileManager, ADateTextThatTheFormatterDidNotMakeIsNone) {
    EXPECT_EQ(PVAssetMetadataFileManager::metadataDateFromString("2001-01-01"), std::nullopt);
    EXPECT_EQ(PVAssetMetadataFileManager::metadataDateFromString(""), std::nullopt);
}

class FileManagerAttributes : public AttributeFolder {
protected:
    std::optional<Dictionary> attributesOf(const AssetPtr& asset) {
        return PVAssetMetadataFileManager::init()->extendedAttributesForAsset_error(asset,
                                                                                    &m_error);
    }

    std::optional<Error> m_error;
};

TEST_F(FileManagerAttributes, AreThoseOfTheAssetsFile) {
    const URL url = file();
    setStored(url, PNMetadataXattrTitle, "T");

    EXPECT_EQ(attributesOf(PVAssetMetadata::metadataWithURL_dictionary(url, nullptr)),
              (Dictionary{{String(PNMetadataXattrTitle), "T"}}));
    EXPECT_EQ(m_error, std::nullopt);
}

TEST_F(FileManagerAttributes, OfAnAssetWithoutAURLAreMissingTheURL) {
    EXPECT_EQ(attributesOf(emptyRecord()), std::nullopt);

    EXPECT_EQ(m_error, makeMissingURLError());
    EXPECT_TRUE(m_error->userInfo().empty());
}

TEST_F(FileManagerAttributes, ThatCanNotBeReadAreNoneAndLeaveTheErrorUntouched) {
    const auto absent =
        PVAssetMetadata::metadataWithURL_dictionary(m_folder.url("absent.epub"), nullptr);
    m_error = makePOSIXError(EXDEV, std::nullopt);

    EXPECT_EQ(attributesOf(absent), std::nullopt);

    EXPECT_EQ(m_error, makePOSIXError(EXDEV, std::nullopt));
}

}  // namespace
}  // namespace parvel::testing
