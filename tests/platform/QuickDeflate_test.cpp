#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <random>

#include <zlib.h>

#include "parvel/platform/linux/QuickDeflate.h"

namespace parvel::testing {
namespace {

using DeflatedBytes = std::vector<std::uint8_t>;

constexpr std::size_t deflateStretch = 60 * 1024;

/// The zlib stream of the bytes, which come in pieces of that size.
DeflatedBytes quicklyDeflated(const DeflatedBytes& bytes, std::size_t piece = 1000) {
    QuickDeflate stream;
    std::span<const std::uint8_t> left = bytes;
    while (!left.empty()) {
        const std::size_t size = std::min(piece, left.size());
        stream.add(left.first(size));
        left = left.subspan(size);
    }
    const std::span<const std::uint8_t> all = stream.finish();
    return {all.begin(), all.end()};
}

/// What zlib makes of the stream, which must end where it ends; nothing where it is damaged.
DeflatedBytes inflatedByZlib(const DeflatedBytes& stream, std::size_t size) {
    DeflatedBytes bytes(size + 1);
    uLongf written = bytes.size();
    uLong read = stream.size();
    if (::uncompress2(bytes.data(), &written, stream.data(), &read) != Z_OK ||
        read != stream.size())
        return {0xBA, 0xD0};
    bytes.resize(written);
    return bytes;
}

void expectInflatedEqual(const DeflatedBytes& bytes) {
    EXPECT_TRUE(inflatedByZlib(quicklyDeflated(bytes), bytes.size()) == bytes)
        << bytes.size() << " bytes";
}

DeflatedBytes bytesAtRandom(std::size_t size, unsigned below = 256) {
    std::mt19937 generator(static_cast<unsigned>(size));
    DeflatedBytes bytes(size);
    for (std::uint8_t& byte : bytes)
        byte = static_cast<std::uint8_t>(generator() % below);
    return bytes;
}

TEST(QuickDeflate, OfNothingIsAnEmptyStream) {
    EXPECT_TRUE(inflatedByZlib(quicklyDeflated({}), 0).empty());
}

TEST(QuickDeflate, OfFewBytesIsReadBackEqual) {
    for (std::size_t size = 1; size < 600; ++size) {
        expectInflatedEqual(DeflatedBytes(size, 7));
        expectInflatedEqual(bytesAtRandom(size, 3));
    }
}

TEST(QuickDeflate, OfWhatEndsAroundAStretchIsReadBackEqual) {
    for (const std::size_t stretches : {1U, 2U}) {
        for (std::size_t size = stretches * deflateStretch - 5;
             size <= stretches * deflateStretch + 5; ++size) {
            expectInflatedEqual(DeflatedBytes(size, 0));
            expectInflatedEqual(bytesAtRandom(size, 5));
        }
    }
}

TEST(QuickDeflate, TakesPiecesOfAnySize) {
    const DeflatedBytes bytes = bytesAtRandom(200'000, 9);

    for (const std::size_t piece : {1U, 7U, 61'440U, 200'000U})
        EXPECT_TRUE(inflatedByZlib(quicklyDeflated(bytes, piece), bytes.size()) == bytes) << piece;
}

TEST(QuickDeflate, MakesNextToNothingOfWhatRepeats) {
    EXPECT_LT(quicklyDeflated(DeflatedBytes(1'000'000, 0)).size(), 6'000U);
}

TEST(QuickDeflate, StoresWhatDoesNotShrink) {
    const DeflatedBytes bytes = bytesAtRandom(1'000'000);

    const DeflatedBytes stream = quicklyDeflated(bytes);

    EXPECT_TRUE(inflatedByZlib(stream, bytes.size()) == bytes);
    EXPECT_LT(stream.size(), 1'000'000U + 17 * 5 + 16);
}

TEST(QuickDeflate, RepeatsNothingFartherThanTheWindow) {
    for (const std::size_t distance : {32'766U, 32'767U, 32'768U, 32'769U, 40'000U}) {
        DeflatedBytes bytes = bytesAtRandom(distance);
        bytes.insert(bytes.end(), bytes.begin(), bytes.begin() + 5'000);

        expectInflatedEqual(bytes);
    }
}

TEST(QuickDeflate, RepeatsAtEveryLengthAndDistance) {
    std::mt19937 generator(1);
    DeflatedBytes bytes = bytesAtRandom(40'000);
    while (bytes.size() < 600'000) {
        const std::size_t distance = 1 + generator() % 33'000;
        const std::size_t length = 3 + generator() % 270;
        for (std::size_t i = 0; i < length; ++i)
            bytes.push_back(bytes[bytes.size() - distance]);
        bytes.push_back(static_cast<std::uint8_t>(generator()));
    }

    expectInflatedEqual(bytes);
}

TEST(QuickDeflate, LimitsTheCodesOfVeryUnevenBytes) {
    DeflatedBytes bytes;
    double count = 1;
    for (std::uint8_t value = 0; value < 22; ++value, count *= 1.6)
        bytes.insert(bytes.end(), static_cast<std::size_t>(std::ceil(count)), value);
    std::shuffle(bytes.begin(), bytes.end(), std::mt19937(1));

    expectInflatedEqual(bytes);
}

}  // namespace
}  // namespace parvel::testing
