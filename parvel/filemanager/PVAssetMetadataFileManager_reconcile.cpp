#include <unordered_set>

#include "parvel/filemanager/PVAssetMetadataFileManager.h"
#include "parvel/foundation/PVParvelLog.h"
#include "parvel/inspection/PVAssetMetadataInspector.h"
#include "parvel/metadata/AssetURL.h"
#include "parvel/platform/ResourceQueries.h"
#include "parvel/platform/Service.h"

namespace parvel {

namespace {

struct URLHash {
    std::size_t operator()(const URL& url) const { return url.hash(); }
};

std::unordered_set<URL, URLHash> standardizedURLsOf(const std::vector<AssetPtr>& assets) {
    std::unordered_set<URL, URLHash> urls;
    urls.reserve(assets.size());
    for (const AssetPtr& asset : assets) {
        if (const auto url = urlOf(asset))
            urls.insert(url->standardized());
    }
    return urls;
}

}  // namespace

std::vector<AssetPtr> PVAssetMetadataFileManager::orphanAssetsInAssets_error(
    const std::vector<AssetPtr>& assets, [[maybe_unused]] ErrorOut error) const {
    PVParvelLog().info("OrphanAssets: start {assets: %ld}", assets.size());
    ResourceQueries& queries = Service<ResourceQueries>::current();
    std::vector<AssetPtr> orphans;
    for (const AssetPtr& asset : assets) {
        const auto url = urlOf(asset);
        if (url && queries.isReachable(*url)) {
            PVParvelLog().debug("OrphanAsset: Asset available: %@", url);
            continue;
        }
        PVParvelLog().info("OrphanAssets: Found Orphan: %@", url);
        orphans.push_back(asset);
    }
    return orphans;
}

std::vector<AssetPtr> PVAssetMetadataFileManager::assetsForURLs_missingFromAssets_error(
    const std::vector<URL>& urls, const std::vector<AssetPtr>& assets, ErrorOut error) const {
    PVParvelLog().info("MissingAssets: start {urls: %ld, assets: %ld}", urls.size(), assets.size());
    const auto known = standardizedURLsOf(assets);
    const auto manager = init();
    std::vector<AssetPtr> missing;
    for (const URL& url : urls) {
        const URL standardized = url.standardized();
        if (known.contains(standardized)) {
            PVParvelLog().debug("MissingAssets: Asset available: %@", standardized);
            continue;
        }
        PVParvelLog().info("MissingAssets: Found missing asset: %@", standardized);
        const AssetPtr inspected =
            PVAssetMetadataInspector::metadataForAssetAtURL_error(url, error);
        if (!inspected) {
            PVParvelLog().error("MissingAsset: Failed to inspect url: %@", url);
            continue;
        }
        if (AssetPtr stamped =
                manager->updateWithKeyAttributesAssetMetadata_error(inspected, error))
            missing.push_back(std::move(stamped));
    }
    return missing;
}

}  // namespace parvel
