// Applies edits and new versions to an asset in the library. An edit
//   1. renames a PDF after its new display name;
//   2. writes the extended attributes;
//   3. expands a zipped book in place;
//   4. replaces the cover file, and keeps its first version;
//   5. writes the store metadata file, and keeps its first version.
// Each step leaves the asset whole, and no completed step is undone when a later one fails: the
// asset stands as the completed steps have made it.

#include "parvel/filemanager/PVAssetMetadataFileManager.h"
#include "parvel/foundation/PVCasts.h"
#include "parvel/foundation/PVParvelLog.h"
#include "parvel/iotasks/PVInstallAssetMetadataIOTask.h"
#include "parvel/metadata/AssetURL.h"
#include "parvel/metadata/PVMutableAssetMetadata.h"

namespace parvel {

AssetPtr
PVAssetMetadataFileManager::updateAsset_withUpdates_temporaryDirectory_inflateIfNeeded_error(
    const AssetPtr& asset, const Dictionary* updates, const std::optional<URL>& temporaryDirectory,
    bool inflateIfNeeded, ErrorOut error) {
    ErrorSlot slot(error);
    const AssetPtr changes =
        PVAssetMetadata::updatesMetadataWithDictionary_error(updates, slot.out());
    if (!changes) {
        PVParvelLog().error("updateMetadata: Failed to create updates metadata -- Bailing Out");
        return nullptr;
    }

    const String* name = PVDynamicCast(classOf<String>, changes->displayName());
    const AssetPtr renamed = _renameExistingPDFMetadata_toDisplayName_error(
        asset, name ? std::optional(*name) : std::nullopt, slot.out());
    if (!renamed) {
        PVParvelLog().error("updateMetadata: Failed rename: %@ error: %@", urlOf(asset),
                            slot.value());
        return nullptr;
    }

    const bool isKnown = renamed->containsAsset(*changes);
    AssetPtr combined = renamed->copyWithUpdates([&](PVMutableAssetMetadata& copy) {
        copy.combineWithMetadata(changes.get());
        copy.setGenerationCount(copy.generationCount() + 1);
        // Deliberate: updates that don't speak of a preview make it none.
        copy.setPreview(changes->isPreview());
        // The record is still being made, so the pointer to it owns nothing.
        persistXattrMetadata(AssetPtr(AssetPtr(), &copy));
    });
    if (isKnown) {
        // Deliberate: the asset as it was given, also where its PDF was renamed, and although its
        // attributes are written. The misspelling is part of the text.
        PVParvelLog().error("updateMetadata: updates == metadta -- Done");
        return asset;
    }
    if (!inflateIfNeeded) {
        PVParvelLog().error("updateMetadata: Won't inflate -- Done");
        return combined;
    }

    const AssetPtr inflated =
        inflateAsset_temporaryDirectory_error(combined, temporaryDirectory, slot.out());
    if (!inflated) {
        PVParvelLog().error("updateMetadata: Inflate failed -- Bailing Out");
        return nullptr;
    }
    AssetPtr covered = _updateImageCoverDataForMetadta_updates_error(inflated, changes, slot.out());
    if (!covered) {
        PVParvelLog().error("updateMetadata: Update image cover failed -- Bailing Out");
        return nullptr;
    }
    persistMetadata(covered);
    PVParvelLog().info("updatedMetadata: Done -- Success");
    return covered;
}

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

AssetPtr PVAssetMetadataFileManager::inflateAsset_temporaryDirectory_error(
    const AssetPtr& asset, const std::optional<URL>& temporaryDirectory, ErrorOut error) {
    // Deliberate: the line lacks its closing brace.
    PVParvelLog().info("inflateMetadata: start {asset: %d, temporaryDirectory: %d",
                       asset != nullptr, temporaryDirectory.has_value());
    ErrorSlot slot(error);
    const auto isCompressed = asset ? asset->isCompressedBookWithError(slot.out()) : std::nullopt;
    if (!isCompressed) {
        PVParvelLog().error("inflateMetadata: failed to get compressed status: %@ error: %@",
                            urlOf(asset), slot.value());
        return nullptr;
    }
    if (!*isCompressed)
        return asset;

    const auto task = taskToInstallAsset(asset);
    task->setTemporaryDirectory(temporaryDirectory);
    task->setReplaceExisting(true);
    task->setShouldPlainCopy(true);
    task->setUseAssetIDFileName(false);
    return task->executeWithTargetDirectory_error(asset->url()->deletingLastPathComponent(),
                                                  slot.out());
}

}  // namespace parvel
