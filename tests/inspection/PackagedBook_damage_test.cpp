#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "parvel/inspection/_PVxPubMetadataInspector.h"
#include "tests/support/PackageDocuments.h"
#include "tests/support/RecordedLog.h"
#include "tests/support/TemporaryDirectory.h"
#include "tests/support/ZipBuilder.h"

namespace parvel::testing {
namespace {

using ::testing::ElementsAre;

/// A zipped book with a store file and a cover, in which an entry is not what its checksum says.
class DamagedBook : public ::testing::Test {
protected:
    URL bookWithDamaged(std::string_view damaged) {
        const std::pair<std::string_view, std::string> entries[] = {
            {"META-INF/container.xml", containerText("a.opf")},
            {"a.opf", opfText("", R"(<item id="cover" href="c.jpg"/>)")},
            {"BazaarMetadata.plist", storeFileText("")},
            {"c.jpg", "cover"}};
        ZipBuilder archive;
        for (const auto& [name, content] : entries) {
            const std::uint32_t checksum = crc32Of(content) + (name == damaged ? 1 : 0);
            archive.entry({.name = std::string(name), .content = content, .crc = checksum});
        }
        return URL::fileURLWithPath(m_folder.write("book.epub", archive.bytes()));
    }
    std::shared_ptr<_PVAggregatedAssetMetadata> read(const URL& url) {
        return _PVxPubMetadataInspector::metadataForAssetAtURL_preloadedMetadata_includeCover_error(
            url, nullptr, /*includeCover=*/true, &m_error);
    }

    TemporaryDirectory m_folder;
    std::optional<Error> m_error;
};

TEST_F(DamagedBook, WithoutAWholeContainerIsAsWithoutAny) {
    const URL url = bookWithDamaged("META-INF/container.xml");
    const RecordedLog log;

    EXPECT_FALSE(read(url));

    EXPECT_EQ(m_error, std::nullopt);
    EXPECT_THAT(log.lines(),
                ElementsAre("debug metadataCompressed: start", "default Failed to get opf data",
                            "debug metadataCompressed: end {success: 0"));
}

TEST_F(DamagedBook, WithoutAWholeOPFIsAsWithoutAny) {
    const URL url = bookWithDamaged("a.opf");
    const RecordedLog log;

    EXPECT_FALSE(read(url));

    EXPECT_EQ(m_error, makeFileError(PVFileErrorCode::Corrupt, url));
    EXPECT_THAT(
        log.lines(),
        ElementsAre("debug metadataCompressed: start", "default Failed to extract opf data",
                    "default Failed to get opf data", "debug metadataCompressed: end {success: 0"));
}

TEST_F(DamagedBook, WithoutAWholeStoreFileHasNoStoreRecord) {
    const auto aggregate = read(bookWithDamaged("BazaarMetadata.plist"));

    ASSERT_TRUE(aggregate);
    EXPECT_EQ(aggregate->bazaarMetadata(), nullptr);
    EXPECT_EQ(aggregate->coverImageData(), Data::copyOf("cover"));
    EXPECT_EQ(m_error, std::nullopt);
}

TEST_F(DamagedBook, WithoutAWholeCoverHasNoCover) {
    const auto aggregate = read(bookWithDamaged("c.jpg"));

    ASSERT_TRUE(aggregate);
    EXPECT_TRUE(aggregate->bazaarMetadata());
    EXPECT_EQ(aggregate->coverImageData(), std::nullopt);
    EXPECT_EQ(m_error, std::nullopt);
}

}  // namespace
}  // namespace parvel::testing
