// Takes assets away: to the trash, off the disk, or aside. Each is one operation of the file-system
// service; the rename in the trash that follows a trashing may fail alone, and leaves the item
// there.

#include "parvel/filemanager/AssetNames.h"
#include "parvel/filemanager/PVAssetMetadataFileManager.h"
#include "parvel/foundation/PVCasts.h"
#include "parvel/foundation/PVParvelLog.h"
#include "parvel/metadata/AssetURL.h"
#include "parvel/metadata/PVMutableAssetMetadata.h"

namespace parvel {

namespace {

/// The item's place in the trash under its display name. None where that is no single name, which
/// is a failed rename: nothing out of a book leads out of the trash or into another item there.
std::optional<URL> renamedInTrash(const URL& trashed, const String& displayName) {
    // Deliberate: a missing extension would be joined as a component of its own, so that the rename
    // fails and the item stays under the name that the trash gave it.
    if (extensionOfPath(displayName).empty() || !isOneComponent(displayName))
        return std::nullopt;
    return trashed.deletingLastPathComponent().appendingPathComponent(displayName);
}

}  // namespace

AssetPtr PVAssetMetadataFileManager::trashAsset_error(const AssetPtr& asset, ErrorOut error) {
    ErrorSlot slot(error);
    PVParvelLog().debug("trashAsset: start");
    const auto url = urlOf(asset);
    std::optional<URL> trashed;
    if (!url)
        assign(slot.out(), makeMissingURLError());
    if (!url || !m_fileManager->trashItem(*url, &trashed, slot.out()) || !trashed) {
        PVParvelLog().error("trashAsset: Fail: %@ error: %@", url, slot.value());
        return nullptr;
    }

    if (const String* name = PVDynamicCast(classOf<String>, asset->displayName())) {
        const auto renamed = renamedInTrash(*trashed, *name);
        if (renamed && m_fileManager->moveItem(*trashed, *renamed)) {
            PVParvelLog().debug("trashAsset: renamed asset in trash directory");
            trashed = renamed;
        } else {
            PVParvelLog().error("trashAsset: Failed to rename file in trash directory");
        }
    }

    PVParvelLog().debug("trashAsset: Success");
    return asset->copyWithUpdates(
        [&trashed](PVMutableAssetMetadata& copy) { copy.setTrashedURL(trashed); });
}

bool PVAssetMetadataFileManager::removeAsset_error(const AssetPtr& asset, ErrorOut error) {
    ErrorSlot slot(error);
    const auto url = urlOf(asset);
    PVParvelLog().info("removeAsset: start {asset: %d} %@", asset != nullptr, url);
    if (!url)
        assign(slot.out(), makeMissingURLError());
    const bool isRemoved = url && m_fileManager->removeItem(*url, slot.out());
    if (isRemoved)
        PVParvelLog().debug("removeAsset: Success");
    else
        PVParvelLog().error("removeAsset: Failed: %@ error: %@", url, slot.value());
    return isRemoved;
}

AssetPtr PVAssetMetadataFileManager::redactAsset_intoDirectory_error(const AssetPtr& asset,
                                                                     const URL& directory,
                                                                     ErrorOut error) {
    const auto url = urlOf(asset);
    PVParvelLog().info("redactAsset: start asset: %@, directory: %@", url, directory);
    if (!url) {
        // Deliberate: the caller's error is not written.
        PVParvelLog().error("redactAsset: Failed redact asset: %@ error: %@", url,
                            std::optional<Error>());
        return nullptr;
    }

    ErrorSlot slot(error);
    const URL target = directory.appendingPathComponent(url->lastPathComponent());
    if (!m_fileManager->moveItem(*url, target, slot.out())) {
        PVParvelLog().error("redactAsset: Failed redact asset: %@ error: %@", url, slot.value());
        return nullptr;
    }
    PVParvelLog().debug("redactAsset: Did perform redact move -- Success");
    return asset->copyWithUpdates([&target](PVMutableAssetMetadata& copy) {
        copy.setWasRedacted(true);
        copy.setUrl(target);
    });
}

}  // namespace parvel
