#include <string>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "tests/reader/images/DecodedImage.h"
#include "tests/reader/images/WebPSamples.h"

namespace parvel::testing {
namespace {

using namespace std::string_literals;
using ::testing::Each;
using ::testing::ElementsAre;

const std::string kRedGreen = "\xFF\0\0\xFF\0\xFF\0\xFF"s;
const std::string kBlueWhite = "\0\0\xFF\xFF\xFF\xFF\xFF\xFF"s;

TEST(WebPDecoder, ReadsAPictureWithoutLoss) {
    const auto image = decoded(webpOf(kRedGreen + kBlueWhite, 2));

    ASSERT_TRUE(image);
    EXPECT_EQ(image->width, 2U);
    EXPECT_EQ(image->height, 2U);
    EXPECT_THAT(image->pixels, ElementsAre(0xFFFF0000, 0xFF00FF00, 0xFF0000FF, 0xFFFFFFFF));
}

TEST(WebPDecoder, MultipliesColoursByAlpha) {
    const auto image = decoded(webpOf("\xFF\x80\0\x80\xFF\xFF\xFF\0"s, 2));

    ASSERT_TRUE(image);
    EXPECT_THAT(image->pixels, ElementsAre(0x80804000, 0x00000000));
}

TEST(WebPDecoder, ReadsAPictureWithLossAndAlpha) {
    std::string pixels;
    for (int i = 0; i < 16 * 16; ++i)
        pixels += "\x77\x77\x77\x40";

    const auto image = decoded(webpOf(pixels, 16, /*lossless=*/false));

    ASSERT_TRUE(image);
    for (const std::uint32_t pixel : image->pixels) {
        EXPECT_EQ(pixel >> 24, 0x40U);
        EXPECT_NEAR(static_cast<int>(pixel & 0xFF), 0x77 * 0x40 / 255, 2);
    }
}

TEST(WebPDecoder, TakesTheFirstFrameOfAnAnimatedPicture) {
    const std::string bytes =
        animatedWebPOf({webpOf(kRedGreen, 2), webpOf(kBlueWhite, 2)}, /*x=*/0, /*y=*/0);

    const auto image = decoded(bytes);

    ASSERT_TRUE(image);
    EXPECT_THAT(image->pixels, ElementsAre(0xFFFF0000, 0xFF00FF00));
}

TEST(WebPDecoder, LeavesTheCanvasTransparentBesideItsFrame) {
    const std::string frame = webpOf(kRedGreen, 2);

    const auto image = decoded(animatedWebPOf({frame, frame}, /*x=*/2, /*y=*/0));

    ASSERT_TRUE(image);
    EXPECT_THAT(image->pixels, ElementsAre(0, 0, 0xFFFF0000, 0xFF00FF00));
}

TEST(WebPDecoder, RefusesWhatIsOverTheLimitsBeforeItTakesMemory) {
    const std::string frame = webpOf(kRedGreen, 2);
    const std::string bytes = animatedWebPOf({frame, frame}, /*x=*/0, /*y=*/0);
    const std::size_t canvas = bytes.find("VP8X") + 12;
    const auto sized = [&](unsigned width, unsigned height) {
        std::string file = bytes;
        for (std::size_t i = 0; i < 3; ++i) {
            file.at(canvas + i) = static_cast<char>((width - 1) >> (8 * i));
            file.at(canvas + 3 + i) = static_cast<char>((height - 1) >> (8 * i));
        }
        return file;
    };

    EXPECT_TRUE(takesMemoryFor(sized(8000, 5000)));
    EXPECT_FALSE(takesMemoryFor(sized(8000, 5001)));
    EXPECT_FALSE(takesMemoryFor(sized(65'536, 1)));
    EXPECT_FALSE(takesMemoryFor(sized(1 << 24, 1 << 24)));
}

TEST(WebPDecoder, RefusesAPictureThatIsCutShort) {
    const std::string bytes = webpOf(kRedGreen + kBlueWhite, 2);

    for (std::size_t size = 0; size < bytes.size() - 1; ++size)
        EXPECT_FALSE(decoded(bytes.substr(0, size))) << size;
}

}  // namespace
}  // namespace parvel::testing
