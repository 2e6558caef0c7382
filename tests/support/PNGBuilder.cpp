#include "tests/support/PNGBuilder.h"

#include <stdexcept>

#include <libdeflate.h>

namespace parvel::testing {

namespace {

std::string bigEndian(std::uint32_t value) {
    std::string text;
    for (int shift = 24; shift >= 0; shift -= 8)
        text += static_cast<char>(value >> shift & 0xFF);
    return text;
}

}  // namespace

PNGBuilder& PNGBuilder::header(std::uint32_t width, std::uint32_t height, int depth, int colorType,
                               bool interlaced) {
    std::string content = bigEndian(width) + bigEndian(height);
    content += static_cast<char>(depth);
    content += static_cast<char>(colorType);
    content += std::string(2, '\0');
    content += static_cast<char>(interlaced);
    return chunk("IHDR", content);
}

PNGBuilder& PNGBuilder::chunk(std::string_view type, std::string_view content) {
    const std::string body = std::string(type) + std::string(content);
    m_bytes += bigEndian(static_cast<std::uint32_t>(content.size())) + body;
    m_bytes += bigEndian(libdeflate_crc32(0, body.data(), body.size()));
    return *this;
}

PNGBuilder& PNGBuilder::data(std::string_view rows) {
    libdeflate_compressor* compressor = libdeflate_alloc_compressor(1);
    std::string compressed(libdeflate_zlib_compress_bound(compressor, rows.size()), '\0');
    compressed.resize(libdeflate_zlib_compress(compressor, rows.data(), rows.size(),
                                               compressed.data(), compressed.size()));
    libdeflate_free_compressor(compressor);
    if (compressed.empty())
        throw std::logic_error("no data");
    return chunk("IDAT", compressed);
}

std::string plainPNG(std::uint32_t width, std::uint32_t height, std::uint32_t color) {
    std::string row(1, '\0');
    for (std::uint32_t x = 0; x < width; ++x) {
        for (int shift = 16; shift >= 0; shift -= 8)
            row += static_cast<char>(color >> shift & 0xFF);
    }
    std::string rows;
    for (std::uint32_t y = 0; y < height; ++y)
        rows += row;
    return PNGBuilder{}.header(width, height, 8, PNGBuilder::rgb).data(rows).end().bytes();
}

}  // namespace parvel::testing
