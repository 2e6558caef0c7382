#include <filesystem>
#include <map>
#include <string>

#include <gtest/gtest.h>

#include "parvel/inspection/_PVxPubMetadataInspector.h"
#include "parvel/platform/FileReader.h"
#include "parvel/platform/Service.h"
#include "parvel/platform/ZipArchive.h"
#include "tests/support/EpubBuilder.h"
#include "tests/support/TemporaryDirectory.h"

namespace parvel::testing {
namespace {

class PackageBudgets : public ::testing::Test {
protected:
    /// A book that is whole, with a store file and a cover.
    static EpubBuilder book() {
        return EpubBuilder{}
            .opf(opfText("", R"(<item id="cover" href="c.jpg"/>)"))
            .store(storeFileText(""))
            .file("OPS/c.jpg", "cover");
    }
    /// The book as a folder in which one file is one byte over the budget.
    URL bookWithLong(std::string_view name, std::uint64_t budget) {
        const URL url = book().expand(m_folder / "book.epub");
        std::filesystem::resize_file(url.path() + "/" + std::string(name), budget + 1);
        return url;
    }
    std::shared_ptr<_PVAggregatedAssetMetadata> read(const URL& url) {
        return _PVxPubMetadataInspector::metadataForAssetAtURL_preloadedMetadata_includeCover_error(
            url, nullptr, /*includeCover=*/true, &m_error);
    }

    TemporaryDirectory m_folder;
    std::optional<Error> m_error;
};

TEST_F(PackageBudgets, ALongContainerDocumentCanNotBeRead) {
    const URL url = bookWithLong("META-INF/container.xml", budget::packageDocument);

    EXPECT_FALSE(read(url));

    EXPECT_EQ(m_error, makeFileError(PVFileErrorCode::Corrupt,
                                     url.appendingPathComponent("META-INF/container.xml")));
}

TEST_F(PackageBudgets, ALongOPFCanNotBeRead) {
    const URL url = bookWithLong("OPS/content.opf", budget::packageDocument);

    EXPECT_FALSE(read(url));

    EXPECT_EQ(m_error, makeFileError(PVFileErrorCode::Corrupt,
                                     url.appendingPathComponent("OPS/content.opf")));
}

TEST_F(PackageBudgets, ALongStoreFileCountsAsAbsent) {
    const auto aggregate = read(bookWithLong("BazaarMetadata.plist", budget::storeFile));

    ASSERT_TRUE(aggregate);
    EXPECT_EQ(aggregate->bazaarMetadata(), nullptr);
    EXPECT_TRUE(aggregate->coverImageData());
    EXPECT_EQ(m_error, std::nullopt);
}

TEST_F(PackageBudgets, ALongCoverCountsAsAbsent) {
    const auto aggregate = read(bookWithLong("OPS/c.jpg", budget::cover));

    ASSERT_TRUE(aggregate);
    EXPECT_EQ(aggregate->coverImageData(), std::nullopt);
    EXPECT_TRUE(aggregate->bazaarMetadata());
    EXPECT_EQ(m_error, std::nullopt);
}

/// Opens the host's archives and notes the limit of each entry that is read.
class NotingZipReader : public ZipReader {
public:
    std::unique_ptr<ZipArchive> open(const URL& url, ErrorOut error) override {
        return std::make_unique<NotingArchive>(host().open(url, error), m_limits);
    }

    std::map<std::string, std::uint64_t, std::less<>> m_limits;

private:
    class NotingArchive : public ZipArchive {
    public:
        NotingArchive(std::unique_ptr<ZipArchive> archive,
                      std::map<std::string, std::uint64_t, std::less<>>& limits)
            : m_archive(std::move(archive)), m_noted(limits) {}
        std::optional<Data> readEntry(std::string_view name, std::uint64_t limit) override {
            m_noted.emplace(name, limit);
            return m_archive->readEntry(name, limit);
        }

    private:
        std::unique_ptr<ZipArchive> m_archive;
        std::map<std::string, std::uint64_t, std::less<>>& m_noted;
    };

    Service<ZipReader>::Replacement m_replacement{*this};
};

TEST_F(PackageBudgets, AnArchivesEntriesAreReadWithinTheSame) {
    const URL url = book().zip(m_folder / "book.epub");
    const NotingZipReader reader;

    ASSERT_TRUE(read(url));

    const std::map<std::string, std::uint64_t, std::less<>> expected{
        {"META-INF/container.xml", budget::packageDocument},
        {"OPS/content.opf", budget::packageDocument},
        {"BazaarMetadata.plist", budget::storeFile},
        {"OPS/c.jpg", budget::cover}};
    EXPECT_EQ(reader.m_limits, expected);
}

}  // namespace
}  // namespace parvel::testing
