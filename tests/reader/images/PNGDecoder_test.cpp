#include <string>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "tests/reader/images/DecodedImage.h"
#include "tests/support/PNGBuilder.h"

namespace parvel::testing {
namespace {

using namespace std::string_literals;
using ::testing::Each;
using ::testing::ElementsAre;

TEST(PNGDecoder, ReadsColours) {
    const std::string bytes = PNGBuilder{}
                                  .header(2, 2, 8, PNGBuilder::rgb)
                                  .data(
                                      "\0\xFF\0\0\0\xFF\0"
                                      "\0\0\0\xFF\x01\x02\x03"s)
                                  .end()
                                  .bytes();

    const auto image = decoded(bytes);

    ASSERT_TRUE(image);
    EXPECT_EQ(image->width, 2U);
    EXPECT_EQ(image->height, 2U);
    EXPECT_THAT(image->pixels, ElementsAre(0xFFFF0000, 0xFF00FF00, 0xFF0000FF, 0xFF010203));
}

TEST(PNGDecoder, MultipliesColoursByAlpha) {
    const std::string bytes = PNGBuilder{}
                                  .header(3, 1, 8, PNGBuilder::rgba)
                                  .data(
                                      "\0\xFF\x80\0\x80"
                                      "\xFF\xFF\xFF\0"
                                      "\x10\x20\x30\xFF"s)
                                  .end()
                                  .bytes();

    const auto image = decoded(bytes);

    ASSERT_TRUE(image);
    EXPECT_THAT(image->pixels, ElementsAre(0x80804000, 0x00000000, 0xFF102030));
}

TEST(PNGDecoder, ReadsAPaletteWithTransparency) {
    const std::string bytes = PNGBuilder{}
                                  .header(4, 1, 2, PNGBuilder::palette)
                                  .chunk("PLTE", "\xFF\0\0\0\xFF\0\0\0\xFF\x10\x20\x30"s)
                                  .chunk("tRNS", "\xFF\0"s)
                                  .data("\0\x1B"s)
                                  .end()
                                  .bytes();

    const auto image = decoded(bytes);

    ASSERT_TRUE(image);
    EXPECT_THAT(image->pixels, ElementsAre(0xFFFF0000, 0x00000000, 0xFF0000FF, 0xFF102030));
}

TEST(PNGDecoder, ReadsGreyOfEveryDepth) {
    const auto grey = [](int depth, const std::string& row) {
        return decoded(PNGBuilder{}.header(2, 1, depth, PNGBuilder::grey).data(row).end().bytes());
    };

    EXPECT_THAT(grey(1, "\0\x40"s)->pixels, ElementsAre(0xFF000000, 0xFFFFFFFF));
    EXPECT_THAT(grey(2, "\0\x70"s)->pixels, ElementsAre(0xFF555555, 0xFFFFFFFF));
    EXPECT_THAT(grey(4, "\0\x8F"s)->pixels, ElementsAre(0xFF888888, 0xFFFFFFFF));
    EXPECT_THAT(grey(8, "\0\x12\xED"s)->pixels, ElementsAre(0xFF121212, 0xFFEDEDED));
    EXPECT_THAT(grey(16, "\0\x80\x80\xFF\xFF"s)->pixels, ElementsAre(0xFF808080, 0xFFFFFFFF));
}

TEST(PNGDecoder, ReadsSixteenBitColoursWithAlpha) {
    const std::string bytes = PNGBuilder{}
                                  .header(1, 1, 16, PNGBuilder::rgba)
                                  .data("\0\xFF\xFF\x80\x80\0\0\x80\x80"s)
                                  .end()
                                  .bytes();

    const auto image = decoded(bytes);

    ASSERT_TRUE(image);
    EXPECT_THAT(image->pixels, ElementsAre(0x80804000));
}

TEST(PNGDecoder, ReadsGreyWithAlpha) {
    const std::string bytes = PNGBuilder{}
                                  .header(2, 1, 8, PNGBuilder::greyAlpha)
                                  .data("\0\xFF\x80\x40\xFF"s)
                                  .end()
                                  .bytes();

    EXPECT_THAT(decoded(bytes)->pixels, ElementsAre(0x80808080, 0xFF404040));
}

TEST(PNGDecoder, ReadsAnInterlacedPicture) {
    // Three by three of grey, numbered by row: the passes hold 1, then 3, 7 9, 2 8 and 4 5 6.
    const std::string bytes = PNGBuilder{}
                                  .header(3, 3, 8, PNGBuilder::grey, /*interlaced=*/true)
                                  .data("\0\x01\0\x03\0\x07\x09\0\x02\0\x08\0\x04\x05\x06"s)
                                  .end()
                                  .bytes();

    const auto image = decoded(bytes);

    ASSERT_TRUE(image);
    EXPECT_THAT(image->pixels,
                ElementsAre(0xFF010101, 0xFF020202, 0xFF030303, 0xFF040404, 0xFF050505, 0xFF060606,
                            0xFF070707, 0xFF080808, 0xFF090909));
}

TEST(PNGDecoder, RefusesWhatIsOverTheLimitsBeforeItTakesMemory) {
    const auto sized = [](std::uint32_t width, std::uint32_t height) {
        return PNGBuilder{}.header(width, height, 8, PNGBuilder::rgb).data("").end().bytes();
    };

    EXPECT_TRUE(takesMemoryFor(sized(8000, 5000)));
    EXPECT_FALSE(takesMemoryFor(sized(8000, 5001)));
    EXPECT_TRUE(takesMemoryFor(sized(65'535, 1)));
    EXPECT_FALSE(takesMemoryFor(sized(65'536, 1)));
    EXPECT_FALSE(takesMemoryFor(sized(1, 65'536)));
    EXPECT_FALSE(takesMemoryFor(sized(0x7FFFFFFF, 0x7FFFFFFF)));
    EXPECT_FALSE(takesMemoryFor(sized(0, 1)));
}

TEST(PNGDecoder, RefusesAPictureThatIsCutShort) {
    const std::string bytes = plainPNG(40, 40);
    const std::size_t endChunk = 12;

    for (std::size_t size = 0; size < bytes.size() - endChunk; ++size)
        EXPECT_FALSE(decoded(bytes.substr(0, size))) << size;
    EXPECT_TRUE(decoded(bytes));
}

TEST(PNGDecoder, RefusesRowsThatAreMissing) {
    EXPECT_FALSE(
        decoded(PNGBuilder{}.header(2, 2, 8, PNGBuilder::grey).data("\0\1\1"s).end().bytes()));
}

TEST(PNGDecoder, ReadsAPictureWithABrokenNote) {
    const std::string bytes = PNGBuilder{}
                                  .header(1, 1, 8, PNGBuilder::grey)
                                  .chunk("iCCP", "name\0\0no deflated profile"s)
                                  .chunk("zTXt", std::string(1000, 'x'))
                                  .data("\0\x77"s)
                                  .end()
                                  .bytes();

    ASSERT_TRUE(decoded(bytes));
    EXPECT_THAT(decoded(bytes)->pixels, ElementsAre(0xFF777777));
}

TEST(PNGDecoder, TakesTheStillPictureOfAnAnimatedOne) {
    const std::string bytes = PNGBuilder{}
                                  .header(1, 1, 8, PNGBuilder::grey)
                                  .chunk("acTL", "\0\0\0\1\0\0\0\0"s)
                                  .data("\0\x77"s)
                                  .end()
                                  .bytes();

    ASSERT_TRUE(decoded(bytes));
    EXPECT_THAT(decoded(bytes)->pixels, Each(0xFF777777));
}

}  // namespace
}  // namespace parvel::testing
