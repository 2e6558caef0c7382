#pragma once

#include <optional>
#include <string>
#include <string_view>

#include "parvel/foundation/URL.h"
#include "parvel/foundation/Value.h"

namespace parvel {

/// The file URL of a path as it is stored; none where the value is absent, empty or no text.
[[nodiscard]] std::optional<URL> fileURLOfStoredPath(const Value* path);

/// The path with its last extension in lower case, as records store and compare it; every other
/// byte stays, but for slashes behind the extension. A path without an extension is unchanged.
[[nodiscard]] std::string pathWithLowercasedExtension(std::string_view path);

}  // namespace parvel
