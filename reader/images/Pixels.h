#pragma once

#include <bit>
#include <cstdint>

#include "parvel/platform/ImageCodec.h"
#include "reader/images/ImageDecoder.h"

namespace parvel::reader {

/// Whether the bytes of a pixel lie in memory as blue, green, red, alpha; else the other way round.
inline constexpr bool blueComesFirst = std::endian::native == std::endian::little;

/// `value * factor / 255`, rounded; exact for bytes.
[[nodiscard]] constexpr std::uint32_t scaledByByte(std::uint32_t value, std::uint32_t factor) {
    const std::uint32_t product = value * factor + 128;
    return (product + (product >> 8)) >> 8;
}

[[nodiscard]] constexpr std::uint32_t opaquePixel(std::uint32_t red, std::uint32_t green,
                                                  std::uint32_t blue) {
    return 0xFF000000U | red << 16 | green << 8 | blue;
}

[[nodiscard]] constexpr std::uint32_t premultipliedPixel(std::uint32_t pixel) {
    const std::uint32_t alpha = pixel >> 24;
    return alpha << 24 | scaledByByte(pixel >> 16 & 0xFF, alpha) << 16 |
           scaledByByte(pixel >> 8 & 0xFF, alpha) << 8 | scaledByByte(pixel & 0xFF, alpha);
}

/// Whether a picture of that size is decoded.
[[nodiscard]] constexpr bool isAllowedSize(std::uint32_t width, std::uint32_t height) {
    return width >= 1 && height >= 1 && width <= ImageCodec::longestSide &&
           height <= ImageCodec::longestSide &&
           std::uint64_t{width} * height <= ImageCodec::mostPixels;
}

/// The canvas's memory for a picture of that size, null also where the size is over the limits.
[[nodiscard]] std::uint32_t* takeCanvas(const Canvas& canvas, std::uint32_t width,
                                        std::uint32_t height);

}  // namespace parvel::reader
