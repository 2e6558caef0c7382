#include "parvel/inspection/_PVxPubMetadataInspector.h"

#include "parvel/foundation/PVCasts.h"
#include "parvel/foundation/PVParvelLog.h"
#include "parvel/inspection/OPFDocument.h"
#include "parvel/metadata/PVAssetType.h"
#include "parvel/platform/FileReader.h"
#include "parvel/platform/MalformedInput.h"
#include "parvel/platform/PropertyList.h"
#include "parvel/platform/ResourceQueries.h"
#include "parvel/platform/Service.h"

namespace parvel {

namespace {

/// The store file's cover path is the only one tried where it has one.
const String* coverPathOf(const _PVAggregatedAssetMetadata& aggregate) {
    const AssetPtr& store = aggregate.bazaarMetadata();
    const String* path = store ? PVDynamicCast(classOf<String>, store->coverImagePath()) : nullptr;
    return path ? path : PVDynamicCast(classOf<String>, aggregate.opfMetadata()->coverImagePath());
}

}  // namespace

std::shared_ptr<_PVAggregatedAssetMetadata>
_PVxPubMetadataInspector::metadataForAssetAtURL_preloadedMetadata_includeCover_error(
    const std::optional<URL>& url, const AssetPtr& preloadedMetadata, bool includeCover,
    ErrorOut error) {
    if (!url)
        return fail(error, makeMissingURLError());
    const _PVxPubMetadataInspector worker(*url, includeCover);
    return worker._metadataWithPreloadedMetadata_error(preloadedMetadata, error);
}

AssetPtr _PVxPubMetadataInspector::bazaarMetadataForBookAssetAtURL_error(
    const std::optional<URL>& url, ErrorOut error) {
    if (!url)
        return nullptr;
    const std::optional<Data> data =
        Service<FileReader>::current().readFile(*url, budget::storeFile);
    if (!data || data->empty())
        return nullptr;
    return bazaarMetadataFromData_url_error(&*data, url, error);
}

AssetPtr _PVxPubMetadataInspector::bazaarMetadataFromZipArchive_url_error(
    ZipArchive& archive, const std::optional<URL>& url, ErrorOut error) {
    const std::optional<Data> data =
        archive.readEntry(PVAssetMetadataBazaarMetadataPlistPath, budget::storeFile);
    if (!data)
        return nullptr;
    return bazaarMetadataFromData_url_error(&*data, url, error);
}

AssetPtr _PVxPubMetadataInspector::bazaarMetadataFromData_url_error(const Data* data,
                                                                    const std::optional<URL>& url,
                                                                    ErrorOut error) {
    PVParvelLog().debug("BazaarMetadata: start {data: %d, url: %d}", data != nullptr,
                        url.has_value());
    if (!data || data->empty()) {
        PVParvelLog().debug("BazaarMetadata: data.length == 0");
        return nullptr;
    }

    try {
        const std::optional<Value> list =
            Service<PropertyListCodec>::current().parse(*data, url, error);
        if (!list) {
            PVParvelLog().debug("BazaarMetadata: fail");
            return nullptr;
        }
        PVParvelLog().debug("BazaarMetadata: success");
        return PVAssetMetadata::metadataWithURL_dictionary(
            url, PVDynamicCast(classOf<Dictionary>, &*list));
    } catch (const MalformedInput&) {
        // Deliberate: the misspelling is part of the text.
        PVParvelLog().error("Exception while parsing Bazaar Metadta");
        return nullptr;
    }
}

_PVxPubMetadataInspector::AggregatePtr
_PVxPubMetadataInspector::_metadataWithPreloadedMetadata_error(const AssetPtr& preloadedMetadata,
                                                               ErrorOut error) const {
    const std::optional<bool> isDirectory =
        Service<ResourceQueries>::current().isDirectory(m_url, error);
    if (!isDirectory) {
        PVParvelLog().info("Failed to determine if url is directory");
        return nullptr;
    }
    return *isDirectory
               ? _metadataFromUncompressedAssetWithPreloadedMetadata_error(preloadedMetadata, error)
               : _metadataFromCompressedAssetWithPreloadedMetadata_error(preloadedMetadata, error);
}

_PVxPubMetadataInspector::AggregatePtr
_PVxPubMetadataInspector::_metadataFromUncompressedAssetWithPreloadedMetadata_error(
    const AssetPtr& preloadedMetadata, ErrorOut error) const {
    PVParvelLog().debug("Getting data from uncompressed book");
    const AggregateDataPtr data = _opfDataFromUncompressetAssetWithError(error);
    if (!data) {
        PVParvelLog().info("Failed to get opf data. url: %@ error: %@", m_url, error);
        return nullptr;
    }

    FileReader& reader = Service<FileReader>::current();
    data->setBazaarMetadata(
        reader.readMember(m_url, PVAssetMetadataBazaarMetadataPlistPath, budget::storeFile));

    AggregatePtr aggregate = data->metadataWithPreloadedMetadata_includeCover_error(
        preloadedMetadata, m_includeCover, error);
    if (!aggregate || !m_includeCover)
        return aggregate;

    if (const String* path = coverPathOf(*aggregate))
        aggregate->setCoverImageData(reader.readMember(m_url, *path, budget::cover));
    return aggregate;
}

_PVxPubMetadataInspector::AggregateDataPtr
_PVxPubMetadataInspector::_opfDataFromUncompressetAssetWithError(ErrorOut error) const {
    FileReader& reader = Service<FileReader>::current();
    const std::optional<Data> bytes =
        reader.readMember(m_url, PVAssetMetadataContainerXMLPath, budget::packageDocument, error);
    const auto container =
        bytes ? Service<XmlParser>::current().parse(
                    *bytes, m_url.appendingPathComponent(PVAssetMetadataContainerXMLPath), error)
              : nullptr;
    if (!container) {
        PVParvelLog().info("Failed to create containerXML document");
        return nullptr;
    }

    std::optional<String> path = parvel_containerxml_opfPathWithError(container->root(), error);
    if (!path) {
        PVParvelLog().info("Failed to get opf path");
        return nullptr;
    }

    std::optional<Data> opf = reader.readMember(m_url, *path, budget::packageDocument, error);
    if (!opf) {
        PVParvelLog().info("Failed to get opf data");
        return nullptr;
    }
    return _PVAggregatedAssetData::initWithURL_opfData_path(m_url, std::move(*opf),
                                                            std::move(*path));
}

_PVxPubMetadataInspector::AggregatePtr
_PVxPubMetadataInspector::_metadataFromCompressedAssetWithPreloadedMetadata_error(
    const AssetPtr& preloadedMetadata, ErrorOut error) const {
    PVParvelLog().debug("metadataCompressed: start");
    AggregatePtr aggregate = metadataFromOpenedArchive(preloadedMetadata, error);
    // Deliberate: the text has no closing brace.
    PVParvelLog().debug("metadataCompressed: end {success: %d", aggregate != nullptr);
    return aggregate;
}

_PVxPubMetadataInspector::AggregatePtr _PVxPubMetadataInspector::metadataFromOpenedArchive(
    const AssetPtr& preloadedMetadata, ErrorOut error) const {
    const std::unique_ptr<ZipArchive> archive = Service<ZipReader>::current().open(m_url, error);
    if (!archive) {
        PVParvelLog().info("Failed to make zipArchive");
        return nullptr;
    }

    const AggregateDataPtr data = _opfDataFromZipArchive_error(*archive, error);
    if (!data) {
        PVParvelLog().info("Failed to get opf data");
        return nullptr;
    }
    data->setBazaarMetadata(
        archive->readEntry(PVAssetMetadataBazaarMetadataPlistPath, budget::storeFile));

    AggregatePtr aggregate = data->metadataWithPreloadedMetadata_includeCover_error(
        preloadedMetadata, m_includeCover, error);
    if (!aggregate || !m_includeCover)
        return aggregate;

    if (const String* path = coverPathOf(*aggregate))
        aggregate->setCoverImageData(archive->readEntry(*path, budget::cover));
    return aggregate;
}

_PVxPubMetadataInspector::AggregateDataPtr _PVxPubMetadataInspector::_opfDataFromZipArchive_error(
    ZipArchive& archive, ErrorOut error) const {
    // Deliberate: an archive without a container document gives no error and no line of its own.
    const std::optional<Data> bytes =
        archive.readEntry(PVAssetMetadataContainerXMLPath, budget::packageDocument);
    if (!bytes)
        return nullptr;

    const auto container = Service<XmlParser>::current().parse(*bytes, m_url, error);
    std::optional<String> path =
        container ? parvel_containerxml_opfPathWithError(container->root(), error) : std::nullopt;
    if (!path) {
        PVParvelLog().info("Failed to get opf url");
        return nullptr;
    }

    std::optional<Data> opf = archive.readEntry(*path, budget::packageDocument);
    if (!opf) {
        PVParvelLog().info("Failed to extract opf data");
        return fail(error, makeFileError(PVFileErrorCode::Corrupt, m_url));
    }
    return _PVAggregatedAssetData::initWithURL_opfData_path(m_url, std::move(*opf),
                                                            std::move(*path));
}

}  // namespace parvel
