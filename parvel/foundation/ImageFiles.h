#pragma once

#include <optional>

#include "parvel/foundation/Data.h"
#include "parvel/foundation/Image.h"
#include "parvel/foundation/PVExport.h"

namespace parvel {

/// The image in the bytes of a PNG, JPEG, GIF (its first frame) or WebP file, told by their
/// beginning. It is decoded in a confined process. None for other bytes, a damaged image, one of
/// over 40,000,000 pixels or 65,535 a side or that takes the process beyond its limits on memory
/// and time, and where the process can't be had.
PV_EXPORT std::optional<Image> imageFromData(const Data& data);

/// The image as a PNG file (ISO/IEC 15948). None for an image of over 40,000,000 pixels.
PV_EXPORT std::optional<Data> pngDataFromImage(const Image& image);

}  // namespace parvel
