#pragma once

#include <cstdint>
#include <functional>
#include <span>

/// Decoding of pictures that come out of a stranger's book. A picture that is damaged or cut short
/// is not decoded, rather than in part. Its size is held to the limits of parvel/platform/
/// ImageCodec.h on its header, before memory is taken. The orientation that a camera notes beside a
/// picture is not applied, and colour profiles are not either.
namespace parvel::reader {

using EncodedImage = std::span<const std::uint8_t>;

/// Gives the memory of a picture once its size is known: zeroed, width * height pixels. Null where
/// there is none. Called at most once for a picture.
using Canvas = std::function<std::uint32_t*(std::uint32_t width, std::uint32_t height)>;

/// Decodes a PNG, JPEG, GIF or WebP picture, told by its first bytes, into premultiplied ARGB32,
/// row upon row without gaps. Of an animated one it is the first frame. False when that fails; the
/// canvas then holds anything.
[[nodiscard]] bool decodeImage(EncodedImage bytes, const Canvas& canvas);

[[nodiscard]] bool decodePNG(EncodedImage bytes, const Canvas& canvas);
[[nodiscard]] bool decodeJPEG(EncodedImage bytes, const Canvas& canvas);
[[nodiscard]] bool decodeGIF(EncodedImage bytes, const Canvas& canvas);
[[nodiscard]] bool decodeWebP(EncodedImage bytes, const Canvas& canvas);

}  // namespace parvel::reader
