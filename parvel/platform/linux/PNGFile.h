#pragma once

#include <optional>

#include "parvel/foundation/Data.h"
#include "parvel/foundation/Image.h"
#include "parvel/platform/linux/Libisal.h"

namespace parvel {

/// The image as a PNG file (ISO/IEC 15948), made quickly rather than small: in RGB where it is
/// opaque, else in RGBA. None for an image without or over the most pixels that are decoded, and
/// where the library that compresses it is missing.
std::optional<Data> pngFileOfImage(const Image& image,
                                   const host::Libisal& libisal = host::Libisal::host());

}  // namespace parvel
