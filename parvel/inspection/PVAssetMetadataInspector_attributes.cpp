#include <array>
#include <string_view>

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

struct TextProperty {
    std::string_view attribute;
    void (PVMutableAssetMetadata::*set)(std::optional<String>);
};

constexpr std::array textProperties = {
    TextProperty{PNMetadataXattrAssetID, &PVMutableAssetMetadata::setGeneratedID},
    TextProperty{PNMetadataXattrTitle, &PVMutableAssetMetadata::setTitle},
    TextProperty{PNMetadataXattrSortTitle, &PVMutableAssetMetadata::setSortTitle},
    TextProperty{PNMetadataXattrAuthor, &PVMutableAssetMetadata::setAuthor},
    TextProperty{PNMetadataXattrSortAuthor, &PVMutableAssetMetadata::setSortAuthor},
    TextProperty{PNMetadataXattrGenre, &PVMutableAssetMetadata::setGenre},
    TextProperty{PNMetadataXattrComments, &PVMutableAssetMetadata::setComments},
    TextProperty{PNMetadataXattrBookDescription, &PVMutableAssetMetadata::setBookDescription},
    TextProperty{PNMetadataXattrYear, &PVMutableAssetMetadata::setYear},
};

/// Empty for an attribute that is not there.
std::string_view textIn(const Dictionary& attributes, std::string_view name) {
    const String* text = PVDynamicCast(classOf<String>, attributes.find(name));
    return text ? std::string_view(*text) : std::string_view();
}

std::optional<Date> dateFrom(std::string_view text) {
    return Service<DateText>::current().dateFromString(text);
}

/// Into a record of the URL alone, which has nothing that an absent attribute would take away.
void setFromAttributes(PVMutableAssetMetadata& record, const Dictionary& attributes) {
    for (const TextProperty& property : textProperties) {
        if (const String* text =
                PVDynamicCast(classOf<String>, attributes.find(property.attribute)))
            (record.*property.set)(*text);
    }

    // Deliberate: set in any case, so that the attributes' answer goes over the content's.
    record.setExplicit(boolReading(textIn(attributes, PNMetadataXattrExplicit)));

    const std::string_view lastOpened = textIn(attributes, PNMetadataXattrLastOpened);
    if (!lastOpened.empty())
        record.setLastOpened(dateFrom(lastOpened));
    const std::string_view firstOpened = textIn(attributes, PNMetadataXattrFirstOpened);
    if (!firstOpened.empty())
        record.setFirstOpened(dateFrom(firstOpened));
    const std::string_view rating = textIn(attributes, PNMetadataXattrRating);
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
    setFromAttributes(*record, readableAttributesAtURL(url));
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
