#pragma once

#include <cstdint>
#include <optional>
#include <string_view>
#include <vector>

#include "reader/images/ImageDecoder.h"

namespace parvel::testing {

/// What a decoder made of some bytes.
struct DecodedImage {
    std::uint32_t width = 0;
    std::uint32_t height = 0;
    std::vector<std::uint32_t> pixels;

    [[nodiscard]] std::uint32_t at(std::uint32_t x, std::uint32_t y) const {
        return pixels.at(std::size_t{y} * width + x);
    }
};

/// None when the picture is not decoded.
inline std::optional<DecodedImage> decoded(std::string_view bytes) {
    DecodedImage image;
    const reader::Canvas canvas = [&image](std::uint32_t width, std::uint32_t height) {
        image.width = width;
        image.height = height;
        image.pixels.resize(std::size_t{width} * height);
        return image.pixels.data();
    };
    const auto* begin = reinterpret_cast<const std::uint8_t*>(bytes.data());
    if (!reader::decodeImage({begin, bytes.size()}, canvas))
        return std::nullopt;
    return image;
}

/// Whether the decoder asks for the memory of a picture.
inline bool takesMemoryFor(std::string_view bytes) {
    bool taken = false;
    const reader::Canvas canvas = [&taken](std::uint32_t, std::uint32_t) -> std::uint32_t* {
        taken = true;
        return nullptr;
    };
    const auto* begin = reinterpret_cast<const std::uint8_t*>(bytes.data());
    const bool done = reader::decodeImage({begin, bytes.size()}, canvas);
    return taken && !done;
}

}  // namespace parvel::testing
