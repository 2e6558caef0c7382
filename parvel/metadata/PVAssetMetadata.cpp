#include "parvel/metadata/PVAssetMetadata.h"

#include <utility>

#include "parvel/foundation/PVCasts.h"
#include "parvel/foundation/ValueReadings.h"
#include "parvel/metadata/PVAssetMetadataKeys.h"
#include "parvel/metadata/StoredPath.h"

namespace parvel {

namespace {

const Value* inBookInfo(const Value* bookInfo, std::string_view name) {
    const Dictionary* dictionary = PVDynamicCast(classOf<Dictionary>, bookInfo);
    return dictionary ? dictionary->find(name) : nullptr;
}

template <class T>
std::optional<T> storedAs(const Value* value) {
    const T* cast = PVDynamicCast(classOf<T>, value);
    return cast ? std::optional<T>(*cast) : std::nullopt;
}

/// A number's value as an integer, a text's 64-bit reading, else 0.
std::int64_t signedReading(const Value* value) {
    const Number* number = PVDynamicCast(classOf<Number>, value);
    return number ? number->int64Value() : int64Reading(value);
}

}  // namespace

PVAssetMetadata::PVAssetMetadata(Construction)
    : m_backingDictionary(std::make_shared<Dictionary>()) {}

PVAssetMetadata::~PVAssetMetadata() = default;

// The three fields.

std::shared_ptr<const Dictionary> PVAssetMetadata::backingDictionary() const {
    return m_backingDictionary;
}

void PVAssetMetadata::setBackingDictionary(Dictionary dictionary) {
    m_backingDictionary = std::make_shared<Dictionary>(std::move(dictionary));
}

const Value* PVAssetMetadata::stored(std::string_view key) const {
    return m_backingDictionary->find(key);
}

// Properties.

std::optional<URL> PVAssetMetadata::url() const {
    return m_backingURL ? m_backingURL : fileURLOfStoredPath(stored(key::path));
}

std::optional<String> PVAssetMetadata::assetID() const {
    std::optional<String> fromStore = stringForm(storeID());
    return fromStore ? fromStore : storedAs<String>(generatedID());
}

std::optional<URL> PVAssetMetadata::sourceURL() const {
    return fileURLOfStoredPath(stored(key::sourcePath));
}

std::optional<URL> PVAssetMetadata::previousURL() const {
    return fileURLOfStoredPath(stored(key::previousPath));
}

std::optional<URL> PVAssetMetadata::trashedURL() const {
    return fileURLOfStoredPath(stored(key::trashedPath));
}

const Value* PVAssetMetadata::generatedID() const {
    return stored(key::generatedID);
}

const Value* PVAssetMetadata::displayName() const {
    return stored(key::displayName);
}

const Value* PVAssetMetadata::format() const {
    return stored(key::format);
}

const Value* PVAssetMetadata::producer() const {
    return stored(key::producer);
}

std::uint64_t PVAssetMetadata::generationCount() const {
    return unsignedReading(stored(key::generationCount));
}

bool PVAssetMetadata::isPreview() const {
    return boolReading(stored(key::isPreview));
}

bool PVAssetMetadata::hasPendingUpdates() const {
    return boolReading(stored(key::hasPendingUpdates));
}

bool PVAssetMetadata::wasRedacted() const {
    return boolReading(stored(key::wasRedacted));
}

bool PVAssetMetadata::isLocked() const {
    return boolReading(stored(key::isLocked));
}

bool PVAssetMetadata::isExplicit() const {
    return boolReading(stored(key::isExplicit));
}

std::optional<URL> PVAssetMetadata::permlink() const {
    const String* text = PVDynamicCast(classOf<String>, stored(key::permlink));
    return text ? URL::fromString(*text) : std::nullopt;
}

const Value* PVAssetMetadata::storeID() const {
    return stored(key::storeID);
}

const Value* PVAssetMetadata::artistName() const {
    return stored(key::artistName);
}

const Value* PVAssetMetadata::itemName() const {
    return stored(key::itemName);
}

const Value* PVAssetMetadata::versionNumber() const {
    return stored(key::versionNumber);
}

bool PVAssetMetadata::shouldDisableOptimizeSpeed() const {
    return boolReading(stored(key::shouldDisableOptimizeSpeed));
}

bool PVAssetMetadata::shouldDisableTouchEmulation() const {
    return boolReading(stored(key::shouldDisableTouchEmulation));
}

const Value* PVAssetMetadata::desktopSupportLevel() const {
    return stored(key::desktopSupportLevel);
}

std::uint64_t PVAssetMetadata::pageCount() const {
    return unsignedReading(stored(key::pageCount));
}

const Value* PVAssetMetadata::updateDate() const {
    return stored(key::updateDate);
}

const Value* PVAssetMetadata::modificationDate() const {
    return stored(key::modificationDate);
}

const Value* PVAssetMetadata::releaseDate() const {
    return stored(key::releaseDate);
}

Date PVAssetMetadata::insertionDate() const {
    const Value* seconds = stored(key::insertionDate);
    return seconds ? Date{static_cast<double>(signedReading(seconds))} : Date::now();
}

const Value* PVAssetMetadata::genre() const {
    return stored(key::genre);
}

const Value* PVAssetMetadata::assetDescription() const {
    return stored(key::assetDescription);
}

const Value* PVAssetMetadata::packageHash() const {
    return inBookInfo(stored(key::bookInfo), key::packageHash);
}

std::uint64_t PVAssetMetadata::allocatedSize() const {
    return unsignedReading(stored(key::allocatedSize));
}

bool PVAssetMetadata::_hasAllocatedSize() const {
    return stored(key::allocatedSize) != nullptr;
}

double PVAssetMetadata::percentComplete() const {
    return doubleReading(stored(key::percentComplete));
}

const Value* PVAssetMetadata::downloadInfo() const {
    return stored(key::downloadInfo);
}

const Value* PVAssetMetadata::coverImagePath() const {
    return inBookInfo(stored(key::bookInfo), key::coverImagePath);
}

const Value* PVAssetMetadata::mimeType() const {
    return inBookInfo(stored(key::bookInfo), key::mimeType);
}

const Value* PVAssetMetadata::coverImageData() const {
    return stored(key::coverImageData);
}

const Value* PVAssetMetadata::coverImageDataReplaced() const {
    return stored(key::coverImageDataReplaced);
}

std::optional<Error> PVAssetMetadata::uploadError() const {
    const String* domain = PVDynamicCast(classOf<String>, stored(key::uploadErrorDomain));
    const std::int64_t code = signedReading(stored(key::uploadErrorCode));
    return domain && code != 0 ? std::optional<Error>(Error(*domain, code)) : std::nullopt;
}

// The checked view.

std::optional<String> PVAssetMetadata::title() const {
    return storedAs<String>(itemName());
}

std::optional<String> PVAssetMetadata::sortTitle() const {
    return storedAs<String>(stored(key::sortTitle));
}

std::optional<String> PVAssetMetadata::author() const {
    return storedAs<String>(artistName());
}

std::optional<String> PVAssetMetadata::sortAuthor() const {
    return storedAs<String>(stored(key::sortAuthor));
}

std::optional<String> PVAssetMetadata::comments() const {
    return storedAs<String>(stored(key::comments));
}

std::optional<String> PVAssetMetadata::bookDescription() const {
    return storedAs<String>(assetDescription());
}

std::optional<String> PVAssetMetadata::year() const {
    return storedAs<String>(stored(key::year));
}

std::optional<Date> PVAssetMetadata::lastOpenDate() const {
    return storedAs<Date>(stored(key::lastOpenDate));
}

// Deliberate: the date of purchase is the date of the first opening.
std::optional<Date> PVAssetMetadata::purchaseDate() const {
    return storedAs<Date>(stored(key::purchaseDate));
}

std::optional<Number> PVAssetMetadata::rating() const {
    return storedAs<Number>(stored(key::rating));
}

}  // namespace parvel
