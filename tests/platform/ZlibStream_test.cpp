#include <gtest/gtest.h>

#include <algorithm>
#include <random>

#include <zlib.h>

#include "parvel/platform/linux/ZlibStream.h"

namespace parvel::testing {
namespace {

using DeflatedBytes = std::vector<std::uint8_t>;

/// The zlib stream of the bytes, which come in pieces of that size.
DeflatedBytes zlibStreamOf(const DeflatedBytes& bytes, std::size_t piece = 1000) {
    ZlibStream stream(host::Libisal::host());
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
    EXPECT_TRUE(inflatedByZlib(zlibStreamOf(bytes), bytes.size()) == bytes)
        << bytes.size() << " bytes";
}

DeflatedBytes bytesAtRandom(std::size_t size, unsigned below = 256) {
    std::mt19937 generator(static_cast<unsigned>(size));
    DeflatedBytes bytes(size);
    for (std::uint8_t& byte : bytes)
        byte = static_cast<std::uint8_t>(generator() % below);
    return bytes;
}

TEST(ZlibStream, OfNothingIsAnEmptyStream) {
    EXPECT_TRUE(inflatedByZlib(zlibStreamOf({}), 0).empty());
}

TEST(ZlibStream, OfFewBytesIsReadBackEqual) {
    for (std::size_t size = 1; size < 600; ++size) {
        expectInflatedEqual(DeflatedBytes(size, 7));
        expectInflatedEqual(bytesAtRandom(size, 3));
    }
}

TEST(ZlibStream, TakesPiecesOfAnySize) {
    const DeflatedBytes bytes = bytesAtRandom(200'000, 9);

    for (const std::size_t piece : {1U, 7U, 61'440U, 200'000U})
        EXPECT_TRUE(inflatedByZlib(zlibStreamOf(bytes, piece), bytes.size()) == bytes) << piece;
}

TEST(ZlibStream, MakesNextToNothingOfWhatRepeats) {
    EXPECT_LT(zlibStreamOf(DeflatedBytes(1'000'000, 0)).size(), 10'000U);
}

TEST(ZlibStream, GrowsLittleOverWhatDoesNotShrink) {
    const DeflatedBytes bytes = bytesAtRandom(1'000'000);

    const DeflatedBytes stream = zlibStreamOf(bytes);

    EXPECT_TRUE(inflatedByZlib(stream, bytes.size()) == bytes);
    EXPECT_LT(stream.size(), 1'001'000U);
}

TEST(ZlibStream, RepeatsNothingFartherThanTheWindow) {
    for (const std::size_t distance : {32'766U, 32'767U, 32'768U, 32'769U, 40'000U}) {
        DeflatedBytes bytes = bytesAtRandom(distance);
        bytes.insert(bytes.end(), bytes.begin(), bytes.begin() + 5'000);

        expectInflatedEqual(bytes);
    }
}

TEST(ZlibStream, RepeatsAtEveryLengthAndDistance) {
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

}  // namespace
}  // namespace parvel::testing
