#include <gtest/gtest.h>

#include <algorithm>
#include <fstream>
#include <string>

#include "parvel/platform/PdfDocument.h"
#include "tests/support/Colours.h"
#include "tests/support/PdfBuilder.h"
#include "tests/support/TemporaryDirectory.h"

namespace parvel::testing {
namespace {

/// A red square in the lower left corner of a box, a green one in the lower right, a blue one in
/// the upper left.
std::string cornerMarks(int left, int bottom, int right, int top) {
    const auto square = [](int x, int y) {
        return std::to_string(x) + " " + std::to_string(y) + " 20 20";
    };
    return filled("1 0 0", square(left, bottom)) + filled("0 1 0", square(right - 20, bottom)) +
           filled("0 0 1", square(left, top - 20));
}

/// The pixels near the corners: upper left, upper right, lower left, lower right.
std::vector<std::uint32_t> cornersOf(const Image& image) {
    const std::uint32_t right = image.width - 4;
    const std::uint32_t bottom = image.height - 4;
    return {image.row(3)[3], image.row(3)[right], image.row(bottom)[3], image.row(bottom)[right]};
}

class PdfPageTest : public ::testing::Test {
protected:
    std::optional<Image> draw(const PdfBuilder& builder, std::uint32_t width,
                              std::uint32_t height) {
        m_folder.write("a.pdf", builder.bytes());
        const auto document = PdfDocuments::host().open(m_folder.url("a.pdf"));
        const auto page = document ? document->firstPage() : nullptr;
        return page ? page->draw(width, height) : std::nullopt;
    }
    void expectCorners(const PdfBuilder& builder, std::uint32_t width, std::uint32_t height,
                       const std::vector<std::uint32_t>& corners) {
        const std::optional<Image> image = draw(builder, width, height);
        ASSERT_TRUE(image);
        EXPECT_EQ(image->width, width);
        EXPECT_EQ(image->height, height);
        EXPECT_EQ(cornersOf(*image), corners);
    }

    TemporaryDirectory m_folder;
};

TEST_F(PdfPageTest, DrawsThePageToItsEdges) {
    expectCorners(PdfBuilder{}.page("", cornerMarks(0, 0, 612, 792)), 293, 380,
                  {blue, white, red, green});
}

TEST_F(PdfPageTest, TurnsThePageRight) {
    expectCorners(PdfBuilder{}.page("/Rotate 90", cornerMarks(0, 0, 612, 792)), 380, 293,
                  {red, blue, green, white});
}

TEST_F(PdfPageTest, TurnsThePageUpsideDown) {
    expectCorners(PdfBuilder{}.page("/Rotate 180", cornerMarks(0, 0, 612, 792)), 293, 380,
                  {green, red, white, blue});
}

TEST_F(PdfPageTest, TurnsThePageLeft) {
    expectCorners(PdfBuilder{}.page("/Rotate -90", cornerMarks(0, 0, 612, 792)), 380, 293,
                  {white, green, blue, red});
}

TEST_F(PdfPageTest, DrawsTheCropBoxAlone) {
    expectCorners(
        PdfBuilder{}.page("/CropBox [100 100 300 500]", filled("0 0 0", "0 0 612 792") +
                                                            filled("1 1 1", "100 100 200 400") +
                                                            cornerMarks(100, 100, 300, 500)),
        190, 380, {blue, white, red, green});
}

TEST_F(PdfPageTest, LeavesTheUnitOfThePageAlone) {
    expectCorners(PdfBuilder{}.page("/UserUnit 10", cornerMarks(0, 0, 612, 792)), 293, 380,
                  {blue, white, red, green});
}

TEST_F(PdfPageTest, CentresThePageInABitmapOfAnotherShape) {
    const std::optional<Image> image = draw(
        PdfBuilder{}.page("/MediaBox [0 0 100 100]", filled("1 0 0", "0 0 100 100")), 300, 100);

    ASSERT_TRUE(image);
    EXPECT_EQ(image->row(50)[99], white);
    EXPECT_EQ(image->row(50)[100], red);
    EXPECT_EQ(image->row(50)[199], red);
    EXPECT_EQ(image->row(50)[200], white);
}

TEST_F(PdfPageTest, LeavesNoEdgeHalfCovered) {
    const std::optional<Image> image =
        draw(PdfBuilder{}.page("", filled("1 0 0", "0 0 612 792")), 293, 380);

    ASSERT_TRUE(image);
    for (std::uint32_t y = 0; y < image->height; ++y)
        EXPECT_EQ(std::count(image->row(y), image->row(y) + image->width, red), 293) << y;
}

TEST_F(PdfPageTest, DrawsOnOpaqueWhite) {
    const std::optional<Image> image = draw(PdfBuilder{}.page(""), 30, 40);

    ASSERT_TRUE(image);
    for (std::uint32_t y = 0; y < image->height; ++y)
        EXPECT_EQ(std::count(image->row(y), image->row(y) + image->width, white), 30) << y;
}

TEST_F(PdfPageTest, DrawsTextInAFontThatTheDocumentDoesNotBringAlong) {
    const std::optional<Image> image =
        draw(PdfBuilder{}.page("/MediaBox [0 0 100 100] /Resources << /Font << /F << /Type /Font "
                               "/Subtype /Type1 /BaseFont /Helvetica >> >> >>",
                               "BT /F 100 Tf 10 10 Td (HH) Tj ET"),
             100, 100);

    ASSERT_TRUE(image);
    std::ptrdiff_t black = 0;
    for (std::uint32_t y = 0; y < image->height; ++y)
        black += std::count(image->row(y), image->row(y) + image->width, 0xFF000000U);
    if (black == 0 && !std::filesystem::exists("/usr/share/fonts"))
        GTEST_SKIP() << "no fonts are installed";
    EXPECT_GT(black, 500);
}

TEST_F(PdfPageTest, IsNotDrawnWithoutASize) {
    EXPECT_FALSE(draw(PdfBuilder{}.page(""), 0, 10));
    EXPECT_FALSE(draw(PdfBuilder{}.page(""), 10, 0));
}

TEST_F(PdfPageTest, IsNotDrawnOverTheLongestSide) {
    EXPECT_FALSE(draw(PdfBuilder{}.page(""), 16385, 1));
    EXPECT_TRUE(draw(PdfBuilder{}.page(""), 16384, 1));
}

TEST_F(PdfPageTest, IsNotDrawnWithoutAnArea) {
    EXPECT_FALSE(draw(PdfBuilder{}.page("/CropBox [10 10 10 10]"), 10, 10));
}

TEST_F(PdfPageTest, IsNotDrawnWhereThatTakesTooLong) {
    std::string curves;
    for (int i = 0; i < 300000; ++i)
        curves += std::to_string(i % 600) + " 0 m 900 900 -900 900 " +
                  std::to_string((i * 7) % 600) + " 792 c s\n";

    EXPECT_FALSE(draw(PdfBuilder{}.page("", curves), 293, 380));
    EXPECT_TRUE(draw(PdfBuilder{}.page(""), 293, 380)) << "the next page is drawn";
}

TEST_F(PdfPageTest, IsDrawnOutOfADocumentLongerThanTheHelpersMemory) {
    // A stream that no page uses stands in front of the cross-reference table, mostly a hole.
    constexpr std::size_t hole = 300 << 20;
    const std::string bytes = PdfBuilder{}.page("", cornerMarks(0, 0, 612, 792)).bytes();
    const std::size_t startxref = bytes.rfind("startxref");
    const std::size_t table = bytes.rfind("xref", startxref - 1);
    const std::string begin = "99 0 obj\n<</Length " + std::to_string(hole) + ">>\nstream\n";
    const std::string end = "\nendstream\nendobj\n";
    std::ofstream file(m_folder / "a.pdf", std::ios::binary);
    file << bytes.substr(0, table) << begin;
    file.seekp(static_cast<std::streamoff>(hole), std::ios::cur);
    file << end << bytes.substr(table, startxref - table) << "startxref\n"
         << table + begin.size() + hole + end.size() << "\n%%EOF\n"
         << std::flush;
    const auto document = PdfDocuments::host().open(m_folder.url("a.pdf"));
    ASSERT_TRUE(document);
    const auto page = document->firstPage();
    ASSERT_TRUE(page);

    const std::optional<Image> image = page->draw(293, 380);

    ASSERT_TRUE(image);
    EXPECT_EQ(cornersOf(*image), (std::vector<std::uint32_t>{blue, white, red, green}));
}

TEST_F(PdfPageTest, IsDrawnAgainAfterAnotherDocumentWasOpened) {
    m_folder.write("a.pdf", PdfBuilder{}.page("", filled("1 0 0", "0 0 612 792")).bytes());
    m_folder.write("b.pdf", PdfBuilder{}.page("", filled("0 1 0", "0 0 612 792")).bytes());
    const auto first = PdfDocuments::host().open(m_folder.url("a.pdf"));
    const auto firstPage = first->firstPage();
    const auto second = PdfDocuments::host().open(m_folder.url("b.pdf"));
    const auto secondPage = second->firstPage();

    const std::optional<Image> firstImage = firstPage->draw(10, 10);
    const std::optional<Image> secondImage = secondPage->draw(10, 10);

    ASSERT_TRUE(firstImage && secondImage);
    EXPECT_EQ(firstImage->row(5)[5], red);
    EXPECT_EQ(secondImage->row(5)[5], green);
}

}  // namespace
}  // namespace parvel::testing
