#pragma once

#include <optional>
#include <string>
#include <string_view>

#include "parvel/foundation/URL.h"
#include "parvel/foundation/Value.h"

namespace parvel {

/// The file URL of a path as it is stored; none where the value is absent, empty or no text.
[[nodiscard]] std::optional<URL> fileURLOfStoredPath(const Value* path);

/// The path with its last extension in lower case, as records store and compare it. Every other
/// byte stays, and so does a path without an extension.
[[nodiscard]] std::string pathWithLowercasedExtension(std::string_view path);

}  // namespace parvel
