#include "parvel/metadata/PVMutableAssetMetadata.h"

#include <utility>

#include "parvel/foundation/PVCasts.h"
#include "parvel/foundation/PVParvelLog.h"
#include "parvel/foundation/ValueReadings.h"
#include "parvel/metadata/CoverFilter.h"
#include "parvel/metadata/PVAssetMetadataKeys.h"
#include "parvel/metadata/StoredPath.h"
#include "parvel/platform/TextRules.h"

namespace parvel {

namespace {

/// Few records have more.
constexpr std::size_t usualEntries = 10;

std::optional<Value> pathToStore(const std::optional<URL>& url) {
    return url ? std::optional<Value>(url->path()) : std::nullopt;
}

std::optional<Value> optionalCopy(const Value* value) {
    return value ? std::optional<Value>(*value) : std::nullopt;
}

/// A number as its decimal string, or none where that reads below 1; anything else as it is.
std::optional<Value> normalizedStoreIDValue(const Value* storeID) {
    if (!PVDynamicCast(classOf<Number>, storeID))
        return optionalCopy(storeID);
    return int64Reading(storeID) < 1 ? std::nullopt : std::optional<Value>(stringForm(storeID));
}

}  // namespace

MutableAssetPtr PVMutableAssetMetadata::initWithURL_dictionary_validate(
    const std::optional<URL>& url, const Dictionary* dictionary, bool validate) {
    auto record = std::make_shared<PVMutableAssetMetadata>(Construction());
    record->mutableDictionary().reserve(usualEntries);
    if (dictionary)
        record->mutableDictionary() = *dictionary;
    // Deliberate: without validation the URL is not kept.
    if (!validate)
        return record;

    // Deliberate: a count that is present is overwritten.
    if (!record->generatedID())
        record->setGenerationCount(1);
    record->setStoreID(record->storeID());
    record->setAssetType(PVAssetTypeUnknown);

    // With no URL set, the record's own is the one of the dictionary's "path".
    const std::optional<URL> ownURL = url ? std::nullopt : record->url();
    const std::optional<URL>& urlToUse = url ? url : ownURL;
    if (urlToUse) {
        if (!record->displayName())
            record->setDisplayName(withReplacedInvalidUTF8(urlToUse->lastPathComponent()));
        record->setUrl(urlToUse);
        if (!record->sourceURL())
            record->setSourceURL(urlToUse);
    } else if (!record->storeID() && !record->generatedID()) {
        PVParvelLog().error(
            "Initializing headless metadata -- May need to support for the metadata update case but I don't like it...");
    }
    return record;
}

// Deliberate: the copy's URL is that of its "path", not the explicit one.
std::shared_ptr<PVAssetMetadata> PVMutableAssetMetadata::copyWithZone() const {
    return initWithURL_dictionary_validate(std::nullopt, backingDictionary().get(),
                                           /*validate=*/false);
}

void PVMutableAssetMetadata::combineWithMetadata(const PVAssetMetadata* other) {
    if (other)
        mutableDictionary().merge(*other->backingDictionary());
}

void PVMutableAssetMetadata::store(std::string_view key, std::optional<Value> value) {
    if (value)
        mutableDictionary().set(key, *std::move(value));
    else
        mutableDictionary().remove(key);
}

void PVMutableAssetMetadata::storeInBookInfo(std::string_view key, std::optional<String> value) {
    const Dictionary* current = PVDynamicCast(classOf<Dictionary>, stored(key::bookInfo));
    Dictionary bookInfo = current ? *current : Dictionary();
    if (value)
        bookInfo.set(key, *std::move(value));
    else
        bookInfo.remove(key);
    mutableDictionary().set(key::bookInfo, std::move(bookInfo));
}

// Setters.

// Deliberate: the cached kind stays.
void PVMutableAssetMetadata::setUrl(std::optional<URL> url) {
    store(key::path,
          url ? std::optional<Value>(pathWithLowercasedExtension(url->path())) : std::nullopt);
    setBackingURL(std::move(url));
}

void PVMutableAssetMetadata::setSourceURL(const std::optional<URL>& url) {
    store(key::sourcePath, pathToStore(url));
}

void PVMutableAssetMetadata::setPreviousURL(const std::optional<URL>& url) {
    store(key::previousPath, pathToStore(url));
}

void PVMutableAssetMetadata::setTrashedURL(const std::optional<URL>& url) {
    store(key::trashedPath, pathToStore(url));
}

void PVMutableAssetMetadata::setGeneratedID(std::optional<String> generatedID) {
    store(key::generatedID, std::move(generatedID));
}

void PVMutableAssetMetadata::setDisplayName(std::optional<String> displayName) {
    store(key::displayName, std::move(displayName));
}

void PVMutableAssetMetadata::setFormat(std::optional<String> format) {
    store(key::format, std::move(format));
}

void PVMutableAssetMetadata::setProducer(std::optional<String> producer) {
    store(key::producer, std::move(producer));
}

void PVMutableAssetMetadata::setGenerationCount(std::uint64_t count) {
    store(key::generationCount, Number::unsignedInteger(count));
}

void PVMutableAssetMetadata::setPreview(bool preview) {
    store(key::isPreview, Number::boolean(preview));
}

void PVMutableAssetMetadata::setHasPendingUpdates(bool pending) {
    store(key::hasPendingUpdates, Number::boolean(pending));
}

void PVMutableAssetMetadata::setUploadError(const std::optional<Error>& error) {
    store(key::uploadErrorDomain, error ? std::optional<Value>(error->domain()) : std::nullopt);
    store(key::uploadErrorCode,
          error ? std::optional<Value>(Number::signedInteger(error->code())) : std::nullopt);
}

void PVMutableAssetMetadata::setWasRedacted(bool redacted) {
    store(key::wasRedacted, Number::boolean(redacted));
}

void PVMutableAssetMetadata::setLocked(bool locked) {
    store(key::isLocked, Number::boolean(locked));
}

void PVMutableAssetMetadata::setExplicit(bool isExplicit) {
    store(key::isExplicit, Number::boolean(isExplicit));
}

void PVMutableAssetMetadata::setPermlink(const std::optional<URL>& permlink) {
    store(key::permlink,
          permlink ? std::optional<Value>(permlink->absoluteString()) : std::nullopt);
}

void PVMutableAssetMetadata::setStoreID(const Value* storeID) {
    store(key::storeID, normalizedStoreIDValue(storeID));
}

void PVMutableAssetMetadata::setArtistName(std::optional<String> artistName) {
    store(key::artistName, std::move(artistName));
}

void PVMutableAssetMetadata::setItemName(std::optional<String> itemName) {
    store(key::itemName, std::move(itemName));
}

void PVMutableAssetMetadata::setVersionNumber(std::optional<String> versionNumber) {
    store(key::versionNumber, std::move(versionNumber));
}

void PVMutableAssetMetadata::setPageCount(std::uint64_t count) {
    store(key::pageCount, Number::unsignedInteger(count));
}

void PVMutableAssetMetadata::setUpdateDate(std::optional<Date> date) {
    store(key::updateDate, date);
}

void PVMutableAssetMetadata::setModificationDate(std::optional<Date> date) {
    store(key::modificationDate, date);
}

void PVMutableAssetMetadata::setReleaseDate(std::optional<Date> date) {
    store(key::releaseDate, date);
}

void PVMutableAssetMetadata::setInsertionDate(std::optional<Date> date) {
    if (!date) {
        store(key::insertionDate, std::nullopt);
        return;
    }
    const std::int64_t seconds = Number::real(date->secondsSinceReferenceDate).int64Value();
    store(key::insertionDate, Number::signedInteger(seconds));
}

void PVMutableAssetMetadata::setGenre(std::optional<String> genre) {
    store(key::genre, std::move(genre));
}

void PVMutableAssetMetadata::setAssetDescription(std::optional<String> description) {
    store(key::assetDescription, std::move(description));
}

void PVMutableAssetMetadata::setPackageHash(std::optional<String> hash) {
    storeInBookInfo(key::packageHash, std::move(hash));
}

void PVMutableAssetMetadata::setAllocatedSize(std::uint64_t bytes) {
    store(key::allocatedSize, Number::unsignedInteger(bytes));
}

void PVMutableAssetMetadata::setPercentComplete(double share) {
    store(key::percentComplete, Number::real(share));
}

void PVMutableAssetMetadata::setCoverImagePath(std::optional<String> path) {
    storeInBookInfo(key::coverImagePath, std::move(path));
}

void PVMutableAssetMetadata::setCoverImageData(const Data* data) {
    if (data && coverFilter().refuses(*data))
        return;
    store(key::coverImageData, data ? std::optional<Value>(*data) : std::nullopt);
}

void PVMutableAssetMetadata::setCoverImageDataReplaced(const Value* replaced) {
    store(key::coverImageDataReplaced, optionalCopy(replaced));
}

void PVMutableAssetMetadata::setMimeType(std::optional<String> mimeType) {
    storeInBookInfo(key::mimeType, std::move(mimeType));
}

// Deliberate: the asset ID is derived; what is set is the package hash.
void PVMutableAssetMetadata::setAssetID(std::optional<String> assetID) {
    setPackageHash(std::move(assetID));
}

void PVMutableAssetMetadata::setTitle(std::optional<String> title) {
    setItemName(std::move(title));
}

void PVMutableAssetMetadata::setSortTitle(std::optional<String> sortTitle) {
    store(key::sortTitle, std::move(sortTitle));
}

void PVMutableAssetMetadata::setAuthor(std::optional<String> author) {
    setArtistName(std::move(author));
}

void PVMutableAssetMetadata::setSortAuthor(std::optional<String> sortAuthor) {
    store(key::sortAuthor, std::move(sortAuthor));
}

void PVMutableAssetMetadata::setComments(std::optional<String> comments) {
    store(key::comments, std::move(comments));
}

void PVMutableAssetMetadata::setBookDescription(std::optional<String> description) {
    setAssetDescription(std::move(description));
}

void PVMutableAssetMetadata::setYear(std::optional<String> year) {
    store(key::year, std::move(year));
}

void PVMutableAssetMetadata::setLastOpened(std::optional<Date> date) {
    store(key::lastOpenDate, date);
}

// Deliberate: read back as the purchase date.
void PVMutableAssetMetadata::setFirstOpened(std::optional<Date> date) {
    store(key::purchaseDate, date);
}

void PVMutableAssetMetadata::setRating(std::optional<Number> rating) {
    store(key::rating, rating);
}

// Deliberate: thumbnails are not kept in the record.
void PVMutableAssetMetadata::setThumbnail(const Data* /*image*/) {}

}  // namespace parvel
