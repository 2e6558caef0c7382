#include "parvel/foundation/PVCasts.h"
#include "parvel/foundation/ValueReadings.h"
#include "parvel/inspection/PVAssetMetadataInspector.h"
#include "parvel/metadata/PVMutableAssetMetadata.h"
#include "parvel/platform/CloudStore.h"
#include "parvel/platform/DateText.h"
#include "parvel/platform/Service.h"
#include "parvel/xattr/AttributeDictionary.h"
#include "parvel/xattr/PNMetadataXattr.h"

namespace parvel {

namespace {

/// The texts of an attribute dictionary; none for an attribute that is not there.
class AttributeTexts {
public:
    explicit AttributeTexts(const Dictionary& attributes) : m_attributes(attributes) {}

    [[nodiscard]] std::optional<String> operator[](std::string_view name) const {
        const String* text = PVDynamicCast(classOf<String>, m_attributes.find(name));
        return text ? std::optional(*text) : std::nullopt;
    }

private:
    const Dictionary& m_attributes;
};

std::optional<Date> dateFrom(std::string_view text) {
    return Service<DateText>::current().dateFromString(text);
}

void setFromAttributes(PVMutableAssetMetadata& record, const AttributeTexts& texts) {
    record.setGeneratedID(texts[PNMetadataXattrAssetID]);
    record.setTitle(texts[PNMetadataXattrTitle]);
    record.setSortTitle(texts[PNMetadataXattrSortTitle]);
    record.setAuthor(texts[PNMetadataXattrAuthor]);
    record.setSortAuthor(texts[PNMetadataXattrSortAuthor]);
    record.setGenre(texts[PNMetadataXattrGenre]);
    record.setComments(texts[PNMetadataXattrComments]);
    record.setBookDescription(texts[PNMetadataXattrBookDescription]);
    record.setYear(texts[PNMetadataXattrYear]);

    // Deliberate: set in any case, so that the attributes' answer goes over the content's.
    record.setExplicit(boolReading(texts[PNMetadataXattrExplicit].value_or("")));

    const String lastOpened = texts[PNMetadataXattrLastOpened].value_or("");
    if (!lastOpened.empty())
        record.setLastOpened(dateFrom(lastOpened));
    const String firstOpened = texts[PNMetadataXattrFirstOpened].value_or("");
    if (!firstOpened.empty())
        record.setFirstOpened(dateFrom(firstOpened));
    const String rating = texts[PNMetadataXattrRating].value_or("");
    if (!rating.empty())
        record.setRating(Number::signedInteger(int64Reading(rating)));
}

}  // namespace

MutableAssetPtr PVAssetMetadataInspector::_xAttrMetadataForAssetAtURL_error(
    const URL& url, [[maybe_unused]] ErrorOut error) {
    if (PVAssetMetadata::assetTypeForAssetAtURL(url) == PVAssetTypeUnknown)
        return nullptr;

    // The record has the URL, so the one error of this read that is handed out can't arise.
    MutableAssetPtr record = PVAssetMetadata::metadataWithURL_dictionary(url, nullptr);
    const Dictionary attributes = readableAttributesAtURL(url);
    setFromAttributes(*record, AttributeTexts(attributes));
    return record;
}

AssetPtr PVAssetMetadataInspector::immediatelyAvailableMetadataForAssetAtURL_error(
    const std::optional<URL>& url, ErrorOut error) {
    CloudStore& cloud = Service<CloudStore>::current();
    if (!url || !cloud.isPromisedItemReachable(*url, error))
        return nullptr;
    // Deliberate: a failed status read gives no error.
    std::optional<DownloadingStatus> status;
    if (!cloud.downloadingStatus(*url, status))
        return nullptr;

    if (status == DownloadingStatus::Current || status == DownloadingStatus::Downloaded)
        return metadataForAssetAtURL_error(url, error);
    // Deliberate: an item in no such storage has no status, and its content is not read either.
    return _xAttrMetadataForAssetAtURL_error(*url, error);
}

}  // namespace parvel
