#include "parvel/foundation/PVParvelLog.h"
#include "parvel/inspection/PVAssetMetadataInspector.h"
#include "parvel/metadata/PVMutableAssetMetadata.h"
#include "parvel/platform/FileReader.h"
#include "parvel/platform/MediaTags.h"
#include "parvel/platform/Service.h"

namespace parvel {

MutableAssetPtr
PVAssetMetadataInspector::_audiobook_metadataForAssetAtURL_preloadedMetadata_includeCover_error(
    const URL& url, const AssetPtr& preloadedMetadata, bool includeCover, ErrorOut error) {
    PVParvelLog().debug("Getting audiobook metadata");
    const auto asset = Service<MediaTags>::current().open(url);
    if (!asset)
        return fail(error, makeNoAssetIDError(url));

    MutableAssetPtr record = PVAssetMetadata::metadataWithURL_dictionary(url, nullptr);
    // Deliberate: as text, so that it stays as it is, 0 too.
    const auto songID = asset->text(MediaTag::SongID);
    const auto storeID = songID ? std::optional<Value>(*songID) : std::nullopt;
    record->setStoreID(storeID ? &*storeID : nullptr);
    record->setArtistName(asset->text(MediaTag::Artist));
    record->setItemName(asset->text(MediaTag::SongName));

    if (includeCover) {
        if (const auto cover = asset->bytes(MediaTag::CoverArt, budget::cover))
            record->setCoverImageData(&*cover);
    }

    record->combineWithMetadata(preloadedMetadata.get());
    return record;
}

}  // namespace parvel
