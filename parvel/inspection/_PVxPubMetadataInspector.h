#pragma once

#include <memory>
#include <optional>
#include <utility>

#include "parvel/foundation/ErrorOut.h"
#include "parvel/foundation/URL.h"
#include "parvel/foundation/Value.h"
#include "parvel/inspection/_PVAggregatedAssetData.h"
#include "parvel/inspection/_PVAggregatedAssetMetadata.h"
#include "parvel/metadata/PVAssetMetadata.h"
#include "parvel/platform/ZipArchive.h"

namespace parvel {

/// Reads a packaged book, zipped or expanded, into its raw inputs and has them aggregated. A folder
/// is an expanded package and anything else a zip archive, whatever the name ends in. Nothing is
/// extracted to the disk. A worker is made for one read.
///
/// A missing or broken store metadata file and a missing cover never fail a book. The two shapes
/// log different words for the same failure, and only a zipped one makes an error for a missing
/// OPF. Both deliberate.
class _PVxPubMetadataInspector {
public:
    /// None for an absent URL (-1002), a package without a readable OPF, and what is no archive.
    /// With `includeCover` the cover that the store file names is read, that of the OPF only where
    /// the store file names none.
    static std::shared_ptr<_PVAggregatedAssetMetadata>
    metadataForAssetAtURL_preloadedMetadata_includeCover_error(const std::optional<URL>& url,
                                                               const AssetPtr& preloadedMetadata,
                                                               bool includeCover,
                                                               ErrorOut error = nullptr);

    /// The store metadata file at the URL itself; none for a package.
    static AssetPtr bazaarMetadataForBookAssetAtURL_error(const std::optional<URL>& url,
                                                          ErrorOut error = nullptr);
    /// The store metadata file of an open archive; none where it has none.
    static AssetPtr bazaarMetadataFromZipArchive_url_error(ZipArchive& archive,
                                                           const std::optional<URL>& url,
                                                           ErrorOut error = nullptr);
    /// The store's own keys are the record's, known or not. A property list that is no dictionary
    /// gives a record of the URL alone. None for absent or empty bytes, for bytes that are no
    /// property list (with the parser's error) and for malformed input within one.
    static AssetPtr bazaarMetadataFromData_url_error(const Data* data,
                                                     const std::optional<URL>& url,
                                                     ErrorOut error = nullptr);

    [[nodiscard]] const URL& url() const { return m_url; }
    [[nodiscard]] bool includeCover() const { return m_includeCover; }

private:
    using AggregatePtr = std::shared_ptr<_PVAggregatedAssetMetadata>;
    using AggregateDataPtr = std::shared_ptr<_PVAggregatedAssetData>;

    _PVxPubMetadataInspector(URL url, bool includeCover)
        : m_url(std::move(url)), m_includeCover(includeCover) {}

    [[nodiscard]] AggregatePtr _metadataWithPreloadedMetadata_error(
        const AssetPtr& preloadedMetadata, ErrorOut error) const;
    [[nodiscard]] AggregatePtr _metadataFromUncompressedAssetWithPreloadedMetadata_error(
        const AssetPtr& preloadedMetadata, ErrorOut error) const;
    [[nodiscard]] AggregatePtr _metadataFromCompressedAssetWithPreloadedMetadata_error(
        const AssetPtr& preloadedMetadata, ErrorOut error) const;
    /// The misspelling is the operation's name.
    [[nodiscard]] AggregateDataPtr _opfDataFromUncompressetAssetWithError(ErrorOut error) const;
    [[nodiscard]] AggregateDataPtr _opfDataFromZipArchive_error(ZipArchive& archive,
                                                                ErrorOut error) const;

    [[nodiscard]] AggregatePtr metadataFromOpenedArchive(const AssetPtr& preloadedMetadata,
                                                         ErrorOut error) const;

    URL m_url;
    bool m_includeCover;
};

}  // namespace parvel
