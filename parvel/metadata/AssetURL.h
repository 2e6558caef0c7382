#pragma once

#include <optional>

#include "parvel/foundation/URL.h"
#include "parvel/metadata/PVAssetMetadata.h"

namespace parvel {

/// Where the record's item is; none for a null record too.
[[nodiscard]] inline std::optional<URL> urlOf(const AssetPtr& asset) {
    return asset ? asset->url() : std::nullopt;
}

}  // namespace parvel
