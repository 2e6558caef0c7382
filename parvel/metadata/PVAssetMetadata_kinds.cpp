#include <algorithm>

#include "parvel/foundation/PVCasts.h"
#include "parvel/foundation/PVParvelLog.h"
#include "parvel/metadata/PVAssetMetadata.h"
#include "parvel/platform/CloudStore.h"
#include "parvel/platform/ResourceQueries.h"
#include "parvel/platform/Service.h"

namespace parvel {

namespace {

char asciiLower(char character) {
    return character >= 'A' && character <= 'Z' ? static_cast<char>(character - 'A' + 'a')
                                                : character;
}

bool equalsLowerCase(std::string_view text, std::string_view lowerCase) {
    return std::equal(text.begin(), text.end(), lowerCase.begin(), lowerCase.end(),
                      [](char left, char right) { return asciiLower(left) == right; });
}

}  // namespace

// The kind.

PVAssetType PVAssetMetadata::assetTypeForFileExtension(std::optional<std::string_view> extension) {
    if (!extension)
        return PVAssetTypeUnknown;
    if (equalsLowerCase(*extension, "epub"))
        return PVAssetTypeEPub;
    if (equalsLowerCase(*extension, "folium"))
        return PVAssetTypeKestrelPub;
    if (equalsLowerCase(*extension, "pdf"))
        return PVAssetTypePDF;
    if (equalsLowerCase(*extension, "m4a"))
        return PVAssetTypeAudiobook;
    return PVAssetTypeUnknown;
}

PVAssetType PVAssetMetadata::assetTypeForAssetAtURL(const std::optional<URL>& url) {
    return url ? assetTypeForFileExtension(url->pathExtension()) : PVAssetTypeUnknown;
}

PVAssetType PVAssetMetadata::assetType() const {
    const PVAssetType cached = m_assetType.load(std::memory_order_relaxed);
    if (cached != PVAssetTypeUnknown)
        return cached;

    const PVAssetType type = assetTypeForAssetAtURL(url());
    // Deliberate: a kind once found stays, whatever URL the record is given later.
    if (type != PVAssetTypeUnknown)
        m_assetType.store(type, std::memory_order_relaxed);
    return type;
}

void PVAssetMetadata::setAssetType(PVAssetType type) {
    m_assetType.store(type, std::memory_order_relaxed);
}

bool PVAssetMetadata::isBookURL(const std::optional<URL>& url) {
    const PVAssetType type = assetTypeForAssetAtURL(url);
    return type == PVAssetTypeEPub || type == PVAssetTypeKestrelPub;
}

bool PVAssetMetadata::isEPub() const {
    return assetType() == PVAssetTypeEPub;
}

bool PVAssetMetadata::isKestrelPub() const {
    return assetType() == PVAssetTypeKestrelPub;
}

bool PVAssetMetadata::isPDF() const {
    return assetType() == PVAssetTypePDF;
}

bool PVAssetMetadata::isAudiobook() const {
    return assetType() == PVAssetTypeAudiobook;
}

bool PVAssetMetadata::isBook() const {
    return isEPub() || isKestrelPub();
}

bool PVAssetMetadata::isRMT() const {
    if (!isEPub())
        return false;
    const String* text = PVDynamicCast(classOf<String>, producer());
    return text && text->starts_with("Folium Author");
}

// Members of a book package.

std::optional<URL> PVAssetMetadata::bazaarMetadataURLWithBaseURL(const std::optional<URL>& base) {
    return _bookSubURLWithBaseURL_filename(base, PVAssetMetadataBazaarMetadataPlistPath);
}

std::optional<URL> PVAssetMetadata::bazaarMetadataBackupURLWithBaseURL(
    const std::optional<URL>& base) {
    return _bookSubURLWithBaseURL_filename(base, PVAssetMetadataBazaarMetadataPlistBackupPath);
}

std::optional<URL> PVAssetMetadata::bazaarArtworkURLWithBaseURL(const std::optional<URL>& base) {
    return _bookSubURLWithBaseURL_filename(base, PVAssetMetadataBazaarArtworkPath);
}

std::optional<URL> PVAssetMetadata::bazaarArtworkBackupURLWithBaseURL(
    const std::optional<URL>& base) {
    return _bookSubURLWithBaseURL_filename(base, PVAssetMetadataBazaarArtworkBackupPath);
}

std::optional<URL> PVAssetMetadata::_bookSubURLWithBaseURL_filename(const std::optional<URL>& base,
                                                                    std::string_view filename) {
    if (!isBookURL(base))
        return std::nullopt;
    return base->appendingPathComponent(filename);
}

std::optional<URL> PVAssetMetadata::bazaarMetadataURL() const {
    return bazaarMetadataURLWithBaseURL(url());
}

std::optional<URL> PVAssetMetadata::bazaarMetadataBackupURL() const {
    return bazaarMetadataBackupURLWithBaseURL(url());
}

std::optional<URL> PVAssetMetadata::bazaarArtworkURL() const {
    return bazaarArtworkURLWithBaseURL(url());
}

std::optional<URL> PVAssetMetadata::bazaarArtworkBackupURL() const {
    return bazaarArtworkBackupURLWithBaseURL(url());
}

// What the host knows. A record without URL fails the query.

bool PVAssetMetadata::isUbiquitous() const {
    const std::optional<URL> item = url();
    std::optional<Error> error;
    const std::optional<bool> ubiquitous =
        item ? Service<CloudStore>::current().isUbiquitous(*item, &error) : std::nullopt;
    if (!ubiquitous)
        PVParvelLog().error("Failed to query ubiquitous state. url: %@ error: %@", item, error);
    return ubiquitous.value_or(false);
}

// Deliberate: the error is never written.
std::optional<bool> PVAssetMetadata::isCompressedBookWithError(ErrorOut /*error*/) const {
    if (!isBook())
        return false;

    const std::optional<URL> item = url();
    const std::optional<bool> directory =
        item ? Service<ResourceQueries>::current().isDirectory(*item) : std::nullopt;
    if (!directory) {
        PVParvelLog().error("Failed to get directory status");
        return std::nullopt;
    }
    return !*directory;
}

bool PVAssetMetadata::isInDirectory(const URL& directory) const {
    const std::optional<URL> item = url();
    return item && Service<ResourceQueries>::current().relationship(directory, *item) ==
                       DirectoryRelationship::Contains;
}

// Other records.

bool PVAssetMetadata::containsAsset(const PVAssetMetadata& other) const {
    return std::all_of(other.m_backingDictionary->begin(), other.m_backingDictionary->end(),
                       [this](const Dictionary::Entry& entry) {
                           const Value* own = stored(entry.key);
                           return own && *own == entry.value;
                       });
}

}  // namespace parvel
