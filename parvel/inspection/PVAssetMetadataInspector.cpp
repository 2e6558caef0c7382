#include "parvel/inspection/PVAssetMetadataInspector.h"

#include <algorithm>
#include <array>

#include "parvel/foundation/PVCasts.h"
#include "parvel/foundation/PVParvelLog.h"
#include "parvel/inspection/_PVxPubMetadataInspector.h"
#include "parvel/metadata/PVMutableAssetMetadata.h"
#include "parvel/platform/HeldItem.h"
#include "parvel/platform/MalformedInput.h"
#include "parvel/platform/ResourceQueries.h"
#include "parvel/platform/Service.h"

namespace parvel {

namespace {

struct KindReader {
    PVAssetType kind;
    MutableAssetPtr (*read)(const URL& url, const AssetPtr& preloadedMetadata, bool includeCover,
                            ErrorOut error);
};

constexpr std::array kindReaders = {
    KindReader{PVAssetTypeEPub,
               &PVAssetMetadataInspector::
                   _eBook_metadataForAssetAtURL_preloadedMetadata_includeCover_error},
    KindReader{PVAssetTypeKestrelPub,
               &PVAssetMetadataInspector::
                   _eBook_metadataForAssetAtURL_preloadedMetadata_includeCover_error},
    KindReader{
        PVAssetTypePDF,
        &PVAssetMetadataInspector::_pdf_metadataForAssetAtURL_preloadedMetadata_includeCover_error},
    KindReader{PVAssetTypeAudiobook,
               &PVAssetMetadataInspector::
                   _audiobook_metadataForAssetAtURL_preloadedMetadata_includeCover_error},
};

/// No record and no error for a kind that has no reader.
MutableAssetPtr readByKind(PVAssetType kind, const URL& url, const AssetPtr& preloadedMetadata,
                           bool includeCover, ErrorOut error) {
    const auto* reader =
        std::find_if(kindReaders.begin(), kindReaders.end(),
                     [kind](const KindReader& candidate) { return candidate.kind == kind; });
    if (reader == kindReaders.end())
        return nullptr;
    return reader->read(url, preloadedMetadata, includeCover, error);
}

}  // namespace

AssetPtr PVAssetMetadataInspector::metadataForAssetAtURL_error(const std::optional<URL>& url,
                                                               ErrorOut error) {
    return _metadataForAssetAtURL_includeCover_error(url, /*includeCover=*/false, error);
}

AssetPtr PVAssetMetadataInspector::metadataIncludingCoverForAssetAtURL_error(
    const std::optional<URL>& url, ErrorOut error) {
    return _metadataForAssetAtURL_includeCover_error(url, /*includeCover=*/true, error);
}

AssetPtr PVAssetMetadataInspector::metadataForAssetAtURL_extraMetadata_error(
    const std::optional<URL>& url, const AssetPtr& extraMetadata, ErrorOut error) {
    const AssetPtr asset =
        _metadataForAssetAtURL_includeCover_error(url, /*includeCover=*/false, error);
    if (!asset)
        return nullptr;
    return asset->copyWithUpdates([&extraMetadata](PVMutableAssetMetadata& copy) {
        copy.combineWithMetadata(extraMetadata.get());
    });
}

AssetPtr PVAssetMetadataInspector::bazaarMetadataForBookAssetAtURL_error(
    const std::optional<URL>& url, ErrorOut error) {
    return _PVxPubMetadataInspector::bazaarMetadataForBookAssetAtURL_error(url, error);
}

AssetPtr PVAssetMetadataInspector::_metadataForAssetAtURL_includeCover_error(
    const std::optional<URL>& url, bool includeCover, ErrorOut error) {
    PVParvelLog().debug("Getting metadata: %@", url);
    AssetPtr asset;
    std::optional<Error> failure;
    std::optional<HeldItem> held;
    if (url && PVAssetMetadata::assetTypeForAssetAtURL(*url) != PVAssetTypeUnknown)
        held.emplace(*url);

    if (!url) {
        PVParvelLog().info("URL is nil");
        failure = makeMissingURLError();
    } else if (!Service<ResourceQueries>::current().isReachable(*url, &failure)) {
        PVParvelLog().info("Asset is unreachable: %@", url);
    } else {
        try {
            asset =
                _typeSpecificMetadtaForAssetAtURL_includeCover_error(*url, includeCover, &failure);
        } catch (const MalformedInput&) {
            PVParvelLog().fault("Caught exception while trying to get asset metadata: %@", url);
            // Deliberate: no error is made of it.
            failure.reset();
        }
    }

    if (asset)
        PVParvelLog().info("Parsed Metadata: %@", asset);
    else
        PVParvelLog().info("Failed to get metadata: %@ url error: %@", url, failure);
    // Deliberate: on success too.
    assign(error, std::move(failure));
    return asset;
}

AssetPtr PVAssetMetadataInspector::_typeSpecificMetadtaForAssetAtURL_includeCover_error(
    const URL& url, bool includeCover, ErrorOut error) {
    const AssetPtr preloadedMetadata = _xAttrMetadataForAssetAtURL_error(url, error);

    const PVAssetType kind = PVAssetMetadata::assetTypeForAssetAtURL(url);
    if (kind == PVAssetTypeUnknown)
        return fail(error, makeNoAssetTypeError(url));
    AssetPtr asset = readByKind(kind, url, preloadedMetadata, includeCover, error);
    if (!asset)
        return nullptr;

    // A record without an identity is never handed out.
    if (asset->assetID().value_or("").empty())
        return fail(error, makeNoAssetIDError(url));
    return asset;
}

MutableAssetPtr
PVAssetMetadataInspector::_eBook_metadataForAssetAtURL_preloadedMetadata_includeCover_error(
    const URL& url, const AssetPtr& preloadedMetadata, bool includeCover, ErrorOut error) {
    PVParvelLog().debug("Getting eBook metadata");
    const auto aggregate =
        _PVxPubMetadataInspector::metadataForAssetAtURL_preloadedMetadata_includeCover_error(
            url, preloadedMetadata, includeCover, error);
    if (!aggregate) {
        PVParvelLog().info("Failed to create aggregated metadata");
        return nullptr;
    }
    return aggregate->combinedMetadata();
}

}  // namespace parvel
