#pragma once

#include <cstdint>
#include <optional>

#include "parvel/foundation/Image.h"
#include "parvel/foundation/PVExport.h"

namespace parvel {

/// The image made larger or smaller, its shape kept, to fit a box: one side is as long as the box's
/// and the other is rounded to whole pixels, at least one. It is resampled with a Lanczos filter in
/// linear light. None for an empty image, an empty box, and a result of over 40,000,000 pixels.
PV_EXPORT std::optional<Image> imageScaledToFit(const Image& image, std::uint32_t width,
                                                std::uint32_t height);

}  // namespace parvel
