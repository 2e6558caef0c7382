#include <gtest/gtest.h>

#include "parvel/platform/PropertyList.h"
#include "parvel/xattr/PNMetadataXattr.h"
#include "tests/support/ManagedFolder.h"
#include "tests/support/RecordedLog.h"
#include "tests/support/Records.h"
#include "tests/support/RefusingServices.h"

namespace parvel::testing {
namespace {

using Lines = std::vector<std::string>;

/// Books as package folders, and what is written into them.
class PersistingMetadata : public ManagedFolder {
protected:
    MutableAssetPtr book(const std::string& name = "a.epub") {
        const Dictionary identity{{"itemId", "77"}, {"itemName", "Title"}};
        return PVAssetMetadata::metadataWithURL_dictionary(makeFolder(name), &identity);
    }
    /// What the store file holds now.
    [[nodiscard]] std::optional<Value> storeFile(const std::string& package = "a.epub") const {
        const std::string bytes = m_folder.read(package + "/BazaarMetadata.plist");
        return PropertyListCodec::host().parse(Data::copyOf(bytes), std::nullopt);
    }
    /// False where the file system keeps no attributes.
    bool giveIdentity(const AssetPtr& asset) {
        return m_manager->setExtendedAttributesForAsset_error(asset);
    }
    [[nodiscard]] std::optional<Value> attribute(const AssetPtr& asset,
                                                 std::string_view name) const {
        const auto attributes = m_manager->extendedAttributesForAsset_error(asset);
        return attributes ? valueOf(attributes->find(name)) : std::nullopt;
    }
    static std::string line(const std::string& text, const AssetPtr& asset) {
        return text + " " + asset->description();
    }
};

TEST_F(PersistingMetadata, TheStoreFileIsTheRecordsStoreFlavour) {
    const auto asset = book();
    asset->setGenre("Crime");
    asset->setWasRedacted(true);
    const Data cover = Data::copyOf("image");
    asset->setCoverImageData(&cover);

    m_manager->persistMetadata(asset);

    EXPECT_EQ(storeFile(), Value(*asset->bazaarMetadataRepresentation()));
    EXPECT_EQ(names("a.epub"), Names{"BazaarMetadata.plist"});
}

TEST_F(PersistingMetadata, TheStoreFileIsAnXMLPropertyList) {
    m_manager->persistMetadata(book());

    const std::string text = m_folder.read("a.epub/BazaarMetadata.plist");
    EXPECT_TRUE(text.starts_with("<?xml version=\"1.0\" encoding=\"UTF-8\"?>"));
    EXPECT_NE(text.find("<plist version=\"1.0\">"), std::string::npos);
}

TEST_F(PersistingMetadata, TheFirstStoreFileIsBackedUpForGood) {
    const auto asset = book();
    m_folder.write("a.epub/BazaarMetadata.plist", "original");

    m_manager->persistMetadata(asset);
    asset->setGenre("Crime");
    m_manager->persistMetadata(asset);

    EXPECT_EQ(m_folder.read("a.epub/BazaarMetadata-original.plist"), "original");
    EXPECT_EQ(storeFile(), Value(*asset->bazaarMetadataRepresentation()));
}

TEST_F(PersistingMetadata, ABookPersistedWithAnIdentityOnDiskLogsEachStep) {
    const auto asset = book();
    if (!giveIdentity(asset))
        GTEST_SKIP() << "no extended attributes here";
    m_folder.write("a.epub/BazaarMetadata.plist", "original");
    asset->setTitle("New Title");
    RecordedLog log;

    m_manager->persistMetadata(asset);

    EXPECT_EQ(log.lines(),
              (Lines{"debug PersistMetadata: start",
                     "debug persistMetadata: Persisted updated book metadata",
                     line("debug persistXattrMetadata: xattr updated for assetMetadata", asset)}));
    EXPECT_EQ(attribute(asset, PNMetadataXattrTitle), Value("New Title"));
}

TEST_F(PersistingMetadata, AFailedBackupIsLoggedAndTheStoreFileWrittenAllTheSame) {
    const auto asset = book();
    RecordedLog log;

    m_manager->persistMetadata(asset);

    EXPECT_EQ(
        log.lines(),
        (Lines{"debug PersistMetadata: start", "error Failed to backup BazaarMetadata.plist",
               "debug persistMetadata: Persisted updated book metadata",
               line("debug persistXattrMetadata: nothing to save for assetMetadata", asset)}));
    EXPECT_EQ(names("a.epub"), Names{"BazaarMetadata.plist"});
}

TEST_F(PersistingMetadata, AFailedCopyLeavesNoBackup) {
    const auto asset = book();
    m_folder.write("a.epub/BazaarMetadata.plist", "original");
    m_manager->setFileManager(std::make_shared<RefusingFileSystem>(
        [](auto act, const URL&) { return act == RefusingFileSystem::Act::Copy; }));

    m_manager->persistMetadata(asset);

    EXPECT_EQ(names("a.epub"), Names{"BazaarMetadata.plist"});
    EXPECT_EQ(storeFile(), Value(*asset->bazaarMetadataRepresentation()));
}

TEST_F(PersistingMetadata, NothingIsWrittenIntoAZipFileButItsAttributes) {
    const auto asset = this->asset("a.epub", "zip");
    asset->setGeneratedID("ID");
    asset->setTitle("Title");
    if (!giveIdentity(asset))
        GTEST_SKIP() << "no extended attributes here";
    asset->setTitle("New Title");
    RecordedLog log;

    m_manager->persistMetadata(asset);

    EXPECT_EQ(
        log.lines(),
        (Lines{"debug PersistMetadata: start", "debug persistMetadata: Asset is compressed -- Bail",
               line("debug persistXattrMetadata: xattr updated for assetMetadata", asset)}));
    EXPECT_EQ(m_folder.read("a.epub"), "zip");
    EXPECT_EQ(attribute(asset, PNMetadataXattrTitle), Value("New Title"));
}

TEST_F(PersistingMetadata, AFoliumPackageIsABook) {
    const auto asset = book("a.folium");

    m_manager->persistMetadata(asset);

    EXPECT_EQ(storeFile("a.folium"), Value(*asset->bazaarMetadataRepresentation()));
}

TEST_F(PersistingMetadata, APDFHasItsAttributesAlone) {
    const auto pdf = asset("a.pdf");
    RecordedLog log;

    m_manager->persistMetadata(pdf);

    EXPECT_EQ(log.lines(),
              (Lines{"debug PersistMetadata: start",
                     line("debug persistXattrMetadata: nothing to save for assetMetadata", pdf)}));
    EXPECT_EQ(names(), Names{"a.pdf"});
}

TEST_F(PersistingMetadata, AnAudiobookHasNothingWritten) {
    const auto audiobook = asset("a.m4a");
    RecordedLog log;

    m_manager->persistMetadata(audiobook);
    m_manager->persistXattrMetadata(audiobook);

    EXPECT_EQ(log.lines(), Lines{"debug PersistMetadata: start"});
}

TEST_F(PersistingMetadata, NoRecordIsNothingToWrite) {
    RecordedLog log;

    m_manager->persistMetadata(nullptr);
    m_manager->persistXattrMetadata(nullptr);

    EXPECT_EQ(log.lines(), Lines{"debug PersistMetadata: start"});
}

TEST_F(PersistingMetadata, AValueThatNoPropertyListHoldsLeavesTheOldStoreFile) {
    const auto asset = book();
    m_folder.write("a.epub/BazaarMetadata.plist", "original");
    asset->setGenre("a\x01z");
    RecordedLog log;

    m_manager->persistMetadata(asset);

    EXPECT_EQ(m_folder.read("a.epub/BazaarMetadata.plist"), "original");
    EXPECT_EQ(m_folder.read("a.epub/BazaarMetadata-original.plist"), "original");
    ASSERT_EQ(log.lines().size(), 3U);
    EXPECT_EQ(log.lines()[1], "error persistMetadata: Failed to create metadata plist");
    EXPECT_TRUE(log.lines()[2].starts_with("debug persistXattrMetadata:"));
}

TEST_F(PersistingMetadata, AFailedWriteLeavesTheOldStoreFileAndGoesOnToTheAttributes) {
    const auto asset = book();
    if (!giveIdentity(asset))
        GTEST_SKIP() << "no extended attributes here";
    m_folder.write("a.epub/BazaarMetadata.plist", "original");
    asset->setGenre("Crime");
    const RefusingFileWriter writer;
    RecordedLog log;

    m_manager->persistMetadata(asset);

    EXPECT_EQ(m_folder.read("a.epub/BazaarMetadata.plist"), "original");
    EXPECT_EQ(log.lines(),
              (Lines{"debug PersistMetadata: start",
                     "error persistMetadata: Failed to persist updated book metadata",
                     line("debug persistXattrMetadata: xattr updated for assetMetadata", asset)}));
    EXPECT_EQ(attribute(asset, PNMetadataXattrGenre), Value("Crime"));
}

TEST_F(PersistingMetadata, AMissingBookFailsEveryStep) {
    const auto asset = PVAssetMetadata::metadataWithURL_dictionary(m_folder.url("a.epub"), nullptr);
    RecordedLog log;

    m_manager->persistMetadata(asset);

    EXPECT_EQ(
        log.lines(),
        (Lines{"debug PersistMetadata: start", "error Failed to get directory status",
               "error Failed to backup BazaarMetadata.plist",
               "error persistMetadata: Failed to persist updated book metadata",
               line("debug persistXattrMetadata: nothing to save for assetMetadata", asset)}));
    EXPECT_EQ(names(), Names{});
}

TEST_F(PersistingMetadata, ABookWithoutURLFailsEveryStep) {
    const auto asset = emptyRecord();
    asset->setAssetType(PVAssetTypeEPub);
    RecordedLog log;

    m_manager->persistMetadata(asset);

    EXPECT_EQ(
        log.lines(),
        (Lines{"debug PersistMetadata: start", "error Failed to get directory status",
               "error Failed to backup BazaarMetadata.plist",
               "error persistMetadata: Failed to persist updated book metadata",
               line("debug persistXattrMetadata: nothing to save for assetMetadata", asset)}));
}

TEST_F(PersistingMetadata, AStoreFileThatIsALinkIsReplacedAndItsTargetLeftAlone) {
    const auto asset = book();
    m_folder.write("outside", "outside");
    std::filesystem::create_symlink("../outside", m_folder / "a.epub/BazaarMetadata.plist");

    m_manager->persistMetadata(asset);

    EXPECT_EQ(m_folder.read("outside"), "outside");
    EXPECT_FALSE(std::filesystem::is_symlink(m_folder / "a.epub/BazaarMetadata.plist"));
    EXPECT_EQ(storeFile(), Value(*asset->bazaarMetadataRepresentation()));
}

TEST_F(PersistingMetadata, TheBackupOfAStoreFileThatIsALinkIsThatLink) {
    const auto asset = book();
    m_folder.write("outside", "outside");
    std::filesystem::create_symlink("../outside", m_folder / "a.epub/BazaarMetadata.plist");

    m_manager->persistMetadata(asset);

    EXPECT_EQ(std::filesystem::read_symlink(m_folder / "a.epub/BazaarMetadata-original.plist"),
              "../outside");
}

TEST_F(PersistingMetadata, ABackupThatIsADanglingLinkIsKeptToo) {
    const auto asset = book();
    m_folder.write("a.epub/BazaarMetadata.plist", "original");
    std::filesystem::create_symlink("missing", m_folder / "a.epub/BazaarMetadata-original.plist");
    RecordedLog log;

    m_manager->persistMetadata(asset);

    EXPECT_EQ(log.lines()[1], "error Failed to backup BazaarMetadata.plist");
    EXPECT_FALSE(std::filesystem::exists(m_folder / "a.epub/missing"));
    EXPECT_EQ(std::filesystem::read_symlink(m_folder / "a.epub/BazaarMetadata-original.plist"),
              "missing");
}

TEST_F(PersistingMetadata, ARewrittenStoreFileKeepsItsMode) {
    const auto asset = book();
    m_folder.write("a.epub/BazaarMetadata.plist", "original");
    std::filesystem::permissions(m_folder / "a.epub/BazaarMetadata.plist",
                                 std::filesystem::perms(0604));

    m_manager->persistMetadata(asset);

    EXPECT_EQ(std::filesystem::status(m_folder / "a.epub/BazaarMetadata.plist").permissions(),
              std::filesystem::perms(0604));
}

TEST_F(PersistingMetadata, AttributesOfAnotherAssetAreNeverOverwritten) {
    const auto asset = book();
    if (!giveIdentity(asset))
        GTEST_SKIP() << "no extended attributes here";
    const auto other = book();
    other->setStoreID(nullptr);
    other->setGeneratedID("other");
    other->setTitle("Other");

    m_manager->persistXattrMetadata(other);

    EXPECT_EQ(attribute(asset, PNMetadataXattrTitle), Value("Title"));
    EXPECT_EQ(attribute(asset, PNMetadataXattrAssetID), Value("77"));
}

}  // namespace
}  // namespace parvel::testing
