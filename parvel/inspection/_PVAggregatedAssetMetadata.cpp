#include "parvel/inspection/_PVAggregatedAssetMetadata.h"

#include "parvel/foundation/PVCasts.h"
#include "parvel/foundation/PVDigest.h"
#include "parvel/foundation/PVParvelLog.h"
#include "parvel/foundation/ValueReadings.h"

namespace parvel {

namespace {

/// A value that is no text counts as absent.
std::optional<String> textOf(const Value* value) {
    const String* text = PVDynamicCast(classOf<String>, value);
    return text ? std::optional(*text) : std::nullopt;
}

}  // namespace

std::shared_ptr<_PVAggregatedAssetMetadata>
_PVAggregatedAssetMetadata::initWithURL_opfMetadata_aggregateData(
    URL url, MutableAssetPtr opfMetadata,
    std::shared_ptr<const _PVAggregatedAssetData> aggregateData) {
    return std::shared_ptr<_PVAggregatedAssetMetadata>(new _PVAggregatedAssetMetadata(
        std::move(url), std::move(opfMetadata), std::move(aggregateData)));
}

MutableAssetPtr _PVAggregatedAssetMetadata::combinedMetadata() const {
    MutableAssetPtr record = PVAssetMetadata::metadataWithURL_dictionary(m_url, nullptr);
    record->combineWithMetadata(m_opfMetadata.get());
    if (!isPreview())
        record->combineWithMetadata(m_bazaarMetadata.get());
    _populatePackageHashOnMetadata(*record);
    if (m_coverImageData)
        record->setCoverImageData(&*m_coverImageData);
    record->combineWithMetadata(m_preloadedMetadata.get());
    return record;
}

void _PVAggregatedAssetMetadata::_populatePackageHashOnMetadata(
    PVMutableAssetMetadata& metadata) const {
    std::optional<String> hash = textOf(metadata.packageHash());
    if (!hash || hash->empty()) {
        hash = parvel_MD5String(m_aggregateData->opf());
        metadata.setPackageHash(hash);
    }
    if (!hash)
        PVParvelLog().error("Failed to generate opf md5");

    // A book that the store knows is identified by its store ID alone.
    if (int64Reading(metadata.storeID()) != 0) {
        metadata.setGeneratedID(std::nullopt);
        return;
    }

    const bool keepsOwnID = metadata.isKestrelPub() || metadata.isRMT() || isPreview();
    const bool overwrite = !keepsOwnID || textOf(metadata.generatedID()).value_or("").empty();
    metadata.setPreview(isPreview());
    if (hash && overwrite)
        metadata.setGeneratedID(std::move(hash));
}

}  // namespace parvel
