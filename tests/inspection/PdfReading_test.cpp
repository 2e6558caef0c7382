#include <cerrno>
#include <filesystem>

#include <gtest/gtest.h>
#include <sys/stat.h>

#include "parvel/foundation/PVCasts.h"
#include "parvel/inspection/PVAssetMetadataInspector.h"
#include "parvel/metadata/PVMutableAssetMetadata.h"
#include "parvel/platform/ImageCodec.h"
#include "parvel/platform/PdfDocument.h"
#include "parvel/platform/ReaderProgram.h"
#include "parvel/platform/Service.h"
#include "tests/support/Colours.h"
#include "tests/support/LargePdf.h"
#include "tests/support/PdfBuilder.h"
#include "tests/support/RecordedLog.h"
#include "tests/support/TemporaryDirectory.h"

namespace parvel::testing {
namespace {

/// Whole documents, read by the helper program.
class PdfReading : public ::testing::Test {
protected:
    AssetPtr read(const PdfBuilder& document, bool includeCover = false) {
        m_folder.write("Walden.pdf", document.bytes());
        return PVAssetMetadataInspector::_metadataForAssetAtURL_includeCover_error(
            m_url, includeCover, &m_error);
    }
    /// The cover of a page that is red in its lower left corner.
    std::optional<Image> coverOfMarkedPage(std::string_view entries) {
        const AssetPtr asset =
            read(PdfBuilder{}.page(entries, filled("1 0 0", "0 0 200 200")), true);
        const auto* bytes = asset ? PVDynamicCast(classOf<Data>, asset->coverImageData()) : nullptr;
        return bytes ? Service<ImageCodec>::current().decode(*bytes) : std::nullopt;
    }

    TemporaryDirectory m_folder;
    URL m_url = m_folder.url("Walden.pdf");
    std::optional<Error> m_error;
};

TEST_F(PdfReading, GivesTheRecordOfADocument) {
    const AssetPtr asset = read(PdfBuilder{}
                                    .information("/Author (Thoreau) /Subject (Essay) "
                                                 "/Title (Another) /Keywords (woods) "
                                                 "/CreationDate (D:20010101000001Z) "
                                                 "/ModDate (D:20010101000002Z)")
                                    .page("")
                                    .page(""));

    ASSERT_TRUE(asset);
    EXPECT_EQ(m_error, std::nullopt);
    EXPECT_EQ(asset->title(), "Walden");
    EXPECT_EQ(asset->author(), "Thoreau");
    EXPECT_EQ(*asset->genre(), Value("Essay"));
    EXPECT_EQ(*asset->releaseDate(), Value(Date{1}));
    EXPECT_EQ(*asset->updateDate(), Value(Date{2}));
    EXPECT_EQ(*asset->modificationDate(), Value(Date{2}));
    EXPECT_EQ(asset->pageCount(), 2U);
    EXPECT_FALSE(asset->isLocked());
    EXPECT_EQ(asset->assetID().value_or("").size(), 32U);
}

TEST_F(PdfReading, TakesNothingFromOtherEntriesOfTheInformation) {
    const AssetPtr asset = read(PdfBuilder{}
                                    .information("/Title (Another) /Keywords (woods) /Creator (C) "
                                                 "/Producer (P) /Trapped /True /Own (entry)")
                                    .page(""));

    ASSERT_TRUE(asset);
    std::vector<std::string> keys;
    for (const auto& [name, value] : *asset->backingDictionary())
        keys.push_back(name);
    EXPECT_EQ(keys, (std::vector<std::string>{"PVDisplayName", "PVGeneratedItemId",
                                              "PVGenerationCount", "PVIsLocked", "explicit",
                                              "itemName", "pageCount", "path", "sourcePath"}));
    EXPECT_EQ(asset->title(), "Walden");
}

/// What encrypts a document of the author "Thoreau" for its owner alone: it opens without a
/// password.
PdfBuilder documentWithOwnerPassword() {
    return PdfBuilder{}
        .information("/Author <166C306C7855FF>")
        .trailer(
            "/Encrypt << /Filter /Standard /V 1 /R 2 /P -4 "
            "/O <C92422687FACEE686E373F10B5C7D04738053152F7E2EE30E11C69EC442576AB> "
            "/U <1CDD99426EDD37A3C2CD10E4FC8FB3A0B4414761A73AF9DF968B3AB8BDB8D94E> >> "
            "/ID [<01> <01>]")
        .page("");
}

TEST_F(PdfReading, ReadsADocumentThatOnlyItsOwnersPasswordProtectsAndDoesNotMarkIt) {
    const AssetPtr asset = read(documentWithOwnerPassword(), /*includeCover=*/true);

    ASSERT_TRUE(asset);
    EXPECT_FALSE(asset->isLocked());
    EXPECT_EQ(asset->author(), "Thoreau");
    EXPECT_EQ(asset->pageCount(), 1U);
    EXPECT_TRUE(asset->coverImageData());
}

/// Documents of one page and a hole, read with an identity that is kept, so that they are not read
/// whole.
class LargePdfReading : public PdfReading {
protected:
    void expectReadAndDrawn(std::uint64_t hole) {
        if (const std::error_code problem = writeLargePdf(m_url.path(), hole))
            GTEST_SKIP() << "no files of that size here: " << problem.message();
        const Dictionary kept{{"PVGeneratedItemId", "KEPT"}};
        const AssetPtr asset = PVAssetMetadataInspector::
            _pdf_metadataForAssetAtURL_preloadedMetadata_includeCover_error(
                m_url, PVAssetMetadata::metadataWithURL_dictionary(m_url, &kept),
                /*includeCover=*/true, &m_error);

        ASSERT_TRUE(asset) << hole;
        EXPECT_EQ(asset->author(), "Thoreau") << hole;
        EXPECT_EQ(asset->pageCount(), 1U) << hole;
        EXPECT_EQ(asset->assetID(), "KEPT") << hole;
        EXPECT_TRUE(asset->coverImageData()) << hole;
    }

    static constexpr std::uint64_t twoGigabytes = std::uint64_t{1} << 31;
};

TEST_F(LargePdfReading, ReadsAndDrawsADocumentOfAlmostTwoGigabytes) {
    expectReadAndDrawn(twoGigabytes - 5000);
}

TEST_F(LargePdfReading, ReadsAndDrawsLargerOnes) {
    expectReadAndDrawn(twoGigabytes);
    expectReadAndDrawn(2 * twoGigabytes);
    expectReadAndDrawn(4 * twoGigabytes);
}

TEST_F(LargePdfReading, RefusesALargeFileThatIsNoDocumentAsCorrupt) {
    m_folder.write("Walden.pdf", "text");
    std::error_code problem;
    std::filesystem::resize_file(m_url.path(), 2 * twoGigabytes, problem);
    if (problem)
        GTEST_SKIP() << "no files of that size here: " << problem.message();

    EXPECT_FALSE(PdfDocuments::host().open(m_url, &m_error));
    EXPECT_EQ(m_error, makeFileError(PVFileErrorCode::Corrupt, m_url));
}

TEST_F(PdfReading, DrawsTheFirstPageOnWhite) {
    const auto cover = coverOfMarkedPage("");

    ASSERT_TRUE(cover);
    ASSERT_EQ(cover->width, 293U);
    ASSERT_EQ(cover->height, 380U);
    EXPECT_EQ(cover->row(375)[5], red);
    EXPECT_EQ(cover->row(5)[5], white);
    EXPECT_EQ(cover->row(375)[288], white);
}

TEST_F(PdfReading, DrawsATurnedPageAsItIsDisplayed) {
    for (const char* entries : {"/Rotate 90", "/Rotate 450", "/Rotate -270"}) {
        const auto cover = coverOfMarkedPage(entries);

        ASSERT_TRUE(cover) << entries;
        ASSERT_EQ(cover->width, 380U);
        ASSERT_EQ(cover->height, 293U);
        EXPECT_EQ(cover->row(5)[5], red) << entries;
        EXPECT_EQ(cover->row(288)[5], white) << entries;
    }
    const auto back = coverOfMarkedPage("/Rotate -90");
    ASSERT_TRUE(back && back->width == 380 && back->height == 293);
    EXPECT_EQ(back->row(288)[375], red);
    EXPECT_EQ(back->row(5)[5], white);
}

TEST_F(PdfReading, DrawsTheCropBoxAlone) {
    const auto cover = coverOfMarkedPage("/CropBox [100 100 300 500]");

    ASSERT_TRUE(cover);
    ASSERT_EQ(cover->width, 190U);
    ASSERT_EQ(cover->height, 380U);
    EXPECT_EQ(cover->row(375)[5], red);
    EXPECT_EQ(cover->row(375)[185], white);
}

TEST_F(PdfReading, DrawsASmallPageLarger) {
    const auto cover = coverOfMarkedPage("/MediaBox [0 0 34 38]");

    ASSERT_TRUE(cover);
    EXPECT_EQ(cover->width, 340U);
    EXPECT_EQ(cover->height, 380U);
}

TEST_F(PdfReading, GivesADocumentWithoutPagesNoCover) {
    const AssetPtr asset = read(PdfBuilder{}, /*includeCover=*/true);

    ASSERT_TRUE(asset);
    EXPECT_EQ(asset->pageCount(), 0U);
    EXPECT_FALSE(asset->coverImageData());
}

TEST_F(PdfReading, FailsForAFolder) {
    std::filesystem::create_directory(m_url.path());
    RecordedLog log;

    EXPECT_FALSE(PVAssetMetadataInspector::metadataForAssetAtURL_error(m_url, &m_error));

    EXPECT_EQ(m_error, makePOSIXError(EISDIR, m_url));
    ASSERT_GE(log.lines().size(), 3U);
    EXPECT_EQ(log.lines()[1], "debug Getting pdf metadata");
    EXPECT_EQ(log.lines()[2], "default Failed to read PDF contents");
}

TEST_F(PdfReading, FailsAtOnceForAPipe) {
    ASSERT_EQ(::mkfifo(m_url.path().c_str(), 0600), 0);

    EXPECT_FALSE(PVAssetMetadataInspector::metadataForAssetAtURL_error(m_url, &m_error));

    EXPECT_EQ(m_error, makeFileError(PVFileErrorCode::Corrupt, m_url));
}

TEST_F(PdfReading, FollowsALinkToADocument) {
    std::filesystem::create_symlink(m_folder.write("elsewhere", PdfBuilder{}.page("").bytes()),
                                    m_url.path());

    const AssetPtr asset = PVAssetMetadataInspector::metadataForAssetAtURL_error(m_url, &m_error);

    ASSERT_TRUE(asset);
    EXPECT_EQ(asset->pageCount(), 1U);
}

TEST_F(PdfReading, FailsWithTheReasonWhereTheHelperIsMissing) {
    setReaderProgramPath(m_folder / "absent");
    RecordedLog log;

    EXPECT_FALSE(read(PdfBuilder{}.page("")));
    setReaderProgramPath("");

    ASSERT_TRUE(m_error);
    EXPECT_EQ(m_error->domain(), PVFileErrorDomain);
    EXPECT_EQ(m_error->code(), 259);
    EXPECT_EQ(*m_error->url(), m_url);
    EXPECT_EQ(m_error->message(), "The helper program parvel-reader can't be started.");
    ASSERT_GE(log.lines().size(), 3U);
    EXPECT_EQ(log.lines()[2], "default Failed to create PDF document");
}

}  // namespace
}  // namespace parvel::testing
