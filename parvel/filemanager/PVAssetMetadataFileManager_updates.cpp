// Applies edits and new versions to an asset in the library. Each step leaves the asset whole, and
// no completed step is undone when a later one fails.

#include "parvel/filemanager/PVAssetMetadataFileManager.h"
#include "parvel/metadata/PVMutableAssetMetadata.h"

namespace parvel {

AssetPtr PVAssetMetadataFileManager::applyUpdate_onExistingAsset_targetDirectory_error(
    const AssetPtr& update, const AssetPtr& existing, const URL& directory, ErrorOut error) {
    const AssetPtr updated = updateWithKeyAttributesAssetMetadata_error(update, error);
    if (!updated)
        return nullptr;

    const AssetPtr moved =
        existing && existing->isUbiquitous()
            ? replaceUbiquitousAsset_withAsset_error(existing, updated, error)
            : moveAsset_toDirectory_replaceExisting_renameIfCollision_useAssetIDFileName_error(
                  updated, directory, /*replaceExisting=*/true, /*renameIfCollision=*/false,
                  /*useAssetIDFileName=*/true, error);
    // Deliberate: with an existing asset a record comes back also when the move failed.
    const AssetPtr& base = existing ? existing : moved;
    if (!base)
        return nullptr;
    return base->copyWithUpdates([&](PVMutableAssetMetadata& copy) {
        if (existing)
            copy.combineWithMetadata(moved.get());
        copy.setHasPendingUpdates(false);
        copy.setGenerationCount(copy.generationCount() + 1);
    });
}

}  // namespace parvel
