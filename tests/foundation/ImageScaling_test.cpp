#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "parvel/foundation/ImageScaling.h"
#include "tests/support/Images.h"

namespace parvel::testing {
namespace {

using ::testing::Each;
using ::testing::ElementsAre;
using ::testing::Pair;

std::pair<std::uint32_t, std::uint32_t> fitted(std::uint32_t width, std::uint32_t height,
                                               std::uint32_t boxWidth, std::uint32_t boxHeight) {
    const auto image = imageScaledToFit(plainImage(width, height, 0xFF808080), boxWidth, boxHeight);
    return image ? std::pair(image->width, image->height) : std::pair(0U, 0U);
}

TEST(ImageScaling, FitsTheBoxAndKeepsTheShape) {
    EXPECT_THAT(fitted(600, 800, 300, 300), Pair(225, 300));
    EXPECT_THAT(fitted(800, 600, 300, 300), Pair(300, 225));
    EXPECT_THAT(fitted(600, 800, 60, 800), Pair(60, 80));
    EXPECT_THAT(fitted(600, 800, 300, 400), Pair(300, 400));
}

TEST(ImageScaling, RoundsTheOtherSide) {
    EXPECT_THAT(fitted(3, 2, 100, 100), Pair(100, 67));
    EXPECT_THAT(fitted(3, 1, 100, 100), Pair(100, 33));
    EXPECT_THAT(fitted(1, 3, 100, 100), Pair(33, 100));
}

TEST(ImageScaling, MakesSmallImagesLarger) {
    EXPECT_THAT(fitted(10, 20, 300, 300), Pair(150, 300));
}

TEST(ImageScaling, LeavesNoSideWithoutAPixel) {
    EXPECT_THAT(fitted(1000, 1, 10, 10), Pair(10, 1));
    EXPECT_THAT(fitted(1, 1000, 10, 10), Pair(1, 10));
    EXPECT_THAT(fitted(1, 1, 5, 3), Pair(3, 3));
    EXPECT_THAT(fitted(2000, 3000, 1, 1), Pair(1, 1));
}

TEST(ImageScaling, GivesBackAnImageThatFitsAlready) {
    const Image image = plainImage(30, 40, 0xFF102030);

    EXPECT_EQ(imageScaledToFit(image, 30, 100)->bytes, image.bytes);
}

TEST(ImageScaling, RefusesEmptyAndHugeResults) {
    EXPECT_THAT(fitted(10, 10, 0, 10), Pair(0, 0));
    EXPECT_THAT(fitted(10, 10, 10, 0), Pair(0, 0));
    EXPECT_THAT(fitted(10, 10, 6325, 6325), Pair(0, 0));
    EXPECT_THAT(fitted(10, 10, 0xFFFFFFFF, 0xFFFFFFFF), Pair(0, 0));
    EXPECT_FALSE(imageScaledToFit({}, 10, 10));
}

TEST(ImageScaling, KeepsAConstantImageConstant) {
    for (const std::uint32_t pixel :
         {0xFF000000U, 0xFFFFFFFFU, 0xFF010203U, 0xFF3366CCU, 0xFF7F8081U, 0x80402010U, 0U}) {
        const Image image = plainImage(37, 23, pixel);

        EXPECT_THAT(pixelsOf(*imageScaledToFit(image, 7, 7)), Each(pixel));
        EXPECT_THAT(pixelsOf(*imageScaledToFit(image, 111, 111)), Each(pixel));
    }
}

TEST(ImageScaling, MixesInLinearLight) {
    // Every other pixel white: half the light is the byte 188, not 128.
    std::vector<std::uint32_t> stripes;
    for (int i = 0; i < 64 * 64; ++i)
        stripes.push_back(i % 2 == 0 ? 0xFFFFFFFF : 0xFF000000);

    const auto image = imageScaledToFit(imageOf(64, stripes), 8, 8);

    for (const std::uint32_t pixel : pixelsOf(*image))
        EXPECT_NEAR(static_cast<int>(pixel & 0xFF), 188, 6);
}

TEST(ImageScaling, LeavesNoDarkFringesBesideTransparency) {
    // Red beside transparent black: whatever the mixture, its colour is red.
    std::vector<std::uint32_t> halves;
    for (int i = 0; i < 64 * 64; ++i)
        halves.push_back(i % 64 < 29 ? 0xFFFF0000 : 0);

    const auto image = imageScaledToFit(imageOf(64, halves), 10, 10);

    for (const std::uint32_t pixel : pixelsOf(*image)) {
        EXPECT_EQ(pixel >> 24, pixel >> 16 & 0xFF);
        EXPECT_EQ(pixel & 0xFFFF, 0U);
    }
}

TEST(ImageScaling, StaysPremultipliedAtSharpEdges) {
    std::vector<std::uint32_t> checks;
    for (int i = 0; i < 40 * 40; ++i)
        checks.push_back((i / 40 / 5 + i % 40 / 5) % 2 == 0 ? 0xFFFFFFFF : 0x20001020);

    const auto image = imageScaledToFit(imageOf(40, checks), 93, 93);

    for (const std::uint32_t pixel : pixelsOf(*image)) {
        const std::uint32_t alpha = pixel >> 24;
        EXPECT_LE(pixel >> 16 & 0xFF, alpha);
        EXPECT_LE(pixel >> 8 & 0xFF, alpha);
        EXPECT_LE(pixel & 0xFF, alpha);
    }
}

TEST(ImageScaling, KeepsWhatLiesWhere) {
    std::vector<std::uint32_t> quarters;
    for (std::uint32_t y = 0; y < 40; ++y) {
        for (std::uint32_t x = 0; x < 40; ++x)
            quarters.push_back(y < 20 ? (x < 20 ? 0xFFFF0000 : 0xFF00FF00)
                                      : (x < 20 ? 0xFF0000FF : 0xFFFFFFFF));
    }

    const std::vector<std::uint32_t> pixels =
        pixelsOf(*imageScaledToFit(imageOf(40, quarters), 10, 10));

    EXPECT_EQ(pixels[0], 0xFFFF0000);
    EXPECT_EQ(pixels[9], 0xFF00FF00);
    EXPECT_EQ(pixels[90], 0xFF0000FF);
    EXPECT_EQ(pixels[99], 0xFFFFFFFF);
}

TEST(ImageScaling, ReadsRowsWithGapsBetween) {
    const auto image = imageScaledToFit(imageOf(1, {0xFF102030, 0xFF102030}, /*gap=*/64), 1, 1);

    EXPECT_THAT(pixelsOf(*image), ElementsAre(0xFF102030));
}

}  // namespace
}  // namespace parvel::testing
