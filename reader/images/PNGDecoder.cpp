#include <algorithm>
#include <memory>

#include <png.h>

#include "reader/images/Pixels.h"

namespace parvel::reader {

bool decodePNG(EncodedImage bytes, const Canvas& canvas) {
    png_image image{};
    image.version = PNG_IMAGE_VERSION;
    if (!png_image_begin_read_from_memory(&image, bytes.data(), bytes.size()))
        return false;
    const std::unique_ptr<png_image, decltype(&png_image_free)> freed(&image, png_image_free);

    const bool hasAlpha = (image.format & PNG_FORMAT_FLAG_ALPHA) != 0;
    image.format = blueComesFirst ? PNG_FORMAT_BGRA : PNG_FORMAT_ARGB;
    // Else 16-bit samples without a note of their gamma would be taken for linear light.
    image.flags |= PNG_IMAGE_FLAG_16BIT_sRGB;
    std::uint32_t* pixels = takeCanvas(canvas, image.width, image.height);
    if (!pixels || !png_image_finish_read(&image, nullptr, pixels, 0, nullptr))
        return false;

    if (hasAlpha) {
        const std::size_t count = std::size_t{image.width} * image.height;
        std::transform(pixels, pixels + count, pixels, premultipliedPixel);
    }
    return true;
}

}  // namespace parvel::reader
