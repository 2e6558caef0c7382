#include "parvel/inspection/_PVAggregatedAssetData.h"

#include "parvel/foundation/PVCasts.h"
#include "parvel/foundation/PVParvelLog.h"
#include "parvel/inspection/OPFDocument.h"
#include "parvel/inspection/_PVAggregatedAssetMetadata.h"
#include "parvel/inspection/_PVxPubMetadataInspector.h"
#include "parvel/platform/Service.h"
#include "parvel/platform/XmlDocument.h"

namespace parvel {

namespace {

/// The cover's path relative to the package's root, where the OPF names a cover.
std::optional<String> coverPathInOPF(const XmlNode& opf, const XmlNode& metadata,
                                     const String& opfPath, ErrorOut error) {
    const std::optional<String> coverID = parvel_opf_metadata_coverId(metadata, error);
    const std::optional<XmlNode> manifest = parvel_opf_manifest(opf, error);
    if (!manifest)
        return std::nullopt;
    const std::optional<String> href =
        parvel_opf_manifest_coverHrefWithId_error(*manifest, coverID, error);
    if (!href)
        return std::nullopt;
    return pathAppending(pathWithoutLastComponent(opfPath), *href);
}

}  // namespace

std::shared_ptr<_PVAggregatedAssetData> _PVAggregatedAssetData::init() {
    return nullptr;
}

std::shared_ptr<_PVAggregatedAssetData> _PVAggregatedAssetData::initWithURL_opfData_path(
    URL url, Data opfData, String path) {
    return std::shared_ptr<_PVAggregatedAssetData>(
        new _PVAggregatedAssetData(std::move(url), std::move(opfData), std::move(path)));
}

std::shared_ptr<_PVAggregatedAssetMetadata>
_PVAggregatedAssetData::metadataWithPreloadedMetadata_includeCover_error(
    const AssetPtr& preloadedMetadata, bool includeCover, ErrorOut error) {
    PVParvelLog().debug("aggregatedMetadata: start {opf: %d, bazaarMetadata: %d}",
                        /*opf=*/true, m_bazaarMetadata.has_value());

    const AssetPtr store = _PVxPubMetadataInspector::bazaarMetadataFromData_url_error(
        m_bazaarMetadata ? &*m_bazaarMetadata : nullptr, m_url);

    const bool hasStoreCover =
        store && PVDynamicCast(classOf<String>, store->coverImagePath()) != nullptr;
    const MutableAssetPtr opf = _opfMetadataWithCover_error(includeCover && !hasStoreCover, error);
    if (!opf) {
        PVParvelLog().info("Failed to create dictionary from opf");
        return nullptr;
    }

    auto aggregate = _PVAggregatedAssetMetadata::initWithURL_opfMetadata_aggregateData(
        m_url, opf, shared_from_this());
    aggregate->setBazaarMetadata(store);
    aggregate->setPreloadedMetadata(preloadedMetadata);
    // Deliberate: the start line has another prefix.
    PVParvelLog().debug("aggregateMetadata: end {success: %d}", true);
    return aggregate;
}

MutableAssetPtr _PVAggregatedAssetData::_opfMetadataWithCover_error(bool cover,
                                                                    ErrorOut error) const {
    PVParvelLog().debug("opfMetadata: start {withCover: %d}", cover);
    const auto document = Service<XmlParser>::current().parse(m_opf, m_url, error);
    if (!document) {
        PVParvelLog().info("Failed to create opf document");
        return nullptr;
    }
    PVParvelLog().debug("opfMetadata: has opf");

    const XmlNode opf = document->root();
    const std::optional<XmlNode> metadata = parvel_opf_metadataElement(opf, error);
    if (!metadata) {
        PVParvelLog().info("Failed to find metadata element.");
        return nullptr;
    }

    MutableAssetPtr record = PVAssetMetadata::metadataWithURL_dictionary(m_url, nullptr);
    record->setProducer(parvel_opf_metadata_producer(*metadata, error));
    if (record->isKestrelPub() || record->isRMT())
        record->setGeneratedID(
            parvel_validatedUniqueIdentifierFromOPFNode_metadataNode_error(opf, *metadata, error));
    record->setArtistName(parvel_opf_metadata_creator(*metadata, error));
    record->setItemName(parvel_opf_metadata_title(*metadata, error));
    record->setGenre(parvel_opf_metadata_subject(*metadata, error));
    record->setAssetDescription(parvel_opf_metadata_description(*metadata, error));
    record->setFormat(parvel_opf_metadata_format(*metadata, error));

    if (cover) {
        PVParvelLog().debug("opfMetadata: getting cover");
        std::optional<String> path = coverPathInOPF(opf, *metadata, m_opfPath, error);
        if (path)
            record->setCoverImagePath(std::move(path));
    }
    PVParvelLog().debug("opfMetadata: end {success: %d}", true);
    return record;
}

}  // namespace parvel
