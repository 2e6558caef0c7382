#pragma once

#include <cstdint>
#include <optional>

#include "parvel/foundation/Data.h"
#include "parvel/foundation/Image.h"

namespace parvel {

/// Reads and writes encoded images: `Service<ImageCodec>::current()`. They are decoded in a
/// confined process. For any thread.
class ImageCodec {
public:
    /// The longest side and the most pixels of an image that is decoded.
    static constexpr std::uint32_t longestSide = 65535;
    static constexpr std::uint64_t mostPixels = 40'000'000;

    virtual ~ImageCodec() = default;

    /// The image in PNG, JPEG, GIF (its first frame) or WebP bytes, told by their beginning. None
    /// for any other or damaged bytes, and for an image over the limits.
    [[nodiscard]] virtual std::optional<Image> decode(const Data& bytes) = 0;
    /// The image as a PNG file (ISO/IEC 15948). None when it can't be encoded.
    [[nodiscard]] virtual std::optional<Data> encodePNG(const Image& image) = 0;

    static ImageCodec& host();
};

}  // namespace parvel
