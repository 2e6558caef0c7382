#pragma once

#include <optional>

#include "parvel/foundation/URL.h"
#include "parvel/foundation/Value.h"

namespace parvel {

/// The thirteen attributes that are read, by name, as far as they exist on the file. None when any
/// read fails. Where the item's content is not on this device, the file that stands for it is read,
/// and "xAttrs: Using promised URL" logged.
[[nodiscard]] std::optional<Dictionary> attributeDictionaryAtURL(const URL& url);
/// The same, but empty when any read fails, so that a file without attributes need not be asked
/// whether it could be read.
[[nodiscard]] Dictionary readableAttributesAtURL(const URL& url);

}  // namespace parvel
