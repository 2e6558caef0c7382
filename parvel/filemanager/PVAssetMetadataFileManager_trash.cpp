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

/// The item's place in the trash under its display name. None, which is a failed rename, where that
/// is no single name: nothing out of a book leads out of the trash or into another item there.
std::optional<URL> renamedInTrash(FileSystemService& service, const URL& trashed,
                                  const String& displayName, std::string_view extension) {
    if (!isOneComponent(displayName))
        return std::nullopt;
    const URL named = trashed.deletingLastPathComponent().appendingPathComponent(displayName);
    if (extension.empty() || !extensionOfPath(displayName).empty())
        return named;
    // Deliberate: a missing extension is joined as a component of its own. The folder that this
    // names is not there, so that the move fails and the item keeps the trash's own name.
    if (service.itemExistsAtPath(named.path()))
        return std::nullopt;
    return named.appendingPathComponent(extension);
}

}  // namespace

AssetPtr PVAssetMetadataFileManager::trashAsset_error(const AssetPtr& asset, ErrorOut error) {
    ErrorSlot slot(error);
    PVParvelLog().debug("trashAsset: start");
    const auto url = urlOf(asset);
    std::optional<URL> trashed;
    if (!url)
        assign(slot.out(), makeMissingURLError());
    if (!url || !m_fileManager->trashItem(*url, &trashed, slot.out())) {
        PVParvelLog().error("trashAsset: Fail: %@ error: %@", url, slot.value());
        return nullptr;
    }

    if (const String* name = PVDynamicCast(classOf<String>, asset->displayName())) {
        const auto renamed =
            trashed ? renamedInTrash(*m_fileManager, *trashed, *name, url->pathExtension())
                    : std::nullopt;
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
