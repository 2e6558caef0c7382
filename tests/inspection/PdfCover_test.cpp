#include <algorithm>
#include <limits>

#include <gtest/gtest.h>

#include "parvel/inspection/PVAssetMetadataInspector.h"
#include "tests/support/FakePdf.h"

namespace parvel::testing {
namespace {

using Size = std::pair<std::uint32_t, std::uint32_t>;

std::optional<Image> drawnIn(FakePdfPage* page, double width, double height) {
    return PVAssetMetadataInspector::_new_pdf_imageFromPDFPage_imageSize(page, width, height);
}

/// The size of the page's image in the box of a cover; 0 by 0 for none.
Size coverSize(FakePdfPage page) {
    const std::optional<Image> image = drawnIn(&page, 340, 380);
    return image ? Size(image->width, image->height) : Size();
}

TEST(PdfCover, FitsTheBoxInOneDimension) {
    EXPECT_EQ(coverSize({612, 792}), Size(293, 380));         // letter
    EXPECT_EQ(coverSize({595.276, 841.89}), Size(268, 380));  // A4
    EXPECT_EQ(coverSize({200, 400}), Size(190, 380));
    EXPECT_EQ(coverSize({2000, 300}), Size(340, 51));
}

TEST(PdfCover, GrowsFromASmallPage) {
    EXPECT_EQ(coverSize({100, 100}), Size(340, 340));
    EXPECT_EQ(coverSize({0.5, 1}), Size(190, 380));
}

TEST(PdfCover, IsTurnedWithThePage) {
    for (const int rotation : {90, -90, 270, -270, 450, 630, -450})
        EXPECT_EQ(coverSize({612, 792, rotation}), Size(380, 293)) << rotation;
    for (const int rotation : {0, 180, -180, 360, 540, -720})
        EXPECT_EQ(coverSize({612, 792, rotation}), Size(293, 380)) << rotation;
}

// Deliberate: both sides are rounded down, also the one that fills the box.
TEST(PdfCover, LosesAPixelWhereTheScaleIsRounded) {
    EXPECT_EQ(coverSize({400, 563}), Size(269, 379));
    EXPECT_EQ(coverSize({420, 595}), Size(268, 379));
}

TEST(PdfCover, OfAPageWithoutSizeIsNone) {
    EXPECT_EQ(coverSize({0, 0}), Size());
    EXPECT_EQ(coverSize({0, 792}), Size());
    EXPECT_EQ(coverSize({612, 0}), Size());
}

TEST(PdfCover, OfAPageOfAbsurdSizeIsNone) {
    static constexpr double infinite = std::numeric_limits<double>::infinity();
    EXPECT_EQ(coverSize({infinite, 100}), Size());
    EXPECT_EQ(coverSize({std::numeric_limits<double>::quiet_NaN(), 100}), Size());
    EXPECT_EQ(coverSize({1e300, 1e-300}), Size());
}

TEST(PdfCover, AnglesAtTheLimitsOfANumberDoNoHarm) {
    EXPECT_EQ(coverSize({612, 792, std::numeric_limits<int>::min()}), Size(293, 380));
    EXPECT_EQ(coverSize({612, 792, std::numeric_limits<int>::max()}), Size(293, 380));
}

TEST(PdfCover, WithoutAPageIsBlankAndWhite) {
    const std::optional<Image> image = drawnIn(nullptr, 340, 380);

    ASSERT_TRUE(image);
    EXPECT_EQ(Size(image->width, image->height), Size(266, 380));
    for (std::uint32_t y = 0; y < image->height; ++y)
        ASSERT_EQ(std::count(image->row(y), image->row(y) + image->width, 0xFFFFFFFFU), 266);
}

TEST(PdfCover, WithoutAPageNeverGrowsButShrinks) {
    const std::optional<Image> wide = drawnIn(nullptr, 1000, 380);
    const std::optional<Image> narrow = drawnIn(nullptr, 133, 380);

    ASSERT_TRUE(wide && narrow);
    EXPECT_EQ(Size(wide->width, wide->height), Size(266, 380));
    EXPECT_EQ(Size(narrow->width, narrow->height), Size(133, 190));
}

TEST(PdfCover, InABoxWithoutRoomIsNone) {
    FakePdfPage page;

    EXPECT_FALSE(drawnIn(&page, 0, 380));
    EXPECT_FALSE(drawnIn(nullptr, 340, 0));
    EXPECT_FALSE(drawnIn(nullptr, 10, 1));  // not a pixel wide
    EXPECT_FALSE(drawnIn(nullptr, 1e9, 1e9));
    EXPECT_FALSE(drawnIn(nullptr, -1, -1));
}

TEST(PdfCover, OfADocumentWithoutPagesIsNone) {
    FakePdfs pdfs;
    pdfs.content.pages = 0;

    EXPECT_FALSE(PVAssetMetadataInspector::_new_pdf_coverImage_imageSize(
        URL::fileURLWithPath("/a.pdf"), 340, 380));
}

TEST(PdfCover, OfWhatCanNotBeOpenedIsNone) {
    FakePdfs pdfs;
    const URL url = URL::fileURLWithPath("/a.pdf");
    pdfs.openError = makeFileError(PVFileErrorCode::NoSuchFile, url);

    EXPECT_FALSE(PVAssetMetadataInspector::_new_pdf_coverImage_imageSize(url, 340, 380));
}

TEST(PdfCover, IsTheFirstPageOfTheDocument) {
    FakePdfs pdfs;

    const auto image = PVAssetMetadataInspector::_new_pdf_coverImage_imageSize(
        URL::fileURLWithPath("/a.pdf"), 100, 1000);

    ASSERT_TRUE(image);
    EXPECT_EQ(Size(image->width, image->height), Size(100, 129));
    EXPECT_EQ(pdfs.drawn.size(), 1U);
}

}  // namespace
}  // namespace parvel::testing
