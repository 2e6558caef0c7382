#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "parvel/platform/linux/PNGFile.h"
#include "tests/reader/images/DecodedImage.h"
#include "tests/support/AbsentLibrary.h"
#include "tests/support/Images.h"

namespace parvel::testing {
namespace {

using ::testing::ElementsAreArray;

std::string fileOf(const Image& image) {
    std::vector<std::uint8_t> storage;
    return std::string(pngFileOfImage(image).value().text(storage));
}

constexpr std::size_t colorTypeOffset = 25;

TEST(PNGFile, OfAnOpaqueImageIsReadBackEqualWithoutAlpha) {
    const Image image = imageOf(3, {0xFF000000, 0xFFFFFFFF, 0xFF102030,  //
                                    0xFF3366CC, 0xFF00FF00, 0xFFFF00FF});

    const std::string file = fileOf(image);

    EXPECT_THAT(decoded(file)->pixels, ElementsAreArray(pixelsOf(image)));
    EXPECT_EQ(file.at(colorTypeOffset), 2);
}

TEST(PNGFile, OfEveryPremultipliedPixelIsReadBackEqual) {
    std::vector<std::uint32_t> pixels;
    for (std::uint32_t alpha = 0; alpha < 256; ++alpha) {
        for (std::uint32_t color = 0; color < 256; ++color)
            pixels.push_back(color <= alpha ? alpha << 24 | color << 16 | color : 0);
    }
    const Image image = imageOf(256, pixels);

    const std::string file = fileOf(image);

    EXPECT_THAT(decoded(file)->pixels, ElementsAreArray(pixels));
    EXPECT_EQ(file.at(colorTypeOffset), 6);
}

TEST(PNGFile, LeavesTheGapsBetweenRowsOut) {
    const Image image = imageOf(2, {0xFF010203, 0xFF040506, 0xFF070809, 0xFF0A0B0C}, /*gap=*/32);

    EXPECT_THAT(decoded(fileOf(image))->pixels, ElementsAreArray(pixelsOf(image)));
}

TEST(PNGFile, OfRowsThatRepeatIsReadBackEqual) {
    const std::vector<std::uint32_t> rows{0xFFFFFFFF, 0xFFFFFFFF, 0xFFFFFFFF, 0xFFFFFFFF,
                                          0xFF123456, 0xFFFFFFFF, 0xFF123456, 0xFFFFFFFF,
                                          0xFFFFFFFF, 0xFF123456, 0xFFFFFFFF, 0xFF123456};

    EXPECT_THAT(decoded(fileOf(imageOf(2, rows)))->pixels, ElementsAreArray(rows));
}

TEST(PNGFile, OfRowsThatAreLongerThanWhatIsCompressedAtOnceIsReadBackEqual) {
    std::vector<std::uint32_t> pixels;
    for (std::uint32_t i = 0; i < 90'000; ++i)
        pixels.push_back(0xFF000000 | i * i);

    EXPECT_THAT(decoded(fileOf(imageOf(45'000, pixels)))->pixels, ElementsAreArray(pixels));
}

TEST(PNGFile, SaysThatItsColoursAreSRGB) {
    EXPECT_NE(fileOf(plainImage(1, 1, 0xFF102030)).find("sRGB"), std::string::npos);
}

TEST(PNGFile, OfAnEmptyOrHugeImageIsNone) {
    Image huge = plainImage(1, 1, 0xFF000000);
    huge.width = 6325;
    huge.height = 6325;

    EXPECT_FALSE(pngFileOfImage(huge));
    EXPECT_FALSE(pngFileOfImage({}));
}

TEST(PNGFile, IsNotMadeWithoutTheLibraryThatCompresses) {
    EXPECT_FALSE(pngFileOfImage(plainImage(1, 1, 0xFF102030), absentLibrary<host::Libisal>()));
}

}  // namespace
}  // namespace parvel::testing
