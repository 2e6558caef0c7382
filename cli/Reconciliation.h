#pragma once

#include <string>
#include <vector>

#include "parvel/foundation/Error.h"
#include "parvel/metadata/PVAssetMetadata.h"

namespace parvel::cli {

/// A record whose file is gone, and the file of the same identity that no record names: it was
/// moved.
struct MovedAsset {
    AssetPtr orphan;
    AssetPtr missing;
};

/// Pairs each orphan with the first missing asset of its identity that no orphan before it has, in
/// time that grows with their number.
std::vector<MovedAsset> movedAssets(const std::vector<AssetPtr>& orphans,
                                    const std::vector<AssetPtr>& missing);

/// Those of the URLs that none of the records names and that no missing asset was made of: they
/// could not be inspected.
std::vector<URL> uninspectedURLs(const std::vector<URL>& urls, const std::vector<AssetPtr>& records,
                                 const std::vector<AssetPtr>& missing);

}  // namespace parvel::cli
