#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <array>
#include <thread>
#include <vector>

#include "parvel/platform/ImageCodec.h"
#include "parvel/platform/ReaderProgram.h"
#include "tests/reader/images/GIFSamples.h"
#include "tests/reader/images/JPEGSamples.h"
#include "tests/reader/images/WebPSamples.h"
#include "tests/support/Images.h"
#include "tests/support/PNGBuilder.h"

namespace parvel::testing {
namespace {

using ::testing::Each;
using ::testing::ElementsAre;
using ::testing::SizeIs;

std::optional<Image> decodedInHelper(std::string_view bytes) {
    return ImageCodec::host().decode(Data::copyOf(bytes));
}

TEST(ImageCodec, DecodesEveryFormat) {
    using namespace std::string_literals;

    const auto png = decodedInHelper(plainPNG(3, 2, 0x3366CC));
    const auto jpeg = decodedInHelper(
        JPEGSample{.width = 3, .height = 2, .color = JPEGSample::Color::Grey, .pixel = "\x80"}
            .bytes());
    const auto gif = decodedInHelper(GIFSample{}.bytes());
    const auto webp = decodedInHelper(webpOf("\xFF\0\0\xFF\0\xFF\0\xFF"s, 2));

    EXPECT_THAT(pixelsOf(png.value()), ::testing::AllOf(SizeIs(6), Each(0xFF3366CC)));
    EXPECT_THAT(pixelsOf(jpeg.value()), ::testing::AllOf(SizeIs(6), Each(0xFF808080)));
    EXPECT_THAT(pixelsOf(gif.value()), ElementsAre(0xFFFF0000, 0xFF00FF00, 0xFF0000FF, 0xFFFFFFFF));
    EXPECT_THAT(pixelsOf(webp.value()), ElementsAre(0xFFFF0000, 0xFF00FF00));
}

TEST(ImageCodec, DecodesBytesOfSeveralRanges) {
    const std::string bytes = plainPNG(3, 2, 0x3366CC);
    const std::array parts{Data::copyOf(std::string_view(bytes).substr(0, 20)),
                           Data::copyOf(std::string_view(bytes).substr(20))};

    EXPECT_TRUE(ImageCodec::host().decode(Data::joining(parts)));
}

TEST(ImageCodec, DecodesTheLargestImage) {
    constexpr std::uint32_t side = 6324;
    const std::string row(1 + side * 3, '\0');
    std::string rows;
    for (std::uint32_t y = 0; y < side; ++y)
        rows += row;

    const auto image = decodedInHelper(
        PNGBuilder{}.header(side, side, 8, PNGBuilder::rgb).data(rows).end().bytes());

    ASSERT_TRUE(image);
    EXPECT_EQ(image->width, side);
    EXPECT_EQ(image->row(side - 1)[side - 1], 0xFF000000U);
}

TEST(ImageCodec, RefusesWhatIsNoImageAndServesTheNext) {
    EXPECT_FALSE(decodedInHelper(""));
    EXPECT_FALSE(decodedInHelper("no image"));
    EXPECT_FALSE(decodedInHelper(plainPNG(30, 30).substr(0, 60)));
    EXPECT_FALSE(decodedInHelper(
        PNGBuilder{}.header(60'000, 60'000, 8, PNGBuilder::rgb).data("").end().bytes()));

    EXPECT_TRUE(decodedInHelper(plainPNG(3, 2)));
}

TEST(ImageCodec, RefusesWhatTakesTooMuchMemoryAndServesTheNext) {
    // All of a progressive image is held twice while it is decoded.
    const JPEGSample large{.width = 8000, .height = 5000, .progressive = true};

    EXPECT_FALSE(decodedInHelper(large.bytes()));

    EXPECT_TRUE(decodedInHelper(plainPNG(3, 2)));
}

TEST(ImageCodec, ServesManyThreads) {
    const std::string bytes = plainPNG(20, 20, 0x3366CC);
    std::vector<std::thread> threads;
    std::atomic<int> sound{0};
    for (int i = 0; i < 8; ++i) {
        threads.emplace_back([&] {
            for (int round = 0; round < 5; ++round) {
                const auto image = decodedInHelper(bytes);
                sound += image && image->row(19)[19] == 0xFF3366CC ? 1 : 0;
            }
        });
    }
    for (std::thread& thread : threads)
        thread.join();

    EXPECT_EQ(sound, 40);
}

TEST(ImageCodec, DecodesNothingWithoutTheHelper) {
    setReaderProgramPath("/nonexistent/parvel-reader");
    // Helpers that wait are used up first.
    std::optional<Image> image;
    for (int i = 0; i < 2000 && (i == 0 || image); ++i)
        image = decodedInHelper(plainPNG(3, 2));
    setReaderProgramPath("");

    EXPECT_FALSE(image);
    EXPECT_TRUE(decodedInHelper(plainPNG(3, 2)));
}

TEST(ImageCodec, EncodesAsPNG) {
    const Image image = imageOf(2, {0xFF102030, 0x80402010, 0, 0xFFFFFFFF});

    const std::optional<Data> file = ImageCodec::host().encodePNG(image);

    ASSERT_TRUE(file);
    EXPECT_EQ(pixelsOf(ImageCodec::host().decode(*file).value()), pixelsOf(image));
}

}  // namespace
}  // namespace parvel::testing
