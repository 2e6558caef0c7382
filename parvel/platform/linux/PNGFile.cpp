#include "parvel/platform/linux/PNGFile.h"

#include <algorithm>
#include <array>
#include <cstdint>
#include <memory>
#include <span>
#include <string_view>

#include <libdeflate.h>

#include "parvel/platform/ImageCodec.h"
#include "parvel/platform/linux/ZlibStream.h"

namespace parvel {

namespace {

bool isOpaque(const Image& image) {
    constexpr std::uint32_t opaque = 0xFF000000;
    for (std::uint32_t y = 0; y < image.height; ++y) {
        const std::uint32_t* row = image.row(y);
        std::uint32_t all = opaque;
        for (std::uint32_t x = 0; x < image.width; ++x)
            all &= row[x];
        if (all != opaque)
            return false;
    }
    return true;
}

std::uint32_t withoutAlpha(std::uint32_t color, std::uint32_t alpha) {
    if (alpha == 0)
        return 0;
    return std::min((color * 255 + alpha / 2) / alpha, 255U);
}

/// A pixel's samples from the highest byte down.
template <std::size_t channels>
std::uint32_t samplesOf(std::uint32_t pixel) {
    if constexpr (channels == 3)
        return pixel << 8;
    const std::uint32_t alpha = pixel >> 24;
    const std::uint32_t red = withoutAlpha(pixel >> 16 & 0xFF, alpha);
    const std::uint32_t green = withoutAlpha(pixel >> 8 & 0xFF, alpha);
    const std::uint32_t blue = withoutAlpha(pixel & 0xFF, alpha);
    return red << 24 | green << 16 | blue << 8 | alpha;
}

/// Four differences at once, each of two bytes.
std::uint32_t differences(std::uint32_t from, std::uint32_t less) {
    constexpr std::uint32_t highest = 0x80808080;
    return ((from | highest) - (less & ~highest)) ^ ((from ^ ~less) & highest);
}

/// Compresses the rows, each behind the byte that names its filter: each sample as its difference
/// from the one to its left.
template <std::size_t channels>
void compressRows(const Image& image, ZlibStream& stream) {
    constexpr std::uint8_t filterSub = 1;
    const std::size_t size = std::size_t{image.width} * channels + 1;
    // A pixel is written as four bytes, of which the next one takes back what is too much.
    const auto filtered = std::make_unique_for_overwrite<std::uint8_t[]>(size + 1);
    filtered[0] = filterSub;
    for (std::uint32_t y = 0; y < image.height; ++y) {
        const std::uint32_t* row = image.row(y);
        // Much of a page is blank: such a row is that above again.
        const bool isRepeated = y > 0 && std::equal(row, row + image.width, image.row(y - 1));
        std::uint8_t* out = filtered.get() + 1;
        std::uint32_t left = 0;
        for (std::uint32_t x = 0; x < image.width && !isRepeated; ++x) {
            const std::uint32_t samples = samplesOf<channels>(row[x]);
            const std::uint32_t difference = differences(samples, left);
            for (int i = 0; i < 4; ++i)
                out[i] = static_cast<std::uint8_t>(difference >> (24 - 8 * i));
            out += channels;
            left = samples;
        }
        stream.add({filtered.get(), size});
    }
}

/// Writes a file's chunks into a buffer that is large enough.
class ChunkWriter {
public:
    explicit ChunkWriter(std::uint8_t* out) : m_out(out) {}

    void signature() { append("\x89PNG\r\n\x1A\n"); }
    void chunk(std::string_view type, std::span<const std::uint8_t> content) {
        number(static_cast<std::uint32_t>(content.size()));
        const std::uint8_t* begin = m_out;
        append(type);
        m_out = std::copy(content.begin(), content.end(), m_out);
        number(libdeflate_crc32(0, begin, static_cast<std::size_t>(m_out - begin)));
    }

private:
    void append(std::string_view text) { m_out = std::copy(text.begin(), text.end(), m_out); }
    void number(std::uint32_t value) {
        for (int shift = 24; shift >= 0; shift -= 8)
            *m_out++ = static_cast<std::uint8_t>(value >> shift);
    }

    std::uint8_t* m_out;
};

std::array<std::uint8_t, 13> header(const Image& image, bool opaque) {
    constexpr std::uint8_t bitDepth = 8;
    constexpr std::uint8_t rgb = 2;
    constexpr std::uint8_t rgba = 6;
    const auto byte = [](std::uint32_t value, int shift) {
        return static_cast<std::uint8_t>(value >> shift);
    };
    return {byte(image.width, 24),
            byte(image.width, 16),
            byte(image.width, 8),
            byte(image.width, 0),
            byte(image.height, 24),
            byte(image.height, 16),
            byte(image.height, 8),
            byte(image.height, 0),
            bitDepth,
            opaque ? rgb : rgba,
            0,
            0,
            0};
}

}  // namespace

std::optional<Data> pngFileOfImage(const Image& image, const host::Libisal& libisal) {
    constexpr std::size_t signatureSize = 8;
    constexpr std::size_t chunkSize = 12;  // beside its content
    constexpr std::array<std::uint8_t, 1> perceptual{0};
    const std::uint64_t pixels = std::uint64_t{image.width} * image.height;
    if (!image.bytes || pixels < 1 || pixels > ImageCodec::mostPixels || !libisal.isComplete())
        return std::nullopt;

    const bool opaque = isOpaque(image);
    ZlibStream stream(libisal);
    if (opaque)
        compressRows<3>(image, stream);
    else
        compressRows<4>(image, stream);
    const std::span<const std::uint8_t> compressed = stream.finish();

    const std::array<std::uint8_t, 13> head = header(image, opaque);
    const std::size_t size =
        signatureSize + 4 * chunkSize + head.size() + perceptual.size() + compressed.size();
    auto file = std::make_unique_for_overwrite<std::uint8_t[]>(size);
    ChunkWriter writer(file.get());
    writer.signature();
    writer.chunk("IHDR", head);
    writer.chunk("sRGB", perceptual);
    writer.chunk("IDAT", compressed);
    writer.chunk("IEND", {});
    return Data::adopt(std::move(file), size);
}

}  // namespace parvel
