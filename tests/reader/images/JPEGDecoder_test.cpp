#include <algorithm>
#include <cstdlib>
#include <string>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "tests/reader/images/DecodedImage.h"
#include "tests/reader/images/JPEGSamples.h"

namespace parvel::testing {
namespace {

using namespace std::string_literals;
using ::testing::Each;
using Color = JPEGSample::Color;

/// Opaque and of that colour, as near as a lossy format comes.
MATCHER_P(IsNearly, color, "") {
    const auto near = [&](int shift) {
        return std::abs(static_cast<int>(arg >> shift & 0xFF) -
                        static_cast<int>(color >> shift & 0xFF)) <= 2;
    };
    return arg >> 24 == 0xFF && near(16) && near(8) && near(0);
}

TEST(JPEGDecoder, ReadsColours) {
    const auto image = decoded(JPEGSample{.width = 31, .height = 7}.bytes());

    ASSERT_TRUE(image);
    EXPECT_EQ(image->width, 31U);
    EXPECT_EQ(image->height, 7U);
    EXPECT_THAT(image->pixels, Each(IsNearly(0x3366CCU)));
}

TEST(JPEGDecoder, ReadsGrey) {
    const auto image = decoded(JPEGSample{.color = Color::Grey, .pixel = "\x77"}.bytes());

    ASSERT_TRUE(image);
    EXPECT_THAT(image->pixels, Each(IsNearly(0x777777U)));
}

TEST(JPEGDecoder, ReadsAProgressivePicture) {
    const auto image = decoded(JPEGSample{.progressive = true}.bytes());

    ASSERT_TRUE(image);
    EXPECT_THAT(image->pixels, Each(IsNearly(0x3366CCU)));
}

TEST(JPEGDecoder, ReadsInksAsAdobeInvertsThem) {
    // Cyan a half, yellow full and black a fifth, each stored as what is left of the white.
    const std::string pixel = "\x80\xFF\0\xCC"s;

    for (Color color : {Color::CMYK, Color::YCCK}) {
        const auto image = decoded(JPEGSample{.color = color, .pixel = pixel}.bytes());

        ASSERT_TRUE(image);
        EXPECT_THAT(image->pixels, Each(IsNearly(0x66CC00U)));
    }
}

TEST(JPEGDecoder, ReadsInksWithoutTheMarkAsTheyAre) {
    const auto image = decoded(
        JPEGSample{.color = Color::CMYK, .pixel = "\x7F\0\xFF\x33"s, .adobeMarker = false}.bytes());

    ASSERT_TRUE(image);
    EXPECT_THAT(image->pixels, Each(IsNearly(0x66CC00U)));
}

/// The sample with another size in its frame header.
std::string withSize(std::string bytes, unsigned width, unsigned height) {
    const std::size_t frame = bytes.find("\xFF\xC0"s);
    for (auto [offset, value] : {std::pair{5, height}, std::pair{7, width}}) {
        bytes.at(frame + static_cast<std::size_t>(offset)) = static_cast<char>(value >> 8);
        bytes.at(frame + static_cast<std::size_t>(offset) + 1) = static_cast<char>(value & 0xFF);
    }
    return bytes;
}

TEST(JPEGDecoder, RefusesWhatIsOverTheLimitsBeforeItTakesMemory) {
    const std::string bytes = JPEGSample{}.bytes();

    EXPECT_TRUE(takesMemoryFor(withSize(bytes, 8000, 5000)));
    EXPECT_FALSE(takesMemoryFor(withSize(bytes, 8000, 5001)));
    EXPECT_FALSE(takesMemoryFor(withSize(bytes, 65'535, 65'535)));
    EXPECT_FALSE(takesMemoryFor(withSize(bytes, 0, 16)));
}

TEST(JPEGDecoder, RefusesAPictureThatIsCutShort) {
    std::string bytes = JPEGSample{.width = 64, .height = 64}.bytes();
    const std::size_t endMarker = 2;

    EXPECT_FALSE(decoded(bytes.substr(0, bytes.size() / 2)));
    EXPECT_FALSE(decoded(bytes.substr(0, bytes.size() - 40)));
    EXPECT_FALSE(decoded(withSize(bytes, 64, 640)));
    EXPECT_TRUE(decoded(bytes.substr(0, bytes.size() - endMarker))) << "it is whole all the same";
}

TEST(JPEGDecoder, ReadsAPictureWithBytesBehindIt) {
    EXPECT_TRUE(decoded(JPEGSample{}.bytes() + "and more"));
}

TEST(JPEGDecoder, RefusesThousandsOfScans) {
    const std::string bytes = JPEGSample{.progressive = true}.bytes();
    const std::size_t lastScan = bytes.rfind("\xFF\xDA"s);
    const std::string scan = bytes.substr(lastScan, bytes.size() - 2 - lastScan);
    std::string many = bytes.substr(0, bytes.size() - 2);
    for (int i = 0; i < 2000; ++i)
        many += scan;

    EXPECT_FALSE(decoded(many + "\xFF\xD9"));
}

}  // namespace
}  // namespace parvel::testing
