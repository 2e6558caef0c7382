#include "reader/images/ImageDecoder.h"

#include <algorithm>
#include <string_view>

#include "reader/images/Pixels.h"

namespace parvel::reader {

namespace {

bool hasAt(EncodedImage bytes, std::size_t offset, std::string_view signature) {
    return bytes.size() >= offset + signature.size() &&
           std::equal(signature.begin(), signature.end(), bytes.begin() + offset,
                      [](char sign, std::uint8_t byte) {
                          return static_cast<std::uint8_t>(sign) == byte;
                      });
}

}  // namespace

bool decodeImage(EncodedImage bytes, const Canvas& canvas) {
    if (hasAt(bytes, 0, "\x89PNG\r\n\x1A\n"))
        return decodePNG(bytes, canvas);
    if (hasAt(bytes, 0, "\xFF\xD8\xFF"))
        return decodeJPEG(bytes, canvas);
    if (hasAt(bytes, 0, "GIF87a") || hasAt(bytes, 0, "GIF89a"))
        return decodeGIF(bytes, canvas);
    if (hasAt(bytes, 0, "RIFF") && hasAt(bytes, 8, "WEBP"))
        return decodeWebP(bytes, canvas);
    return false;
}

std::uint32_t* takeCanvas(const Canvas& canvas, std::uint32_t width, std::uint32_t height) {
    return isAllowedSize(width, height) ? canvas(width, height) : nullptr;
}

}  // namespace parvel::reader
