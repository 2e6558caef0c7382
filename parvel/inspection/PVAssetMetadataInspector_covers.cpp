#include "parvel/foundation/ImageFiles.h"
#include "parvel/foundation/PVCasts.h"
#include "parvel/foundation/PVParvelLog.h"
#include "parvel/inspection/PVAssetMetadataInspector.h"
#include "parvel/platform/FileReader.h"
#include "parvel/platform/HeldItem.h"
#include "parvel/platform/ResourceQueries.h"
#include "parvel/platform/Service.h"
#include "parvel/platform/ZipArchive.h"

namespace parvel {

namespace {

/// The store's artwork file of an expanded book package.
std::optional<Data> artworkInDirectory(const URL& package) {
    if (!PVAssetMetadata::bazaarArtworkURLWithBaseURL(package))
        return std::nullopt;
    return Service<FileReader>::current().readMember(package, PVAssetMetadataBazaarArtworkPath,
                                                     budget::cover);
}

/// The same of a zipped one; any other file is no archive and has none.
std::optional<Data> artworkInArchive(const URL& url) {
    const std::unique_ptr<ZipArchive> archive = Service<ZipReader>::current().open(url);
    if (!archive)
        return std::nullopt;
    return archive->readEntry(PVAssetMetadataBazaarArtworkPath, budget::cover);
}

std::optional<Data> storeArtwork(const std::optional<URL>& url) {
    const std::optional<bool> isDirectory =
        url ? Service<ResourceQueries>::current().isDirectory(*url) : std::nullopt;
    if (!isDirectory) {
        PVParvelLog().info("Failed to query directory: %@", url);
        return std::nullopt;
    }
    return *isDirectory ? artworkInDirectory(*url) : artworkInArchive(*url);
}

}  // namespace

std::optional<Data> PVAssetMetadataInspector::coverImageDataForAssetAtURL_error(
    const std::optional<URL>& url, ErrorOut error) {
    std::optional<HeldItem> held;
    if (url)
        held.emplace(*url);
    std::optional<Data> artwork = storeArtwork(url);
    if (artwork && !artwork->empty())
        return artwork;

    const AssetPtr asset = metadataIncludingCoverForAssetAtURL_error(url, error);
    const Data* cover = asset ? PVDynamicCast(classOf<Data>, asset->coverImageData()) : nullptr;
    return cover ? std::optional(*cover) : std::nullopt;
}

std::optional<Image> PVAssetMetadataInspector::coverImageForAssetAtURL_error(
    const std::optional<URL>& url, ErrorOut error) {
    const std::optional<Data> bytes = coverImageDataForAssetAtURL_error(url, error);
    return bytes ? imageFromData(*bytes) : std::nullopt;
}

}  // namespace parvel
