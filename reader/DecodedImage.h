#pragma once

#include "reader/Channel.h"

namespace parvel::reader {

/// Decodes the encoded image that came, into a memory file. Refused for what is no image, a damaged
/// one and one over the limits.
[[nodiscard]] Answer decodedImage(const Received& received);

}  // namespace parvel::reader
