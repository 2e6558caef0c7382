#pragma once

#include <cstdint>
#include <memory>
#include <vector>

#include "parvel/foundation/Image.h"

namespace parvel::testing {

/// An image of these pixels, row upon row, with a gap of `gap` bytes behind each row.
inline Image imageOf(std::uint32_t width, const std::vector<std::uint32_t>& pixels,
                     std::size_t gap = 0) {
    const auto height = static_cast<std::uint32_t>(pixels.size() / width);
    const std::size_t stride = width * sizeof(std::uint32_t) + gap;
    const std::size_t words = stride / sizeof(std::uint32_t);
    const auto rows = std::make_shared<std::uint32_t[]>(words * height);
    for (std::size_t i = 0; i < pixels.size(); ++i)
        rows[i / width * words + i % width] = pixels[i];
    return {width, height, stride, {rows, reinterpret_cast<const std::uint8_t*>(rows.get())}};
}

/// An image of one colour.
inline Image plainImage(std::uint32_t width, std::uint32_t height, std::uint32_t pixel) {
    return imageOf(width, std::vector<std::uint32_t>(std::size_t{width} * height, pixel));
}

inline std::vector<std::uint32_t> pixelsOf(const Image& image) {
    std::vector<std::uint32_t> pixels;
    for (std::uint32_t y = 0; y < image.height; ++y)
        pixels.insert(pixels.end(), image.row(y), image.row(y) + image.width);
    return pixels;
}

}  // namespace parvel::testing
