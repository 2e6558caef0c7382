#include <filesystem>
#include <random>

#include <gtest/gtest.h>

#include "parvel/filemanager/PVAssetMetadataFileManager.h"
#include "parvel/inspection/PVAssetMetadataInspector.h"
#include "parvel/metadata/PVAssetMetadata.h"
#include "parvel/platform/CloudStore.h"
#include "tests/support/EpubBuilder.h"
#include "tests/support/SyncthingPair.h"
#include "tests/support/Waiting.h"

namespace parvel::testing {
namespace {

namespace fs = std::filesystem;

std::string randomBytes(std::size_t length) {
    std::mt19937 random(1);
    std::string bytes(length, '\0');
    for (char& byte : bytes)
        byte = static_cast<char>(random());
    return bytes;
}

/// Two daemons in step; the library looks at the second one's folder. Starting them takes seconds,
/// so that one pair serves the whole story.
class SyncthingStory : public ::testing::Test {
protected:
    void SetUp() override {
        if (!SyncthingPair::isInstalled())
            GTEST_SKIP() << "syncthing is not installed";
        m_pair = std::make_unique<SyncthingPair>();
        ASSERT_TRUE(m_pair->isConnected());
    }
    [[nodiscard]] URL here(const std::string& name) const {
        return m_pair->folder().url("second/" + name);
    }
    [[nodiscard]] std::optional<DownloadingStatus> status(const std::string& name) const {
        std::optional<DownloadingStatus> result;
        if (!CloudStore::host().downloadingStatus(here(name), result))
            return std::nullopt;
        return result;
    }
    [[nodiscard]] bool becomes(const std::string& name, DownloadingStatus expected) const {
        return comesTrue([&] { return status(name) == expected; });
    }
    /// Makes a book beside the first folder and renames it in.
    void send(const std::string& name, const std::string& title) const {
        const std::string made = m_pair->folder() / "made.epub";
        EpubBuilder{}.opf(opfText("<dc:title>" + title + "</dc:title>")).zip(made);
        fs::rename(made, m_pair->folder() / ("first/" + name));
    }
    [[nodiscard]] AssetPtr inspected(const std::string& name) const {
        return PVAssetMetadataInspector::metadataForAssetAtURL_error(here(name), nullptr);
    }

    std::unique_ptr<SyncthingPair> m_pair;
};

TEST_F(SyncthingStory, ABookArrivesWholeIsReplacedAndStaysReadable) {
    send("a.epub", "First");
    ASSERT_TRUE(becomes("a.epub", DownloadingStatus::Current));
    AssetPtr asset = inspected("a.epub");
    ASSERT_TRUE(asset);
    EXPECT_EQ(asset->title(), "First");
    EXPECT_TRUE(asset->isUbiquitous());
    const auto manager = PVAssetMetadataFileManager::init();
    manager->setExtendedAttributesForAsset_error(asset);
    const std::optional<String> identity = asset->assetID();

    // The other device's edition wipes the attributes; the content answers.
    send("a.epub", "Second");
    ASSERT_TRUE(comesTrue([&] {
        asset = inspected("a.epub");
        return asset && asset->title() == "Second";
    }));
    EXPECT_NE(asset->assetID(), identity);
    EXPECT_TRUE(becomes("a.epub", DownloadingStatus::Current));
    const auto attributes = manager->extendedAttributesForAsset_error(asset);
    ASSERT_TRUE(attributes);
    EXPECT_TRUE(attributes->empty());
}

TEST_F(SyncthingStory, ALargeItemInTheMiddleOfItsTransferIsNotDownloaded) {
    const std::string bytes = randomBytes(1'000'000);
    m_pair->folder().write("first/big.pdf", bytes);
    m_pair->folder().write("first/p.epub/mimetype", "application/epub+zip");
    m_pair->folder().write("first/p.epub/big", bytes.substr(0, 600'000));

    EXPECT_TRUE(becomes("big.pdf", DownloadingStatus::NotDownloaded));
    EXPECT_FALSE(fs::exists(here("big.pdf").path()));
    EXPECT_TRUE(comesTrue([&] { return fs::exists(here("p.epub").path()); }));
    EXPECT_TRUE(becomes("p.epub", DownloadingStatus::NotDownloaded));

    // Taking the package out waits for the rest of it.
    const auto fileManager = FileSystemService::makeDefault();
    const URL outside = m_pair->folder().url("out.epub");
    std::optional<Error> error;
    EXPECT_TRUE(fileManager->setUbiquitous(false, here("p.epub"), outside, &error));
    EXPECT_FALSE(error);
    EXPECT_EQ(fs::file_size(outside.path() + "/big"), 600'000U);
    EXPECT_TRUE(becomes("big.pdf", DownloadingStatus::Current));
    EXPECT_EQ(m_pair->folder().read("second/big.pdf"), bytes);
}

TEST_F(SyncthingStory, ABookMovedInIsPendingAndThenCurrentOnBothSides) {
    const std::string made = m_pair->folder() / "made.epub";
    EpubBuilder{}.zip(made);
    const auto fileManager = FileSystemService::makeDefault();

    ASSERT_TRUE(fileManager->setUbiquitous(true, URL::fileURLWithPath(made), here("b.epub")));

    EXPECT_EQ(status("b.epub"), DownloadingStatus::Downloaded);
    EXPECT_TRUE(becomes("b.epub", DownloadingStatus::Current));
    EXPECT_TRUE(comesTrue([&] { return fs::exists(m_pair->folder() / "first/b.epub"); }));
    EXPECT_EQ(m_pair->folder().read("first/b.epub"), m_pair->folder().read("second/b.epub"));
}

}  // namespace
}  // namespace parvel::testing
