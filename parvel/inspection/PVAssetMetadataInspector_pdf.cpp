#include <algorithm>
#include <utility>

#include "parvel/foundation/PVCasts.h"
#include "parvel/foundation/PVParvelLog.h"
#include "parvel/foundation/UpperCaseHex.h"
#include "parvel/inspection/PVAssetMetadataInspector.h"
#include "parvel/metadata/PVMutableAssetMetadata.h"
#include "parvel/platform/Digest.h"
#include "parvel/platform/ImageCodec.h"
#include "parvel/platform/PdfDocument.h"
#include "parvel/platform/Service.h"
#include "parvel/platform/TextRules.h"

namespace parvel {

namespace {

constexpr double coverWidth = 340;
constexpr double coverHeight = 380;
constexpr double blankPageShape = 0.7;  ///< its width by its height
constexpr std::uint32_t longestSide = 16384;

bool hasGeneratedID(const AssetPtr& record) {
    const String* text = record ? PVDynamicCast(classOf<String>, record->generatedID()) : nullptr;
    return text && !text->empty();
}

bool hasCover(const AssetPtr& record) {
    const Data* cover = record ? PVDynamicCast(classOf<Data>, record->coverImageData()) : nullptr;
    return cover && !cover->empty();
}

std::optional<Data> coverOf(const URL& url) {
    const std::optional<Image> image =
        PVAssetMetadataInspector::_new_pdf_coverImage_imageSize(url, coverWidth, coverHeight);
    return image ? Service<ImageCodec>::current().encodePNG(*image) : std::nullopt;
}

/// Rounded down; 0 for what is no length of a bitmap's side (a page may have no size at all).
std::uint32_t wholePixels(double length) {
    return length >= 0 && length <= longestSide ? static_cast<std::uint32_t>(length) : 0;
}

std::optional<Image> blankPage(std::uint32_t width, std::uint32_t height) {
    if (width == 0 || height == 0)
        return std::nullopt;
    const std::size_t stride = std::size_t{4} * width;
    auto white = std::make_unique_for_overwrite<std::uint8_t[]>(stride * height);
    std::fill_n(white.get(), stride * height, std::uint8_t{0xFF});
    return Image{width, height, stride, std::move(white)};
}

}  // namespace

MutableAssetPtr
PVAssetMetadataInspector::_pdf_metadataForAssetAtURL_preloadedMetadata_includeCover_error(
    const URL& url, const AssetPtr& preloadedMetadata, bool includeCover, ErrorOut error) {
    PVParvelLog().debug("Getting pdf metadata");
    PdfDocuments& documents = Service<PdfDocuments>::current();
    const bool needsID = !hasGeneratedID(preloadedMetadata);
    const auto digest = needsID ? Service<Digest>::current().beginMD5() : nullptr;
    const auto file = documents.openFile(url, error);
    const auto feedDigest = [&digest](Data::Bytes piece) { digest->update(piece); };
    if (!file || (digest && !file->readAll(feedDigest, error))) {
        PVParvelLog().info("Failed to read PDF contents");
        return nullptr;
    }
    const auto document = documents.openDocument(*file, error);
    if (!document) {
        PVParvelLog().info("Failed to create PDF document");
        return nullptr;
    }

    MutableAssetPtr record = PVAssetMetadata::metadataWithURL_dictionary(url, nullptr);
    const String name = withReplacedInvalidUTF8(pathWithoutExtension(url.lastPathComponent()));
    record->setArtistName(document->author());
    // Deliberate: the document's own title is not read.
    record->setItemName(name);
    if (needsID) {
        const auto md5 = digest ? digest->finish() : std::nullopt;
        if (md5)
            record->setGeneratedID(upperCaseHex(*md5));
        else
            PVParvelLog().error("Failed to generate PDF ID");
    }
    record->setLocked(document->isLocked());
    record->setUpdateDate(document->modificationDate());
    record->setModificationDate(document->modificationDate());
    record->setReleaseDate(document->creationDate());
    record->setGenre(document->subject());
    record->setPageCount(document->pageCount());
    record->setDisplayName(name);

    if (includeCover && document->pageCount() > 0 && !hasCover(preloadedMetadata)) {
        if (const std::optional<Data> cover = coverOf(url))
            record->setCoverImageData(&*cover);
    }

    record->combineWithMetadata(preloadedMetadata.get());
    return record;
}

std::optional<Image> PVAssetMetadataInspector::_new_pdf_coverImage_imageSize(const URL& url,
                                                                             double width,
                                                                             double height) {
    const auto document = Service<PdfDocuments>::current().open(url);
    if (!document || document->pageCount() == 0)
        return std::nullopt;
    // A page that the document lacks in spite of its count is drawn blank.
    const std::unique_ptr<PdfPage> page = document->firstPage();
    return _new_pdf_imageFromPDFPage_imageSize(page.get(), width, height);
}

std::optional<Image> PVAssetMetadataInspector::_new_pdf_imageFromPDFPage_imageSize(PdfPage* page,
                                                                                   double width,
                                                                                   double height) {
    const double pageWidth = page ? page->cropBoxWidth() : blankPageShape * height;
    const double pageHeight = page ? page->cropBoxHeight() : height;
    const double scale =
        page ? std::min(width / pageWidth, height / pageHeight) : std::min(width / pageWidth, 1.0);
    std::uint32_t pixelWidth = wholePixels(pageWidth * scale);
    std::uint32_t pixelHeight = wholePixels(pageHeight * scale);
    if (!page)
        return blankPage(pixelWidth, pixelHeight);
    const int turned = (page->rotation() % 360 + 360) % 360;
    if (turned == 90 || turned == 270)
        std::swap(pixelWidth, pixelHeight);
    return page->draw(pixelWidth, pixelHeight);
}

}  // namespace parvel
