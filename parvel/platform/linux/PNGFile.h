#pragma once

#include <optional>

#include "parvel/foundation/Data.h"
#include "parvel/foundation/Image.h"

namespace parvel {

/// The image as a PNG file (ISO/IEC 15948), made quickly rather than small: in RGB where it is
/// opaque, else in RGBA. None for an image without or over the most pixels that are decoded.
std::optional<Data> pngFileOfImage(const Image& image);

}  // namespace parvel
