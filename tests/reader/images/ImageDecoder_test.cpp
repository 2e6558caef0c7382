#include <random>
#include <string>

#include <gtest/gtest.h>

#include "tests/reader/images/DecodedImage.h"
#include "tests/reader/images/GIFSamples.h"
#include "tests/reader/images/JPEGSamples.h"
#include "tests/reader/images/WebPSamples.h"
#include "tests/support/PNGBuilder.h"
#include "tests/support/TestRounds.h"

namespace parvel::testing {
namespace {

/// Decodes the bytes changed at random: whatever comes out is whole and premultiplied.
void decodeChanged(const std::string& bytes) {
    std::mt19937 random(1);
    for (std::size_t round = 0; round < testRounds(400); ++round) {
        std::string changed = bytes;
        for (std::size_t i = 0; i <= random() % 4; ++i)
            changed[random() % changed.size()] = static_cast<char>(random());
        if (random() % 8 == 0)
            changed.resize(random() % changed.size());

        const auto image = decoded(changed);

        if (!image)
            continue;
        ASSERT_EQ(image->pixels.size(), std::size_t{image->width} * image->height);
        for (const std::uint32_t pixel : image->pixels) {
            const std::uint32_t alpha = pixel >> 24;
            ASSERT_TRUE((pixel >> 16 & 0xFF) <= alpha && (pixel >> 8 & 0xFF) <= alpha &&
                        (pixel & 0xFF) <= alpha)
                << round;
        }
    }
}

std::string noise(std::size_t size) {
    std::mt19937 random(2);
    std::string bytes;
    for (std::size_t i = 0; i < size; ++i)
        bytes += static_cast<char>(random());
    return bytes;
}

TEST(ImageDecoder, StaysWholeOverChangedPNGFiles) {
    decodeChanged(plainPNG(20, 20));
    std::string rows;
    for (int y = 0; y < 8; ++y)
        rows += '\0' + noise(8 * 8);
    decodeChanged(PNGBuilder{}.header(8, 8, 16, PNGBuilder::rgba).data(rows).end().bytes());
}

TEST(ImageDecoder, StaysWholeOverChangedJPEGFiles) {
    decodeChanged(JPEGSample{}.bytes());
    decodeChanged(JPEGSample{.progressive = true}.bytes());
    decodeChanged(JPEGSample{.color = JPEGSample::Color::YCCK, .pixel = "abcd"}.bytes());
}

TEST(ImageDecoder, StaysWholeOverChangedGIFFiles) {
    decodeChanged(GIFSample{}.bytes());
    decodeChanged(GIFSample{.interlaced = true, .transparent = 1, .frames = 3}.bytes());
}

TEST(ImageDecoder, StaysWholeOverChangedWebPFiles) {
    decodeChanged(webpOf(noise(16 * 16 * 4), 16));
    decodeChanged(webpOf(noise(16 * 16 * 4), 16, /*lossless=*/false));
    decodeChanged(animatedWebPOf({webpOf(noise(256), 8), webpOf(noise(256), 8)}, 2, 2));
}

TEST(ImageDecoder, RefusesWhatIsNoPictureThatItKnows) {
    EXPECT_FALSE(decoded(""));
    EXPECT_FALSE(decoded("GIF8"));
    EXPECT_FALSE(decoded("RIFF\4\0\0\0WEBP"));
    EXPECT_FALSE(decoded("<svg xmlns='http://www.w3.org/2000/svg'/>"));
    EXPECT_FALSE(decoded("BM" + noise(100)));
    EXPECT_FALSE(takesMemoryFor(noise(1000)));
}

TEST(ImageDecoder, StopsWhereThereIsNoMemory) {
    EXPECT_TRUE(takesMemoryFor(plainPNG(2, 2)));
    EXPECT_TRUE(takesMemoryFor(JPEGSample{}.bytes()));
    EXPECT_TRUE(takesMemoryFor(GIFSample{}.bytes()));
    EXPECT_TRUE(takesMemoryFor(webpOf(noise(64), 4)));
}

}  // namespace
}  // namespace parvel::testing
