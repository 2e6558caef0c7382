#include <string>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "tests/reader/images/DecodedImage.h"
#include "tests/reader/images/GIFSamples.h"
#include "tests/support/Colours.h"

namespace parvel::testing {
namespace {

using namespace std::string_literals;
using ::testing::Each;
using ::testing::ElementsAre;

TEST(GIFDecoder, ReadsColours) {
    const auto image = decoded(GIFSample{}.bytes());

    ASSERT_TRUE(image);
    EXPECT_EQ(image->width, 2U);
    EXPECT_EQ(image->height, 2U);
    EXPECT_THAT(image->pixels, ElementsAre(red, green, blue, white));
}

TEST(GIFDecoder, ReadsTheFramesOwnColours) {
    EXPECT_THAT(decoded(GIFSample{.localColors = true}.bytes())->pixels,
                ElementsAre(red, green, blue, white));
}

TEST(GIFDecoder, LeavesTheTransparentColourOut) {
    EXPECT_THAT(decoded(GIFSample{.transparent = 2}.bytes())->pixels,
                ElementsAre(red, green, 0, white));
}

TEST(GIFDecoder, PutsInterlacedRowsInOrder) {
    const GIFSample sample{.screenWidth = 1,
                           .screenHeight = 5,
                           .width = 1,
                           .height = 5,
                           .indices = "\0\3\2\1\1"s,
                           .interlaced = true};

    EXPECT_THAT(decoded(sample.bytes())->pixels, ElementsAre(red, green, blue, green, white));
}

TEST(GIFDecoder, TakesTheFirstFrameOfAnAnimatedPicture) {
    EXPECT_THAT(decoded(GIFSample{.frames = 20}.bytes())->pixels,
                ElementsAre(red, green, blue, white));
}

TEST(GIFDecoder, LeavesTheScreenTransparentBesideItsFrame) {
    const GIFSample sample{.screenWidth = 3, .screenHeight = 2, .left = 1, .width = 1};

    EXPECT_THAT(decoded(sample.bytes())->pixels, ElementsAre(0, red, 0, 0, green, 0));
}

TEST(GIFDecoder, CutsAFrameAtTheScreensEdge) {
    EXPECT_THAT(decoded(GIFSample{.left = 1, .top = 1}.bytes())->pixels, ElementsAre(0, 0, 0, red));
    EXPECT_THAT(decoded(GIFSample{.left = 9, .top = 9}.bytes())->pixels, Each(0));
}

TEST(GIFDecoder, TakesTheFramesSizeWhereTheScreenHasNone) {
    const auto image = decoded(GIFSample{.screenWidth = 0, .screenHeight = 0}.bytes());

    ASSERT_TRUE(image);
    EXPECT_THAT(image->pixels, ElementsAre(red, green, blue, white));
}

TEST(GIFDecoder, RefusesAFrameWithoutColours) {
    EXPECT_FALSE(decoded(GIFSample{.noColors = true}.bytes()));
}

/// The sample with the size of its screen, or of its frame, replaced.
std::string withSize(std::string bytes, std::size_t offset, unsigned width, unsigned height) {
    for (unsigned value : {width, height}) {
        bytes.at(offset++) = static_cast<char>(value & 0xFF);
        bytes.at(offset++) = static_cast<char>(value >> 8);
    }
    return bytes;
}

TEST(GIFDecoder, RefusesWhatIsOverTheLimitsBeforeItTakesMemory) {
    const std::string bytes = GIFSample{}.bytes();
    const std::size_t screen = 6;
    const std::size_t frame = bytes.rfind("\x2C\0\0\0\0"s) + 5;

    EXPECT_TRUE(takesMemoryFor(withSize(bytes, screen, 8000, 5000)));
    EXPECT_FALSE(takesMemoryFor(withSize(bytes, screen, 8000, 5001)));
    EXPECT_FALSE(takesMemoryFor(withSize(bytes, screen, 65'535, 65'535)));
    EXPECT_FALSE(takesMemoryFor(withSize(bytes, frame, 65'535, 65'535)));
    EXPECT_FALSE(takesMemoryFor(withSize(bytes, frame, 0, 2)));
}

TEST(GIFDecoder, RefusesAPictureThatIsCutShort) {
    const std::string bytes = GIFSample{}.bytes();
    const std::size_t trailer = 1;

    for (std::size_t size = 0; size < bytes.size() - trailer; ++size)
        EXPECT_FALSE(decoded(bytes.substr(0, size))) << size;
    EXPECT_TRUE(decoded(bytes.substr(0, bytes.size() - trailer)));
}

}  // namespace
}  // namespace parvel::testing
