// Replaces a package's cover file or brings the original back.
//   New cover: the present file is moved aside to the backup, unless there is one already; the new
//   file takes the cover's place in one step. A write that fails leaves the original where it was
//   moved, or the cover as it was.
//   No cover: the present file is removed, then the backup is moved back. A removal that fails
//   leaves all as it was; without a backup no cover file is left.

#include "parvel/filemanager/PVAssetMetadataFileManager.h"
#include "parvel/foundation/PVCasts.h"
#include "parvel/foundation/PVParvelLog.h"
#include "parvel/metadata/PVAssetMetadataKeys.h"
#include "parvel/metadata/PVMutableAssetMetadata.h"
#include "parvel/platform/FileReader.h"
#include "parvel/platform/FileWriter.h"
#include "parvel/platform/Service.h"

namespace parvel {

namespace {

/// The cover file's bytes; none where it can't be read.
std::optional<Data> coverFileOf(const PVAssetMetadata& asset) {
    const auto package = asset.url();
    if (!package)
        return std::nullopt;
    return Service<FileReader>::current().readMember(*package, PVAssetMetadataBazaarArtworkPath,
                                                     budget::cover);
}

/// The null marker is no buffer, and is stored as it is.
void setCover(PVMutableAssetMetadata& record, const Value& cover) {
    if (const Data* bytes = PVDynamicCast(classOf<Data>, &cover)) {
        record.setCoverImageData(bytes);
        return;
    }
    Dictionary dictionary = *record.backingDictionary();
    dictionary.set(key::coverImageData, cover);
    record.setBackingDictionary(std::move(dictionary));
}

/// A package's cover file and its backup.
struct CoverFiles {
    URL artwork;
    URL backup;
};

AssetPtr restoreOriginalCover(FileSystemService& fileManager, const PVAssetMetadata& asset,
                              const CoverFiles& files, ErrorOut error) {
    // Deliberate: the misspelling is part of the text.
    PVParvelLog().info("ReplaceCover: udpates.coverImageData = null -- Removing existing metadata");
    if (!fileManager.removeItem(files.artwork, error))
        return nullptr;

    // Deliberate: goes on without an original. It was asked for, so the error passes out beside
    // the record.
    ErrorSlot restoring(error);
    if (fileManager.moveItem(files.backup, files.artwork, restoring.out())) {
        PVParvelLog().debug("ReplaceCover: Restored existing URL -- Success");
    } else {
        // Deliberate: the line names the store file's backup.
        PVParvelLog().error("ReplaceCover: Could not restore original cover: %@ error: %@",
                            asset.bazaarMetadataBackupURL(), restoring.value());
    }

    const auto restored = coverFileOf(asset);
    return asset.copyWithUpdates([&restored](PVMutableAssetMetadata& copy) {
        copy.setCoverImageData(restored ? &*restored : nullptr);
    });
}

AssetPtr replaceCover(FileSystemService& fileManager, const PVAssetMetadata& asset,
                      const CoverFiles& files, const Data& cover, ErrorOut error) {
    const auto present = coverFileOf(asset);
    const Value replaced = present ? Value(*present) : Value();
    // Deliberate: a backup that is there already fails the move, so that the first original is
    // kept. What is passed over stays out of the caller's error: the new cover is there.
    std::optional<Error> asideError;
    if (fileManager.moveItem(files.artwork, files.backup, &asideError)) {
        PVParvelLog().info("ReplaceCover: Moved aside original book cover");
    } else {
        PVParvelLog().error(
            "ReplaceCover: Failed to move aside the original BazaarArtwork: %@ error: %@",
            files.artwork, asideError);
    }

    if (!Service<FileWriter>::current().writeFile(files.artwork, cover, error)) {
        PVParvelLog().error("ReplaceCover: Failed to write new cover image -- Fail");
        return nullptr;
    }
    AssetPtr updated = asset.copyWithUpdates(
        [&replaced](PVMutableAssetMetadata& copy) { copy.setCoverImageDataReplaced(&replaced); });
    PVParvelLog().info("ReplaceCover: Wrote new cover image -- Done");
    return updated;
}

}  // namespace

AssetPtr PVAssetMetadataFileManager::_updateImageCoverDataForMetadta_updates_error(
    const AssetPtr& asset, const AssetPtr& updates, ErrorOut error) {
    PVParvelLog().debug("ReplaceCover: start");
    const Value* value = updates ? updates->coverImageData() : nullptr;
    const Data* cover = PVDynamicCast(classOf<Data>, value);
    const bool isRemoval = PVRefTypeCast(TypeID::Null, value) != nullptr;
    if (!asset || (!cover && !isRemoval)) {
        PVParvelLog().debug("ReplaceCover: No cover to update -- Done");
        return asset;
    }

    const auto artwork = asset->bazaarArtworkURL();
    const auto backup = asset->bazaarArtworkBackupURL();
    if (!artwork || !backup)
        return asset->copyWithUpdates(
            [value](PVMutableAssetMetadata& copy) { setCover(copy, *value); });
    const CoverFiles files{*artwork, *backup};
    if (isRemoval)
        return restoreOriginalCover(*m_fileManager, *asset, files, error);
    if (cover->empty())
        return nullptr;
    return replaceCover(*m_fileManager, *asset, files, *cover, error);
}

}  // namespace parvel
