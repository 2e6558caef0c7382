#include "parvel/platform/linux/PNGFile.h"

#include <algorithm>
#include <array>
#include <cstdint>
#include <memory>
#include <span>
#include <string_view>

#include <libdeflate.h>

#include "parvel/platform/ImageCodec.h"

namespace parvel {

namespace {

/// The rows of a file, each behind the byte that names its filter.
struct FilteredRows {
    std::unique_ptr<std::uint8_t[]> bytes;
    std::size_t size = 0;
};

struct CompressorFree {
    void operator()(libdeflate_compressor* compressor) const {
        libdeflate_free_compressor(compressor);
    }
};

bool isOpaque(const Image& image) {
    for (std::uint32_t y = 0; y < image.height; ++y) {
        const std::uint32_t* row = image.row(y);
        if (!std::all_of(row, row + image.width,
                         [](std::uint32_t pixel) { return pixel >> 24 == 0xFF; }))
            return false;
    }
    return true;
}

std::uint8_t withoutAlpha(std::uint32_t color, std::uint32_t alpha) {
    if (alpha == 0)
        return 0;
    return static_cast<std::uint8_t>(std::min((color * 255 + alpha / 2) / alpha, 255U));
}

template <std::size_t channels>
std::array<std::uint8_t, channels> samplesOf(std::uint32_t pixel) {
    const std::uint32_t alpha = pixel >> 24;
    const std::uint32_t red = pixel >> 16 & 0xFF;
    const std::uint32_t green = pixel >> 8 & 0xFF;
    const std::uint32_t blue = pixel & 0xFF;
    if constexpr (channels == 3)
        return {static_cast<std::uint8_t>(red), static_cast<std::uint8_t>(green),
                static_cast<std::uint8_t>(blue)};
    else
        return {withoutAlpha(red, alpha), withoutAlpha(green, alpha), withoutAlpha(blue, alpha),
                static_cast<std::uint8_t>(alpha)};
}

/// Each sample as its difference from the one to its left.
template <std::size_t channels>
FilteredRows filteredRows(const Image& image) {
    constexpr std::uint8_t filterSub = 1;
    FilteredRows rows;
    rows.size = (std::size_t{image.width} * channels + 1) * image.height;
    rows.bytes = std::make_unique_for_overwrite<std::uint8_t[]>(rows.size);

    std::uint8_t* out = rows.bytes.get();
    for (std::uint32_t y = 0; y < image.height; ++y) {
        const std::uint32_t* row = image.row(y);
        std::array<std::uint8_t, channels> left{};
        *out++ = filterSub;
        for (std::uint32_t x = 0; x < image.width; ++x) {
            const std::array<std::uint8_t, channels> samples = samplesOf<channels>(row[x]);
            for (std::size_t i = 0; i < channels; ++i)
                *out++ = static_cast<std::uint8_t>(samples[i] - left[i]);
            left = samples;
        }
    }
    return rows;
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

std::optional<Data> pngFileOfImage(const Image& image) {
    constexpr int fastest = 1;
    constexpr std::size_t signatureSize = 8;
    constexpr std::size_t chunkSize = 12;  // beside its content
    constexpr std::array<std::uint8_t, 1> perceptual{0};
    const std::uint64_t pixels = std::uint64_t{image.width} * image.height;
    if (!image.bytes || pixels < 1 || pixels > ImageCodec::mostPixels)
        return std::nullopt;

    const bool opaque = isOpaque(image);
    const FilteredRows rows = opaque ? filteredRows<3>(image) : filteredRows<4>(image);
    const std::unique_ptr<libdeflate_compressor, CompressorFree> compressor(
        libdeflate_alloc_compressor(fastest));
    if (!compressor)
        return std::nullopt;
    const std::size_t bound = libdeflate_zlib_compress_bound(compressor.get(), rows.size);
    const auto compressed = std::make_unique_for_overwrite<std::uint8_t[]>(bound);
    const std::size_t compressedSize = libdeflate_zlib_compress(compressor.get(), rows.bytes.get(),
                                                                rows.size, compressed.get(), bound);
    if (compressedSize == 0)
        return std::nullopt;

    const std::array<std::uint8_t, 13> head = header(image, opaque);
    const std::size_t size =
        signatureSize + 4 * chunkSize + head.size() + perceptual.size() + compressedSize;
    auto file = std::make_unique_for_overwrite<std::uint8_t[]>(size);
    ChunkWriter writer(file.get());
    writer.signature();
    writer.chunk("IHDR", head);
    writer.chunk("sRGB", perceptual);
    writer.chunk("IDAT", {compressed.get(), compressedSize});
    writer.chunk("IEND", {});
    return Data::adopt(std::move(file), size);
}

}  // namespace parvel
