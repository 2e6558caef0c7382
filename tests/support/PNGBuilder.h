#pragma once

#include <cstdint>
#include <string>
#include <string_view>

namespace parvel::testing {

/// Builds a PNG file chunk by chunk, as it should be or not.
/// `PNGBuilder{}.header(2, 1, 8, 2).data(row("\xFF...")).end().bytes()`
class PNGBuilder {
public:
    static constexpr int grey = 0, rgb = 2, palette = 3, greyAlpha = 4, rgba = 6;

    PNGBuilder& header(std::uint32_t width, std::uint32_t height, int depth, int colorType,
                       bool interlaced = false);
    PNGBuilder& chunk(std::string_view type, std::string_view content);
    /// The rows, each behind the byte that names its filter, compressed.
    PNGBuilder& data(std::string_view rows);
    PNGBuilder& end() { return chunk("IEND", ""); }

    [[nodiscard]] const std::string& bytes() const { return m_bytes; }

private:
    std::string m_bytes = "\x89PNG\r\n\x1A\n";
};

/// A picture of one opaque colour, 0xRRGGBB.
std::string plainPNG(std::uint32_t width, std::uint32_t height, std::uint32_t color = 0x3366CC);

}  // namespace parvel::testing
