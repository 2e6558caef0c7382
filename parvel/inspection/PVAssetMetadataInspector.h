#pragma once

#include <optional>

#include "parvel/foundation/ErrorOut.h"
#include "parvel/foundation/Image.h"
#include "parvel/foundation/PVExport.h"
#include "parvel/foundation/URL.h"
#include "parvel/metadata/PVAssetMetadata.h"

namespace parvel {

class PdfPage;

/// Turns an asset on disk into its record. It keeps nothing between calls, reads the disk afresh
/// each time, and may be called from any thread. One malformed asset never brings the caller down.
///
/// Reading prefers, from the least to the most: the package document, the store metadata file (but
/// for a preview), the asset's extended attributes, the caller's extra metadata.
class PV_EXPORT PVAssetMetadataInspector {
public:
    PVAssetMetadataInspector() = delete;

    /// The record, without cover bytes. Errors: -1002 for an absent URL, that of the host where the
    /// asset is unreachable, -1001 for an extension of no kind, -1003 for a record without asset
    /// ID, else the reader's; none at all for input that is malformed within. The error is assigned
    /// in every case, on success too.
    static AssetPtr metadataForAssetAtURL_error(const std::optional<URL>& url,
                                                ErrorOut error = nullptr);
    /// The same with the cover bytes.
    static AssetPtr metadataIncludingCoverForAssetAtURL_error(const std::optional<URL>& url,
                                                              ErrorOut error = nullptr);
    /// The record without cover, with the extra metadata's entries over what was read.
    static AssetPtr metadataForAssetAtURL_extraMetadata_error(const std::optional<URL>& url,
                                                              const AssetPtr& extraMetadata,
                                                              ErrorOut error = nullptr);
    /// What can be known without a download: the whole record, without cover, where synchronised
    /// storage says that the content is on this device, else what the extended attributes hold. So
    /// a plain local file's content is not read either. Deliberate. None, with the host's error,
    /// when not even a promise of the asset is there; none when its state can't be told.
    static AssetPtr immediatelyAvailableMetadataForAssetAtURL_error(const std::optional<URL>& url,
                                                                    ErrorOut error = nullptr);
    /// The encoded cover image: the store's artwork file in a package, else the cover bytes of
    /// `metadataIncludingCoverForAssetAtURL_error`, whose errors it has.
    static std::optional<Data> coverImageDataForAssetAtURL_error(const std::optional<URL>& url,
                                                                 ErrorOut error = nullptr);
    /// The same image decoded, in a confined process. None, without an error of its own, where the
    /// bytes are no PNG, JPEG, GIF or WebP image that can be decoded.
    static std::optional<Image> coverImageForAssetAtURL_error(const std::optional<URL>& url,
                                                              ErrorOut error = nullptr);
    /// The store metadata file at the URL itself as a record; none for a package.
    static AssetPtr bazaarMetadataForBookAssetAtURL_error(const std::optional<URL>& url,
                                                          ErrorOut error = nullptr);

    // For the library's own use and its tests.

    static AssetPtr _metadataForAssetAtURL_includeCover_error(const std::optional<URL>& url,
                                                              bool includeCover, ErrorOut error);
    /// The misspelling is the operation's name.
    static AssetPtr _typeSpecificMetadtaForAssetAtURL_includeCover_error(const URL& url,
                                                                         bool includeCover,
                                                                         ErrorOut error);
    static MutableAssetPtr _eBook_metadataForAssetAtURL_preloadedMetadata_includeCover_error(
        const URL& url, const AssetPtr& preloadedMetadata, bool includeCover, ErrorOut error);
    /// The document information's author, subject and dates, page count, lock and an identity made
    /// from the file's bytes; the title is the file's name. The read's error for a file that can't
    /// be read; general error 259 for what is no document. Without `includeCover` no page is drawn;
    /// with it a page that can't be drawn leaves the record without a cover.
    static MutableAssetPtr _pdf_metadataForAssetAtURL_preloadedMetadata_includeCover_error(
        const URL& url, const AssetPtr& preloadedMetadata, bool includeCover, ErrorOut error);
    /// The first page of the document at the URL, which is opened for that alone.
    static std::optional<Image> _new_pdf_coverImage_imageSize(const URL& url, double width,
                                                              double height);
    /// The page as it is displayed, on white, as large as fits: small ones grow. Without a page a
    /// blank one, 0.7 times as wide as it is high, that never grows. Deliberate. None where there
    /// is nothing to draw on.
    static std::optional<Image> _new_pdf_imageFromPDFPage_imageSize(PdfPage* page, double width,
                                                                    double height);
    static MutableAssetPtr _audiobook_metadataForAssetAtURL_preloadedMetadata_includeCover_error(
        const URL& url, const AssetPtr& preloadedMetadata, bool includeCover, ErrorOut error);
    /// The record that the asset's extended attributes hold: with little but its URL where it has
    /// none. None for an extension of no kind. A failed attribute read leaves the record without
    /// them.
    static MutableAssetPtr _xAttrMetadataForAssetAtURL_error(const URL& url, ErrorOut error);
};

}  // namespace parvel
