// Writes what a record says into its asset:
//   1. the package's store metadata file is copied to its backup, unless there is one already;
//   2. the new store metadata file takes the old one's place in one step;
//   3. the extended attributes that differ are written.
// A step that fails is logged and the next one taken. The store file is the old one or the new one,
// always whole.

#include "parvel/filemanager/PVAssetMetadataFileManager.h"
#include "parvel/foundation/PVParvelLog.h"
#include "parvel/metadata/PVAssetMetadataFlavor.h"
#include "parvel/platform/FileWriter.h"
#include "parvel/platform/PropertyList.h"
#include "parvel/platform/Service.h"

namespace parvel {

namespace {

void writeStoreFile(const PVAssetMetadata& asset) {
    const auto store =
        asset.dictionaryRepresentationWithFlavor(PVAssetMetadataFlavorBazaarMetadata);
    const auto bytes = Service<PropertyListCodec>::current().writeXML(*store);
    if (!bytes) {
        PVParvelLog().error("persistMetadata: Failed to create metadata plist");
        return;
    }
    const auto url = asset.bazaarMetadataURL();
    if (url && Service<FileWriter>::current().writeFile(*url, *bytes))
        PVParvelLog().debug("persistMetadata: Persisted updated book metadata");
    else
        PVParvelLog().error("persistMetadata: Failed to persist updated book metadata");
}

}  // namespace

void PVAssetMetadataFileManager::persistMetadata(const AssetPtr& asset) {
    PVParvelLog().debug("PersistMetadata: start");
    if (asset && asset->isBook()) {
        // Nothing is written into a zip file.
        if (asset->isCompressedBookWithError() == true) {
            PVParvelLog().debug("persistMetadata: Asset is compressed -- Bail");
        } else {
            _backupMetadataIfNeeded(asset);
            writeStoreFile(*asset);
        }
    }
    persistXattrMetadata(asset);
}

void PVAssetMetadataFileManager::_backupMetadataIfNeeded(const AssetPtr& asset) {
    const auto store = asset ? asset->bazaarMetadataURL() : std::nullopt;
    const auto backup = asset ? asset->bazaarMetadataBackupURL() : std::nullopt;
    // Deliberate: a backup that is there already fails the copy, so that the first is kept for
    // good.
    if (!store || !backup || !m_fileManager->copyItem(*store, *backup))
        PVParvelLog().error("Failed to backup BazaarMetadata.plist");
}

void PVAssetMetadataFileManager::persistXattrMetadata(const AssetPtr& asset) {
    if (!asset || !asset->shouldUpdateXattrMetadata())
        return;
    if (updateExtendedAttributesForAsset_error(asset))
        PVParvelLog().debug("persistXattrMetadata: xattr updated for assetMetadata %@", asset);
    else
        PVParvelLog().debug("persistXattrMetadata: nothing to save for assetMetadata %@", asset);
}

}  // namespace parvel
