#pragma once

#include <optional>
#include <string>

#include "parvel/foundation/URL.h"

namespace parvel {

/// The URL of a copy of the source in the directory: its name, with the extension in lower case.
/// None without either.
[[nodiscard]] std::optional<URL> urlOfCopy(const std::optional<URL>& source,
                                           const std::optional<URL>& directory);

/// The path to give to a copying service, which fails for the empty one of no URL.
[[nodiscard]] inline std::string pathOrEmpty(const std::optional<URL>& url) {
    return url ? url->path() : std::string();
}

}  // namespace parvel
