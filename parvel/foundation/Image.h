#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>

namespace parvel {

/// A raster image in sRGB, immutable; copies share the pixels. Each pixel is 32 bits in the host's
/// byte order: alpha, red, green, blue from the highest byte down, the colours multiplied by alpha.
struct Image {
    std::uint32_t width = 0;   ///< in pixels; above zero
    std::uint32_t height = 0;  ///< in pixels; above zero
    std::size_t stride = 0;    ///< bytes from one row to the next, a multiple of 4
    /// `stride` times `height` bytes, top row first, at an address that is a multiple of 4.
    std::shared_ptr<const std::uint8_t[]> bytes;

    /// The pixels of one row.
    [[nodiscard]] const std::uint32_t* row(std::uint32_t y) const {
        return reinterpret_cast<const std::uint32_t*>(bytes.get() + y * stride);
    }
};

}  // namespace parvel
